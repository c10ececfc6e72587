// SPDX-License-Identifier: Apache-2.0
// The report on each of thousands of changed documents agrees with the verification of the document.

#include "outcome_count.h"
#include "token_changes.h"
#include "token_files.h"
#include "verifiers.h"

#include "support/fixed_environment.h"
#include "support/repetitions.h"
#include "support/sanitized.h"
#include "xml/xml_text.h"

#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Reports {
namespace {

using Testing::JudgedVerifier;
using Testing::JudgeElement;
using Testing::Judgement;
using Testing::JudgeText;
using Testing::RandomSource;

/// How many changed texts each file gets.
std::size_t Changes() {
  return Testing::IS_SANITIZED ? 4 : Testing::Repetitions<std::size_t>(500, 40);
}

/// Calls `judge` with each changed text, and with a description of the change.
template <typename Judge>
void ForEachChange(std::uint64_t seed, const std::string &folder, const Judge &judge) {
  const std::vector<TokenFile> &all = AllTokenFiles();
  RandomSource random(seed);
  for (const TokenFile &file : ReadTokenFiles(folder)) {
    for (std::size_t change = 0; change < Changes(); ++change) {
      const std::string &other = all[random.Below(all.size())].xml;
      judge(ChangeToken(file.xml, other, random), file.name + ", change " + std::to_string(change));
      if (testing::Test::HasFatalFailure()) {
        return;
      }
    }
  }
}

class ReportsOnChanges : public testing::Test {
protected:
  OutcomeCount JudgeTexts(const std::string &folder) {
    OutcomeCount count;
    RandomSource random(1);
    ForEachChange(14, folder, [&](const std::string &xml, const std::string &change) {
      // Half of the time the usual verifier: with it, more texts reach the rarer checks, which follow the signature.
      const auto &verifiers = AllVerifiers();
      const JudgedVerifier &verifier = random.OnceIn(2) ? verifiers[random.Below(verifiers.size())] : UsualVerifier();
      const Judgement judgement = JudgeText(verifier, xml);
      ASSERT_EQ("", judgement.contradictions) << change << "\n" << xml.substr(0, 10'000);
      count.Add(judgement);
    });
    return count;
  }

private:
  const Testing::FixedEnvironment m_clock;
};

TEST_F(ReportsOnChanges, AreRightForTokens) {
  const OutcomeCount count = JudgeTexts("tokens");
  EXPECT_GT(count.GetAccepted(), Changes() / 4);
  EXPECT_GT(count.GetDifferentRefusals(), 10 * Changes());
  std::vector<std::string> checks = {"well-formed", "form", "signature"};
  if (!Testing::IS_SANITIZED) { // so few changes do not reach the others
    checks.insert(checks.end(),
                  {"validity", "algorithms", "keys", "references", "digests", "audience", "required-confirmation"});
  }
  for (const std::string &check : checks) {
    EXPECT_GT(count.GetFirstFailed().count(check), 0u) << check;
  }
}

TEST_F(ReportsOnChanges, AreRightForAttacks) {
  const OutcomeCount count = JudgeTexts("attacks");
  EXPECT_GT(count.GetDifferentRefusals(), 10 * Changes());
}

TEST_F(ReportsOnChanges, AreRightForMessagesThatAreNotTokens) {
  EXPECT_EQ(0u, JudgeTexts("requests").GetAccepted());
}

TEST_F(ReportsOnChanges, AreRightForElements) {
  OutcomeCount count;
  ForEachChange(15, "tokens", [&](const std::string &xml, const std::string &change) {
    Tarvel::Ref<Tarvel::Xml::Document> document;
    try {
      SsoClient::ParseXML(xml, document);
    } catch (const Tarvel::Xml::XMLParseException &) {
      return;
    }
    const Judgement judgement = JudgeElement(UsualVerifier(), *document->GetDocumentElement());
    ASSERT_EQ("", judgement.contradictions) << change << "\n" << xml.substr(0, 10'000);
    count.Add(judgement);
  });
  EXPECT_GT(count.GetAccepted(), Changes() / 4);
  EXPECT_GT(count.GetDifferentRefusals(), 5 * Changes());
}

} // namespace
} // namespace Reports
