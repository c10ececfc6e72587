// SPDX-License-Identifier: Apache-2.0
// Tokens whose own signature depends on what is around them.

#include "proof/token_element.h"

#include "support/fixed_environment.h"
#include "support/sample_message.h"
#include "support/throws_message.h"
#include "support/token_stand_in.h"
#include "support/xml_tree.h"
#include "unit/proof/unchanged_message.h"

#include <ssoclient/proof/sign_message.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

const char INCLUSIVE[] = "Invalid argument : the signature of the token uses inclusive canonicalization, so it would "
                         "not be valid in a message";

TEST(TokenElement, RefusesSignaturesWithInclusiveCanonicalisation) {
  for (const char *const name : {"c14n-inclusive", "c14n-inclusive-with-comments", "c14n-mixed"}) {
    const TokenStandIn token("_t", ReadDataFile(std::string("tokens/") + name + ".xml"), SamlToken::BEARER);
    EXPECT_THROWS_MESSAGE(TokenElement element(token), Tarvel::InvalidArgumentException, INCLUSIVE);
  }
}

std::string SignedToken(const std::string &signedInfoMethod, const std::string &uri, const std::string &transforms) {
  return "<t ID=\"_t\"><d:Signature xmlns:d=\"" + DS + "\"><d:SignedInfo><d:CanonicalizationMethod Algorithm=\"" +
         signedInfoMethod + "\"/><d:Reference" + uri + "><d:Transforms>" + transforms +
         "</d:Transforms></d:Reference></d:SignedInfo></d:Signature></t>";
}

const std::string EXCLUSIVE = "http://www.w3.org/2001/10/xml-exc-c14n#";
const std::string ENVELOPED = "<d:Transform Algorithm=\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/>";
const std::string EXCLUSIVE_TRANSFORM = "<d:Transform Algorithm=\"" + EXCLUSIVE + "\"/>";

TEST(TokenElement, TreatsAReferenceWithoutCanonicalisationAndUnknownMethodsAsInclusive) {
  for (const std::string &xml : {
           SignedToken(EXCLUSIVE, " URI=\"#_t\"", ENVELOPED),
           SignedToken("http://www.w3.org/2006/12/xml-c14n11", " URI=\"#_t\"", EXCLUSIVE_TRANSFORM),
           SignedToken("http://www.w3.org/TR/2001/REC-xml-c14n-20010315#", " URI=\"#_t\"", EXCLUSIVE_TRANSFORM),
           SignedToken("urn:unknown", " URI=\"#_t\"", EXCLUSIVE_TRANSFORM),
           SignedToken(EXCLUSIVE, " URI=\"#_t\"",
                       "<d:Transform Algorithm=\"http://www.w3.org/2006/12/xml-c14n11#WithComments\"/>"),
       }) {
    const TokenStandIn token("_t", xml, SamlToken::BEARER);
    EXPECT_THROWS_MESSAGE(TokenElement element(token), Tarvel::InvalidArgumentException, INCLUSIVE) << xml;
  }
}

TEST(TokenElement, RefusesASignatureOverTheWholeDocument) {
  const TokenStandIn token("_t", SignedToken(EXCLUSIVE, " URI=\"\"", ENVELOPED + EXCLUSIVE_TRANSFORM),
                           SamlToken::BEARER);
  EXPECT_THROWS_MESSAGE(TokenElement element(token), Tarvel::InvalidArgumentException,
                        "Invalid argument : the signature of the token refers to its whole document, so it would not "
                        "be valid in a message");
}

TEST(TokenElement, IgnoresSignaturesInTheContentOfTheToken) {
  const TokenStandIn token("_t", "<a><b>" + SignedToken(EXCLUSIVE, " URI=\"\"", ENVELOPED) + "</b></a>",
                           SamlToken::BEARER);
  EXPECT_EQ(TokenElement(token).GetIdentifiers(), (std::set<std::string, std::less<>>{"_t"}));
}

TEST(TokenElement, AcceptsExclusiveCanonicalisationInEveryForm) {
  for (const char *const name : {"bearer", "c14n-exclusive-with-comments", "c14n-inclusive-prefixes",
                                 "style-default-namespace", "style-prefixes-on-root", "rsa-sha512"}) {
    const TokenStandIn token("_t", ReadDataFile(std::string("tokens/") + name + ".xml"), SamlToken::BEARER);
    EXPECT_NO_THROW(TokenElement element(token)) << name;
  }
}

/// A token whose signature includes these prefixes.
TokenStandIn TokenIncluding(const std::string &prefixes, bool inReference) {
  const std::string list = "<e:InclusiveNamespaces xmlns:e=\"" + EXCLUSIVE + "\" PrefixList=\"" + prefixes + "\"/>";
  const std::string method = "<d:Transform Algorithm=\"" + EXCLUSIVE + "\">";
  std::string xml = SignedToken(EXCLUSIVE, " URI=\"#_t\"", method + (inReference ? list : "") + "</d:Transform>");
  if (!inReference) {
    const std::string plain = "<d:CanonicalizationMethod Algorithm=\"" + EXCLUSIVE + "\"";
    xml.replace(xml.find(plain), plain.size() + 2, plain + ">" + list + "</d:CanonicalizationMethod>");
  }
  xml.replace(0, 2, "<t xmlns:own=\"urn:own\"");
  return {"_t", xml, SamlToken::BEARER};
}

std::string EnvelopeDeclaring(const std::string &declarations) {
  return "<s:Envelope xmlns:s=\"" + SOAP11 + "\"" + declarations + "><s:Body/></s:Envelope>";
}

TEST(AttachToken, RefusesAMessageThatDeclaresAPrefixThatTheTokensSignatureIncludes) {
  const struct {
    const char *prefixes;
    const char *declarations;
    std::string refused;
  } cases[] = {{"a xs\tb", " xmlns:xs=\"urn:xs\"", "xs"}, {"s", "", "s"}, {"wsse", "", "wsse"}};
  for (const auto &[prefixes, declarations, refused] : cases) {
    for (const bool inReference : {true, false}) {
      const TokenStandIn token = TokenIncluding(prefixes, inReference);
      EXPECT_TRUE(RefusesUnchanged<InvalidMessageException>(
          EnvelopeDeclaring(declarations), [&](Tarvel::Xml::Document &document) { AttachToken(document, token); },
          "The signature of the token would not be valid in the message: it includes the prefix '" + refused +
              "', which the message declares"));
    }
  }
}

TEST(AttachToken, AcceptsIncludedPrefixesThatTheTokenDeclaresOrTheMessageDoesNot) {
  const std::string envelope = EnvelopeDeclaring(" xmlns:own=\"urn:1\" xmlns=\"urn:2\" xmlns:x=\"urn:3\"");
  for (const bool inReference : {true, false}) {
    EXPECT_NO_THROW(AttachToken(envelope, TokenIncluding("own xs #default", inReference)));
  }
}

TEST(AttachToken, KeepsTheNamespaceOfNamesWithoutPrefixInTheToken) {
  const FixedEnvironment environment;
  const std::string message = "<Envelope xmlns=\"" + SOAP12 + "\"><Header/><Body/></Envelope>";
  for (const char *const xml : {"<p:t xmlns:p=\"urn:p\"><x/></p:t>", "<p:t xmlns:p=\"urn:p\" xmlns=\"\"><x/></p:t>"}) {
    const auto document = ParseDocument(message);
    AttachToken(*document, TokenStandIn("_t", xml, SamlToken::BEARER));
    const auto *const security =
        document->GetDocumentElement()->FindChildElement("Header")->FindChildElement("Security");
    EXPECT_EQ(security->FindChildElement("t")->FindChildElement("x")->GetQName(), Tarvel::Xml::QName("", "x"));
  }
  const std::string own = "<t xmlns=\"urn:t\"><x></x></t>";
  EXPECT_NE(AttachToken(message, TokenStandIn("_t", own, SamlToken::BEARER)).find(own), std::string::npos);
}

} // namespace
} // namespace SsoClient
