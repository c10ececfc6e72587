// SPDX-License-Identifier: Apache-2.0
// Documents that are large in one dimension: refused at a documented limit, or read at a cost that grows no faster than
// their length. The cost is the number of octets allocated, which does not depend on the load of the machine.

#include "heap_octets.h"
#include "outcome.h"
#include "support/signed_again.h"

#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <string>

namespace Attacks {
namespace {

constexpr int MANY = 100000;

std::string Repeated(const std::string &piece, int count) {
  std::string text;
  text.reserve(piece.size() * static_cast<std::size_t>(count));
  for (int i = 0; i < count; ++i) {
    text += piece;
  }
  return text;
}

/// `prefix` with a number from 0 up and `suffix`, `count` times.
std::string Numbered(const std::string &prefix, const std::string &suffix, int count) {
  std::string text;
  for (int i = 0; i < count; ++i) {
    text += prefix + std::to_string(i) + suffix;
  }
  return text;
}

struct Counted {
  Outcome outcome;
  std::size_t octets;
};

Counted CountToken(const std::string &xml) {
  const HeapCount heap;
  Outcome outcome = TryToken(xml);
  return {std::move(outcome), heap.GetAllocated()};
}

/// The bearer token with `text` in its subject's name. It then fails at the signature, after everything else has been
/// read, checked and digested.
std::string WithSubject(const std::string &text) {
  return Replaced(ReadToken("bearer"), "alice@", text + "@");
}

TEST(Limits, DepthOf100000IsRefusedAtTheLimit) {
  const Counted counted = CountToken(Repeated("<x>", MANY) + Repeated("</x>", MANY));
  EXPECT_EQ("XMLParseException", counted.outcome.exceptionClass);
  EXPECT_EQ("elements are nested deeper than 256 at line 1, column 769", counted.outcome.text);
  // Memory for the copy of the text and for the 256 elements only.
  EXPECT_LT(counted.octets, 7u * MANY * 4);
}

TEST(Limits, DepthOf100000InsideATokenIsRefusedAtTheLimit) {
  const Outcome outcome = TryToken(WithSubject(Repeated("<x>", MANY) + Repeated("</x>", MANY)));
  EXPECT_EQ("XMLParseException", outcome.exceptionClass) << outcome;
}

TEST(Limits, AttributesBeyondTheLimitAreRefused) {
  const Outcome outcome = TryToken("<x" + Numbered(" a", "=\"\"", MANY) + "/>");
  EXPECT_EQ((Outcome{"XMLParseException", "an element has more than 256 attributes at line 1, column 1"}), outcome);
}

TEST(Limits, NamespaceDeclarationsBeyondTheLimitAreRefused) {
  const Outcome outcome = TryToken("<x" + Numbered(" xmlns:a", "=\"urn:x\"", MANY) + "/>");
  EXPECT_EQ((Outcome{"XMLParseException", "an element has more than 256 attributes at line 1, column 1"}), outcome);
}

TEST(Limits, NamespaceDeclarationsThatAddUpBeyondTheLimitAreRefused) {
  std::string xml;
  for (int depth = 0; depth < 20; ++depth) {
    xml += "<x" + Numbered(" xmlns:d" + std::to_string(depth) + "n", "=\"urn:x\"", 20) + ">";
  }
  const Outcome outcome = TryToken(xml + Repeated("</x>", 20));
  EXPECT_EQ("XMLParseException", outcome.exceptionClass) << outcome;
}

TEST(Limits, DocumentBeyondTheLimitIsRefused) {
  const Outcome outcome = TryToken("<x>" + std::string(Tarvel::Xml::MAX_DOCUMENT_BYTES, 'a') + "</x>");
  EXPECT_EQ("XMLParseException", outcome.exceptionClass) << outcome;
}

TEST(Limits, LongTextsAreReadAtACostInProportionToTheirLength) {
  const Counted small = CountToken(WithSubject(std::string(50'000, 'a')));
  const Counted large = CountToken(WithSubject(std::string(5'000'000, 'a')));
  EXPECT_EQ("InvalidSignatureException", small.outcome.exceptionClass) << small.outcome;
  EXPECT_EQ("InvalidSignatureException", large.outcome.exceptionClass) << large.outcome;
  EXPECT_LT(large.octets, small.octets * 150);
}

TEST(Limits, ManySmallNodesAreReadAtACostInProportionToTheirNumber) {
  const std::string comment = "<!---->";
  const Counted small =
      CountToken(Replaced(ReadToken("bearer"), "<saml:Subject>", Repeated(comment, 1000) + "<saml:Subject>"));
  const Counted large =
      CountToken(Replaced(ReadToken("bearer"), "<saml:Subject>", Repeated(comment, MANY) + "<saml:Subject>"));
  EXPECT_TRUE(small.outcome.IsAccepted()) << small.outcome;
  EXPECT_EQ(small.outcome, large.outcome);
  EXPECT_LT(large.octets, small.octets * 150);
}

TEST(Limits, ManyReferencesInASignatureAreRefusedBeforeAnyIsDigested) {
  std::string xml = ReadToken("bearer");
  const std::size_t begin = xml.find("<ds:Reference ");
  const std::string reference = xml.substr(begin, xml.find("</ds:SignedInfo>") - begin);
  const Outcome outcome = TryToken(xml.insert(begin, Repeated(reference, 10000)));
  EXPECT_FALSE(outcome.IsAccepted());
  EXPECT_NE("undocumented", outcome.exceptionClass) << outcome;
}

TEST(Limits, AMillionInclusivePrefixesAreRefusedWithoutAListOfThem) {
  const std::string list = Repeated("a ", 1'000'000);
  const std::string transform = "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"";
  const Counted counted = CountToken(
      Replaced(ReadToken("bearer"), transform + "/>",
               transform + "><InclusiveNamespaces xmlns=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList=\"" +
                   list + "\"/></ds:Transform>"));
  EXPECT_EQ(
      (Outcome{"InvalidSignatureException", "Signature verification error. The PrefixList of the algorithm "
                                            "\"http://www.w3.org/2001/10/xml-exc-c14n#\" has more than 256 prefixes"}),
      counted.outcome);
  // Memory for texts of the document's length, but not for each prefix.
  EXPECT_LT(counted.octets, 10 * list.size());
}

TEST(Limits, OneHundredThousandGroupsAreReadAtACostInProportion) {
  const auto withGroups = [](int count) {
    const std::string value = "<saml:AttributeValue>corp.example\\Users</saml:AttributeValue>";
    return Replaced(ReadToken("bearer"), value, Repeated(value, count));
  };
  const Counted small = CountToken(withGroups(1000));
  const Counted large = CountToken(withGroups(MANY));
  EXPECT_EQ("InvalidSignatureException", large.outcome.exceptionClass) << large.outcome;
  EXPECT_LT(large.octets, small.octets * 150);
}

/// bearer-50k with its groups repeated up to about 5 MB, and signed again by xmlsec1: too large to keep as a file.
class LargeToken : public testing::Test {
protected:
  void SetUp() override {
    std::string xml = ReadToken("bearer-50k");
    const std::string first = "<saml:AttributeValue>corp.example\\Department 0001";
    const std::size_t begin = xml.find(first);
    const std::string groups = xml.substr(begin, xml.find("</saml:Attribute>", begin) - begin);
    xml.insert(begin, Repeated(groups, 104));
    m_xml = Testing::SignedAgain(xml);
  }

  std::string m_xml;
};

TEST_F(LargeToken, OfFiveMegabytesIsAcceptedAtACostInProportionToFiftyKilobytes) {
  ASSERT_GT(m_xml.size(), 5'000'000u);
  const std::string small = ReadToken("bearer-50k");
  const Counted five = CountToken(ReadToken("bearer-5k"));
  const Counted fifty = CountToken(small);
  const Counted large = CountToken(m_xml);
  EXPECT_TRUE(fifty.outcome.IsAccepted()) << fifty.outcome;
  EXPECT_TRUE(large.outcome.IsAccepted()) << large.outcome.exceptionClass;
  // 1.5: growing vectors and strings may double once more.
  EXPECT_LT(fifty.octets, five.octets * 16);
  EXPECT_LT(static_cast<double>(large.octets), 1.5 * static_cast<double>(fifty.octets) *
                                                   static_cast<double>(m_xml.size()) /
                                                   static_cast<double>(small.size()));
}

} // namespace
} // namespace Attacks
