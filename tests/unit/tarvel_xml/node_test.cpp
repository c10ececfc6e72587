// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/node.h>

#include "nodes.h"
#include "support/throws_message.h"
#include "support/xml_tree.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <string>
#include <type_traits>

namespace Tarvel::Xml {
namespace {

using ::Testing::DescribeTree;
using ::Testing::Lookup;
using ::Testing::MakeElement;
using ::Testing::MakeText;
using ::Testing::ParseDocument;
using ::Testing::WriteElement;
using namespace std::string_literals;

static_assert(std::is_trivially_destructible_v<Attribute>);
static_assert(!std::is_copy_constructible_v<ElementNode> && !std::is_default_constructible_v<ElementNode>);

TEST(CreateElementNode, MakesAnEmptyElement) {
  const Ref<ElementNode> element = MakeElement("Body", "soapenv");
  EXPECT_EQ(element->GetName(), "soapenv:Body");
  EXPECT_EQ(element->GetPrefix(), "soapenv");
  EXPECT_EQ(element->GetLocalName(), "Body");
  EXPECT_EQ(element->GetKind(), NodeKind::ELEMENT);
  EXPECT_EQ(element->GetParent(), nullptr);
  EXPECT_EQ(element->GetFirstChild(), nullptr);
  EXPECT_EQ(element->GetNextSibling(), nullptr);
  EXPECT_EQ(element->GetFirstAttribute(), nullptr);
  EXPECT_EQ(element->GetRoot(), element.get());
  EXPECT_EQ(element->GetLine(), 0u);
  EXPECT_EQ(element->GetColumn(), 0u);
}

TEST(CreateElementNode, MakesAnElementWithoutAPrefix) {
  const Ref<ElementNode> element = MakeElement("a");
  EXPECT_EQ(element->GetName(), "a");
  EXPECT_EQ(element->GetPrefix(), "");
  EXPECT_EQ(element->GetLocalName(), "a");
}

TEST(CreateElementNode, RefusesAnInvalidName) {
  Ref<ElementNode> element = MakeElement("kept");
  for (const std::string name :
       {"", "a:b", ":", "1a", "-a", ".a", "a b", "a<", "a\n", "\xC3\x97", "\xCC\x80", "\xFF", "a\xC3"}) {
    EXPECT_THROWS_MESSAGE(CreateElementNode("", name, element), InvalidArgumentException,
                          "Invalid argument : the local name '" + name + "' is not an XML name without a colon");
    if (!name.empty()) {
      EXPECT_THROWS_MESSAGE(CreateElementNode(name, "a", element), InvalidArgumentException,
                            "Invalid argument : the prefix '" + name + "' is not an XML name without a colon");
    }
  }
  EXPECT_EQ(element->GetName(), "kept");
}

TEST(CreateElementNode, AcceptsEveryKindOfNameCharacter) {
  for (const char *const name :
       {"_", "a-b.c_d1", "\xC3\x80", "a\xC2\xB7", "a\xCC\x80", "\xE4\xB8\x80", "\xF0\x90\x80\x80", "A\xE2\x80\xBF"}) {
    EXPECT_EQ(MakeElement(name)->GetLocalName(), name);
  }
}

TEST(CreateTextNode, MakesAnEmptyTextThatAcceptsValues) {
  Ref<TextNode> text;
  CreateTextNode(text);
  EXPECT_EQ(text->GetValue(), "");
  EXPECT_EQ(text->GetParent(), nullptr);
  for (const std::string &value : {"short"s, std::string(100'000, 'x'), "<&>\r\n\t\xF0\x9F\x98\x80"s, ""s}) {
    text->SetValue(value);
    EXPECT_TRUE(text->GetValue() == value);
  }
}

TEST(SetValue, ReportsTheByteOfAForbiddenCharacterAtEveryPosition) {
  Ref<TextNode> text;
  CreateTextNode(text);
  for (std::size_t before = 0; before < 20; ++before) {
    const std::string byte = std::to_string(before + 1);
    EXPECT_THROWS_MESSAGE(
        text->SetValue(std::string(before, ' ') + "\x1F" + std::string(20 - before, '\x7F')), InvalidArgumentException,
        "Invalid argument : the text holds the character U+001F at byte " + byte + ", which XML 1.0 cannot carry");
    EXPECT_THROWS_MESSAGE(text->SetValue(std::string(before, '!') + "\x80" + std::string(20 - before, 'x')),
                          InvalidArgumentException, "Invalid argument : the text is not UTF-8 at byte " + byte);
  }
}

struct Forbidden {
  std::string value;
  std::string message; // what follows "the text" or "the value of the attribute ..."
};

const Forbidden FORBIDDEN[] = {
    {"ab\x01", "holds the character U+0001 at byte 3, which XML 1.0 cannot carry"},
    {"\0"s, "holds the character U+0000 at byte 1, which XML 1.0 cannot carry"},
    {"\x1F", "holds the character U+001F at byte 1, which XML 1.0 cannot carry"},
    {"\xC3\xA4\xEF\xBF\xBE", "holds the character U+FFFE at byte 3, which XML 1.0 cannot carry"},
    {"\xEF\xBF\xBF", "holds the character U+FFFF at byte 1, which XML 1.0 cannot carry"},
    {"ab\xFF", "is not UTF-8 at byte 3"},
    {"\xED\xA0\x80", "is not UTF-8 at byte 1"},
    {"\xC3", "is not UTF-8 at byte 1"},
};

TEST(SetValue, RefusesWhatXmlCannotCarryAndKeepsTheValue) {
  const Ref<TextNode> text = MakeText("kept");
  for (const Forbidden &forbidden : FORBIDDEN) {
    EXPECT_THROWS_MESSAGE(text->SetValue(forbidden.value), InvalidArgumentException,
                          "Invalid argument : the text " + forbidden.message);
  }
  EXPECT_EQ(text->GetValue(), "kept");
}

TEST(DefineAttribute, RefusesWhatXmlCannotCarryAndKeepsTheElement) {
  const Ref<ElementNode> element = MakeElement("a");
  for (const Forbidden &forbidden : FORBIDDEN) {
    EXPECT_THROWS_MESSAGE(element->DefineAttribute("p:x", forbidden.value), InvalidArgumentException,
                          "Invalid argument : the value of the attribute 'p:x' " + forbidden.message);
  }
  EXPECT_EQ(element->GetFirstAttribute(), nullptr);
}

TEST(DefineAttribute, RefusesAnInvalidQualifiedName) {
  const Ref<ElementNode> element = MakeElement("a");
  for (const std::string name : {"", ":", "a:", ":a", "a:b:c", "1", "a:1", "a b", "a=", "\xFF"}) {
    EXPECT_THROWS_MESSAGE(element->DefineAttribute(name, ""), InvalidArgumentException,
                          "Invalid argument : the attribute name '" + name + "' is not a qualified XML name");
  }
}

TEST(DefineAttribute, KeepsTheOrderAndThePlaceOfARedefinedAttribute) {
  const Ref<ElementNode> element = MakeElement("a");
  element->DefineAttribute("x", "1");
  element->DefineAttribute("p:y", "2");
  element->DefineAttribute("xmlns:p", "urn:p");
  element->DefineAttribute("x", "changed");
  EXPECT_EQ(WriteElement(*element), "<a x=\"changed\" p:y=\"2\" xmlns:p=\"urn:p\"></a>");
}

TEST(DefineAttribute, CopiesNameAndValue) {
  const Ref<ElementNode> element = MakeElement("a");
  std::string name = "name";
  std::string value = "value";
  element->DefineAttribute(name, value);
  name[0] = value[0] = 'X';
  EXPECT_EQ(WriteElement(*element), "<a name=\"value\"></a>");
}

TEST(DefineAttribute, AddsToAParsedElement) {
  const auto document = ParseDocument("<a x='1'/>");
  document->GetDocumentElement()->DefineAttribute("xmlns:p", "urn:p");
  document->GetDocumentElement()->DefineAttribute("x", "2");
  EXPECT_EQ(WriteElement(*document->GetDocumentElement()), "<a x=\"2\" xmlns:p=\"urn:p\"></a>");
  EXPECT_EQ(Lookup(*document->GetDocumentElement(), "p"), "bound to 'urn:p'");
}

TEST(Attribute, ReportsItsPartsAndWhetherItDeclaresANamespace) {
  const auto document = ParseDocument("<a x='1' p:y='2' xmlns='urn:d' xmlns:p='urn:p' xmlnsx='3' p:xmlns='4'/>");
  std::string seen;
  for (const Attribute *attribute = document->GetDocumentElement()->GetFirstAttribute(); attribute;
       attribute = attribute->GetNext()) {
    seen += std::string(attribute->GetPrefix()) + "|" + std::string(attribute->GetLocalName()) +
            (attribute->IsNamespaceDeclaration() ? " declares; " : "; ");
  }
  EXPECT_EQ(seen, "|x; p|y; |xmlns declares; xmlns|p declares; |xmlnsx; p|xmlns; ");
}

TEST(FindAttribute, FindsOnlyAttributesWithoutAPrefixForTheEmptyNamespace) {
  const auto document = ParseDocument("<a xmlns='urn:p' xmlns:p='urn:p' xmlns:q='urn:p' r:x='0' p:x='1' x='2'/>");
  const ElementNode &a = *document->GetDocumentElement();
  std::string_view value = "untouched";
  EXPECT_TRUE(a.GetAttribute(QName("", "x"), value));
  EXPECT_EQ(value, "2");
  EXPECT_TRUE(a.GetAttribute(QName("urn:p", "x"), value));
  EXPECT_EQ(value, "1");
  EXPECT_FALSE(a.GetAttribute(QName("urn:p", "y"), value));
  EXPECT_FALSE(a.GetAttribute(QName("urn:q", "x"), value));
  EXPECT_EQ(value, "1");
}

TEST(FindAttribute, FindsNoNamespaceDeclarations) {
  const auto document = ParseDocument("<a xmlns='urn:d' xmlns:p='urn:p'/>");
  const ElementNode &a = *document->GetDocumentElement();
  EXPECT_EQ(a.FindAttribute("", "xmlns"), nullptr);
  EXPECT_EQ(a.FindAttribute("http://www.w3.org/2000/xmlns/", "p"), nullptr);
}

TEST(FindAttribute, FindsAttributesOfTheXmlNamespace) {
  const auto document = ParseDocument("<a xml:id='i'/>");
  const Attribute *const found =
      document->GetDocumentElement()->FindAttribute("http://www.w3.org/XML/1998/namespace", "id");
  ASSERT_NE(found, nullptr);
  EXPECT_EQ(found->GetValue(), "i");
}

TEST(FindChildElement, FindsTheFirstOfThatNameAmongTheChildrenOnly) {
  const auto document = ParseDocument("<a xmlns:p='urn:p'>t<c><p:b n='0'/></c><b n='1'/><p:b n='2'/><p:b n='3'/></a>");
  ElementNode &a = *document->GetDocumentElement();
  const auto number = [](const ElementNode *element) {
    return element ? std::string(element->FindAttribute("", "n")->GetValue()) : "none";
  };
  EXPECT_EQ(number(a.FindChildElement("b")), "1");
  EXPECT_EQ(number(a.FindChildElement(QName("", "b"))), "1");
  EXPECT_EQ(number(a.FindChildElement(QName("urn:p", "b"))), "2");
  EXPECT_EQ(number(a.FindChildElement(QName("urn:q", "b"))), "none");
  EXPECT_EQ(number(a.FindChildElement("d")), "none");
}

TEST(AppendChild, AppendsElementsAndTextInOrder) {
  const Ref<ElementNode> a = MakeElement("a");
  a->AppendChild(MakeElement("b").get());
  a->AppendChild(MakeText("one").get());
  a->AppendChild(MakeElement("c").get());
  EXPECT_EQ(WriteElement(*a), "<a><b></b>one<c></c></a>");
  EXPECT_EQ(a->FindChildElement("c")->GetParent(), a.get());
  EXPECT_EQ(a->FindChildElement("c")->GetRoot(), a.get());
}

TEST(AppendElement, MakesTheLastChild) {
  const Ref<ElementNode> a = MakeElement("a");
  a->AppendChild(MakeElement("b").get());
  ElementNode *const c = a->AppendElement("p", "c");
  EXPECT_EQ(c->GetName(), "p:c");
  EXPECT_EQ(c->GetPrefix(), "p");
  EXPECT_EQ(c->GetParent(), a.get());
  c->DefineAttribute("x", "1");
  c->AppendElement("", std::string(3000, 'd'))->AppendText("text");
  EXPECT_EQ(WriteElement(*a),
            "<a><b></b><p:c x=\"1\"><" + std::string(3000, 'd') + ">text</" + std::string(3000, 'd') + "></p:c></a>");
}

TEST(AppendElement, RefusesAnInvalidNameAndKeepsTheElement) {
  const Ref<ElementNode> a = MakeElement("a");
  EXPECT_THROWS_MESSAGE(a->AppendElement("", "b:c"), InvalidArgumentException,
                        "Invalid argument : the local name 'b:c' is not an XML name without a colon");
  EXPECT_THROWS_MESSAGE(a->AppendElement("1", "b"), InvalidArgumentException,
                        "Invalid argument : the prefix '1' is not an XML name without a colon");
  EXPECT_EQ(a->GetFirstChild(), nullptr);
}

TEST(AppendElement, MakesAChildThatKeepsItsTreeAlive) {
  Ref<ElementNode> a = MakeElement("a");
  const Ref<ElementNode> b(a->AppendElement("", "b"));
  a.reset();
  EXPECT_EQ(WriteElement(*static_cast<const ElementNode *>(b->GetParent())), "<a><b></b></a>");
}

TEST(AppendText, AppendsTextsInOrder) {
  const Ref<ElementNode> a = MakeElement("a");
  a->AppendText("one");
  a->AppendElement("", "b");
  a->AppendText("");
  a->AppendText("two");
  EXPECT_EQ(WriteElement(*a), "<a>one<b></b>two</a>");
}

TEST(AppendText, RefusesWhatXmlCannotCarryAndKeepsTheElement) {
  const Ref<ElementNode> a = MakeElement("a");
  for (const Forbidden &forbidden : FORBIDDEN) {
    EXPECT_THROWS_MESSAGE(a->AppendText(forbidden.value), InvalidArgumentException,
                          "Invalid argument : the text " + forbidden.message);
  }
  EXPECT_EQ(a->GetFirstChild(), nullptr);
}

TEST(AppendChild, RefusesNullDocumentsAndCycles) {
  const auto document = ParseDocument("<a><b><c/></b></a>");
  ElementNode &a = *document->GetDocumentElement();
  ElementNode &c = *a.FindChildElement("b")->FindChildElement("c");
  EXPECT_THROWS_MESSAGE(a.AppendChild(nullptr), InvalidArgumentException, "Invalid argument : the child is null");
  EXPECT_THROWS_MESSAGE(MakeElement("x")->AppendChild(a.GetParent()), InvalidArgumentException,
                        "Invalid argument : a document cannot be a child");
  for (ElementNode *const child : {&a, a.FindChildElement("b"), &c}) {
    EXPECT_THROWS_MESSAGE(c.AppendChild(child), InvalidArgumentException,
                          "Invalid argument : an element cannot be a child of itself or of a node below it");
  }
}

TEST(AppendChild, RefusesCyclesOfNodesThatWereMadeSeparately) {
  const Ref<ElementNode> a = MakeElement("a");
  const Ref<ElementNode> b = MakeElement("b");
  const Ref<ElementNode> c = MakeElement("c");
  b->AppendChild(c.get());
  a->AppendChild(b.get());
  EXPECT_THROWS_MESSAGE(c->AppendChild(a.get()), InvalidArgumentException,
                        "Invalid argument : an element cannot be a child of itself or of a node below it");
  EXPECT_THROWS_MESSAGE(a->AppendChild(a.get()), InvalidArgumentException,
                        "Invalid argument : an element cannot be a child of itself or of a node below it");
}

TEST(AppendChild, RefusesTheChildOfAnotherElement) {
  const Ref<ElementNode> a = MakeElement("a");
  const Ref<ElementNode> b = MakeElement("b");
  a->AppendChild(b.get());
  EXPECT_THROWS_MESSAGE(a->AppendChild(b.get()), InvalidStateException, "the node already is the child of an element");
  EXPECT_THROWS_MESSAGE(MakeElement("c")->AppendChild(b.get()), InvalidStateException,
                        "the node already is the child of an element");
  EXPECT_EQ(WriteElement(*a), "<a><b></b></a>");
}

TEST(AppendChild, RemovesADocumentElementFromItsDocument) {
  const Ref<ElementNode> envelope = MakeElement("envelope");
  const auto document = ParseDocument("<!--before--><a><b/></a><!--after-->");
  envelope->AppendChild(document->GetDocumentElement());
  EXPECT_EQ(document->GetDocumentElement(), nullptr);
  EXPECT_EQ(DescribeTree(*document->GetDocumentNode()), " comment=6:before comment=5:after");
  EXPECT_EQ(WriteElement(*envelope), "<envelope><a><b></b></a></envelope>");
  EXPECT_EQ(envelope->FindChildElement("a")->GetNextSibling(), nullptr);
}

TEST(AppendChild, RemovesTheLastNodeFromItsDocument) {
  const auto document = ParseDocument("<a/><!--after-->");
  ElementNode *const a = document->GetDocumentElement();
  a->AppendChild(a->GetNextSibling());
  EXPECT_EQ(DescribeTree(*document->GetDocumentNode()), "(1:a comment=5:after)");
  const Ref<ElementNode> b = MakeElement("b");
  b->AppendChild(a);
  EXPECT_EQ(DescribeTree(*document->GetDocumentNode()), "");
  EXPECT_EQ(DescribeTree(*b), "(1:b(1:a comment=5:after))");
}

TEST(CheckedDowncasts, ReturnNullForNullAndForOtherKinds) {
  const auto document = ParseDocument("<a>text</a>");
  const Node *const element = document->GetDocumentElement();
  const Node *const text = element->GetFirstChild();
  const Node *const none = nullptr;
  EXPECT_EQ(AsElement(element), element);
  EXPECT_EQ(AsElement(text), nullptr);
  EXPECT_EQ(AsElement(none), nullptr);
  EXPECT_EQ(AsText(text), text);
  EXPECT_EQ(AsText(element), nullptr);
  EXPECT_EQ(AsText(none), nullptr);
}

} // namespace
} // namespace Tarvel::Xml
