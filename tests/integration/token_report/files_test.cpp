// SPDX-License-Identifier: Apache-2.0
// The report on each document of the tests agrees with the verification of the document, for every choice of
// certificates and options.

#include "outcome_count.h"
#include "token_files.h"
#include "verifiers.h"

#include "support/fixed_environment.h"
#include "support/sanitized.h"
#include "xml/xml_text.h"

#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Reports {
namespace {

using Testing::JudgedVerifier;
using Testing::JudgeElement;
using Testing::Judgement;
using Testing::JudgeText;

/// With sanitizers, all verifiers would take ten minutes. So each file is given to every fifth one, and the next file to the
/// ones that follow these.
constexpr std::size_t STEP = Testing::IS_SANITIZED ? 5 : 1;

class ReportsOnFiles : public testing::Test {
protected:
  /// Expects that each verifier's report on each file is right, and counts the outcomes.
  void ExpectRightReports(const std::string &folder, OutcomeCount &count) {
    const std::vector<JudgedVerifier> &verifiers = AllVerifiers();
    std::size_t first = 0;
    for (const TokenFile &file : ReadTokenFiles(folder)) {
      for (std::size_t i = first++ % STEP; i < verifiers.size(); i += STEP) {
        const Judgement judgement = JudgeText(verifiers[i], file.xml);
        ASSERT_EQ("", judgement.contradictions) << file.name;
        count.Add(judgement);
      }
    }
  }

private:
  const Testing::FixedEnvironment m_clock;
};

TEST_F(ReportsOnFiles, AreRightForTokens) {
  OutcomeCount count;
  ExpectRightReports("tokens", count);
  EXPECT_GT(count.GetAccepted(), 200u / STEP);
  for (const char *const check : {"validity", "keys", "signature", "audience", "required-confirmation"}) {
    EXPECT_GT(count.GetFirstFailed().count(check), 0u) << check;
  }
}

TEST_F(ReportsOnFiles, AreRightForAttacks) {
  OutcomeCount count;
  ExpectRightReports("attacks", count);
  EXPECT_GT(count.GetDifferentRefusals(), 70u);
  for (const char *const check : {"well-formed", "form", "algorithms", "references", "signature", "digests"}) {
    EXPECT_GT(count.GetFirstFailed().count(check), 0u) << check;
  }
}

TEST_F(ReportsOnFiles, AreRightForTokensOfOtherTools) {
  OutcomeCount count;
  ExpectRightReports("saml2", count);
  EXPECT_GT(count.GetAccepted(), 200u / STEP);
  EXPECT_GT(count.GetDifferentRefusals(), 45u);
  for (const char *const check : {"form", "validity", "confirmation", "delegation", "names", "audience"}) {
    EXPECT_GT(count.GetFirstFailed().count(check), 0u) << check;
  }
}

TEST_F(ReportsOnFiles, AreRightForMessagesThatAreNotTokens) {
  OutcomeCount count;
  ExpectRightReports("requests", count);
  EXPECT_EQ(0u, count.GetAccepted());
  EXPECT_GT(count.GetTokens(), 0u);
}

const Tarvel::Xml::Node *NextInDocumentOrder(const Tarvel::Xml::Node *node) {
  if (node->GetFirstChild()) {
    return node->GetFirstChild();
  }
  while (node && !node->GetNextSibling()) {
    node = node->GetParent();
  }
  return node ? node->GetNextSibling() : nullptr;
}

void ExpectRightReportsOnElements(const TokenFile &file, OutcomeCount &count) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  try {
    SsoClient::ParseXML(file.xml, document);
  } catch (const Tarvel::Xml::XMLParseException &) {
    return;
  }
  for (const Tarvel::Xml::Node *node = document->GetDocumentElement(); node; node = NextInDocumentOrder(node)) {
    const Tarvel::Xml::ElementNode *const element = Tarvel::Xml::AsElement(node);
    if (element && (element->GetLocalName() == "Assertion" || node == document->GetDocumentElement())) {
      const Judgement judgement = JudgeElement(UsualVerifier(), *element);
      ASSERT_EQ("", judgement.contradictions) << file.name << ": " << element->GetName();
      count.Add(judgement);
    }
  }
}

TEST_F(ReportsOnFiles, AreRightForEveryAssertionElement) {
  OutcomeCount count;
  for (const TokenFile &file : AllTokenFiles()) {
    ExpectRightReportsOnElements(file, count);
    ASSERT_FALSE(HasFatalFailure());
  }
  EXPECT_GT(count.GetAccepted(), 30u);
  EXPECT_GT(count.GetDifferentRefusals(), 50u);
}

TEST_F(ReportsOnFiles, ShowTheFirstAssertionWithinAnotherDocument) {
  const std::string token = AllTokenFiles().front().xml;
  const std::string assertion = token.substr(token.find("<saml:Assertion"));
  const SsoClient::TokenReport alone = UsualVerifier().verifier.Explain(assertion);
  const std::string wrapped = "<env:Envelope xmlns:env=\"urn:envelope\"><env:Body>" + assertion +
                              "<saml:Assertion xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\" ID=\"_second\"/>" +
                              "</env:Body></env:Envelope>";
  const Judgement judgement = JudgeText(UsualVerifier(), wrapped);
  EXPECT_EQ("", judgement.contradictions);
  ASSERT_TRUE(alone.claims.id);
  EXPECT_TRUE(alone.claims.id == judgement.report.claims.id);
  EXPECT_FALSE(judgement.report.accepted);
  EXPECT_EQ("Expected element 'Assertion' not found.", judgement.report.refusal);
}

} // namespace
} // namespace Reports
