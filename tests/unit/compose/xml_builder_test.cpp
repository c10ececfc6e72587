// SPDX-License-Identifier: Apache-2.0

#include "compose/xml_builder.h"

#include "support/throws_message.h"
#include "xml/xml_text.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using ElementRef = Tarvel::Ref<Tarvel::Xml::ElementNode>;

ElementRef Build(const XMLBuilderPtr &builder) {
  ElementRef element;
  builder->build(element);
  return element;
}

TEST(ElementBuilder, WritesAttributesInByteOrderOfTheirNames) {
  const XMLBuilderPtr builder =
      ElementBuilder("p", "e", {{"xmlns:wsu", "urn:u"}, {"wsu:Id", "i"}, {"ValueType", "v"}, {"EncodingType", "t"}});
  EXPECT_EQ(SerializeToXML(builder), "<p:e EncodingType=\"t\" ValueType=\"v\" wsu:Id=\"i\" xmlns:wsu=\"urn:u\"></p:e>");
}

TEST(ElementBuilder, UsesTheFirstValueOfANameThatAnInitialiserListRepeats) {
  EXPECT_EQ(SerializeToXML(ElementBuilder("p", "e", {{"A", "first"}, {"A", "second"}})), "<p:e A=\"first\"></p:e>");
}

TEST(ElementBuilder, MakesANewElementAtEachBuild) {
  const XMLBuilderPtr builder = ElementBuilder("p", "e");
  EXPECT_NE(Build(builder).get(), Build(builder).get());
}

TEST(ElementBuilder, ReplacesTheValueOfTheOutReference) {
  ElementRef element = Build(ElementBuilder("p", "old"));
  ElementBuilder("p", "new")->build(element);
  EXPECT_EQ(element->GetName(), "p:new");
}

TEST(TextElementBuilder, GivesAnEmptyTextOneEmptyTextChild) {
  const ElementRef element = Build(TextElementBuilder("p", "e", ""));
  const auto *const text = Tarvel::Xml::AsText(element->GetFirstChild());
  ASSERT_NE(text, nullptr);
  EXPECT_EQ(text->GetValue(), "");
  EXPECT_EQ(text->GetNextSibling(), nullptr);
}

TEST(TextElementBuilder, StoresMarkupAsGivenAndLeavesEscapingToTheSerialiser) {
  const XMLBuilderPtr builder = TextElementBuilder("p", "e", {{"a", "<&\""}}, "a<b & c");
  const ElementRef element = Build(builder);
  ASSERT_NE(Tarvel::Xml::AsText(element->GetFirstChild()), nullptr);
  EXPECT_EQ(Tarvel::Xml::AsText(element->GetFirstChild())->GetValue(), "a<b & c");
  EXPECT_EQ(SerializeToXML(builder), "<p:e a=\"&lt;&amp;&quot;\">a&lt;b &amp; c</p:e>");
}

TEST(XMLCompositeBuilder, BuildsExactlyTheBaseElementWithoutChildren) {
  const auto composite = std::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e", {{"a", "1"}}));
  EXPECT_EQ(SerializeToXML(composite), "<p:e a=\"1\"></p:e>");
}

TEST(XMLCompositeBuilder, ListsChildrenInTheOrderInWhichTheyWereAdded) {
  const auto composite = std::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"));
  composite->Add(ElementBuilder("p", "c")).Add(ElementBuilder("p", "a")).Add(TextElementBuilder("p", "b", "t"));
  EXPECT_EQ(SerializeToXML(composite), "<p:e><p:c></p:c><p:a></p:a><p:b>t</p:b></p:e>");
}

TEST(XMLCompositeBuilder, IgnoresANullChildAndStillReturnsItself) {
  XMLCompositeBuilder composite(ElementBuilder("p", "e"));
  EXPECT_EQ(&composite.Add(nullptr), &composite);
  ElementRef element;
  composite.build(element);
  EXPECT_EQ(element->GetFirstChild(), nullptr);
}

TEST(XMLCompositeBuilder, AddsAfterTheChildrenOfItsBase) {
  const auto base = std::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "e"));
  base->Add(ElementBuilder("p", "first"));
  const auto composite = std::make_shared<XMLCompositeBuilder>(base);
  composite->Add(ElementBuilder("p", "second"));
  EXPECT_EQ(SerializeToXML(composite), "<p:e><p:first></p:first><p:second></p:second></p:e>");
  EXPECT_EQ(SerializeToXML(base), "<p:e><p:first></p:first></p:e>");
}

TEST(XMLCompositeBuilder, SharesOneChildBetweenTwoTrees) {
  const XMLBuilderPtr child = TextElementBuilder("p", "c", "t");
  const auto one = std::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "one"));
  const auto two = std::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "two"));
  one->Add(child);
  two->Add(child);
  EXPECT_EQ(SerializeToXML(one), "<p:one><p:c>t</p:c></p:one>");
  EXPECT_EQ(SerializeToXML(two), "<p:two><p:c>t</p:c></p:two>");
}

TEST(PreBuiltElementImpl, ReturnsTheSameNodeAtEachBuild) {
  const ElementRef element = Build(ElementBuilder("p", "e"));
  const XMLBuilderPtr builder = std::make_shared<const PreBuiltElementImpl>(element);
  EXPECT_EQ(Build(builder).get(), element.get());
  EXPECT_EQ(Build(builder).get(), element.get());
}

TEST(PreBuiltElementImpl, RefusesASecondTree) {
  const auto composite = std::make_shared<XMLCompositeBuilder>(ElementBuilder("p", "parent"));
  composite->Add(std::make_shared<const PreBuiltElementImpl>(Build(ElementBuilder("p", "e"))));
  const ElementRef first = Build(composite);
  EXPECT_THROW(Build(composite), Tarvel::InvalidStateException);
}

TEST(BuildAndAppendChildTo, AppendsAsLastChild) {
  const ElementRef parent = Build(ElementBuilder("p", "e"));
  BuildAndAppendChildTo(parent.get(), ElementBuilder("p", "a"));
  BuildAndAppendChildTo(parent.get(), ElementBuilder("p", "b"));
  EXPECT_EQ(SerializeToXML(std::make_shared<const PreBuiltElementImpl>(parent)), "<p:e><p:a></p:a><p:b></p:b></p:e>");
}

TEST(ElementDefineAttribute, DefinesTheAttributeByItsQualifiedName) {
  const ElementRef element = Build(ElementBuilder("p", "e"));
  ElementDefineAttribute(element.get(), {"xmlns:p", "urn:p"});
  ElementDefineAttribute(element.get(), {"p:a", "v"});
  ASSERT_NE(element->FindAttribute("urn:p", "a"), nullptr);
  EXPECT_EQ(element->FindAttribute("urn:p", "a")->GetValue(), "v");
}

TEST(SerializeToXML, WritesTextAndAttributeValuesInAscii) {
  const XMLBuilderPtr builder = TextElementBuilder("p", "e", {{"a", "ü<"}}, "łx語\xF0\x9F\x98\x80&");
  EXPECT_EQ(SerializeToXML(builder), "<p:e a=\"&#xFC;&lt;\">&#x142;x&#x8A9E;&#x1F600;&amp;</p:e>");
}

TEST(SerializeToXML, KeepsNamesAndCommentsOfAPreBuiltElementUnchanged) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML("<ü><!--ü-->ü</ü>", document);
  const Tarvel::Ref<Tarvel::Xml::ElementNode> root(document->GetDocumentElement());
  EXPECT_EQ(SerializeToXML(std::make_shared<const PreBuiltElementImpl>(root)), "<ü><!--ü-->&#xFC;</ü>");
}

/// Texts that an XML 1.0 document cannot contain, escaped or not.
const std::string NOT_ALLOWED_IN_XML[] = {
    std::string("a\0b", 3), "a\x01z",         "a\bz",   "a\x0bz", "a\x1fz",   "a\xef\xbf\xbez",
    "a\xef\xbf\xbfz",       "a\xed\xa0\x80z", "a\xffz", "a\xc3",  "\xc0\x80", "\xf4\x90\x80\x80"};

TEST(SerializeToXML, RefusesTextThatXmlCannotCarryAndDoesNotQuoteIt) {
  for (const std::string &text : NOT_ALLOWED_IN_XML) {
    const std::string secret = "s3cret-" + text + "-s3cret";
    try {
      SerializeToXML(TextElementBuilder("p", "e", secret));
      ADD_FAILURE() << "accepted " << testing::PrintToString(secret);
    } catch (const Tarvel::InvalidArgumentException &refusal) {
      EXPECT_EQ(std::string(refusal.what()).find("s3cret"), std::string::npos) << refusal.what();
      EXPECT_GT(std::string(refusal.what()).size(), std::string("Invalid argument : ").size());
    }
  }
}

TEST(SerializeToXML, RefusesAttributeValuesThatXmlCannotCarryAndDoesNotQuoteThem) {
  for (const std::string &text : NOT_ALLOWED_IN_XML) {
    const std::string secret = "s3cret-" + text + "-s3cret";
    try {
      SerializeToXML(ElementBuilder("p", "e", {{"a", secret}}));
      ADD_FAILURE() << "accepted " << testing::PrintToString(secret);
    } catch (const Tarvel::InvalidArgumentException &refusal) {
      EXPECT_EQ(std::string(refusal.what()).find("s3cret"), std::string::npos) << refusal.what();
    }
  }
}

} // namespace
} // namespace SsoClient
