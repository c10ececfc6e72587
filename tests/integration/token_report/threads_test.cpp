// SPDX-License-Identifier: Apache-2.0
// Eight threads use one verifier at the same time.

#include "token_files.h"
#include "verifiers.h"

#include "support/facts_of.h"
#include "support/fixed_environment.h"
#include "support/rendezvous.h"
#include "support/report_texts.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstddef>
#include <exception>
#include <string>
#include <thread>
#include <vector>

namespace Reports {
namespace {

constexpr int THREADS = 8;

/// The result of verifying a text, and the report on it.
std::string OutcomeOf(const SsoClient::TokenVerifier &verifier, const std::string &xml) {
  std::string outcome;
  try {
    outcome = Testing::FactsOf(*verifier.Verify(xml));
  } catch (const std::exception &failure) {
    outcome = failure.what();
  }
  return outcome + '\n' + Testing::DescribeReport(verifier.Explain(xml));
}

TEST(VerifierOnEightThreads, VerifiesAndExplainsLikeOnOneThread) {
  const Testing::FixedEnvironment clock;
  const std::vector<TokenFile> &files = AllTokenFiles();
  const SsoClient::TokenVerifier &verifier = UsualVerifier().verifier;
  std::vector<std::string> expected;
  for (const TokenFile &file : files) {
    expected.push_back(OutcomeOf(verifier, file.xml));
  }
  // No thread has used this verifier before, so it prepares now what it prepares at its first use.
  const SsoClient::TokenVerifier fresh(UsualVerifier().trusted, UsualVerifier().options);
  std::atomic<int> differences{0};
  Testing::Gate start;
  std::vector<std::thread> threads;
  for (int number = 0; number < THREADS; ++number) {
    threads.emplace_back([&, number] {
      start.Pass();
      const SsoClient::TokenVerifier copy = fresh;
      for (std::size_t i = 0; i < files.size(); ++i) {
        const std::size_t index = (i + static_cast<std::size_t>(number) * files.size() / THREADS) % files.size();
        differences += OutcomeOf(number % 2 ? copy : fresh, files[index].xml) == expected[index] ? 0 : 1;
      }
    });
  }
  EXPECT_TRUE(start.WaitForArrivals(THREADS));
  start.Open();
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(0, differences);
}

} // namespace
} // namespace Reports
