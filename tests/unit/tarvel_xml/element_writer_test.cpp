// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/node.h>

#include "support/data_file.h"
#include "support/xml_tree.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <string_view>

namespace Tarvel::Xml {
namespace {

using ::Testing::DescribeTree;
using ::Testing::ParseDocument;
using ::Testing::WriteElement;

std::string WriteAgain(const std::string &text) {
  return WriteElement(*ParseDocument(text)->GetDocumentElement());
}

TEST(WriteTo, EscapesSpecialCharactersInText) {
  EXPECT_EQ(WriteAgain("<a>&lt;&gt;&amp;\"'&#xD;\n\t</a>"), "<a>&lt;&gt;&amp;\"'&#xD;\n\t</a>");
}

TEST(WriteTo, EscapesSpecialCharactersInAttributeValues) {
  EXPECT_EQ(WriteAgain("<a x='&lt;>&amp;\"&apos;&#xD;&#xA;&#x9; '/>"),
            "<a x=\"&lt;>&amp;&quot;'&#xD;&#xA;&#x9; \"></a>");
}

TEST(WriteTo, KeepsPrefixesDeclarationsAndTheirOrder) {
  const std::string text =
      "<p:a z=\"1\" xmlns:q=\"urn:p\" xmlns=\"\" xmlns:p=\"urn:p\" q:y=\"2\"><p:b xmlns:p=\"urn:p\"></p:b></p:a>";
  EXPECT_EQ(WriteAgain(text), text);
}

TEST(WriteTo, WritesCommentsAndProcessingInstructions) {
  EXPECT_EQ(WriteAgain("<a><!-- c --><?t?><?u  v ?></a>"), "<a><!-- c --><?t?><?u v ?></a>");
}

TEST(WriteTo, WritesCDataAsText) {
  EXPECT_EQ(WriteAgain("<a><![CDATA[<b>&amp;]]></a>"), "<a>&lt;b&gt;&amp;amp;</a>");
}

TEST(WriteTo, WritesTheElementWithoutItsSiblings) {
  const auto document = ParseDocument("<a>one<b x='1'><c/>two</b>three<d/></a>");
  EXPECT_EQ(WriteElement(*document->GetDocumentElement()->FindChildElement("b")), "<b x=\"1\"><c></c>two</b>");
}

TEST(WriteTo, WritesMoreThanItsBufferHolds) {
  const std::string text = "<a>" + std::string(100'000, 'x') + "<b></b>" + std::string(20'000, 'y') + "</a>";
  EXPECT_TRUE(WriteAgain(text) == text);
}

TEST(WriteTo, WritesPiecesOfEveryLengthAroundTheSizeOfItsBuffer) {
  for (const std::size_t around : {8192U, 16384U}) {
    for (std::size_t length = around - 20; length <= around + 20; ++length) {
      const std::string text = "<a><b>" + std::string(length, 'x') + "</b><c>" + std::string(10'000, 'y') + "</c></a>";
      EXPECT_TRUE(WriteAgain(text) == text) << length;
    }
  }
}

std::string WriteInAscii(const ElementNode &element) {
  const Ref<StringWriter> writer = CreateStringWriter();
  element.WriteTo(*writer, CharacterForm::REFERENCES);
  return writer->GetText();
}

TEST(WriteTo, WritesUtf8WhenNotAskedForReferences) {
  const std::string text = "<a x=\"\xC3\xBC\">\xF0\x9F\x98\x80</a>";
  EXPECT_EQ(WriteAgain(text), text);
}

TEST(WriteTo, WritesTextAndAttributeValuesAsReferencesWhenAskedTo) {
  const auto document = ParseDocument("<a x='\xC3\xBC&amp;\xC5\x82\t\xF0\x9F\x98\x80'>\x7F\xC2\x80&lt;\xE8\xAA\x9E"
                                      "\xEF\xBF\xBD\xF4\x8F\xBF\xBFz</a>");
  EXPECT_EQ(WriteInAscii(*document->GetDocumentElement()),
            "<a x=\"&#xFC;&amp;&#x142; &#x1F600;\">\x7F&#x80;&lt;&#x8A9E;&#xFFFD;&#x10FFFF;z</a>");
}

TEST(WriteTo, WritesNamesCommentsAndInstructionsAsUtf8WhenAskedForReferences) {
  const std::string text =
      "<\xC3\xBC:a xmlns:\xC3\xBC=\"urn:u\" \xC3\xA4=\"1\"><!-- \xC3\xB6 --><?\xC3\xBC \xC3\xA4?></\xC3\xBC:a>";
  EXPECT_EQ(WriteInAscii(*ParseDocument(text)->GetDocumentElement()), text);
}

TEST(WriteTo, WritesMoreReferencesThanItsBufferHolds) {
  std::string text;
  std::string references;
  for (int i = 0; i < 20'000; ++i) {
    text += i % 7 == 0 ? "x" : "\xC3\xBC";
    references += i % 7 == 0 ? "x" : "&#xFC;";
  }
  const auto document = ParseDocument("<a>" + text + "</a>");
  EXPECT_TRUE(WriteInAscii(*document->GetDocumentElement()) == "<a>" + references + "</a>");
}

TEST(WriteTo, WritesAReferenceAtEveryPositionOfAText) {
  struct Case {
    std::string_view character;
    std::string_view inText;
    std::string_view inAttributes;
  };
  constexpr std::size_t LENGTH = 36; // two blocks of 16 bytes, each of them checked at once, and a rest
  constexpr Case CASES[] = {{"&", "&amp;", "&amp;"}, {"<", "&lt;", "&lt;"},    {">", "&gt;", ">"},
                            {"\"", "\"", "&quot;"},  {"\r", "&#xD;", "&#xD;"}, {"\t", "\t", "&#x9;"},
                            {"\n", "\n", "&#xA;"},   {"\x7F", "\x7F", "\x7F"}, {"\xC3\xBC", "&#xFC;", "&#xFC;"}};
  for (const Case &tried : CASES) {
    for (std::size_t before = 0; before < LENGTH; ++before) {
      const std::string begin(before, 'x');
      const std::string end(LENGTH - before, '!');
      Ref<ElementNode> element;
      CreateElementNode("", "a", element);
      Ref<TextNode> text;
      CreateTextNode(text);
      element->DefineAttribute("x", begin + std::string(tried.character) + end);
      text->SetValue(begin + std::string(tried.character) + end);
      element->AppendChild(text.get());
      EXPECT_EQ(WriteInAscii(*element), "<a x=\"" + begin + std::string(tried.inAttributes) + end + "\">" + begin +
                                            std::string(tried.inText) + end + "</a>");
    }
  }
}

const char *const TEXTS[] = {"",
                             "plain",
                             " leading and trailing ",
                             "<&>\"'",
                             "]]>",
                             "-->",
                             "?>",
                             "&amp;&#x41;",
                             "\t\n\r\r\n\n\r",
                             "\xC3\xA4\xC3\xB6\xC3\xBC \xE2\x82\xAC \xE4\xB8\xAD\xE6\x96\x87",
                             "\xF0\x9F\x98\x80\xF0\x9F\x91\xA8\xE2\x80\x8D\xF0\x9F\x91\xA9",
                             "\x7F\xC2\x80\xC2\x85\xE2\x80\xA8\xEF\xBF\xBD\xEE\x80\x80"};

TEST(WriteTo, WritesEachTextSoThatAParserReturnsIt) {
  for (const char *const text : TEXTS) {
    Ref<ElementNode> element;
    Ref<TextNode> node;
    CreateElementNode("", "a", element);
    CreateTextNode(node);
    node->SetValue(text);
    element->DefineAttribute("x", text);
    element->AppendChild(node.get());
    for (const std::string &written : {WriteElement(*element), WriteInAscii(*element)}) {
      const auto document = ParseDocument(written);
      const TextNode *const read = AsText(document->GetDocumentElement()->GetFirstChild());
      EXPECT_EQ(read ? read->GetValue() : "", text);
      EXPECT_EQ(document->GetDocumentElement()->GetFirstAttribute()->GetValue(), text);
    }
  }
}

TEST(WriteTo, WritesEachAsciiCharacterSoThatAParserReturnsIt) {
  for (char c = 1; c < 0x7F; ++c) {
    if (c < 0x20 && c != '\t' && c != '\n' && c != '\r') {
      continue;
    }
    Ref<ElementNode> element;
    CreateElementNode("", "a", element);
    element->DefineAttribute("x", std::string(2, c));
    Ref<TextNode> text;
    CreateTextNode(text);
    text->SetValue(std::string(2, c));
    element->AppendChild(text.get());
    EXPECT_EQ(DescribeTree(*ParseDocument(WriteElement(*element))->GetDocumentNode()), DescribeTree(*element));
  }
}

TEST(WriteTo, WritesEachTokenSoThatAParserReturnsItsTree) {
  std::size_t tokens = 0;
  for (const auto &entry : std::filesystem::directory_iterator(::Testing::DataPath("tokens"))) {
    if (entry.path().extension() != ".xml") {
      continue;
    }
    SCOPED_TRACE(entry.path());
    const auto document = ParseDocument(::Testing::ReadDataFile("tokens/" + entry.path().filename().string()));
    const auto again = ParseDocument(WriteElement(*document->GetDocumentElement()));
    EXPECT_TRUE(DescribeTree(*again->GetDocumentElement()) == DescribeTree(*document->GetDocumentElement()));
    const auto inAscii = ParseDocument(WriteInAscii(*document->GetDocumentElement()));
    EXPECT_TRUE(DescribeTree(*inAscii->GetDocumentElement()) == DescribeTree(*document->GetDocumentElement()));
    ++tokens;
  }
  EXPECT_GT(tokens, 10u);
}

} // namespace
} // namespace Tarvel::Xml
