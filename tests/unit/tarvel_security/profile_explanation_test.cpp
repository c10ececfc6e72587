// SPDX-License-Identifier: Apache-2.0
// What the profile refuses, in the report on a signature.

#include "explained.h"
#include "genuine_token.h"

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <sstream>
#include <string>
#include <vector>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Tarvel::Xml::Security::SignatureReport;
using Tarvel::Xml::Security::SignatureRule;
using Testing::Explain;
using Testing::Explained;
using Testing::FindElement;
using Testing::GenuineToken;
using Testing::IdOf;
using Testing::RefusalsOf;
using Testing::Replaced;
using Testing::Texts;
using Testing::WRONG_VALUE;

const std::string EXCLUSIVE = "http://www.w3.org/2001/10/xml-exc-c14n#";
const std::string EXCLUSIVE_TRANSFORM = "<ds:Transform Algorithm=\"" + EXCLUSIVE + "\"/>";
const std::string CANONICALIZATION_URIS =
    "http://www.w3.org/TR/2001/REC-xml-c14n-20010315, http://www.w3.org/TR/2001/REC-xml-c14n-20010315#WithComments, "
    "http://www.w3.org/2001/10/xml-exc-c14n#, http://www.w3.org/2001/10/xml-exc-c14n#WithComments";

Explained ExplainReplaced(std::string_view from, std::string_view to) {
  return Explain(Replaced(GenuineToken(), from, to));
}

TEST(Explain, ShowsAllThatAnAcceptedSignatureHas) {
  const Explained explained = Explain(GenuineToken());
  const SignatureReport &report = explained.report;
  EXPECT_EQ(Texts(), RefusalsOf(report));
  EXPECT_EQ(EXCLUSIVE, report.canonicalizationMethod);
  EXPECT_EQ(Uri::RSA_SHA256, report.signatureMethod);
  ASSERT_EQ(1u, report.references.size());
  const SignatureReport::Reference &reference = report.references.front();
  EXPECT_EQ("#" + IdOf(GenuineToken()), reference.uri);
  EXPECT_EQ(explained.document->GetDocumentElement(), reference.target);
  EXPECT_EQ((Texts{std::string(Uri::ENVELOPED_SIGNATURE), EXCLUSIVE}), reference.transforms);
  EXPECT_EQ(Uri::DIGEST_SHA256, reference.digestMethod);
  EXPECT_EQ(32u, reference.digestWanted.size());
  EXPECT_EQ(reference.digestWanted, reference.digestComputed);
  EXPECT_TRUE(reference.digestMatches);
  EXPECT_TRUE(report.areDigestsComputed);
  EXPECT_TRUE(report.isValueChecked);
}

TEST(Explain, ReturnsTheSameReportEachTime) {
  const auto document = Testing::ParseDocument(Replaced(GenuineToken(), "alice", "malice"));
  const auto signature = Testing::SignatureOf(*document);
  const auto resolver = Tarvel::Xml::Security::CreateTrustSetKeyResolver(Testing::Trusted({"other"}));
  const Texts first = RefusalsOf(signature->Explain(*resolver));
  EXPECT_EQ(2u, first.size());
  EXPECT_EQ(first, RefusalsOf(signature->Explain(*resolver)));
}

// Profile

TEST(Explain, ShowsTheAcceptedSignatureAlgorithmsForAnUnknownOneAndStillComputesTheDigests) {
  const Explained explained = ExplainReplaced(Uri::RSA_SHA256, "urn:other");
  ASSERT_EQ(1u, explained.report.refusals.size());
  const SignatureReport::Refusal &refusal = explained.report.refusals.front();
  EXPECT_EQ(SignatureRule::PROFILE, refusal.rule);
  EXPECT_EQ("The signature algorithm \"urn:other\" is not accepted", refusal.message);
  EXPECT_EQ(&FindElement(*explained.document, "SignatureMethod"), refusal.element);
  EXPECT_EQ("urn:other", refusal.found);
  std::string wanted;
  for (const std::string_view uri :
       {Uri::RSA_SHA256, Uri::RSA_SHA384, Uri::RSA_SHA512, Uri::RSA_PSS_SHA256, Uri::RSA_PSS_SHA384,
        Uri::RSA_PSS_SHA512, Uri::ECDSA_SHA256, Uri::ECDSA_SHA384, Uri::ECDSA_SHA512}) {
    wanted.append(wanted.empty() ? "" : ", ").append(uri);
  }
  EXPECT_EQ(wanted, refusal.wanted);
  EXPECT_FALSE(explained.report.isValueChecked);
  EXPECT_TRUE(explained.report.areDigestsComputed);
  EXPECT_TRUE(explained.report.references.front().digestMatches);
  ASSERT_EQ(1u, explained.report.keys.size());
  EXPECT_FALSE(explained.report.keys.front().isUsable);
  EXPECT_FALSE(explained.report.keys.front().madeSignature);
}

TEST(Explain, ListsOnlyUrisThatAreAccepted) {
  for (const std::string_view original : {Uri::RSA_SHA256, Uri::DIGEST_SHA256, Uri::ENVELOPED_SIGNATURE}) {
    std::istringstream listed(ExplainReplaced(original, "urn:other").report.refusals.front().wanted);
    for (std::string uri; std::getline(listed >> std::ws, uri, ',');) {
      std::string text = Replaced(GenuineToken(), original, uri);
      if (original == Uri::ENVELOPED_SIGNATURE) {
        text = Replaced(text, EXCLUSIVE_TRANSFORM, ""); // nothing may follow a canonicalisation
      }
      const Explained explained = Explain(text, {"sts-rsa", "sts-ec256"});
      EXPECT_TRUE(explained.report.refusals.empty() || explained.report.refusals.front().rule > SignatureRule::PROFILE)
          << uri;
    }
  }
}

TEST(Explain, ComputesNoDigestWithAnUnknownDigestAlgorithm) {
  const Explained explained = ExplainReplaced(Uri::DIGEST_SHA256, "urn:other");
  EXPECT_EQ((Texts{"PROFILE\nThe digest algorithm \"urn:other\" is not accepted\nds:DigestMethod\nurn:other\n"
                   "http://www.w3.org/2001/04/xmlenc#sha256, http://www.w3.org/2001/04/xmldsig-more#sha384, "
                   "http://www.w3.org/2001/04/xmlenc#sha512",
                   WRONG_VALUE}),
            RefusalsOf(explained));
  const SignatureReport::Reference &reference = explained.report.references.front();
  EXPECT_EQ("urn:other", reference.digestMethod);
  EXPECT_TRUE(reference.digestComputed.empty());
  EXPECT_FALSE(reference.digestMatches);
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ComputesTheDigestsOfTheOtherReferences) {
  const std::string text = Testing::ReadDataFile("tokens/reference-two.xml");
  const Explained explained = Explain(Replaced(text, Uri::DIGEST_SHA256, "urn:other"));
  ASSERT_EQ(2u, explained.report.references.size());
  EXPECT_TRUE(explained.report.references[0].digestComputed.empty());
  EXPECT_FALSE(explained.report.references[0].digestMatches);
  EXPECT_TRUE(explained.report.references[1].digestMatches);
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ComputesNoDigestWithAnUnknownTransform) {
  const Explained explained = ExplainReplaced(Uri::ENVELOPED_SIGNATURE, "urn:other");
  EXPECT_EQ((Texts{"PROFILE\nThe transform algorithm \"urn:other\" is not accepted\nds:Transform\nurn:other\n"
                   "http://www.w3.org/2000/09/xmldsig#enveloped-signature, " +
                       CANONICALIZATION_URIS,
                   WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_EQ((Texts{"urn:other", EXCLUSIVE}), explained.report.references.front().transforms);
  EXPECT_TRUE(explained.report.references.front().digestComputed.empty());
}

TEST(Explain, ChecksNoValueWithAnUnknownCanonicalization) {
  const Explained explained = ExplainReplaced(EXCLUSIVE, "urn:other");
  EXPECT_EQ((Texts{"PROFILE\nThe canonicalization algorithm \"urn:other\" is not accepted\n"
                   "ds:CanonicalizationMethod\nurn:other\n" +
                   CANONICALIZATION_URIS}),
            RefusalsOf(explained));
  EXPECT_TRUE(explained.report.keys.front().isUsable);
  EXPECT_FALSE(explained.report.isValueChecked);
  EXPECT_TRUE(explained.report.areDigestsComputed);
}

/// The refusal of a parameter.
std::string ParameterRefusal(const std::string &parameter, const std::string &uri, const std::string &element) {
  return "PROFILE\nThe parameter \"" + parameter + "\" of the algorithm \"" + uri + "\" is not accepted\n" + element +
         "\n" + parameter + "\nno such parameter";
}

TEST(Explain, ShowsEachParameterThatAnAlgorithmDoesNotHave) {
  const std::string inclusive = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";
  const std::string parameters =
      "><x xmlns=\"urn:x\"/><InclusiveNamespaces PrefixList=\"a\" xmlns=\"" + EXCLUSIVE + "\"/></ds:Transform>";
  Explained explained =
      ExplainReplaced(EXCLUSIVE_TRANSFORM, "<ds:Transform Algorithm=\"" + inclusive + "\"" + parameters);
  EXPECT_EQ((Texts{ParameterRefusal("x", inclusive, "ds:Transform"),
                   ParameterRefusal("InclusiveNamespaces", inclusive, "ds:Transform"), WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_FALSE(explained.report.areDigestsComputed);
  explained = ExplainReplaced(EXCLUSIVE_TRANSFORM, "<ds:Transform Algorithm=\"" + EXCLUSIVE + "\"" + parameters);
  EXPECT_EQ((Texts{ParameterRefusal("x", EXCLUSIVE, "ds:Transform"), WRONG_VALUE}), RefusalsOf(explained));
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ChecksNoValueWithAParameterOfTheSignatureAlgorithm) {
  const std::string method = "<ds:SignatureMethod Algorithm=\"" + std::string(Uri::RSA_SHA256) + "\"";
  const Explained explained =
      ExplainReplaced(method + "/>", method + "><ds:HMACOutputLength>8</ds:HMACOutputLength></ds:SignatureMethod>");
  EXPECT_EQ(Texts{ParameterRefusal("ds:HMACOutputLength", std::string(Uri::RSA_SHA256), "ds:SignatureMethod")},
            RefusalsOf(explained));
  EXPECT_FALSE(explained.report.isValueChecked);
}

TEST(Explain, ShowsTooManyInclusivePrefixesAndComputesNoDigestWithThem) {
  std::string list = "p0";
  for (int number = 1; number < 257; ++number) {
    list += " p" + std::to_string(number);
  }
  const Explained explained = ExplainReplaced(
      EXCLUSIVE_TRANSFORM, "<ds:Transform Algorithm=\"" + EXCLUSIVE + "\"><InclusiveNamespaces PrefixList=\"" + list +
                               "\" xmlns=\"" + EXCLUSIVE + "\"/></ds:Transform>");
  EXPECT_EQ((Texts{"PROFILE\nThe PrefixList of the algorithm \"" + EXCLUSIVE +
                       "\" has more than 256 prefixes\nds:Transform\n" + Tarvel::StringUtil::Shorten(list) +
                       "\nat most 256 prefixes",
                   WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ExaminesOnlyTheFirstTwoTransforms) {
  std::string transforms;
  for (int count = 0; count < 10; ++count) {
    transforms += "<ds:Transform Algorithm=\"urn:" + std::to_string(count) + "\"/>";
  }
  const Explained explained = ExplainReplaced(EXCLUSIVE_TRANSFORM, EXCLUSIVE_TRANSFORM + transforms);
  EXPECT_EQ((Texts{"PROFILE\nA reference has 12 transforms; at most 2 are accepted\nds:Transform\n12 "
                   "transforms\nat most 2",
                   WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_EQ("urn:0", explained.report.refusals.front().element->FindAttribute("", "Algorithm")->GetValue());
  EXPECT_EQ(10u, explained.report.references.front().transforms.size());
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ShowsATransformAfterACanonicalizationOnce) {
  const Explained explained = ExplainReplaced(Uri::ENVELOPED_SIGNATURE, EXCLUSIVE);
  EXPECT_EQ((Texts{"PROFILE\nThe transform \"" + EXCLUSIVE + "\" is not accepted after \"" + EXCLUSIVE +
                       "\"\nds:Transform\n" + EXCLUSIVE +
                       "\nthe enveloped-signature transform, then one canonicalization, each at most once",
                   WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

TEST(Explain, ComputesTheDigestOfAReferenceWithAType) {
  const Explained explained = ExplainReplaced("<ds:Reference ", "<ds:Reference Type=\"urn:type\" ");
  EXPECT_EQ((Texts{"PROFILE\nA reference of the type \"urn:type\" is not accepted\nds:Reference\nurn:type\nno Type",
                   WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_TRUE(explained.report.references.front().digestMatches);
}

TEST(Explain, ChecksEverythingOfASignatureWithObjects) {
  const Explained explained = ExplainReplaced("</ds:Signature>", "<ds:Object Id='first'/><ds:Object/></ds:Signature>");
  EXPECT_EQ(Texts{"PROFILE\nA signature with ds:Object is not accepted\nds:Object\nds:Object\nno ds:Object"},
            RefusalsOf(explained));
  EXPECT_TRUE(explained.report.refusals.front().element->FindAttribute("", "Id"));
  EXPECT_TRUE(explained.report.keys.front().madeSignature);
  EXPECT_TRUE(explained.report.references.front().digestMatches);
}

TEST(Explain, ComputesNoDigestsWithoutReferences) {
  std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:Reference");
  text.erase(begin, text.find("</ds:SignedInfo>") - begin);
  const Explained explained = Explain(text);
  EXPECT_EQ((Texts{"PROFILE\nThe signature has no reference\nds:SignedInfo\n\na reference", WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

/// The genuine token with its reference `count` times. The last one has the identifier "last".
std::string WithReferences(int count) {
  std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:Reference");
  const std::size_t end = text.find("</ds:SignedInfo>");
  const std::string reference = text.substr(begin, end - begin);
  text.insert(end, Replaced(reference, "<ds:Reference", "<ds:Reference Id=\"last\""));
  for (int more = 2; more < count; ++more) {
    text.insert(end, reference);
  }
  return text;
}

TEST(Explain, ExaminesTenReferences) {
  const Explained explained = Explain(WithReferences(10));
  EXPECT_EQ(Texts{WRONG_VALUE}, RefusalsOf(explained));
  ASSERT_EQ(10u, explained.report.references.size());
  for (const SignatureReport::Reference &reference : explained.report.references) {
    EXPECT_TRUE(reference.digestMatches);
  }
  EXPECT_TRUE(explained.report.areDigestsComputed);
}

TEST(Explain, ExaminesOnlyTheFirstTenOfElevenReferences) {
  const std::string text = WithReferences(11);
  const std::size_t last = text.rfind(std::string(Uri::DIGEST_SHA256));
  const Explained explained = Explain(std::string(text).replace(last, 1, "x"));
  EXPECT_EQ((Texts{"PROFILE\nThe signature has 11 references; at most 10 are accepted\nds:Reference\n11 references\n"
                   "at most 10",
                   WRONG_VALUE}),
            RefusalsOf(explained));
  EXPECT_EQ("last", explained.report.refusals.front().element->FindAttribute("", "Id")->GetValue());
  ASSERT_EQ(10u, explained.report.references.size());
  EXPECT_TRUE(explained.report.references.back().digestMatches);
  EXPECT_FALSE(explained.report.areDigestsComputed);
}

} // namespace
