// SPDX-License-Identifier: Apache-2.0
// The guide lists the checks of a report by the names that programs and the tool show.

#include <ssoclient/token_report.h>

#include "support/data_file.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using Testing::ReadDataFile;

/// The code spans at the beginning of the rows of the table after `head`.
std::vector<std::string> ReadRowNames(const std::string &page, const std::string &head) {
  std::vector<std::string> names;
  const std::string rowBegin = "\n| `";
  const std::size_t table = page.find(head);
  EXPECT_NE(table, std::string::npos);
  const std::size_t end = page.find("\n\n", table);
  for (std::size_t row = page.find(rowBegin, table); row < end; row = page.find(rowBegin, row + 1)) {
    const std::size_t name = row + rowBegin.size();
    names.push_back(page.substr(name, page.find('`', name) - name));
  }
  return names;
}

TEST(GetCheckName, ReturnsTheNamesInTheGuideInTheirOrder) {
  std::vector<std::string> names;
  for (int check = 0; check <= static_cast<int>(TokenReport::Check::REQUIRED_CONFIRMATION); ++check) {
    names.emplace_back(GetCheckName(static_cast<TokenReport::Check>(check)));
  }
  EXPECT_EQ(ReadRowNames(ReadDataFile("../../docs/guide/explain.md"), "\n| Check | Passes if |\n"), names);
}

} // namespace
