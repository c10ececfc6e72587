// SPDX-License-Identifier: Apache-2.0

#include "support/data_file.h"

#include <ssoclient/ssoclient.h>

#include <gtest/gtest.h>

#include <filesystem>
#include <set>
#include <sstream>
#include <string>

namespace {

TEST(UmbrellaHeader, IncludesAllOtherPublicHeadersOfTheClient) {
  const std::string folder = "../../include/ssoclient";
  std::set<std::string> expected;
  const std::filesystem::path root = Testing::DataPath(folder);
  for (const auto &entry : std::filesystem::recursive_directory_iterator(root)) {
    if (entry.path().extension() == ".h" && entry.path() != root / "ssoclient.h") {
      expected.insert("#include <ssoclient/" + entry.path().lexically_relative(root).string() + ">");
    }
  }
  EXPECT_GT(expected.size(), 10u);

  std::set<std::string> included;
  std::istringstream lines(Testing::ReadDataFile(folder + "/ssoclient.h"));
  for (std::string line; std::getline(lines, line);) {
    if (line.rfind("#include", 0) == 0) {
      included.insert(line);
    }
  }
  EXPECT_EQ(included, expected);
}

// Both types are complete: a program needs no other header.
static_assert(sizeof(SsoClient::SecurityTokenServiceConfig) > 0 && sizeof(SsoClient::PrincipalIdLess) > 0);

} // namespace
