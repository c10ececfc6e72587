// SPDX-License-Identifier: Apache-2.0
// Generated documents, read by our reader and by others.

#include "comparison.h"
#include "generated_xml.h"

#include "support/repetitions.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <iostream>
#include <string>
#include <vector>

namespace {

using Testing::Compare;
using Testing::Comparison;
using Testing::DifferenceRules;

constexpr std::size_t ALL_DOCUMENTS = 2'000'000;
const std::size_t DOCUMENTS = Testing::Repetitions<std::size_t>(ALL_DOCUMENTS, 20'000);
constexpr std::size_t MOST_FINDINGS = 20;

TEST(GeneratedDocuments, AreReadAlikeByAllReadersExceptForNamedDifferences) {
  std::vector<std::size_t> counts(DifferenceRules().size());
  std::size_t accepted = 0;
  std::size_t findings = 0;
  for (std::uint64_t seed = 0; seed < DOCUMENTS; ++seed) {
    const std::string document = Testing::GenerateXml(seed);
    const Comparison comparison = Compare(document);
    accepted += comparison.ours.isAccepted ? 1u : 0u;
    for (const Testing::AppliedRule &applied : comparison.rules) {
      ++counts[applied.rule];
    }
    if (!comparison.unexplained.empty()) {
      ADD_FAILURE() << "document " << seed << ":\n" << comparison.unexplained;
      ASSERT_LT(++findings, MOST_FINDINGS);
    }
  }
  std::cout << accepted << " of " << DOCUMENTS << " documents are accepted\n";
  for (std::size_t i = 0; i < counts.size(); ++i) {
    std::cout << counts[i] << " times " << DifferenceRules()[i].name << "\n";
    if (DOCUMENTS == ALL_DOCUMENTS) {
      EXPECT_NE(counts[i], 0u) << "the rule never applies: " << DifferenceRules()[i].name;
    }
  }
}

} // namespace
