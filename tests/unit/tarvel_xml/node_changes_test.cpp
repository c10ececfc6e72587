// SPDX-License-Identifier: Apache-2.0
// Children at the beginning of an element, and children and attributes that are removed again.

#include "nodes.h"
#include "support/throws_message.h"
#include "support/xml_tree.h"

#include <tarvel/core/exception.h>
#include <tarvel/xml/node.h>

#include <gtest/gtest.h>

namespace Tarvel::Xml {
namespace {

using ::Testing::DescribeTree;
using ::Testing::Lookup;
using ::Testing::MakeElement;
using ::Testing::MakeText;
using ::Testing::ParseDocument;
using ::Testing::WriteElement;

TEST(PrependChild, MakesTheFirstChild) {
  const Ref<ElementNode> a = MakeElement("a");
  a->PrependChild(MakeElement("d").get());
  a->PrependChild(MakeText("c").get());
  a->PrependChild(MakeElement("b").get());
  EXPECT_EQ(WriteElement(*a), "<a><b></b>c<d></d></a>");
  EXPECT_EQ(a->FindChildElement("b")->GetParent(), a.get());
}

TEST(PrependChild, KeepsTheLastChildWhereTheNextOneIsAppended) {
  const Ref<ElementNode> a = MakeElement("a");
  a->PrependChild(MakeElement("b").get());
  a->AppendElement("", "c");
  a->PrependChild(MakeElement("d").get());
  a->AppendElement("", "e");
  EXPECT_EQ(WriteElement(*a), "<a><d></d><b></b><c></c><e></e></a>");
}

TEST(PrependChild, KeepsTheTreeOfTheChildAlive) {
  const Ref<ElementNode> a = MakeElement("a");
  {
    const Ref<ElementNode> b = MakeElement("b");
    b->AppendText("text of the tree that was added");
    a->PrependChild(b.get());
  }
  EXPECT_EQ(WriteElement(*a), "<a><b>text of the tree that was added</b></a>");
}

TEST(PrependChild, RemovesADocumentElementFromItsDocument) {
  const Ref<ElementNode> envelope = MakeElement("envelope");
  const auto document = ParseDocument("<!--before--><a><b/></a><!--after-->");
  envelope->PrependChild(document->GetDocumentElement());
  EXPECT_EQ(document->GetDocumentElement(), nullptr);
  EXPECT_EQ(DescribeTree(*document->GetDocumentNode()), " comment=6:before comment=5:after");
  EXPECT_EQ(WriteElement(*envelope), "<envelope><a><b></b></a></envelope>");
}

TEST(PrependChild, RefusesWhatCannotBeAChild) {
  const auto document = ParseDocument("<a><b/></a>");
  ElementNode &a = *document->GetDocumentElement();
  EXPECT_THROWS_MESSAGE(a.PrependChild(nullptr), InvalidArgumentException, "Invalid argument : the child is null");
  EXPECT_THROWS_MESSAGE(MakeElement("x")->PrependChild(a.GetParent()), InvalidArgumentException,
                        "Invalid argument : a document cannot be a child");
  EXPECT_THROWS_MESSAGE(a.FindChildElement("b")->PrependChild(&a), InvalidArgumentException,
                        "Invalid argument : an element cannot be a child of itself or of a node below it");
  EXPECT_THROWS_MESSAGE(MakeElement("x")->PrependChild(a.FindChildElement("b")), InvalidStateException,
                        "the node already is the child of an element");
  EXPECT_EQ(WriteElement(a), "<a><b></b></a>");
}

TEST(RemoveChild, RemovesTheFirstTheMiddleAndTheLastChild) {
  const auto document = ParseDocument("<a><b/><c/><d/><e/></a>");
  ElementNode &a = *document->GetDocumentElement();
  for (const char *const name : {"c", "b", "e"}) {
    EXPECT_TRUE(a.RemoveChild(a.FindChildElement(name)));
  }
  EXPECT_EQ(WriteElement(a), "<a><d></d></a>");
  a.AppendElement("", "f");
  EXPECT_EQ(WriteElement(a), "<a><d></d><f></f></a>");
}

TEST(RemoveChild, LeavesAnEmptyElementThatAcceptsChildren) {
  const Ref<ElementNode> a = MakeElement("a");
  ElementNode *const b = a->AppendElement("", "b");
  EXPECT_TRUE(a->RemoveChild(b));
  EXPECT_EQ(a->GetFirstChild(), nullptr);
  EXPECT_EQ(b->GetParent(), nullptr);
  a->PrependChild(b);
  a->AppendElement("", "c");
  EXPECT_EQ(WriteElement(*a), "<a><b></b><c></c></a>");
}

TEST(RemoveChild, ChangesNothingWhenTheNodeIsNotAChildOfTheElement) {
  const auto document = ParseDocument("<a><b><c/></b></a>");
  ElementNode &a = *document->GetDocumentElement();
  EXPECT_FALSE(a.RemoveChild(nullptr));
  EXPECT_FALSE(a.RemoveChild(a.FindChildElement("b")->FindChildElement("c")));
  EXPECT_FALSE(a.RemoveChild(&a));
  EXPECT_EQ(WriteElement(a), "<a><b><c></c></b></a>");
}

TEST(RemoveAttribute, RemovesTheFirstTheMiddleAndTheLast) {
  for (const char *const name : {"x", "y", "z"}) {
    const auto document = ParseDocument("<a x=\"1\" y=\"2\" z=\"3\"/>");
    ElementNode &a = *document->GetDocumentElement();
    EXPECT_TRUE(a.RemoveAttribute(name));
    EXPECT_EQ(a.FindAttribute("", name), nullptr);
    a.DefineAttribute("w", "4");
    std::string names;
    for (const Attribute *attribute = a.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
      names += attribute->GetName();
    }
    std::string wanted = "xyzw";
    wanted.erase(wanted.find(name), 1);
    EXPECT_EQ(names, wanted);
  }
}

TEST(RemoveAttribute, UnbindsThePrefixOfADeclaration) {
  for (const char *const prefix : {"p", "q", "r"}) {
    const auto document = ParseDocument("<a xmlns:p=\"urn:p\" x=\"1\" xmlns:q=\"urn:q\" xmlns:r=\"urn:r\"/>");
    ElementNode &a = *document->GetDocumentElement();
    EXPECT_TRUE(a.RemoveAttribute(std::string("xmlns:") + prefix));
    for (const std::string other : {"p", "q", "r"}) {
      EXPECT_EQ(Lookup(a, other), other == prefix ? "unbound" : "bound to 'urn:" + other + "'");
    }
    a.DefineAttribute("xmlns:s", "urn:s");
    EXPECT_EQ(Lookup(a, "s"), "bound to 'urn:s'");
    EXPECT_NE(a.FindAttribute("", "x"), nullptr);
  }
}

TEST(RemoveAttribute, ComparesTheNameAsWritten) {
  const auto document = ParseDocument("<a xmlns:p=\"urn:p\" p:x=\"1\"/>");
  ElementNode &a = *document->GetDocumentElement();
  EXPECT_FALSE(a.RemoveAttribute("x"));
  EXPECT_FALSE(a.RemoveAttribute(""));
  EXPECT_EQ(WriteElement(a), "<a xmlns:p=\"urn:p\" p:x=\"1\"></a>");
  EXPECT_TRUE(a.RemoveAttribute("p:x"));
  EXPECT_EQ(WriteElement(a), "<a xmlns:p=\"urn:p\"></a>");
}

} // namespace
} // namespace Tarvel::Xml
