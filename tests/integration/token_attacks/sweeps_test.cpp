// SPDX-License-Identifier: Apache-2.0
// No prefix of a genuine token, and none of thousands of small changes to it, causes an undocumented exception, or is
// accepted with facts other than those that were signed.

#include "outcome.h"
#include "support/data_file.h"
#include "support/repetitions.h"
#include "support/sanitized.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

namespace Attacks {
namespace {

std::vector<std::string> TokenNames() {
  std::vector<std::string> names;
  for (const auto &entry : std::filesystem::directory_iterator(Testing::DataPath("tokens"))) {
    if (entry.path().extension() == ".xml") {
      names.push_back(entry.path().stem());
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

std::string TestName(const testing::TestParamInfo<std::string> &info) {
  std::string name = info.param;
  std::replace(name.begin(), name.end(), '-', '_');
  return name;
}

class Truncation : public testing::TestWithParam<std::string> {};

TEST_P(Truncation, EveryPrefixIsRefusedByTheParser) {
  const std::string xml = ReadToken(GetParam());
  const Outcome whole = TryToken(xml);
  // Only comments and white space follow the end tag. A prefix that ends there is the same token, or not well-formed if
  // it ends in a comment.
  const std::size_t rootEnd = xml.rfind("Assertion>") + std::string("Assertion>").size();
  // The large token repeats one line; steps of a prime length reach each place of that line.
  const std::size_t step = xml.size() > 20000 ? Testing::Repetitions<std::size_t>(1, 61) : 1;
  for (std::size_t length = 0; length < rootEnd; length += step) {
    const Outcome outcome = TryToken(xml.substr(0, length));
    ASSERT_EQ("XMLParseException", outcome.exceptionClass) << length << " octets: " << outcome;
  }
  for (std::size_t length = rootEnd; length <= xml.size(); ++length) {
    const Outcome outcome = TryToken(xml.substr(0, length));
    ASSERT_TRUE(outcome == whole || outcome.exceptionClass == "XMLParseException") << length << " octets: " << outcome;
  }
}

INSTANTIATE_TEST_SUITE_P(Of, Truncation, testing::ValuesIn(TokenNames()), TestName);

struct Swept {
  std::string file; // without its extension
  SsoClient::TokenProfile profile = SsoClient::TokenProfile::STRICT;
};

void PrintTo(const Swept &swept, std::ostream *out) {
  *out << swept.file;
}

class Mutation : public testing::TestWithParam<Swept> {
protected:
  void SetUp() override { ASSERT_TRUE(m_genuine.IsAccepted()) << m_genuine; }

  /// Small tokens get every kind of change at every place. In large ones the kinds alternate, so that the sweep stays
  /// short. Under a sanitizer they alternate in all tokens: each change costs many times as much there, and a fuzz
  /// target makes such changes, too.
  bool IsTurn(std::size_t damage, std::size_t damages, std::size_t place) const {
    return (m_xml.size() < 2500 && !Testing::IS_SANITIZED) || place % damages == damage;
  }

  void ExpectHarmless(const std::string &damaged, const std::string &what) const {
    const Outcome outcome = TryToken(damaged, GetParam().profile);
    ASSERT_NE("undocumented", outcome.exceptionClass) << what << ": " << outcome.text;
    ASSERT_TRUE(!outcome.IsAccepted() || outcome == m_genuine) << what << ": " << outcome;
  }

  const std::string m_xml = Testing::ReadDataFile(GetParam().file + ".xml");
  const Outcome m_genuine = TryToken(m_xml, GetParam().profile);
};

TEST_P(Mutation, EachFlippedBitNeverLeadsToOtherFacts) {
  for (std::size_t place = 0; place < m_xml.size(); ++place) {
    for (unsigned bit = 0; bit < 8; ++bit) {
      if (!IsTurn(bit, 8, place)) {
        continue;
      }
      std::string damaged = m_xml;
      damaged[place] = static_cast<char>(static_cast<unsigned char>(damaged[place]) ^ (1u << bit));
      ExpectHarmless(damaged, "bit " + std::to_string(bit) + " of octet " + std::to_string(place));
      ASSERT_FALSE(HasFatalFailure());
    }
  }
}

TEST_P(Mutation, EachOctetReplacedByAMarkupCharacterNeverLeadsToOtherFacts) {
  const std::string characters("<>&\"'=:/ \n\0", 11);
  for (std::size_t place = 0; place < m_xml.size(); ++place) {
    for (std::size_t i = 0; i < characters.size(); ++i) {
      if (!IsTurn(i, characters.size(), place)) {
        continue;
      }
      std::string damaged = m_xml;
      damaged[place] = characters[i];
      ExpectHarmless(damaged, "a character at " + std::to_string(place));
      ASSERT_FALSE(HasFatalFailure());
    }
  }
}

TEST_P(Mutation, EachChunkDeletedOrDoubledNeverLeadsToOtherFacts) {
  for (const std::size_t length : {1u, 7u, 32u, 129u, 1000u}) {
    for (std::size_t place = 0; place + length <= m_xml.size(); place += std::max<std::size_t>(5, length / 3)) {
      const std::string what = std::to_string(length) + " octets at " + std::to_string(place);
      std::string deleted = m_xml;
      deleted.erase(place, length);
      ExpectHarmless(deleted, "deleted " + what);
      ASSERT_FALSE(HasFatalFailure());
      std::string doubled = m_xml;
      doubled.insert(place, m_xml, place, length);
      ExpectHarmless(doubled, "doubled " + what);
      ASSERT_FALSE(HasFatalFailure());
    }
  }
}

/// Where each element, including its content, begins and ends; only the tags are read.
std::vector<std::pair<std::size_t, std::size_t>> ElementRanges(const std::string &xml) {
  std::vector<std::pair<std::size_t, std::size_t>> ranges;
  std::vector<std::size_t> open;
  for (std::size_t begin = xml.find('<'); begin != std::string::npos; begin = xml.find('<', begin + 1)) {
    const std::size_t end = xml.find('>', begin) + 1;
    if (xml[begin + 1] == '?' || xml[begin + 1] == '!') {
      continue;
    }
    if (xml[begin + 1] == '/') {
      ranges.emplace_back(open.back(), end);
      open.pop_back();
    } else if (xml[end - 2] == '/') {
      ranges.emplace_back(begin, end);
    } else {
      open.push_back(begin);
    }
  }
  return ranges;
}

TEST_P(Mutation, EachElementDeletedDoubledOrCopiedElsewhereNeverLeadsToOtherFacts) {
  const auto ranges = ElementRanges(m_xml);
  ASSERT_GT(ranges.size(), 10u);
  for (const auto &[begin, end] : ranges) {
    const std::string element = m_xml.substr(begin, end - begin);
    std::string deleted = m_xml;
    deleted.erase(begin, end - begin);
    ExpectHarmless(deleted, "deleted " + element.substr(0, 40));
    ASSERT_FALSE(HasFatalFailure());
    for (const auto &target : ranges) {
      std::string copied = m_xml;
      copied.insert(target.first, element);
      ExpectHarmless(copied, "copied " + element.substr(0, 40) + " to " + std::to_string(target.first));
      ASSERT_FALSE(HasFatalFailure());
    }
  }
}

std::vector<Swept> SweptTokens() {
  std::vector<Swept> tokens;
  for (const char *const name : {"bearer-minimal", "full", "style-default-namespace", "c14n-inclusive-prefixes",
                                 "ecdsa-p256-sha256", "reference-empty-uri", "reference-two"}) {
    tokens.push_back({"tokens/" + std::string(name)});
  }
  tokens.push_back({"saml2/attributes-all-values", SsoClient::TokenProfile::SAML2});
  if (!Testing::IS_SANITIZED) { // with sanitizers, these would take minutes
    for (const char *const name : {"saml2/form-unusable-key-and-bearer", "saml2/advice-everything", "tokens/full"}) {
      tokens.push_back({name, SsoClient::TokenProfile::SAML2});
    }
  }
  return tokens;
}

INSTANTIATE_TEST_SUITE_P(Of, Mutation, testing::ValuesIn(SweptTokens()), [](const auto &swept) {
  const bool isStrict = swept.param.profile == SsoClient::TokenProfile::STRICT;
  std::string name = swept.param.file.substr(swept.param.file.find('/') + 1) + (isStrict ? "" : "-in-saml2");
  std::replace(name.begin(), name.end(), '-', '_');
  return name;
});

} // namespace
} // namespace Attacks
