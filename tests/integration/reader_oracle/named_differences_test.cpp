// SPDX-License-Identifier: Apache-2.0
// At least one document for each kind of intended difference, and the readers that read it differently from ours.

#include "comparison.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

namespace {

using namespace std::string_literals;
using Testing::Comparison;
using Testing::DifferenceRules;

constexpr unsigned LIBXML2 = static_cast<unsigned>(Testing::Peer::LIBXML2);
constexpr unsigned EXPAT = static_cast<unsigned>(Testing::Peer::EXPAT);
constexpr unsigned EXPAT_WITH_NAMESPACES = static_cast<unsigned>(Testing::Peer::EXPAT_WITH_NAMESPACES);
constexpr unsigned BOTH_OF_EXPAT = EXPAT | EXPAT_WITH_NAMESPACES;
constexpr unsigned ALL = LIBXML2 | BOTH_OF_EXPAT;

std::string Repeated(std::size_t count, const std::string &text) {
  std::string repeated;
  for (; count != 0; --count) {
    repeated += text;
  }
  return repeated;
}

std::string Numbered(std::size_t count, const std::string &before, const std::string &after) {
  std::string numbered;
  for (std::size_t i = 0; i < count; ++i) {
    numbered += before + std::to_string(i) + after;
  }
  return numbered;
}

struct Example {
  std::string document;
  std::string rule;
  unsigned peers;  // that differ
  bool isAccepted; // by us
};

const std::vector<Example> &Examples() {
  static const std::vector<Example> examples{
      {"<!DOCTYPE a><a/>", "we refuse a document type declaration", ALL, false},
      {"<?xml version='1.1'?><a/>", "we refuse a version other than 1.0", ALL, false},
      {"<?xml version='1.0' encoding='UTF8'?><a/>", "we refuse a declared encoding other than UTF-8 and US-ASCII",
       LIBXML2, false},
      {"<?xml version='1.0' encoding='ISO-8859-1'?><a>\xC3\xA4</a>",
       "we refuse a declared encoding other than UTF-8 and US-ASCII", ALL, false},
      {"<?xml version='1.0' encoding='US-ASCII'?><a>\xC3\xA4</a>",
       "we refuse octets beyond US-ASCII where that is declared", LIBXML2, false},
      {"\xFF\xFE<\0a\0/\0>\0"s, "we refuse UTF-16 and UTF-32", ALL, false},
      {Repeated(257, "<a>") + Repeated(257, "</a>"), "we refuse elements beyond the greatest depth", ALL, false},
      {"<a" + Numbered(257, " a", "=''") + "/>", "we refuse an element with too many attributes", ALL, false},
      {"<" + std::string(4097, 'a') + "/>", "we refuse too long names", ALL, false},
      {"<a" + Numbered(256, " xmlns:a", "='x:'") + "><a xmlns='x:'/></a>", "we refuse too many declarations in scope",
       ALL, false},
      {"<\xE2\x81\xB0/>", "expat knows the names of the fourth edition only", BOTH_OF_EXPAT, true},
      {"<p:a/>", "expat refuses an unbound prefix", EXPAT_WITH_NAMESPACES, true},
      {"<a xmlns='urn: '/>", "expat does not judge whether a namespace name is a URI", BOTH_OF_EXPAT, false},
      {"\x4C\x6F\xA7\x94\x93\x40\xA5\x85\x99\xA2\x89\x96\x95\x7E\x7D\xF1\x4B\xF0\x7D\x6F\x6E\x4C\x81\x61\x6E",
       "libxml2 reads EBCDIC", LIBXML2, false},
      {"<a/>\0"s, "libxml2 ends at a null byte", LIBXML2, false},
      {"<xmlns:a/>", "libxml2 takes the prefix xmlns on an element for an unbound one", LIBXML2, false},
      {"<a xmlns='http://[a]/'/>", "libxml2 takes anything in brackets for an address in a namespace name", LIBXML2,
       false},
      {"<a xmlns='urn:a#[1]'/>", "libxml2 accepts brackets in the fragment of a namespace name", LIBXML2, false},
      {"<a xmlns='http://h:/'/>", "libxml2 wants a port that is an int in a namespace name", LIBXML2, true},
      {"<?xml version='1.0' encoding='UTF-8'standalone='yes'?><a/>", "libxml2 needs no space after the encoding",
       LIBXML2, false},
  };
  return examples;
}

TEST(NamedDifferences, AreThoseOfTheirExamples) {
  for (const Example &example : Examples()) {
    const Comparison comparison = Testing::Compare(example.document);
    EXPECT_EQ(comparison.unexplained, "");
    EXPECT_EQ(comparison.ours.isAccepted, example.isAccepted) << example.rule;
    unsigned peers = 0;
    for (const Testing::AppliedRule &applied : comparison.rules) {
      const bool isExample = DifferenceRules()[applied.rule].name == example.rule;
      peers |= isExample ? static_cast<unsigned>(applied.peer) : 0u;
    }
    EXPECT_EQ(peers, example.peers) << example.rule;
  }
}

TEST(NamedDifferences, HaveAnExampleEach) {
  std::set<std::string> named;
  for (const Testing::DifferenceRule &rule : DifferenceRules()) {
    named.insert(rule.name);
  }
  std::set<std::string> shown;
  for (const Example &example : Examples()) {
    shown.insert(example.rule);
  }
  EXPECT_EQ(shown, named);
}

} // namespace
