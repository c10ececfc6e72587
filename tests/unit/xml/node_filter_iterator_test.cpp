// SPDX-License-Identifier: Apache-2.0

#include "xml/node_filter_iterator.h"

#include "support/parsed_document.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Tarvel::Xml::ElementNode;
using Testing::ParsedDocument;

TEST(MoveToChild, SkipsWhiteSpaceAndComments) {
  const ParsedDocument document("<r>  \n<!-- note --><e/></r>");
  NodeFilterIterator iterator = document.Cursor();
  ASSERT_NE(nullptr, IteratorToElement(iterator.MoveToChild()));
  EXPECT_EQ("e", IteratorToElement(iterator)->GetName());
}

TEST(MoveToChild, StopsAtTextWithAnythingButWhiteSpace) {
  const ParsedDocument document("<r>\t x<e/></r>");
  NodeFilterIterator iterator = document.Cursor();
  iterator.MoveToChild();
  ASSERT_NE(nullptr, Tarvel::Xml::AsText(iterator.node));
  EXPECT_EQ("\t x", Tarvel::Xml::AsText(iterator.node)->GetValue());
  EXPECT_EQ(nullptr, IteratorToElement(iterator));
}

TEST(MoveToChild, HidesOnlyTheFourWhiteSpaceCharactersOfXml) {
  const ParsedDocument hidden("<r>\t\n&#13; </r>");
  EXPECT_EQ(nullptr, hidden.Cursor().MoveToChild().node);
  const ParsedDocument noBreakSpace("<r>\u00a0</r>");
  EXPECT_NE(nullptr, noBreakSpace.Cursor().MoveToChild().node);
}

TEST(MoveToChild, StopsAtCharacterData) {
  const ParsedDocument document("<r><![CDATA[x]]></r>");
  EXPECT_NE(nullptr, Tarvel::Xml::AsText(document.Cursor().MoveToChild().node));
}

TEST(MoveToChild, StopsAtProcessingInstruction) {
  const ParsedDocument document("<r><?pi data?><e/></r>");
  NodeFilterIterator iterator = document.Cursor();
  iterator.MoveToChild();
  ASSERT_NE(nullptr, iterator.node);
  EXPECT_EQ(Tarvel::Xml::NodeKind::PROCESSING_INSTRUCTION, iterator.node->GetKind());
  EXPECT_EQ(nullptr, IteratorToElement(iterator));
}

TEST(MoveToChild, MovesPastTheEndWhenThereAreNoChildren) {
  const ParsedDocument document("<r/>");
  NodeFilterIterator iterator = document.Cursor();
  EXPECT_EQ(nullptr, iterator.MoveToChild().node);
  EXPECT_EQ(nullptr, iterator.MoveToChild().node);
}

TEST(MoveToChild, MovesPastTheEndWhenAllChildrenAreHidden) {
  const ParsedDocument document("<r> <!-- a --> <!-- b --> </r>");
  EXPECT_EQ(nullptr, document.Cursor().MoveToChild().node);
}

TEST(MoveToSibling, SkipsWhiteSpaceAndComments) {
  const ParsedDocument document("<r><a/> <!-- note --> <b/></r>");
  NodeFilterIterator iterator = document.Cursor().GetChild();
  iterator.MoveToSibling();
  ASSERT_NE(nullptr, IteratorToElement(iterator));
  EXPECT_EQ("b", IteratorToElement(iterator)->GetName());
}

TEST(MoveToSibling, MovesPastTheEndAfterTheLastVisibleNode) {
  const ParsedDocument document("<r><a/> <!-- note --> </r>");
  NodeFilterIterator iterator = document.Cursor().GetChild();
  EXPECT_EQ(nullptr, iterator.MoveToSibling().node);
  EXPECT_EQ(nullptr, IteratorToElement(iterator));
  EXPECT_EQ(nullptr, iterator.MoveToSibling().node);
}

TEST(GetChild, DoesNotMoveTheIterator) {
  const ParsedDocument document("<r><a/></r>");
  const NodeFilterIterator iterator = document.Cursor();
  EXPECT_EQ("a", IteratorToElement(iterator.GetChild())->GetName());
  EXPECT_EQ(&document.Root(), iterator.node);
}

TEST(NodeFilterIterator, CopiesMoveIndependentlyAndShareTheFilter) {
  const ParsedDocument document("<r><a/><b/></r>");
  NodeFilterIterator original = document.Cursor().GetChild();
  NodeFilterIterator copy = original;
  copy.MoveToSibling();
  EXPECT_EQ("a", IteratorToElement(original)->GetName());
  EXPECT_EQ("b", IteratorToElement(copy)->GetName());
  EXPECT_EQ(original.filter, copy.filter);
  original = copy;
  EXPECT_EQ("b", IteratorToElement(original)->GetName());
}

TEST(NodeFilterIterator, StartsAtItsFirstNodeEvenIfTheFilterHidesIt) {
  const ParsedDocument document("<r> </r>");
  const NodeFilterIterator iterator = ParsedDocument::CursorOn(*document.Root().GetFirstChild());
  EXPECT_EQ(document.Root().GetFirstChild(), iterator.node);
}

TEST(NodeFilterIterator, HasTheParentAlsoPastTheEnd) {
  const ParsedDocument document("<r><e/></r>");
  NodeFilterIterator iterator = document.Cursor();
  EXPECT_EQ(document.Root().GetParent(), iterator.parent);
  iterator.MoveToChild();
  EXPECT_EQ(&document.Root(), iterator.parent);
  EXPECT_EQ(&document.Child("e"), iterator.GetChild().parent);
  iterator.MoveToSibling();
  EXPECT_EQ(nullptr, iterator.node);
  EXPECT_EQ(&document.Root(), iterator.parent);
}

} // namespace
