// SPDX-License-Identifier: Apache-2.0
// Every hostile document under tests/data/attacks has the outcome in tests/data/attacks/expected.tsv: it is refused
// with exactly that exception and message, or, if the change is harmless, accepted with the subject that was signed.
// The outcome in the profile SAML2 is the same, except if expected-saml2.tsv has another one.

#include "outcome.h"

#include "support/data_file.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <map>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Attacks {
namespace {

using SsoClient::TokenProfile;

/// One line: file, "document" or the number of the assertion element in it, exception class or "accepted", message or
/// subject.
struct Row {
  std::string file;
  std::string part;
  std::string exceptionClass;
  std::string text;
};

std::vector<Row> ReadTable(const std::string &file) {
  std::istringstream lines(Testing::ReadDataFile(file));
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

std::vector<Row> StrictTable() {
  return ReadTable("attacks/expected.tsv");
}

/// The table of the profile STRICT, in which the rows of expected-saml2.tsv replace those of the same files.
std::vector<Row> Saml2Table() {
  std::map<std::string, Row> differing;
  for (const Row &row : ReadTable("attacks/expected-saml2.tsv")) {
    differing[row.file + '\t' + row.part] = row;
  }
  std::vector<Row> rows = StrictTable();
  for (Row &row : rows) {
    const auto found = differing.find(row.file + '\t' + row.part);
    if (found != differing.end()) {
      row = found->second;
      differing.erase(found);
    }
  }
  if (!differing.empty()) {
    throw std::logic_error("not in expected.tsv: " + differing.begin()->first);
  }
  return rows;
}

std::string SubjectLine(const std::string &facts) {
  const std::size_t begin = facts.find("subject ");
  return facts.substr(begin, facts.find('\n', begin) - begin);
}

void ExpectOutcome(const Row &row, TokenProfile profile) {
  const std::string xml = Testing::ReadDataFile("attacks/" + row.file + ".xml");
  const Outcome outcome =
      row.part == "document" ? TryToken(xml, profile) : TryElement(xml, std::stoul(row.part), profile);
  const Outcome expected = {row.exceptionClass, row.text};
  const Outcome brief = outcome.IsAccepted() ? Outcome{"accepted", SubjectLine(outcome.text)} : outcome;
  EXPECT_EQ(expected, brief);
}

std::string TestName(const testing::TestParamInfo<Row> &info) {
  std::string name = info.param.file + "_" + info.param.part;
  std::replace_if(
      name.begin(), name.end(), [](char c) { return c == '-' || c == '.'; }, '_');
  return name;
}

class AttackFile : public testing::TestWithParam<Row> {};

TEST_P(AttackFile, EndsAsDocumented) {
  ExpectOutcome(GetParam(), TokenProfile::STRICT);
}

INSTANTIATE_TEST_SUITE_P(All, AttackFile, testing::ValuesIn(StrictTable()), TestName);

class AttackFileInSaml2 : public testing::TestWithParam<Row> {};

TEST_P(AttackFileInSaml2, EndsAsDocumented) {
  ExpectOutcome(GetParam(), TokenProfile::SAML2);
}

INSTANTIATE_TEST_SUITE_P(All, AttackFileInSaml2, testing::ValuesIn(Saml2Table()), TestName);

TEST(AttackFiles, AreAllInTheTable) {
  std::set<std::string> inTable;
  for (const Row &row : StrictTable()) {
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
