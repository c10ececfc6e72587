// SPDX-License-Identifier: Apache-2.0

#include "nodes.h"
#include "support/xml_tree.h"

#include <gtest/gtest.h>

namespace Tarvel::Xml {
namespace {

using ::Testing::Lookup;
using ::Testing::MakeElement;
using ::Testing::ParseDocument;

TEST(LookupNamespace, FindsTheInnermostDeclarationInScope) {
  const auto document = ParseDocument("<a xmlns='urn:1' xmlns:p='urn:2'><b xmlns:p='urn:3'><c xmlns=''/></b></a>");
  const ElementNode &a = *document->GetDocumentElement();
  const ElementNode &b = *a.FindChildElement("b");
  const ElementNode &c = *b.FindChildElement("c");
  EXPECT_EQ(Lookup(a, ""), "bound to 'urn:1'");
  EXPECT_EQ(Lookup(b, ""), "bound to 'urn:1'");
  EXPECT_EQ(Lookup(c, ""), "bound to ''");
  EXPECT_EQ(Lookup(a, "p"), "bound to 'urn:2'");
  EXPECT_EQ(Lookup(c, "p"), "bound to 'urn:3'");
  EXPECT_EQ(Lookup(c, "q"), "unbound");
}

TEST(LookupNamespace, AlwaysKnowsXmlAndXmlnsAndTheEmptyDefault) {
  const Ref<ElementNode> element = MakeElement("a");
  EXPECT_EQ(Lookup(*element, "xml"), "bound to 'http://www.w3.org/XML/1998/namespace'");
  EXPECT_EQ(Lookup(*element, "xmlns"), "bound to 'http://www.w3.org/2000/xmlns/'");
  EXPECT_EQ(Lookup(*element, ""), "bound to ''");
}

TEST(LookupNamespace, DoesNotChangeTheResultForAnUnboundPrefix) {
  std::string_view uri = "untouched";
  EXPECT_FALSE(MakeElement("a")->LookupNamespace("p", uri));
  EXPECT_EQ(uri, "untouched");
}

TEST(LookupNamespace, TreatsAnEmptyDeclarationAsUnbinding) {
  const Ref<ElementNode> outer = MakeElement("a");
  const Ref<ElementNode> inner = MakeElement("b");
  outer->DefineAttribute("xmlns:p", "urn:p");
  inner->DefineAttribute("xmlns:p", "");
  outer->AppendChild(inner.get());
  EXPECT_EQ(Lookup(*outer, "p"), "bound to 'urn:p'");
  EXPECT_EQ(Lookup(*inner, "p"), "unbound");
}

TEST(LookupNamespace, SeesEachChangeOfTheDeclarations) {
  const Ref<ElementNode> outer = MakeElement("a");
  const Ref<ElementNode> inner = MakeElement("b", "p");
  EXPECT_EQ(inner->GetQName(), QName("", "b"));
  outer->AppendChild(inner.get());
  outer->DefineAttribute("xmlns:p", "urn:outer");
  EXPECT_EQ(inner->GetQName(), QName("urn:outer", "b"));
  inner->DefineAttribute("xmlns:p", "urn:inner");
  EXPECT_EQ(inner->GetQName(), QName("urn:inner", "b"));
}

TEST(HasQName, RequiresABoundPrefixAndBothTexts) {
  const auto document = ParseDocument("<p:a xmlns:p='urn:p'><q:b/><c/></p:a>");
  const ElementNode &a = *document->GetDocumentElement();
  EXPECT_TRUE(a.HasQName("urn:p", "a"));
  EXPECT_FALSE(a.HasQName("urn:p", "b"));
  EXPECT_FALSE(a.HasQName("urn:P", "a"));
  EXPECT_FALSE(a.HasQName("", "a"));
  EXPECT_FALSE(a.FindChildElement("b")->HasQName("", "b")) << "an unbound prefix has no namespace, not the empty one";
  EXPECT_TRUE(a.FindChildElement("c")->HasQName("", "c"));
}

} // namespace
} // namespace Tarvel::Xml
