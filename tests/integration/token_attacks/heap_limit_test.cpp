// SPDX-License-Identifier: Apache-2.0
// Reading a document of the maximum length takes a bounded part of the heap, however the document reaches the limits.

#include "heap_octets.h"
#include "outcome.h"

#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <functional>
#include <ostream>
#include <string>

namespace Attacks {
namespace {

using Tarvel::Xml::MAX_DOCUMENT_BYTES;
using Tarvel::Xml::MAX_NAME_BYTES;
using Tarvel::Xml::MAX_NODES;

constexpr std::size_t MAX_HEAP_OCTETS = 160u * 1024 * 1024; // in addition to the text that the caller has

std::string Repeated(const std::string &piece, std::size_t count) {
  std::string text;
  text.reserve(piece.size() * count);
  for (; count > 0; --count) {
    text += piece;
  }
  return text;
}

const std::string REFERENCE = "&#65;"; // a text that has one must be copied to be decoded

struct LargeDocument {
  const char *name;
  std::function<std::string()> make;
};

void PrintTo(const LargeDocument &document, std::ostream *out) {
  *out << document.name;
}

/// As many elements as are allowed, and then `end`, which is long and has `nodes` nodes and attributes. Because of the
/// reference at the beginning, the reader makes its buffer when the unread rest of the document is longest.
std::string WithElements(const std::string &end, std::size_t nodes) {
  return "<r>" + REFERENCE + Repeated("<a/>", MAX_NODES - 2 - nodes) + end + "</r>";
}

constexpr std::size_t LEFT_AFTER_ELEMENTS = MAX_DOCUMENT_BYTES - 4 * MAX_NODES - 20;

/// A text with many references, which is copied piece by piece.
std::string DecodedInPieces() {
  const std::string piece = REFERENCE + std::string(1000, 'x');
  return Repeated(piece, LEFT_AFTER_ELEMENTS / piece.size());
}

/// Of all texts of its length that need decoding, this one is the longest after decoding.
std::string LongestDecoded() {
  return REFERENCE + std::string(LEFT_AFTER_ELEMENTS - REFERENCE.size(), 'x');
}

std::string WithText() {
  return WithElements(LongestDecoded(), 1);
}

std::string WithReferencesInText() {
  return WithElements(DecodedInPieces(), 1);
}

std::string WithAttribute() {
  return WithElements("<b c='" + LongestDecoded() + "'/>", 2);
}

/// The reader keeps a copy of the namespace name as long as the element is open.
std::string WithDeclaration() {
  return WithElements("<b xmlns:c='" + LongestDecoded() + "'/>", 2);
}

std::string WithReferencesInAttribute() {
  return WithElements("<b c='" + DecodedInPieces() + "'/>", 2);
}

std::string WithTexts() {
  return "<r>" + Repeated("<a/>" + REFERENCE, MAX_NODES / 2 - 1) + "</r>";
}

std::string WithAttributes() {
  return "<r>" + Repeated("<a b='&#65;'/>", MAX_NODES / 2 - 1) + "</r>";
}

std::string WithAttributesOfOneElement() {
  std::string element = "<a";
  for (int i = 0; i < 256; ++i) {
    element += " b" + std::to_string(i) + "='&#9;'";
  }
  return "<r>" + Repeated(element + "/>", MAX_NODES / 257 - 1) + "</r>";
}

std::string WithDeclarations() {
  return "<r>" + Repeated("<b:a xmlns:b='&#65;'/>", MAX_NODES / 2 - 1) + "</r>";
}

std::string WithNames() {
  const std::string nodes = Repeated("<a/>", MAX_NODES - 4000);
  std::string xml = "<r>" + nodes;
  for (std::size_t number = 0; xml.size() + MAX_NAME_BYTES + 100 < MAX_DOCUMENT_BYTES; ++number) {
    const std::string end = std::to_string(number);
    xml += "<" + std::string(MAX_NAME_BYTES - end.size(), 'n') + end + "/>";
  }
  return xml + "</r>";
}

std::string WithPrefixes() {
  std::string xml = "<r>";
  for (std::size_t number = 0; xml.size() + 40 < MAX_DOCUMENT_BYTES && number < MAX_NODES / 2 - 1; ++number) {
    const std::string prefix = "p" + std::to_string(number);
    xml.append("<").append(prefix).append(":a xmlns:").append(prefix).append("='u'/>");
  }
  return xml + "</r>";
}

std::string WithComments() {
  return "<r>" + Repeated("<!--c-->x", MAX_NODES / 2 - 1) + "</r>";
}

std::string WithInstructions() {
  return "<r>" + Repeated("<?p d?>", MAX_NODES - 2) + "</r>";
}

class LargestDocuments : public testing::TestWithParam<LargeDocument> {};

TEST_P(LargestDocuments, TakeABoundedPartOfTheHeapAsTokens) {
  const std::string xml = GetParam().make();
  ASSERT_LE(xml.size(), MAX_DOCUMENT_BYTES);
  const HeapCount heap;
  const Outcome outcome = TryToken(xml);
  EXPECT_LE(heap.GetPeak(), MAX_HEAP_OCTETS);
  EXPECT_EQ("ParseException", outcome.exceptionClass) << outcome.text.substr(0, 1000);
}

TEST_P(LargestDocuments, TakeABoundedPartOfTheHeapToParse) {
  const std::string xml = GetParam().make();
  const HeapCount heap;
  const auto reader = Tarvel::CreateStringReader(xml);
  const auto document = Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*reader);
  EXPECT_LE(heap.GetPeak(), MAX_HEAP_OCTETS);
  EXPECT_GT(heap.GetPeak(), xml.size()); // at least the reader's copy: the heap is really counted
  EXPECT_TRUE(document);
}

TEST(LargestDocument, WithTooManyNodesIsRefusedWithinABoundedPartOfTheHeap) {
  const std::string piece = "<a/>x";
  const std::string xml = "<r>" + Repeated(piece, MAX_DOCUMENT_BYTES / piece.size() - 2) + "</r>";
  const HeapCount heap;
  const Outcome outcome = TryToken(xml);
  EXPECT_LE(heap.GetPeak(), MAX_HEAP_OCTETS);
  EXPECT_EQ((Outcome{"XMLParseException",
                     "the document has more than 1048576 nodes and attributes at line 1, column 2621443"}),
            outcome);
}

INSTANTIATE_TEST_SUITE_P(
    With, LargestDocuments,
    testing::Values(LargeDocument{"OneText", WithText}, LargeDocument{"ReferencesInText", WithReferencesInText},
                    LargeDocument{"ReferencesInAttribute", WithReferencesInAttribute},
                    LargeDocument{"TextsBetweenElements", WithTexts}, LargeDocument{"OneAttribute", WithAttribute},
                    LargeDocument{"OneDeclaration", WithDeclaration}, LargeDocument{"Attributes", WithAttributes},
                    LargeDocument{"ManyAttributesOfAnElement", WithAttributesOfOneElement},
                    LargeDocument{"Declarations", WithDeclarations}, LargeDocument{"LongNames", WithNames},
                    LargeDocument{"Prefixes", WithPrefixes}, LargeDocument{"Comments", WithComments},
                    LargeDocument{"Instructions", WithInstructions}),
    [](const auto &document) { return document.param.name; });

} // namespace
} // namespace Attacks
