// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/parser.h>

#include "support/throws_message.h"
#include "support/xml_tree.h"

#include <gtest/gtest.h>

#include <string>

namespace Tarvel::Xml {
namespace {

using ::Testing::ParseDocument;

std::string Repeat(const std::string &text, std::size_t count) {
  std::string repeated;
  repeated.reserve(text.size() * count);
  for (std::size_t i = 0; i < count; ++i) {
    repeated += text;
  }
  return repeated;
}

/// ` PREFIX0="VALUE0" PREFIX1="VALUE1"` and so on.
std::string Attributes(const std::string &prefix, std::size_t count, const std::string &value = "") {
  std::string attributes;
  for (std::size_t i = 0; i < count; ++i) {
    const std::string number = std::to_string(i);
    attributes.append(" ").append(prefix).append(number).append("=\"").append(value).append("\"");
  }
  return attributes;
}

TEST(XMLParser, AcceptsADocumentOfTheGreatestLengthButNoLongerOne) {
  const std::string frame = "<a></a>";
  const std::string longest = "<a>" + std::string(MAX_DOCUMENT_BYTES - frame.size(), 'x') + "</a>";
  const auto document = ParseDocument(longest);
  EXPECT_EQ(AsText(document->GetDocumentElement()->GetFirstChild())->GetValue().size(), longest.size() - frame.size());
  EXPECT_THROWS_MESSAGE(ParseDocument(longest + "\n"), XMLParseException,
                        "the document is longer than 16777216 bytes at line 1, column 16777217");
}

TEST(XMLParser, AcceptsTheGreatestDepthAndNoMore) {
  const std::string deepest = Repeat("<a>", MAX_ELEMENT_DEPTH) + Repeat("</a>", MAX_ELEMENT_DEPTH);
  EXPECT_NO_THROW(ParseDocument(deepest));
  EXPECT_THROWS_MESSAGE(ParseDocument(Repeat("<a>", 257) + Repeat("</a>", 257)), XMLParseException,
                        "elements are nested deeper than 256 at line 1, column 769");
  EXPECT_THROWS_MESSAGE(ParseDocument(Repeat("<a>", 256) + "\n<a/>" + Repeat("</a>", 256)), XMLParseException,
                        "elements are nested deeper than 256 at line 2, column 1");
}

TEST(XMLParser, CountsTheDepthOfEachSiblingSeparately) {
  const std::string branch = Repeat("<a>", MAX_ELEMENT_DEPTH - 1) + Repeat("</a>", MAX_ELEMENT_DEPTH - 1);
  EXPECT_NO_THROW(ParseDocument("<r>" + branch + branch + branch + "</r>"));
}

TEST(XMLParser, RefusesAHundredThousandNestedElements) {
  EXPECT_THROWS_MESSAGE(ParseDocument(Repeat("<a>", 100'000) + Repeat("</a>", 100'000)), XMLParseException,
                        "elements are nested deeper than 256 at line 1, column 769");
}

TEST(XMLParser, AcceptsTheGreatestNumberOfAttributesAndNoMore) {
  EXPECT_NO_THROW(ParseDocument("<a" + Attributes("x", MAX_ATTRIBUTES) + "/>"));
  EXPECT_NO_THROW(ParseDocument("<a" + Attributes("x", 128) + Attributes("xmlns:y", 128, "urn:y") + "/>"));
  EXPECT_THROWS_MESSAGE(ParseDocument("<a>\n <b" + Attributes("x", 257) + "/></a>"), XMLParseException,
                        "an element has more than 256 attributes at line 2, column 2");
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + Attributes("x", 129) + Attributes("xmlns:y", 128, "urn:y") + "></a>"),
                        XMLParseException, "an element has more than 256 attributes at line 1, column 1");
}

TEST(XMLParser, CountsAttributesDespiteQuotesAndMarkupInValues) {
  const std::string single = Repeat(" a=' > \" = '", 300);
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + single + "/>"), XMLParseException,
                        "an element has more than 256 attributes at line 1, column 1");
  EXPECT_NO_THROW(ParseDocument("<a x='" + Repeat(" a=\"\"", 300) + "'>" + Repeat("'\"", 1000) + "</a>"));
}

TEST(XMLParser, RefusesTheShortestStartTagWithTooManyAttributes) {
  // The name is repeated, because there are not 257 names of one byte. A repetition is refused at the end of the tag.
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + Repeat(" a=\"\"", 257) + "/>"), XMLParseException,
                        "an element has more than 256 attributes at line 1, column 1");
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + Repeat(" a=\"\"", 256) + "/>"), XMLParseException,
                        "the attribute 'a' occurs twice at line 1, column 9");
}

TEST(XMLParser, CountsNoAttributesInCommentsCDataInstructionsAndText) {
  const std::string tag = "<a" + Attributes("x", 1000) + ">";
  EXPECT_NO_THROW(ParseDocument("<a><!-- " + tag + " --></a>"));
  EXPECT_NO_THROW(ParseDocument("<a><![CDATA[" + tag + "]]></a>"));
  EXPECT_NO_THROW(ParseDocument("<a><?pi " + tag + "?></a>"));
  EXPECT_NO_THROW(ParseDocument("<a>" + Attributes("x", 1000) + "</a>"));
  EXPECT_THROWS_MESSAGE(ParseDocument("<a><!-- " + tag + " -->\n" + tag + "</a>"), XMLParseException,
                        "an element has more than 256 attributes at line 2, column 1");
}

TEST(XMLParser, RefusesAHundredThousandAttributes) {
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + Attributes("x", 100'000) + "/>"), XMLParseException,
                        "an element has more than 256 attributes at line 1, column 1");
}

TEST(XMLParser, RefusesAHundredThousandNamespaceDeclarations) {
  EXPECT_THROWS_MESSAGE(ParseDocument("<a" + Attributes("xmlns:x", 100'000, "urn:x") + "/>"), XMLParseException,
                        "an element has more than 256 attributes at line 1, column 1");
}

TEST(XMLParser, AcceptsTheGreatestNumberOfNamespacesInScopeAndNoMore) {
  const std::string outer = "<a" + Attributes("xmlns:x", 200, "urn:x") + ">";
  const auto nested = [&outer](std::size_t count) {
    const std::string inner = "\n<b" + Attributes("xmlns:y", count, "urn:y") + "/>";
    return outer + inner + inner + "</a>";
  };
  EXPECT_NO_THROW(ParseDocument(nested(56)));
  EXPECT_THROWS_MESSAGE(ParseDocument(nested(57)), XMLParseException,
                        "more than 256 namespace declarations are in scope at line 2, column 1");
}

TEST(XMLParser, AcceptsAHundredThousandElementsThatEachDeclareANamespace) {
  const auto document = ParseDocument("<r>" + Repeat("<p:a xmlns:p=\"urn:p\"/>", 100'000) + "</r>");
  std::size_t count = 0;
  for (const Node *node = document->GetDocumentElement()->GetFirstChild(); node; node = node->GetNextSibling()) {
    count += AsElement(node)->HasQName("urn:p", "a");
  }
  EXPECT_EQ(count, 100'000u);
}

TEST(XMLParser, AcceptsTextAndValuesOverTenMebibytes) {
  const std::string text = Repeat("\xC3\xA4\r\n&amp;", 1'300'000);
  const auto document = ParseDocument("<a>" + text + "</a>");
  // Not EXPECT_EQ, which would print them.
  EXPECT_TRUE(AsText(document->GetDocumentElement()->GetFirstChild())->GetValue() == Repeat("\xC3\xA4\n&", 1'300'000));

  const auto withValue = ParseDocument("<a x='" + text + "'/>");
  EXPECT_TRUE(withValue->GetDocumentElement()->GetFirstAttribute()->GetValue() == Repeat("\xC3\xA4 &", 1'300'000));
}

TEST(XMLParser, AcceptsManyUnboundPrefixesOnElementsWithLongNames) {
  const std::string tag = "<" + std::string(MAX_NAME_BYTES, 'n') + Attributes("p:a", MAX_ATTRIBUTES) + "/>";
  EXPECT_NO_THROW(ParseDocument("<r>" + Repeat(tag, MAX_DOCUMENT_BYTES / tag.size() - 1) + "</r>"));
}

TEST(XMLParser, AcceptsTheLongestNamesButNoLongerOnes) {
  const std::string longest(MAX_NAME_BYTES, 'n');
  const std::string prefixed = "p:" + longest.substr(2);
  for (const std::string &name : {longest, prefixed}) {
    EXPECT_NO_THROW(ParseDocument("<" + name + "/>"));
    EXPECT_NO_THROW(ParseDocument("<a " + name + "=''/>"));
    EXPECT_THROWS_MESSAGE(ParseDocument("<" + name + "n/>"), XMLParseException,
                          "a name is longer than 4096 bytes at line 1, column 2");
    EXPECT_THROWS_MESSAGE(ParseDocument("<a\n" + name + "n=''/>"), XMLParseException,
                          "a name is longer than 4096 bytes at line 2, column 1");
  }
  EXPECT_NO_THROW(ParseDocument("<a><?" + longest + "?></a>"));
  EXPECT_THROWS_MESSAGE(ParseDocument("<a><?" + longest + "n?></a>"), XMLParseException,
                        "a name is longer than 4096 bytes at line 1, column 6");
}

/// A document with that many nodes and attributes, of every kind.
std::string DocumentOf(std::size_t nodes) {
  const std::string group = "<a x='1' xmlns='urn:x'>t</a><!--c--><?p?>";
  constexpr std::size_t IN_GROUP = 6;
  const std::size_t groups = (nodes - 1) / IN_GROUP;
  return "<r>" + Repeat(group, groups) + Repeat("<a/>", nodes - 1 - groups * IN_GROUP);
}

TEST(XMLParser, AcceptsTheGreatestNumberOfNodesAndNoMore) {
  const std::string most = DocumentOf(MAX_NODES);
  EXPECT_NO_THROW(ParseDocument(most + "</r>"));
  const auto column = [&most](std::size_t further) { return std::to_string(most.size() + 1 + further); };
  const std::string refusal = "the document has more than 1048576 nodes and attributes at line 1, column ";
  for (const std::string more : {"<b/>", "<!--c-->", "<?p?>", "t", "&amp;", "<![CDATA[t]]>"}) {
    EXPECT_THROWS_MESSAGE(ParseDocument(most + more + "</r>"), XMLParseException, refusal + column(0));
  }
  const std::string allButOne = DocumentOf(MAX_NODES - 1);
  EXPECT_THROWS_MESSAGE(ParseDocument(allButOne + "<b x=''/></r>"), XMLParseException,
                        refusal + std::to_string(allButOne.size() + 4));
  EXPECT_THROWS_MESSAGE(ParseDocument(allButOne + "<b xmlns=''/></r>"), XMLParseException,
                        refusal + std::to_string(allButOne.size() + 4));
  EXPECT_NO_THROW(ParseDocument(most + "<![CDATA[]]></r>")); // makes no node
}

TEST(XMLParser, RefusesASecondByteOrderMark) {
  const std::string mark = "\xEF\xBB\xBF";
  EXPECT_NO_THROW(::Testing::ParseDocument(mark + "<a/>"));
  EXPECT_THROW(::Testing::ParseDocument(mark + mark + "<a/>"), XMLParseException);
}

TEST(XMLParser, ReadsLargeDocumentsOfSmallPartsInLinearTime) {
  // Each of these takes well under a second when time is linear, and minutes when it is quadratic.
  EXPECT_NO_THROW(ParseDocument("<r>" + Repeat("<a/>", 1'000'000) + "</r>"));
  EXPECT_THROW(ParseDocument("<r>" + Repeat("<a/>", 2'000'000) + "</r>"), XMLParseException);
  EXPECT_NO_THROW(ParseDocument("<r>" + Repeat("<a>" + std::string(2000, 'x') + "</a>", 5'000) + "</r>"));
  EXPECT_NO_THROW(ParseDocument("<r>" + Repeat("x<!--c-->", 500'000) + "</r>"));
  EXPECT_NO_THROW(ParseDocument("<r>" + Repeat("<![CDATA[x]]>", 1'000'000) + "</r>"));
  EXPECT_NO_THROW(ParseDocument("<r>" + Repeat("<p:a q:x='1'/>", 200'000) + "</r>"));
  EXPECT_THROW(ParseDocument("<r>" + Repeat("<a x='" + std::string(2000, 'x'), 8'000)), XMLParseException);
  EXPECT_THROW(ParseDocument("<r>" + Repeat("<!-- <a>", 2'000'000)), XMLParseException);
  EXPECT_THROW(ParseDocument("<r>" + Repeat("&x;", 5'000'000)), XMLParseException);
  EXPECT_THROW(ParseDocument("<r>" + Repeat("<a", 5'000'000)), XMLParseException);
}

} // namespace
} // namespace Tarvel::Xml
