// SPDX-License-Identifier: Apache-2.0
// Every hostile document under tests/data/attacks ends as tests/data/attacks/expected.tsv says: in the documented
// exception with exactly that message, or, where the change is harmless, accepted with the facts that were signed.

#include "outcome.h"

#include "support/data_file.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace Attacks {
namespace {

/// One line: file, "document" or the number of the assertion element in it, exception class or "accepted", message or
/// subject.
struct Row {
  std::string file;
  std::string part;
  std::string exceptionClass;
  std::string text;
};

std::vector<Row> ReadTable() {
  std::istringstream lines(Testing::ReadDataFile("attacks/expected.tsv"));
  std::vector<Row> rows;
  for (std::string line; std::getline(lines, line);) {
    std::istringstream fields(line);
    Row row;
    std::getline(fields, row.file, '\t');
    std::getline(fields, row.part, '\t');
    std::getline(fields, row.exceptionClass, '\t');
    std::getline(fields, row.text);
    rows.push_back(row);
  }
  return rows;
}

std::string SubjectLine(const std::string &facts) {
  const std::size_t begin = facts.find("subject ");
  return facts.substr(begin, facts.find('\n', begin) - begin);
}

class AttackFile : public testing::TestWithParam<Row> {};

TEST_P(AttackFile, EndsAsDocumented) {
  const Row &row = GetParam();
  const std::string xml = Testing::ReadDataFile("attacks/" + row.file + ".xml");
  const Outcome outcome = row.part == "document" ? TryToken(xml) : TryElement(xml, std::stoul(row.part));
  const Outcome expected = {row.exceptionClass, row.text};
  const Outcome brief = outcome.IsAccepted() ? Outcome{"accepted", SubjectLine(outcome.text)} : outcome;
  EXPECT_EQ(expected, brief);
}

INSTANTIATE_TEST_SUITE_P(All, AttackFile, testing::ValuesIn(ReadTable()), [](const auto &row) {
  std::string name = row.param.file + "_" + row.param.part;
  std::replace_if(
      name.begin(), name.end(), [](char c) { return c == '-' || c == '.'; }, '_');
  return name;
});

TEST(AttackFiles, AreAllInTheTable) {
  std::set<std::string> inTable;
  for (const Row &row : ReadTable()) {
    inTable.insert(row.file);
  }
  std::set<std::string> inFolder;
  for (const auto &entry : std::filesystem::directory_iterator(Testing::DataPath("attacks"))) {
    if (entry.path().extension() == ".xml") {
      inFolder.insert(entry.path().stem());
    }
  }
  EXPECT_EQ(inTable, inFolder);
}

} // namespace
} // namespace Attacks
