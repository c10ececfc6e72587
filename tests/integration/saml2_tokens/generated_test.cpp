// SPDX-License-Identifier: Apache-2.0
// Every random assertion that the standard's schema allows is read as it was written, unless a documented rule refuses it.

#include "details_text.h"
#include "generated_assertion.h"
#include "outcome_text.h"

#include "integration/signed_requests/foreign_document.h"
#include "integration/signed_requests/schemas.h"
#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/judged_token.h"
#include "support/repetitions.h"
#include "support/sanitized.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <map>
#include <string>

namespace Testing {
namespace {

using namespace SsoClient;

std::size_t Assertions() {
  return IS_SANITIZED ? 100 : Repetitions<std::size_t>(10'000, 600);
}

JudgedVerifier MakeVerifier() {
  return JudgedVerifier({Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))}, Saml2Options());
}

TEST(GeneratedAssertions, AreReadAsTheyWereWrittenUnlessADocumentedRuleRefusesThem) {
  const FixedEnvironment clock;
  const Schemas schemas;
  const JudgedVerifier verifier = MakeVerifier();
  const std::string key = ReadDataFile("tokens/sts-rsa.key");
  RandomSource random(2005);
  std::map<std::string, int> refusals;
  std::size_t accepted = 0;
  for (std::size_t i = 0; i < Assertions(); ++i) {
    const GeneratedAssertion assertion = GenerateAssertion(random);
    const std::string xml = SignTemplate(assertion.xml, key);
    ASSERT_EQ("", schemas.Judge(xml)) << xml;
    const Judgement judgement = JudgeText(verifier, xml);
    ASSERT_EQ("", judgement.contradictions) << xml;
    ASSERT_EQ(assertion.refusal.empty(), judgement.verification.token != nullptr)
        << assertion.refusal << "\n"
        << judgement.verification.refusal << "\n"
        << xml;
    if (judgement.verification.token) {
      ASSERT_EQ(assertion.details, DescribeDetails(*judgement.verification.token)) << xml;
      ++accepted;
    } else {
      ASSERT_EQ("ParseException", judgement.verification.exceptionClass) << xml;
      ++refusals[assertion.refusal];
    }
  }
  EXPECT_GT(accepted, Assertions() / 5);
  EXPECT_GE(refusals.size(), IS_SANITIZED ? 4u : 7u) << testing::PrintToString(refusals);
}

} // namespace
} // namespace Testing
