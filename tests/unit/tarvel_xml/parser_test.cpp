// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/parser.h>

#include "support/throws_message.h"
#include "support/xml_tree.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <stdexcept>
#include <string>

namespace Tarvel::Xml {
namespace {

using ::Testing::DescribeTree;
using ::Testing::ParseDocument;

std::string DescribeDocument(const std::string &text) {
  return DescribeTree(*ParseDocument(text)->GetDocumentNode());
}

TEST(ParseDocument, ReadsElementsAttributesAndTextInOrder) {
  EXPECT_EQ(DescribeDocument("<a x=\"1\" y='2'>one<b/>two<c>three</c></a>"),
            "(1:a @1:x=1:1 @1:y=1:2 text=3:one(1:b) text=3:two(1:c text=5:three))");
}

TEST(ParseDocument, KeepsNamespaceDeclarationsAmongTheAttributesInDocumentOrder) {
  EXPECT_EQ(DescribeDocument("<p:a x='1' xmlns:p='urn:p' p:y='2' xmlns='urn:d' z='3'/>"),
            "(3:p:a @1:x=1:1 @7:xmlns:p=5:urn:p @3:p:y=1:2 @5:xmlns=5:urn:d @1:z=1:3)");
}

TEST(ParseDocument, ReadsSpaceAroundEqualsSignsAndInEndTags) {
  EXPECT_EQ(DescribeDocument("<a\n x =\t'1'\r\n xmlns:p\n=\n\"urn:p\" ></a\n>"), "(1:a @1:x=1:1 @7:xmlns:p=5:urn:p)");
}

TEST(ParseDocument, DecodesReferencesInTextAndValues) {
  EXPECT_EQ(DescribeDocument("<a x='&lt;&gt;&amp;&apos;&quot;&#65;&#x42;'>&lt;&gt;&amp;&apos;&quot;&#65;&#x42;</a>"),
            "(1:a @1:x=7:<>&'\"AB text=7:<>&'\"AB)");
}

TEST(ParseDocument, DecodesReferencesInNamespaceDeclarations) {
  const auto document = ParseDocument("<p:a x='0' xmlns:p='urn:a&amp;b&#x63;'/>");
  EXPECT_EQ(document->GetDocumentElement()->GetQName(), QName("urn:a&bc", "a"));
}

TEST(ParseDocument, NormalisesLineEndsAndWhiteSpaceInValues) {
  EXPECT_EQ(DescribeDocument("<a x='1\r\n2\n3\r4\t5&#xA;6&#xD;7'>1\r\n2\r3\n4&#xD;5</a>"),
            "(1:a @1:x=13:1 2 3 4 5\n6\r7 text=9:1\n2\n3\n4\r5)");
}

TEST(ParseDocument, MergesAdjacentTextAndCDataIntoOneNode) {
  EXPECT_EQ(DescribeDocument("<a>one &amp; <![CDATA[<two>]]><![CDATA[ & ]]>three \xC3\xA4&#x20AC;</a>"),
            "(1:a text=25:one & <two> & three \xC3\xA4\xE2\x82\xAC)");
}

TEST(ParseDocument, MakesNoTextNodeForAnEmptyCDataSection) {
  EXPECT_EQ(DescribeDocument("<a><![CDATA[]]></a>"), "(1:a)");
}

TEST(ParseDocument, SplitsTextAtCommentsAndProcessingInstructions) {
  EXPECT_EQ(DescribeDocument("<a>one<!--c-->two<?t d?>three</a>"),
            "(1:a text=3:one comment=1:c text=3:two pi=1:t?1:d text=5:three)");
}

TEST(ParseDocument, KeepsWhiteSpaceBetweenElements) {
  EXPECT_EQ(DescribeDocument("<a>\n <b/>\n</a>"), "(1:a text=2:\n (1:b) text=1:\n)");
}

TEST(ParseDocument, KeepsCommentsAndInstructionsAroundTheDocumentElement) {
  EXPECT_EQ(DescribeDocument("<?xml version='1.0'?>\n<!--before--><?t?>\n<a/><!----><?u  v w ?>\n"),
            " comment=6:before pi=1:t?0:(1:a) comment=0: pi=1:u?4:v w ");
}

TEST(ParseDocument, KeepsUnboundPrefixesInTheTree) {
  EXPECT_EQ(DescribeDocument("<p:a q:x='1' r:x='2'><s:b/></p:a>"), "(3:p:a @3:q:x=1:1 @3:r:x=1:2(3:s:b))");
}

TEST(ParseDocument, AcceptsADeclarationOfTheXmlPrefix) {
  EXPECT_EQ(DescribeDocument("<a y='1' xmlns:xml='http://www.w3.org/XML/1998/namespace' xmlns:p='urn:p' "
                             "xml:space='preserve' xml:lang='de' xml:id='i'/>"),
            "(1:a @1:y=1:1 @9:xmlns:xml=36:http://www.w3.org/XML/1998/namespace @7:xmlns:p=5:urn:p "
            "@9:xml:space=8:preserve @8:xml:lang=2:de @6:xml:id=1:i)");
}

TEST(ParseDocument, AcceptsNamesBeyondAscii) {
  EXPECT_EQ(DescribeDocument("<\xC3\xA4:\xE4\xB8\x80 xmlns:\xC3\xA4='urn:x' \xCE\xB1\xC2\xB7='1'/>"),
            "(6:\xC3\xA4:\xE4\xB8\x80 @8:xmlns:\xC3\xA4=5:urn:x @4:\xCE\xB1\xC2\xB7=1:1)");
}

TEST(ParseDocument, AcceptsAByteOrderMarkAndCountsColumnsAfterIt) {
  const auto document = ParseDocument("\xEF\xBB\xBF<?xml version='1.0' encoding='UTF-8'?><a/>");
  EXPECT_EQ(document->GetDocumentElement()->GetLine(), 1u);
  EXPECT_EQ(document->GetDocumentElement()->GetColumn(), 39u);
}

TEST(ParseDocument, AcceptsUtf8AndUsAsciiInAnyLetterCase) {
  for (const char *const encoding : {"UTF-8", "utf-8", "Utf-8", "US-ASCII", "us-ascii"}) {
    EXPECT_EQ(DescribeDocument("<?xml version=\"1.0\" encoding=\"" + std::string(encoding) + "\"?><a/>"), "(1:a)");
  }
}

TEST(ParseDocument, IgnoresAnEncodingInAnInstructionOrInText) {
  EXPECT_EQ(DescribeDocument("<?xml-stylesheet encoding='UTF-16'?><a>encoding='UTF-16'</a>"),
            " pi=14:xml-stylesheet?17:encoding='UTF-16'(1:a text=17:encoding='UTF-16')");
}

TEST(ParseDocument, ReportsLineAndColumnInBytesOfEachElement) {
  const auto document = ParseDocument("<?xml version='1.0'?>\n<a\n x='1'>\xC3\xA4<b/>\r\n  <c\n\n/><d\ny='>'/></a>");
  const ElementNode &a = *document->GetDocumentElement();
  const auto position = [&a](std::string_view name) {
    const ElementNode &element = name == "a" ? a : *a.FindChildElement(name);
    return std::to_string(element.GetLine()) + ":" + std::to_string(element.GetColumn());
  };
  EXPECT_EQ(position("a"), "2:1");
  EXPECT_EQ(position("b"), "3:10");
  EXPECT_EQ(position("c"), "4:3");
  EXPECT_EQ(position("d"), "6:3");
}

TEST(Document, HasADocumentNodeAboveTheDocumentElement) {
  const auto document = ParseDocument("<!--c--><a/>");
  const Ref<const Document> constant = document;
  EXPECT_EQ(document->GetDocumentElement()->GetParent(), document->GetDocumentNode());
  EXPECT_EQ(document->GetDocumentElement()->GetRoot(), document->GetDocumentNode());
  EXPECT_EQ(constant->GetDocumentElement(), document->GetDocumentElement());
  EXPECT_EQ(document->GetDocumentNode()->GetParent(), nullptr);
  EXPECT_EQ(document->GetDocumentNode()->GetKind(), NodeKind::DOCUMENT);
}

TEST(XMLParser, ReadsOneDocumentAfterAnother) {
  const Ref<XMLParser> parser = CreateXMLParser(CreateXMLDocumentHandler());
  const Ref<Object> first = parser->Parse(*CreateStringReader("<a>1</a>"));
  EXPECT_THROW(parser->Parse(*CreateStringReader("<b>2")), XMLParseException);
  const Ref<Object> third = parser->Parse(*CreateStringReader("<c>3</c>"));
  EXPECT_EQ(DescribeTree(*CheckedCast<Document>(first)->GetDocumentNode()), "(1:a text=1:1)");
  EXPECT_EQ(DescribeTree(*CheckedCast<Document>(third)->GetDocumentNode()), "(1:c text=1:3)");
}

/// Returns its text in small pieces, and then fails if `fails` is set.
class SlowReader final : public Reader {
public:
  SlowReader(std::string text, bool fails) : m_text(std::move(text)), m_fails(fails) {}

  std::size_t Read(char *buffer, std::size_t length) override {
    const std::size_t count = m_text.copy(buffer, std::min<std::size_t>(length, 3), m_offset);
    m_offset += count;
    if (count == 0 && m_fails) {
      throw IOException("the line is cut");
    }
    return count;
  }

private:
  const std::string m_text;
  const bool m_fails;
  std::size_t m_offset = 0;
};

TEST(XMLParser, ReadsAReaderToItsEnd) {
  const Ref<Reader> reader = MakeRef<SlowReader>("<a>some text</a>", false);
  const Ref<Object> result = CreateXMLParser(CreateXMLDocumentHandler())->Parse(*reader);
  EXPECT_EQ(DescribeTree(*CheckedCast<Document>(result)->GetDocumentNode()), "(1:a text=9:some text)");
}

TEST(XMLParser, PassesOnTheFailureOfItsReader) {
  const Ref<Reader> reader = MakeRef<SlowReader>("<a/>", true);
  EXPECT_THROWS_MESSAGE(CreateXMLParser(CreateXMLDocumentHandler())->Parse(*reader), IOException, "the line is cut");
}

/// Throws at the event with the given name, and records the events before it.
class ThrowingHandler final : public XMLHandler {
public:
  explicit ThrowingHandler(std::string event) : m_event(std::move(event)) {}

  void StartDocument(std::string_view, const Ref<Object> &) override { At("StartDocument"); }
  void StartElement(std::string_view, const AttributeEvent *, std::size_t, std::uint32_t, std::uint32_t) override {
    At("StartElement");
  }
  void EndElement() override { At("EndElement"); }
  void Characters(std::string_view) override { At("Characters"); }
  void Comment(std::string_view) override { At("Comment"); }
  void ProcessingInstruction(std::string_view, std::string_view) override { At("ProcessingInstruction"); }
  Ref<Object> TakeResult() override {
    At("TakeResult");
    return nullptr;
  }

  std::string seen;

private:
  void At(const std::string &event) {
    if (event == m_event) {
      throw std::out_of_range(event);
    }
    seen += event + " ";
  }

  const std::string m_event;
};

TEST(XMLParser, PassesEventsToItsHandlerAndReturnsItsResult) {
  const Ref<ThrowingHandler> handler = MakeRef<ThrowingHandler>("");
  EXPECT_FALSE(CreateXMLParser(handler)->Parse(*CreateStringReader("<a>t<!--c--><?p?><b/></a>")));
  EXPECT_EQ(handler->seen,
            "StartDocument StartElement Characters Comment ProcessingInstruction StartElement EndElement "
            "EndElement TakeResult ");
}

TEST(XMLParser, StopsAtAnExceptionOfItsHandlerAndPassesItOn) {
  for (const char *const event : {"StartDocument", "StartElement", "EndElement", "Characters", "Comment",
                                  "ProcessingInstruction", "TakeResult"}) {
    const Ref<ThrowingHandler> handler = MakeRef<ThrowingHandler>(event);
    EXPECT_THROWS_MESSAGE(
        CreateXMLParser(handler)->Parse(*CreateStringReader("<a>t<![CDATA[u]]><!--c--><?p?><b/><b>t</b></a>")),
        std::out_of_range, event);
  }
}

TEST(XMLParser, PrintsNothing) {
  ::testing::internal::CaptureStderr();
  ::testing::internal::CaptureStdout();
  for (const char *const text : {"", "<a", "<a>&x;</a>", "<p:a/>", "<a xmlns='a b'/>", "<a xmlns='relative'/>",
                                 "<?xml version='1.7'?><a/>", "<a xml:space='odd'/>", "<!DOCTYPE a SYSTEM 'x'><a/>"}) {
    try {
      ParseDocument(text);
    } catch (const XMLParseException &) {
      continue; // the messages are tested elsewhere
    }
  }
  EXPECT_EQ(::testing::internal::GetCapturedStderr(), "");
  EXPECT_EQ(::testing::internal::GetCapturedStdout(), "");
}

} // namespace
} // namespace Tarvel::Xml
