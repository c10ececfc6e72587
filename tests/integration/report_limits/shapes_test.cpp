// SPDX-License-Identifier: Apache-2.0
// For every shape of hostile document, a report costs no more than in proportion to the document's length, and stays
// small. The cost is the number of octets allocated, which does not depend on the load of the machine; the benchmark
// hostile_shapes measures the time.

#include "explained.h"

#include "bench/hostile_documents.h"
#include "support/data_file.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <string>

namespace Reports {
namespace {

using Bench::HostileShape;

constexpr std::size_t KIB = 1024;

/// The longest text of a report, with the note of how much was cut.
constexpr std::size_t LONGEST_TEXT = 1024 + 40;

/// How many texts a full report has: seven for each finding, and those that it has only once.
constexpr std::size_t MAX_TEXTS = SsoClient::TokenReport::MAX_FINDINGS * 7 + 400;

bool IsFull(const SsoClient::TokenReport &report) {
  return std::any_of(report.checks.begin(), report.checks.end(),
                     [](const auto &result) { return result.unlistedFindings > 0; });
}

TEST(ReportsOnHostileShapes, CostNoMoreThanInProportionToTheDocument) {
  std::size_t shapes = 0;
  std::size_t fullReports = 0;
  for (const HostileShape &shape : Bench::MakeHostileShapes(Testing::ReadDataFile("tokens/bearer.xml"))) {
    SCOPED_TRACE(shape.name);
    const std::string smallXml = shape.make(512 * KIB);
    const std::string largeXml = shape.make(2048 * KIB);
    const Explained small = Explain(smallXml);
    const Explained large = Explain(largeXml);
    const double growth = static_cast<double>(largeXml.size()) / static_cast<double>(smallXml.size());
    // 1.6: vectors and strings that grow may double one more time. The last term is for the texts of the report itself.
    EXPECT_LT(static_cast<double>(large.allocated),
              1.6 * growth * static_cast<double>(small.allocated) + static_cast<double>(4 * CountTexts(large.report)));
    EXPECT_LE(CountFindings(large.report), SsoClient::TokenReport::MAX_FINDINGS);
    EXPECT_LE(CountTexts(large.report), MAX_TEXTS * LONGEST_TEXT);
    fullReports += IsFull(large.report) ? 1u : 0u;
    ++shapes;
  }
  EXPECT_GT(shapes, 130u);
  EXPECT_GE(fullReports, 3u); // so that some reports reach the maximum
}

} // namespace
} // namespace Reports
