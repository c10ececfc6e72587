// SPDX-License-Identifier: Apache-2.0
// The report on a signature agrees with its verification for every document.

#include "explained.h"
#include "genuine_token.h"
#include "support/data_file.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <filesystem>
#include <functional>
#include <set>
#include <string>
#include <vector>

namespace {

using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
using Tarvel::Xml::Security::CreateSignatureFromDom;
using Tarvel::Xml::Security::CreateTrustSetKeyResolver;
using Tarvel::Xml::Security::KeyInfoResolver;
using Tarvel::Xml::Security::Signature;
using Tarvel::Xml::Security::SignatureReport;
using Testing::GenuineToken;
using Testing::IdOf;
using Testing::Trusted;
using Testing::VerdictOf;

/// The `Signature` elements of a document that have the syntax of a signature.
std::vector<Ref<Signature>> SignaturesOf(const Document &document) {
  std::vector<Ref<Signature>> signatures;
  const Node *node = document.GetDocumentElement();
  while (node) {
    const ElementNode *const element = Tarvel::Xml::AsElement(node);
    if (element && element->GetLocalName() == "Signature") {
      try {
        Ref<Signature> signature;
        CreateSignatureFromDom(*element, *element, signature);
        signatures.push_back(signature);
      } catch (const Tarvel::Xml::Security::SignatureSyntaxException &) {
        // There is nothing to verify.
      }
    }
    const Node *next = node->GetFirstChild();
    while (node && !next) {
      next = node->GetNextSibling();
      node = node->GetParent();
    }
    node = next;
  }
  return signatures;
}

/// Resolvers that trust no key, one key, keys from which KeyInfo selects, and keys of all kinds.
const std::vector<Ref<KeyInfoResolver>> &Resolvers() {
  static const std::vector<Ref<KeyInfoResolver>> RESOLVERS = {
      CreateTrustSetKeyResolver({}), CreateTrustSetKeyResolver(Trusted({"sts-rsa"})),
      CreateTrustSetKeyResolver(Trusted({"other", "sts-rsa-2"})),
      CreateTrustSetKeyResolver(Trusted(
          {"sts-rsa-reissued", "sts-rsa1024", "sts-ec384", "sts-ec521", "sts-ec256", "sts-rsa3072", "sts-rsa"}))};
  return RESOLVERS;
}

/// Whether a report without refusals shows that everything was checked.
bool ShowsAllChecks(const SignatureReport &report) {
  return report.isValueChecked && report.areDigestsComputed &&
         std::any_of(report.keys.begin(), report.keys.end(),
                     [](const auto &key) { return key.isUsable && key.madeSignature; }) &&
         std::all_of(report.references.begin(), report.references.end(),
                     [](const auto &reference) { return reference.target && reference.digestMatches; });
}

/// Compares the verdicts on all signatures of a text with the reports and adds them. Ignores text that does not parse.
void Compare(const std::string &text, const std::string &name, std::set<std::string> &verdicts) {
  Ref<Document> document;
  try {
    document = Testing::ParseDocument(text);
  } catch (const Tarvel::Xml::XMLParseException &) {
    return;
  }
  for (const Ref<Signature> &signature : SignaturesOf(*document)) {
    for (const Ref<KeyInfoResolver> &resolver : Resolvers()) {
      const SignatureReport report = signature->Explain(*resolver);
      const std::string verdict = VerdictOf(*signature, *resolver);
      EXPECT_EQ(verdict, VerdictOf(report)) << name;
      EXPECT_TRUE(std::is_sorted(report.refusals.begin(), report.refusals.end(),
                                 [](const auto &left, const auto &right) { return left.rule < right.rule; }))
          << name;
      EXPECT_TRUE(verdict != "accepted" || ShowsAllChecks(report)) << name;
      verdicts.insert(verdict);
    }
  }
}

TEST(Explain, AgreesWithVerifyForEveryDocumentOfTheTestData) {
  std::set<std::string> verdicts;
  for (const auto &entry : std::filesystem::recursive_directory_iterator(Testing::DataPath(""))) {
    if (entry.path().extension() == ".xml") {
      const std::string name = std::filesystem::relative(entry.path(), Testing::DataPath("")).string();
      Compare(Testing::ReadDataFile(name), name, verdicts);
    }
  }
  EXPECT_EQ(1u, verdicts.count("accepted"));
  EXPECT_EQ(1u, verdicts.count("wrong"));
  EXPECT_LE(40u, verdicts.size());
}

TEST(Explain, AgreesWithVerifyForEveryChangedCharacterOfASignature) {
  const std::string text = GenuineToken();
  const std::size_t end = text.find("</ds:Signature>");
  std::set<std::string> verdicts;
  for (std::size_t at = text.find("<ds:Signature "); at < end; ++at) {
    std::string changed = text;
    changed[at] = changed[at] == 'A' ? 'B' : 'A';
    Compare(changed, "character " + std::to_string(at), verdicts);
  }
  EXPECT_LE(100u, verdicts.size());
}

struct Change {
  std::string from;
  std::string to;
};

/// Changes of a token, each of which breaks one rule, and some that break none.
std::vector<Change> Changes(const std::string &token) {
  const std::string transform = "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>";
  const std::string id = IdOf(token);
  return {
      {"</ds:Signature>", "<ds:Object/></ds:Signature>"},
      {"</ds:Signature>", "<!-- nothing --></ds:Signature>"},
      {"xml-exc-c14n#\"/><ds:SignatureMethod", "unknown\"/><ds:SignatureMethod"},
      {"rsa-sha256", "rsa-sha1"},
      {"rsa-sha256\"/>", "rsa-sha256\"><ds:HMACOutputLength>8</ds:HMACOutputLength></ds:SignatureMethod>"},
      {"<ds:Reference ", "<ds:Reference Type=\"urn:type\" "},
      {"xmldsig#enveloped-signature", "xmldsig#base64"},
      {transform, transform + transform},
      {transform, ""},
      {"xmlenc#sha256", "xmlenc#ripemd160"},
      {"xmlenc#sha256", "xmlenc#sha512"},
      {"URI=\"#" + id, "URI=\"#nobody"},
      {"URI=\"#" + id, "URI=\""},
      {"URI=\"#" + id, "URI=\"#xpointer(/)"},
      {"URI=\"#" + id, "URI=\"#subject"},
      {"<saml:Subject>", "<saml:Subject Id=\"subject\">"},
      {"<ds:KeyInfo", "<ds:KeyInfo Id=\"" + id + "\""},
      {"<saml:Subject>", "<saml:Subject><foo:bar/>"},
      {"<ds:SignedInfo>", "<ds:SignedInfo xmlns:r=\"relative\">"},
      {"alice", "malice"},
      {"<ds:SignatureValue>", "<ds:SignatureValue>AAAA"},
      {"<ds:DigestValue>", "<ds:DigestValue>AAAA"},
  };
}

std::string Applied(const std::string &text, const Change &change) {
  return text.find(change.from) == std::string::npos ? text : Testing::Replaced(text, change.from, change.to);
}

TEST(Explain, AgreesWithVerifyForEachPairOfChanges) {
  std::set<std::string> verdicts;
  for (const char *const name : {"tokens/rsa-sha256.xml", "tokens/reference-two.xml"}) {
    const std::string token = Testing::ReadDataFile(name);
    for (const Change &first : Changes(token)) {
      for (const Change &second : Changes(token)) {
        Compare(Applied(Applied(token, first), second), first.to + " and " + second.to, verdicts);
      }
    }
  }
  EXPECT_EQ(1u, verdicts.count("accepted"));
  EXPECT_EQ(1u, verdicts.count("wrong"));
  EXPECT_LE(20u, verdicts.size());
}

} // namespace
