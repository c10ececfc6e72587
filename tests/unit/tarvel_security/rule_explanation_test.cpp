// SPDX-License-Identifier: Apache-2.0
// References, values and digests in the report on a signature, and several refusals in their order.

#include "explained.h"
#include "genuine_token.h"

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <vector>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Tarvel::StringUtil;
using Tarvel::Xml::Security::SignatureReport;
using Tarvel::Xml::Security::SignatureRule;
using Testing::Explain;
using Testing::Explained;
using Testing::FindElement;
using Testing::GenuineToken;
using Testing::IdOf;
using Testing::ReadDataFile;
using Testing::RefusalsOf;
using Testing::Replaced;
using Testing::Texts;
using Testing::WRONG_VALUE;

Explained ExplainReplaced(std::string_view from, std::string_view to) {
  return Explain(Replaced(GenuineToken(), from, to));
}

/// The refusal of a reference's URI at an element.
std::string UriRefusal(const std::string &uri, const std::string &why, const std::string &element,
                       const std::string &wanted) {
  return "REFERENCES\nThe reference URI \"" + uri + "\" is not accepted: " + why + "\n" + element + "\n" + uri + "\n" +
         wanted;
}

TEST(Explain, FindsNoTargetForAUriThatIsNeitherEmptyNorABareName) {
  for (const auto &[uri, why] : {std::pair<std::string, std::string>{"#", "it names nothing"},
                                 {"#xpointer(/)", "it is an XPointer"},
                                 {"other.xml#a", "it points outside the document"}}) {
    const Explained explained = ExplainReplaced("#" + IdOf(GenuineToken()), uri);
    EXPECT_EQ((Texts{UriRefusal(uri, why, "ds:Reference", "\"\", or \"#\" and an identifier"), WRONG_VALUE}),
              RefusalsOf(explained));
    EXPECT_EQ(uri, explained.report.references.front().uri);
    EXPECT_EQ(nullptr, explained.report.references.front().target);
    EXPECT_TRUE(explained.report.references.front().digestComputed.empty());
    EXPECT_FALSE(explained.report.areDigestsComputed);
  }
}

TEST(Explain, FindsNoTargetWithoutAnElementOfThatIdentifier) {
  const Explained explained = ExplainReplaced("#" + IdOf(GenuineToken()), "#nobody");
  EXPECT_EQ((Texts{UriRefusal("#nobody", "no element has that identifier", "ds:Reference",
                              "one element with that identifier"),
                   WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_EQ(nullptr, explained.report.references.front().target);
}

TEST(Explain, FindsNoTargetIfSeveralElementsHaveTheIdentifierAndShowsTheSecondOfThem) {
  const std::string id = IdOf(GenuineToken());
  std::string duplicates;
  for (const char *const name : {"second", "third", "fourth"}) {
    duplicates.append("<").append(name).append(" ID='").append(id).append("'/>");
  }
  const Explained explained = ExplainReplaced("</ds:X509Data>", "</ds:X509Data>" + duplicates);
  EXPECT_EQ(Texts{UriRefusal("#" + id, "several elements have that identifier", "second",
                             "one element with that identifier")},
            RefusalsOf(explained));
  EXPECT_EQ(nullptr, explained.report.references.front().target);
  EXPECT_FALSE(explained.report.areDigestsComputed);
  EXPECT_TRUE(explained.report.keys.front().madeSignature);
}

TEST(Explain, ShowsTheSameWrongUriOfSeveralReferencesOnce) {
  std::string text = Replaced(GenuineToken(), "#" + IdOf(GenuineToken()), "#nobody");
  const std::size_t begin = text.find("<ds:Reference");
  const std::size_t end = text.find("</ds:SignedInfo>");
  text.insert(end, text.substr(begin, end - begin));
  const Explained explained = Explain(text);
  EXPECT_EQ(2u, RefusalsOf(explained).size());
  ASSERT_EQ(2u, explained.report.references.size());
  EXPECT_EQ(nullptr, explained.report.references[1].target);
}

/// The refusal of a target.
std::string TargetRefusal(const std::string &uri, const std::string &why) {
  return "REFERENCES\nThe reference URI \"" + uri + "\" " + why + "\nds:Reference\n" + uri +
         "\nan element that contains the signature and more";
}

TEST(Explain, ComputesNoDigestOfATargetThatDoesNotEnvelopTheSignature) {
  std::string text = Replaced(GenuineToken(), "#" + IdOf(GenuineToken()), "#elsewhere");
  text = Replaced(text, "<saml:Subject>", "<saml:Subject ID=\"elsewhere\">");
  const Explained explained = Explain(text);
  EXPECT_EQ(
      (Texts{TargetRefusal("#elsewhere", "has the enveloped-signature transform, but does not envelop the signature"),
             WRONG_VALUE}),
      RefusalsOf(explained));
  const SignatureReport::Reference &reference = explained.report.references.front();
  EXPECT_EQ(&FindElement(*explained.document, "Subject"), reference.target);
  EXPECT_TRUE(reference.digestComputed.empty());
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ComputesNoDigestIfOnlyTheSignatureIsCovered) {
  std::string text = ReadDataFile("tokens/reference-empty-uri.xml");
  const std::size_t begin = text.find("<ds:Signature ");
  text = text.substr(begin, text.find("</ds:Signature>") + 15 - begin);
  const Explained explained = Explain(text);
  ASSERT_EQ(1u, explained.report.refusals.size());
  EXPECT_EQ(TargetRefusal("", "covers nothing but the signature, which the enveloped-signature transform removes"),
            RefusalsOf(explained).front());
  EXPECT_EQ(explained.document->GetDocumentNode(), explained.report.references.front().target);
  EXPECT_TRUE(explained.report.references.front().digestComputed.empty());
}

TEST(Explain, ComputesTheDigestOfATargetWithoutTheSignatureIfNoTransformRemovesIt) {
  const Explained explained = Explain(ReadDataFile("tokens/reference-two.xml"));
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  ASSERT_EQ(2u, explained.report.references.size());
  EXPECT_EQ(&FindElement(*explained.document, "KeyInfo"), explained.report.references[0].target);
  EXPECT_TRUE(explained.report.references[0].digestMatches);
  EXPECT_TRUE(explained.report.references[1].digestMatches);
}

TEST(Explain, ShowsTheWrongDigestOfChangedContent) {
  const Explained explained = ExplainReplaced("alice", "malice");
  const SignatureReport::Reference &reference = explained.report.references.front();
  EXPECT_EQ(Texts{"DIGESTS\n\nds:DigestValue\n" + StringUtil::Base64Encode(reference.digestComputed) + "\n" +
                  StringUtil::Base64Encode(reference.digestWanted)},
            RefusalsOf(explained));
  const SignatureReport genuine = Explain(GenuineToken()).report;
  EXPECT_EQ(genuine.references.front().digestWanted, reference.digestWanted);
  EXPECT_EQ(32u, reference.digestComputed.size());
  EXPECT_NE(reference.digestWanted, reference.digestComputed);
  EXPECT_FALSE(reference.digestMatches);
  EXPECT_TRUE(explained.report.areDigestsComputed);
  EXPECT_TRUE(explained.report.keys.front().madeSignature);
}

TEST(Explain, ShowsASignedDigestOfAnotherLength) {
  const Explained explained = Explain(ReadDataFile("attacks/digest-resigned-31-octets.xml"));
  ASSERT_EQ(1u, explained.report.refusals.size());
  EXPECT_EQ(SignatureRule::DIGESTS, explained.report.refusals.front().rule);
  EXPECT_EQ(31u, explained.report.references.front().digestWanted.size());
  EXPECT_EQ(32u, explained.report.references.front().digestComputed.size());
}

TEST(Explain, ShortensALongDigest) {
  const std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:DigestValue>") + 16;
  const std::string digest = text.substr(begin, text.find('<', begin) - begin);
  const std::string octets = StringUtil::Base64Encode(std::vector<std::uint8_t>(100000, 1));
  const Explained explained = Explain(Replaced(text, digest, octets));
  EXPECT_EQ(StringUtil::Shorten(octets), explained.report.refusals.back().wanted);
}

TEST(Explain, ChecksTheDigestsOfASignatureWithAWrongValue) {
  const std::string text = GenuineToken();
  const std::size_t value = text.find("SignatureValue>") + 20;
  const Explained explained = Explain(std::string(text).replace(value, 1, text[value] == 'A' ? "B" : "A"));
  EXPECT_EQ(Texts{WRONG_VALUE}, RefusalsOf(explained));
  EXPECT_FALSE(explained.report.keys.front().madeSignature);
  EXPECT_TRUE(explained.report.isValueChecked);
  EXPECT_TRUE(explained.report.references.front().digestMatches);
}

TEST(Explain, ShowsThatATargetHasNoCanonicalForm) {
  const Explained explained = ExplainReplaced("<saml:Subject>", "<saml:Subject><foo:bar/>");
  ASSERT_EQ(1u, explained.report.refusals.size());
  const SignatureReport::Refusal &refusal = explained.report.refusals.front();
  EXPECT_EQ(SignatureRule::DIGESTS, refusal.rule);
  const auto &unbound =
      static_cast<const Tarvel::Xml::ElementNode &>(*FindElement(*explained.document, "Subject").GetFirstChild());
  EXPECT_EQ("No canonical form: the prefix \"foo\" is not bound at line " + std::to_string(unbound.GetLine()) +
                ", column " + std::to_string(unbound.GetColumn()),
            refusal.message);
  EXPECT_EQ(&FindElement(*explained.document, "Reference"), refusal.element);
  EXPECT_TRUE(explained.report.references.front().digestComputed.empty());
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ShowsThatSignedInfoHasNoCanonicalFormAndChecksTheDigests) {
  const Explained explained = ExplainReplaced("<ds:SignedInfo>", "<ds:SignedInfo xmlns:r=\"relative\">");
  ASSERT_EQ(1u, explained.report.refusals.size());
  const SignatureReport::Refusal &refusal = explained.report.refusals.front();
  EXPECT_EQ(SignatureRule::VALUE, refusal.rule);
  EXPECT_EQ(0u, refusal.message.find("No canonical form: the namespace name \"relative\" is relative at line "));
  EXPECT_EQ(&FindElement(*explained.document, "SignedInfo"), refusal.element);
  EXPECT_FALSE(explained.report.isValueChecked);
  EXPECT_TRUE(explained.report.references.front().digestMatches);
}

// Several refusals at once

/// The rules of the refusals with their messages, in order.
Texts RulesOf(const Explained &explained) {
  Texts rules;
  for (const SignatureReport::Refusal &refusal : explained.report.refusals) {
    rules.push_back(Testing::NameOf(refusal.rule) + ": " + refusal.message);
  }
  return rules;
}

TEST(Explain, ShowsAllRefusalsOfTheProfileInTheOrderOfVerify) {
  std::string text = Replaced(GenuineToken(), "</ds:Signature>", "<ds:Object/></ds:Signature>");
  text = Replaced(text, "http://www.w3.org/2001/10/xml-exc-c14n#", "urn:c14n");
  text = Replaced(text, Uri::RSA_SHA256, "urn:signature");
  text = Replaced(text, "<ds:Reference ", "<ds:Reference Type=\"urn:type\" ");
  text = Replaced(text, Uri::ENVELOPED_SIGNATURE, "urn:transform");
  text = Replaced(text, Uri::DIGEST_SHA256, "urn:digest");
  EXPECT_EQ((Texts{"PROFILE: A signature with ds:Object is not accepted",
                   "PROFILE: The canonicalization algorithm \"urn:c14n\" is not accepted",
                   "PROFILE: The signature algorithm \"urn:signature\" is not accepted",
                   "PROFILE: A reference of the type \"urn:type\" is not accepted",
                   "PROFILE: The transform algorithm \"urn:transform\" is not accepted",
                   "PROFILE: The digest algorithm \"urn:digest\" is not accepted"}),
            RulesOf(Explain(text)));
}

TEST(Explain, ShowsTheRefusalsOfAllRulesInTheOrderOfVerify) {
  std::string text = Replaced(ReadDataFile("tokens/reference-two.xml"), "#_key", "#nobody");
  text = Replaced(text, "<ds:Reference ", "<ds:Reference Type=\"urn:type\" ");
  text = Replaced(text, "alice", "malice");
  EXPECT_EQ((Texts{"PROFILE: A reference of the type \"urn:type\" is not accepted",
                   "REFERENCES: The reference URI \"#nobody\" is not accepted: no element has that identifier",
                   "VALUE: ", "DIGESTS: "}),
            RulesOf(Explain(text)));
  EXPECT_EQ(
      (Texts{"PROFILE: A reference of the type \"urn:type\" is not accepted",
             "KEYS: No trusted key can be used with the signature algorithm \"" + std::string(Uri::RSA_SHA256) + "\"",
             "REFERENCES: The reference URI \"#nobody\" is not accepted: no element has that identifier", "DIGESTS: "}),
      RulesOf(Explain(text, {"sts-ec256"})));
}

TEST(Explain, ShowsADuplicateIdentifierBeforeAMissingOne) {
  std::string text = Replaced(ReadDataFile("tokens/reference-two.xml"), "#_key", "#nobody");
  const std::string id = IdOf(text);
  text = Replaced(text, "<ds:KeyName>", "<ds:KeyName Id=\"" + id + "\">");
  EXPECT_EQ(
      (Texts{"REFERENCES: The reference URI \"#" + id + "\" is not accepted: several elements have that identifier",
             "REFERENCES: The reference URI \"#nobody\" is not accepted: no element has that identifier", "VALUE: "}),
      RulesOf(Explain(text)));
}

} // namespace
