// SPDX-License-Identifier: Apache-2.0
// Tokens that OpenSAML, WSS4J and xmlsec1 made have the outcomes in tests/data/saml2/expected.tsv. In those of OpenSAML
// and WSS4J, this library reads what OpenSAML reads.

#include "details_text.h"
#include "outcome_text.h"

#include "integration/signed_requests/schemas.h"
#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/parsed_document.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace Testing {
namespace {

using namespace SsoClient;

/// The name of each file, and its outcome.
using Row = std::pair<std::string, std::string>;

std::vector<Row> ReadTable() {
  std::istringstream lines(ReadDataFile("saml2/expected.tsv"));
  std::vector<Row> rows;
  for (std::string line; std::getline(lines, line);) {
    const std::size_t tabulator = line.find('\t');
    rows.emplace_back(line.substr(0, tabulator), line.substr(tabulator + 1));
  }
  return rows;
}

std::string TestName(const testing::TestParamInfo<Row> &info) {
  std::string name = info.param.first;
  std::replace(name.begin(), name.end(), '-', '_');
  return name;
}

bool IsAccepted(const Row &row) {
  return row.second.rfind("accepted\t", 0) == 0;
}

class Saml2File : public testing::TestWithParam<Row> {
protected:
  const std::string m_xml = ReadDataFile("saml2/" + GetParam().first + ".xml");

private:
  const FixedEnvironment m_clock;
};

TEST_P(Saml2File, HasTheOutcomeInTheTable) {
  EXPECT_EQ(GetParam().second, OutcomeOf(VerifierWith(Saml2Options()), m_xml));
}

TEST_P(Saml2File, HasTheSameOutcomeAsAnElement) {
  const TokenVerifier verifier = VerifierWith(Saml2Options());
  const ParsedDocument document(m_xml);
  if (!IsAccepted(GetParam())) {
    EXPECT_ANY_THROW(verifier.Verify(document.Root()));
    return;
  }
  const auto token = verifier.Verify(document.Root());
  EXPECT_EQ(GetParam().second, "accepted\t" + DescribeOutcome(*token));
  EXPECT_EQ(DescribeDetails(*verifier.Verify(m_xml)), DescribeDetails(*token));
}

TEST_P(Saml2File, IsValidBySchemaIfItIsAccepted) {
  if (IsAccepted(GetParam())) {
    static const Schemas schemas;
    EXPECT_EQ("", schemas.Judge(m_xml));
  }
}

/// Each file contains something that only the profile SAML2 reads.
TEST_P(Saml2File, IsRefusedInTheStrictProfile) {
  EXPECT_ANY_THROW(VerifierWith(VerifyOptions()).Verify(m_xml));
}

INSTANTIATE_TEST_SUITE_P(All, Saml2File, testing::ValuesIn(ReadTable()), TestName);

TEST(Saml2Files, AreAllInTheTable) {
  std::set<std::string> inTable;
  for (const Row &row : ReadTable()) {
    inTable.insert(row.first);
    EXPECT_EQ(row.first.rfind("refused-", 0) != 0, IsAccepted(row)) << row.first;
  }
  std::set<std::string> inFolder;
  for (const auto &entry : std::filesystem::directory_iterator(DataPath("saml2"))) {
    if (entry.path().extension() == ".xml") {
      inFolder.insert(entry.path().stem());
    }
  }
  EXPECT_EQ(inTable, inFolder);
  EXPECT_GT(inTable.size(), 110u);
}

/// What OpenSAML reads in each token, by the name of the file.
std::map<std::string, std::string> ReadDetails() {
  std::istringstream lines(ReadDataFile("saml2/details.txt"));
  std::map<std::string, std::string> details;
  std::string *current = nullptr;
  for (std::string line; std::getline(lines, line);) {
    if (line.rfind("== ", 0) == 0) {
      current = &details[line.substr(3)];
    } else {
      *current += line + '\n';
    }
  }
  return details;
}

TEST(Saml2Files, StateWhatOpenSamlReads) {
  const FixedEnvironment clock;
  const TokenVerifier verifier = VerifierWith(Saml2Options());
  const std::map<std::string, std::string> all = ReadDetails();
  EXPECT_GT(all.size(), 50u);
  for (const auto &[name, details] : all) {
    EXPECT_EQ(details, DescribeDetails(*verifier.Verify(ReadDataFile("saml2/" + name + ".xml")))) << name;
  }
}

} // namespace
} // namespace Testing
