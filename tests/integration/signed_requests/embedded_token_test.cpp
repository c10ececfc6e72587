// SPDX-License-Identifier: Apache-2.0
// The signature of a token inside our messages stays valid, however the token is written, if its canonicalisation does
// not include the elements around it.
#include "exchange/request_builder_impl.h"
#include "integration/signed_requests/foreign_document.h"
#include "support/data_file.h"
#include "support/identity.h"
#include "support/sample_requests.h"
#include "support/token_stand_in.h"
#include "xml/xml_text.h"

#include <ssoclient/create_saml_token.h>
#include <tarvel/xml/document.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

const char EXCLUSIVE[] = "http://www.w3.org/2001/10/xml-exc-c14n#";
const char INCLUSIVE[] = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";

struct Embedding {
  const char *name;
  void (*build)(const RequestBuilderImpl &builder, const SamlToken &token, Request &request);
};

const Embedding EMBEDDINGS[] = {
    {"exchange", [](const RequestBuilderImpl &builder, const SamlToken &token,
                    Request &request) { builder.BuildExchangeTokenRequest(token, FullSpec(), request); }},
    {"renew", [](const RequestBuilderImpl &builder, const SamlToken &token,
                 Request &request) { builder.BuildRenewRequest(token, 600, request); }},
    {"validate", [](const RequestBuilderImpl &builder, const SamlToken &token,
                    Request &request) { builder.BuildValidateSubjectRequest(token, request); }},
};

class EmbeddedToken : public testing::Test {
protected:
  /// The message of `embedding` with `xml` as its token.
  std::string Embed(const Embedding &embedding, const std::string &xml) const {
    const TokenStandIn token(AttributeOf(ForeignDocument(xml).Root(), "ID"), xml, SamlToken::HOLDER_OF_KEY);
    Request request;
    embedding.build(m_builder, token, request);
    return request.body;
  }

  static xmlNodePtr Assertion(const ForeignDocument &message) { return Find(message.Root(), "Assertion"); }

  static bool IsValidIn(const std::string &message, const std::string &certificate) {
    const ForeignDocument document(message);
    return IsValidSignature(Child(Assertion(document), "Signature"), ReadDataFile(certificate));
  }

  /// Like `IsValidIn`, but after the assertion was copied into its own document.
  static bool IsValidTakenOutOf(const std::string &message, const std::string &certificate) {
    const ForeignDocument document(message);
    const xmlDocPtr alone = xmlNewDoc(reinterpret_cast<const xmlChar *>("1.0"));
    xmlDocSetRootElement(alone, xmlDocCopyNode(Assertion(document), alone, 1));
    xmlChar *text = nullptr;
    int size = 0;
    xmlDocDumpMemory(alone, &text, &size);
    const std::string xml(reinterpret_cast<const char *>(text), static_cast<std::size_t>(size));
    xmlFree(text);
    xmlFreeDoc(alone);
    const ForeignDocument standalone(xml);
    return IsValidSignature(Child(standalone.Root(), "Signature"), ReadDataFile(certificate));
  }

  /// Whether the message's own signature is valid; a validate request has none.
  static bool IsMessageValid(const std::string &message) {
    const ForeignDocument document(message);
    for (const xmlNodePtr signature : FindAll(document.Root(), "Signature")) {
      if (AttributeOf(signature, "Id") == "holderOfKeyProofSignature") {
        return IsValidSignature(signature, ReadDataFile("tokens/holder.crt"));
      }
    }
    return true;
  }

  const RequestBuilderImpl m_builder{HolderIdentity()};
};

struct Fixture {
  const char *token;
  const char *certificate;
};

/// Tokens whose signature does not depend on the elements around them.
const Fixture EXCLUSIVE_TOKENS[] = {
    {"bearer", "sts-rsa"},
    {"bearer-minimal", "sts-rsa"},
    {"bearer-50k", "sts-rsa"},
    {"holder-of-key", "sts-rsa"},
    {"delegated", "sts-rsa"},
    {"full", "sts-rsa"},
    {"style-default-namespace", "sts-rsa"},
    {"style-prefixes-on-root", "sts-rsa"},
    {"style-pretty", "sts-rsa"},
    {"c14n-exclusive-with-comments", "sts-rsa"},
    {"c14n-inclusive-prefixes", "sts-rsa"}, // the prefixes that it includes are its own
    {"rsa-sha512", "sts-rsa"},
    {"ecdsa-p256-sha256", "sts-ec256"},
    {"ecdsa-p521-sha512", "sts-ec521"},
};

TEST_F(EmbeddedToken, KeepsItsSignatureInEveryMessageHoweverItIsWritten) {
  for (const Fixture &fixture : EXCLUSIVE_TOKENS) {
    const std::string certificate = std::string("tokens/") + fixture.certificate + ".crt";
    for (const Embedding &embedding : EMBEDDINGS) {
      const std::string message = Embed(embedding, ReadDataFile(std::string("tokens/") + fixture.token + ".xml"));
      EXPECT_TRUE(IsValidIn(message, certificate)) << fixture.token << " in " << embedding.name;
      EXPECT_TRUE(IsMessageValid(message)) << fixture.token << " in " << embedding.name;
    }
  }
}

/// Inclusive canonicalisation includes the declarations of all elements around the token, so its signature is not valid
/// in a message that declares anything. Also, a reference to "" means the whole message there. The service must copy
/// these tokens into their own documents to verify them; there they are valid again.
TEST_F(EmbeddedToken, OfInclusiveCanonicalisationIsValidAgainInItsOwnDocument) {
  for (const char *const name : {"c14n-inclusive", "c14n-inclusive-with-comments", "c14n-mixed",
                                 "style-prefixes-on-root-inclusive", "reference-empty-uri"}) {
    for (const Embedding &embedding : EMBEDDINGS) {
      const std::string message = Embed(embedding, ReadDataFile(std::string("tokens/") + name + ".xml"));
      EXPECT_FALSE(IsValidIn(message, "tokens/sts-rsa.crt")) << name << " in " << embedding.name;
      EXPECT_TRUE(IsValidTakenOutOf(message, "tokens/sts-rsa.crt")) << name << " in " << embedding.name;
      EXPECT_TRUE(IsMessageValid(message)) << name << " in " << embedding.name;
    }
  }
}

/// An unsigned token with the prefix `p` for SAML (empty: the default namespace) and `d` for signatures, with further
/// declarations on its root, and with a signature template for the canonicalisation `algorithm`.
std::string TokenTemplate(const std::string &p, const std::string &d, const std::string &declarations,
                          const std::string &algorithm) {
  const std::string s = p.empty() ? "" : p + ":";
  const auto element = [](const std::string &name, const std::string &attributes, const std::string &content) {
    return "<" + name + attributes + ">" + content + "</" + name + ">";
  };
  const std::string c14n = " Algorithm=\"" + algorithm + "\"";
  const std::string signature = element(
      d + ":Signature", " xmlns:" + d + "=\"http://www.w3.org/2000/09/xmldsig#\"",
      element(
          d + ":SignedInfo", "",
          element(d + ":CanonicalizationMethod", c14n, "") +
              element(d + ":SignatureMethod", " Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"", "") +
              element(d + ":Reference", " URI=\"#_t1\"",
                      element(d + ":Transforms", "",
                              element(d + ":Transform",
                                      " Algorithm=\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"", "") +
                                  element(d + ":Transform", c14n, "")) +
                          element(d + ":DigestMethod", " Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"", "") +
                          element(d + ":DigestValue", "", ""))) +
          element(d + ":SignatureValue", "", ""));
  const std::string nameId =
      element(s + "NameID", " Format=\"http://schemas.xmlsoap.org/claims/UPN\"", "alice@corp.example");
  const std::string until = " NotOnOrAfter=\"2120-01-01T00:00:00.000Z\"";
  const std::string confirmation =
      element(s + "SubjectConfirmation", " Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"",
              element(s + "SubjectConfirmationData", until, ""));
  return element(
      s + "Assertion", declarations + " ID=\"_t1\" IssueInstant=\"2020-01-01T00:00:00.000Z\" Version=\"2.0\"",
      element(s + "Issuer", " Format=\"http://schemas.xmlsoap.org/claims/UPN\"", "sts@corp.example") + signature +
          element(s + "Subject", "", nameId + confirmation) +
          element(s + "Conditions", " NotBefore=\"2020-01-01T00:00:00.000Z\"" + until,
                  element(s + "AudienceRestriction", "", element(s + "Audience", "", "a\n \tb"))) +
          element(s + "AuthnStatement", " AuthnInstant=\"2020-01-01T00:00:00.000Z\"",
                  element(s + "AuthnContext", "",
                          element(s + "AuthnContextClassRef", "", "urn:oasis:names:tc:SAML:2.0:ac:classes:Password"))));
}

std::string Declare(const std::string &prefix, const std::string &uri) {
  return (prefix.empty() ? " xmlns=\"" : " xmlns:" + prefix + "=\"") + uri + "\"";
}

const std::string SAML = "urn:oasis:names:tc:SAML:2.0:assertion";

TEST_F(EmbeddedToken, KeepsItsSignatureWhateverPrefixesItShares) {
  // Prefixes that our messages use for other namespaces, and the default namespace, which they do not use.
  for (const std::string prefix : {"", "saml", "soapenv", "wsse", "wsu", "wst", "ds", "rsa-advice"}) {
    for (const std::string signaturePrefix : {"ds", "wst", "soapenv", "sig"}) {
      if (prefix == signaturePrefix) {
        continue;
      }
      const std::string unsignedToken = TokenTemplate(prefix, signaturePrefix, Declare(prefix, SAML), EXCLUSIVE);
      const std::string token = SignTemplate(unsignedToken, ReadDataFile("tokens/sts-rsa.key"));
      for (const Embedding &embedding : EMBEDDINGS) {
        const std::string message = Embed(embedding, token);
        EXPECT_TRUE(IsValidIn(message, "tokens/sts-rsa.crt"))
            << "'" << prefix << "' and " << signaturePrefix << " in " << embedding.name;
        EXPECT_TRUE(IsMessageValid(message)) << "'" << prefix << "' and " << signaturePrefix;
      }
    }
  }
}

TEST_F(EmbeddedToken, OfInclusiveCanonicalisationKeepsItsSignatureWhenItsRootDeclaresEveryPrefixAroundIt) {
  const std::string declarations = Declare("saml", SAML) + Declare("soapenv", "urn:a") + Declare("wsse", "urn:b") +
                                   Declare("wst", "urn:c") + Declare("wsu", "urn:d");
  const std::string token =
      SignTemplate(TokenTemplate("saml", "ds", declarations, INCLUSIVE), ReadDataFile("tokens/sts-rsa.key"));
  for (const Embedding &embedding : EMBEDDINGS) {
    EXPECT_TRUE(IsValidIn(Embed(embedding, token), "tokens/sts-rsa.crt")) << embedding.name;
  }
}

/// A token from a response whose outer elements declare the token's prefixes, extracted by our own parser.
class TokenFromResponse : public EmbeddedToken {
protected:
  static std::shared_ptr<const SamlToken> Take(const std::string &prefix, const std::string &aboveDeclarations,
                                               const std::string &algorithm) {
    const std::string response =
        SignTemplate("<r:Response xmlns:r=\"urn:r\"" + aboveDeclarations + "><r:Token>" +
                         TokenTemplate(prefix, "ds", "", algorithm) + "</r:Token></r:Response>",
                     ReadDataFile("tokens/sts-rsa.key"));
    Tarvel::Ref<Tarvel::Xml::Document> document;
    ParseXML(response, document);
    const auto *const token = document->GetDocumentElement()->FindChildElement("Token")->FindChildElement("Assertion");
    return CreateSamlTokenFromDom(*token,
                                  {Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))});
  }
};

TEST_F(TokenFromResponse, KeepsItsSignatureWhenItsPrefixesAreDeclaredAboveIt) {
  for (const std::string prefix : {"", "saml", "a", "wst"}) {
    const auto token = Take(prefix, Declare(prefix, SAML) + Declare("unused", "urn:u"), EXCLUSIVE);
    for (const Embedding &embedding : EMBEDDINGS) {
      if (std::string(embedding.name) != "renew") { // a bearer token cannot be renewed
        Request request;
        embedding.build(m_builder, *token, request);
        EXPECT_TRUE(IsValidIn(request.body, "tokens/sts-rsa.crt")) << "'" << prefix << "' in " << embedding.name;
      }
    }
  }
}

TEST_F(TokenFromResponse, OfInclusiveCanonicalisationIsValidInItsOwnDocument) {
  const auto token = Take("saml", Declare("saml", SAML) + Declare("soapenv", "urn:s"), INCLUSIVE);
  Request request;
  m_builder.BuildExchangeTokenRequest(*token, FullSpec(), request);
  EXPECT_FALSE(IsValidIn(request.body, "tokens/sts-rsa.crt"));
  EXPECT_TRUE(IsValidTakenOutOf(request.body, "tokens/sts-rsa.crt"));
}

TEST_F(TokenFromResponse, OfInclusiveCanonicalisationKeepsItsSignatureWhenTheResponseDeclaredOurPrefixes) {
  const auto token =
      Take("saml", Declare("saml", SAML) + Declare("soapenv", "urn:s") + Declare("wsse", "urn:w"), INCLUSIVE);
  Request request;
  m_builder.BuildExchangeTokenRequest(*token, FullSpec(), request);
  EXPECT_TRUE(IsValidIn(request.body, "tokens/sts-rsa.crt"));
}

} // namespace
} // namespace SsoClient
