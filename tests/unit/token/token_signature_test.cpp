// SPDX-License-Identifier: Apache-2.0

#include "token/token_signature.h"

#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using namespace Testing;

constexpr const char *REFERENCE_END = "</ds:Reference>";

/// Parses an assertion whose children are `signature` and another element. Returns the local name of the node at the cursor
/// afterwards.
std::string Parse(const std::string &signature) {
  const ParsedDocument document(Assertion({signature, "<next/>"}));
  NodeFilterIterator iterator = document.Cursor().GetChild();
  Tarvel::Ref<Tarvel::Xml::Security::Signature> parsed;
  ParseTokenSignature(iterator, document.Root(), parsed);
  EXPECT_TRUE(parsed);
  return std::string(IteratorToElement(iterator)->GetLocalName());
}

std::string WithUri(const std::string &uri) {
  return ReplaceOnce(Piece::SIGNATURE, "URI=\"#_a1\"", "URI=\"" + uri + "\"");
}

std::string Reference(const std::string &uri) {
  const std::string signature = WithUri(uri);
  const std::size_t begin = signature.find("<ds:Reference");
  return signature.substr(begin, signature.find(REFERENCE_END) + std::string(REFERENCE_END).size() - begin);
}

TEST(ParseTokenSignature, AcceptsAReferenceToTheAssertionAndMovesTheCursor) {
  EXPECT_EQ("next", Parse(Piece::SIGNATURE));
}

TEST(ParseTokenSignature, AcceptsAReferenceToTheWholeDocument) {
  EXPECT_EQ("next", Parse(WithUri("")));
}

TEST(ParseTokenSignature, AcceptsASecondReferenceToTheAssertion) {
  EXPECT_EQ("next", Parse(ReplaceOnce(Piece::SIGNATURE, Reference("#_a1"), Reference("#_other") + Reference("#_a1"))));
  EXPECT_EQ("next", Parse(ReplaceOnce(Piece::SIGNATURE, Reference("#_a1"), Reference("#_other") + Reference(""))));
}

TEST(ParseTokenSignature, AcceptsAFirstReferenceToTheAssertion) {
  EXPECT_EQ("next", Parse(ReplaceOnce(Piece::SIGNATURE, Reference("#_a1"), Reference("#_a1") + Reference("#_other"))));
  EXPECT_EQ("next", Parse(ReplaceOnce(Piece::SIGNATURE, Reference("#_a1"), Reference("") + Reference("#_other"))));
}

TEST(ParseTokenSignature, RefusesReferencesToOtherElements) {
  for (const std::string uri : {"#_other", "_a1", "#", "#_A1", "#_a1 ", " #_a1", "#_a", "#_a11", "##_a1", "x_a1",
                                "/_a1", " _a1", "#xpointer(id('_a1'))", "#xpointer(/)", "http://corp.example/#_a1"}) {
    EXPECT_THROWS_MESSAGE(Parse(WithUri(uri)), ParseException, "Token's signature must cover the entire token");
  }
}

TEST(ParseTokenSignature, RefusesASignatureWithoutReferences) {
  EXPECT_THROWS_MESSAGE(Parse(ReplaceOnce(Piece::SIGNATURE, Reference("#_a1"), "")), ParseException,
                        "Token's signature must cover the entire token");
}

TEST(ParseTokenSignature, RefusesWhenThereIsNoElement) {
  const ParsedDocument document("<r>text</r>");
  Tarvel::Ref<Tarvel::Xml::Security::Signature> signature;
  NodeFilterIterator iterator = document.Cursor().GetChild();
  EXPECT_THROWS_MESSAGE(ParseTokenSignature(iterator, document.Root(), signature), ParseException,
                        "Expected element ds:Signature not found");
  iterator.MoveToSibling();
  EXPECT_THROWS_MESSAGE(ParseTokenSignature(iterator, document.Root(), signature), ParseException,
                        "Expected element ds:Signature not found");
}

TEST(ParseTokenSignature, ReportsThePlatformsReasonForASyntaxError) {
  const std::string start = Piece::START;
  EXPECT_THROWS_MESSAGE(Parse("<saml:Subject/>"), ParseException,
                        "Signature syntax error: Expected ds:Signature, found \"saml:Subject\" at line 1, column " +
                            std::to_string(start.size() + 1));
  EXPECT_THROWS_MESSAGE(Parse("<ds:Signature/>"), ParseException,
                        "Signature syntax error: Expected ds:SignedInfo in \"ds:Signature\", but nothing follows at "
                        "line 1, column " +
                            std::to_string(start.size() + 1));
}

} // namespace
