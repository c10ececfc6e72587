// SPDX-License-Identifier: Apache-2.0
// Documents with a million deviations. The parser examines each node a limited number of times; otherwise these tests
// would need hours. It makes texts only as long as the sink is not full, which RecordedDeviations checks.
#include "support/parsed_document.h"
#include "support/recorded_deviations.h"
#include "token/assertion_parser.h"
#include "unit/token/assertion_text.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <string>

namespace {

using namespace SsoClient;
using namespace Testing;

constexpr std::size_t MANY = 1'000'000;
constexpr std::size_t CAPACITY = 1000;

std::string Many(const std::string &text, std::size_t count = MANY) {
  std::string all;
  all.reserve(text.size() * count);
  for (std::size_t i = 0; i < count; ++i) {
    all += text;
  }
  return all;
}

std::size_t CountDeviations(const std::string &text) {
  const ParsedDocument document(text);
  NodeFilterIterator iterator = document.Cursor();
  SamlAssertionType assertion;
  RecordedDeviations sink(CAPACITY);
  ParseSamlAssertionElement(iterator, assertion, sink);
  EXPECT_EQ(CAPACITY, sink.all.size());
  return sink.all.size() + sink.unlisted;
}

/// The number of deviations in a bearer assertion in which `from` is replaced.
std::size_t CountDeviations(const std::string &from, const std::string &to) {
  return CountDeviations(ReplaceOnce(BearerAssertion(), from, to));
}

TEST(HostileAssertion, HasAMillionElementsBeforeTheExpectedOnes) {
  std::string text = BearerAssertion();
  for (const std::string piece : {Piece::ISSUER, Piece::SIGNATURE, Piece::SUBJECT_NAME, Piece::CLASS_REF}) {
    text = ReplaceOnce(text, piece, Many("<x/>", MANY / 4) + piece);
  }
  EXPECT_EQ(MANY, CountDeviations(text));
}

TEST(HostileAssertion, HasAMillionElementsAfterTheExpectedOnes) {
  std::string text = BearerAssertion();
  for (const std::string end : {"</saml:Subject>", "</saml:Assertion>"}) {
    text = ReplaceOnce(text, end, Many("<x/>", MANY / 2) + end);
  }
  EXPECT_EQ(MANY, CountDeviations(text));
}

TEST(HostileAssertion, HasAMillionElementsInLists) {
  std::string text = BearerAssertion();
  for (const std::string list :
       {Piece::ATTRIBUTES, Piece::RSA_ADVICE, Piece::DELEGATES, Piece::AUDIENCES, Piece::PROXY_RESTRICTION}) {
    text = ReplaceOnce(text, list, Many("<x/>", MANY / 5));
  }
  EXPECT_EQ(MANY, CountDeviations(text));
}

TEST(HostileAssertion, HasManyStatements) {
  const std::size_t half = MANY / 2; // more would exceed the reader's limits
  EXPECT_EQ(half, CountDeviations(Piece::AttributeStatement(), Many("<saml:AttributeStatement/>", half + 1)));
  const std::size_t pairs = MANY / 8;
  const std::string statement = "<saml:AttributeStatement><saml:Attribute Name=\"\"/></saml:AttributeStatement>";
  EXPECT_EQ(pairs, CountDeviations(Piece::AttributeStatement(), Many(statement, pairs + 1)));
}

TEST(HostileAssertion, HasAMillionElementsInsteadOfItsOwn) {
  // The parser searches the whole list for each of Issuer, Signature, Subject, Conditions and AuthnStatement. Then it
  // refuses each element, because none is an attribute statement.
  const std::string content = BearerAssertion();
  const std::size_t begin = content.find("<saml:Issuer");
  const std::string children = content.substr(begin, content.find("</saml:Assertion>") - begin);
  EXPECT_EQ(MANY + 5, CountDeviations(children, Many("<x/>")));
}

TEST(HostileAssertion, HasManyTextsThatAreNotDates) {
  const std::size_t dates = MANY / 4;
  EXPECT_EQ(2 * dates, CountDeviations(Piece::DELEGATES, Many("<del:Delegate DelegationInstant=\"\"/>", dates)));
}

TEST(HostileAssertion, IsFoundBelowManyElementsOfItsName) {
  std::string text = BearerAssertion();
  for (int depth = 0; depth < 200; ++depth) {
    text = "<Assertion>" + text + "</Assertion>";
  }
  const ParsedDocument document(text);
  NodeFilterIterator iterator = document.Cursor();
  SamlAssertionType assertion;
  RecordedDeviations sink;
  ParseSamlAssertionElement(iterator, assertion, sink);
  EXPECT_EQ(1u, sink.all.size());
  EXPECT_EQ("_a1", assertion.ID);
}

} // namespace
