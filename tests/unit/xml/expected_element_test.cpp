// SPDX-License-Identifier: Apache-2.0

#include "xml/expected_element.h"

#include "support/parsed_document.h"
#include "support/recorded_deviations.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

using Take = NodeFilterIterator (*)(NodeFilterIterator &, std::string_view, std::string_view, DeviationSink &);

std::string NameAt(const NodeFilterIterator &iterator) {
  const Tarvel::Xml::ElementNode *const element = IteratorToElement(iterator);
  return element ? std::string(element->GetName()) : iterator.node ? "another node" : "the end";
}

/// The result of taking an element `x:e`.
struct Taken {
  std::string element;              ///< the name of the element that was taken
  std::string next;                 ///< where the cursor is afterwards
  std::vector<std::string> refused; ///< what was found at each node that was refused

  friend bool operator==(const Taken &, const Taken &) = default;
  friend std::ostream &operator<<(std::ostream &out, const Taken &taken) {
    out << "took " << taken.element << ", next is " << taken.next << ", refused:";
    for (const std::string &found : taken.refused) {
      out << " [" << found << "]";
    }
    return out;
  }
};

/// Takes `x:e` from the children of an element, starting at the child with this index.
Taken TakeFrom(Take take, const std::string &children, int start) {
  const ParsedDocument document("<x:r xmlns:x='urn:x' xmlns:y='urn:y'>" + children + "</x:r>");
  Taken result;
  DeviationsOf([&](DeviationSink &sink) {
    NodeFilterIterator iterator = document.Cursor().GetChild();
    for (int i = 0; i < start; ++i) {
      iterator.MoveToSibling();
    }
    const NodeFilterIterator taken = take(iterator, "e", "urn:x", sink);
    if (auto *const recorded = dynamic_cast<RecordedDeviations *>(&sink)) {
      result = {NameAt(taken), NameAt(iterator), {}};
      for (const Deviation &deviation : recorded->all) {
        result.refused.push_back(deviation.found);
      }
    }
  });
  return result;
}

Taken TakeFirst(const std::string &children) {
  return TakeFrom(TakeElement, children, 0);
}

TEST(TakeElement, TakesTheElementAtTheCursor) {
  EXPECT_EQ((Taken{"x:e", "x:f", {}}), TakeFirst(" <!-- note --><x:e/><x:f/>"));
  EXPECT_EQ((Taken{"x:e", "the end", {}}), TakeFirst("<x:e/>"));
}

TEST(TakeElement, SkipsToTheElementAndRefusesEachNodeBefore) {
  EXPECT_EQ((Taken{"x:e", "x:h", {"element x:f", "text", "element x:g"}}),
            TakeFirst("<x:f/>text<x:g/><!-- note --><x:e/><x:h/>"));
}

TEST(TakeElement, StaysWhenThereIsNoSuchElement) {
  EXPECT_EQ((Taken{"the end", "x:f", {"element x:f"}}), TakeFirst("<x:f/><x:g/>"));
  EXPECT_EQ((Taken{"the end", "the end", {""}}), TakeFirst(""));
}

TEST(TakeElement, TakesAnElementOfTheLocalNameInAnotherNamespace) {
  EXPECT_EQ((Taken{"y:e", "x:f", {"element {urn:y}e"}}), TakeFirst("<y:e/><x:f/>"));
  EXPECT_EQ((Taken{"y:e", "the end", {"element x:f", "element {urn:y}e"}}), TakeFirst("<x:f/><y:e/>"));
  EXPECT_EQ((Taken{"y:e", "e", {"element x:f", "element {urn:y}e"}}), TakeFirst("<x:f/><y:e/><e/>"));
}

TEST(TakeElement, PrefersTheElementInTheRightNamespace) {
  EXPECT_EQ((Taken{"x:e", "the end", {"element {urn:y}e", "element x:f"}}), TakeFirst("<y:e/><x:f/><x:e/>"));
}

TEST(TakeElement, TakesTheFirstOfSeveral) {
  EXPECT_EQ((Taken{"x:e", "x:e", {"element x:f"}}), TakeFirst("<x:f/><x:e/><x:e/>"));
}

TEST(TakeElement, TakesAnElementThatWasSkippedAndStays) {
  EXPECT_EQ((Taken{"x:e", "x:g", {"element x:g"}}), TakeFrom(TakeElement, "<x:e/><x:f/><x:g/>", 2));
  EXPECT_EQ((Taken{"x:e", "the end", {""}}), TakeFrom(TakeElement, "<x:e/>", 1));
}

TEST(TakeElement, DoesNotLeaveTheListOfSiblings) {
  const ParsedDocument document("<x:r xmlns:x='urn:x'><x:e/></x:r>");
  NodeFilterIterator root = document.Cursor();
  RecordedDeviations sink;
  EXPECT_EQ("the end", NameAt(TakeElement(root, "e", "urn:x", sink)));
  EXPECT_EQ("x:r", NameAt(root));
}

TEST(TakeListElement, TakesTheElementAtTheCursor) {
  EXPECT_EQ((Taken{"x:e", "x:e", {}}), TakeFrom(TakeListElement, "<x:e/><x:e/>", 0));
}

TEST(TakeListElement, SkipsOneNodeThatIsNotTheElement) {
  EXPECT_EQ((Taken{"the end", "x:g", {"element x:f"}}), TakeFrom(TakeListElement, "<x:f/><x:g/><x:e/>", 0));
  EXPECT_EQ((Taken{"the end", "x:e", {"text"}}), TakeFrom(TakeListElement, "text<x:e/>", 0));
}

TEST(TakeListElement, TakesAnElementOfTheLocalNameInAnotherNamespace) {
  EXPECT_EQ((Taken{"y:e", "x:e", {"element {urn:y}e"}}), TakeFrom(TakeListElement, "<y:e/><x:e/>", 0));
}

TEST(TakeListElement, RefusesAnEmptyList) {
  EXPECT_EQ((Taken{"the end", "the end", {""}}), TakeFrom(TakeListElement, "", 0));
}

} // namespace
