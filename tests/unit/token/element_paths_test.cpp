// SPDX-License-Identifier: Apache-2.0

#include "token/element_paths.h"

#include "support/parsed_document.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using SsoClient::ElementPaths;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;
using Testing::ParsedDocument;

/// The path of the last element in the document.
std::string PathOfLast(const std::string &text) {
  const ParsedDocument document(text);
  const ElementNode *last = nullptr;
  for (const ElementNode *element = &document.Root(); element;) {
    last = element;
    element = nullptr;
    for (const auto *child = last->GetFirstChild(); child; child = child->GetNextSibling()) {
      element = AsElement(child) ? AsElement(child) : element;
    }
  }
  return ElementPaths().Of(*last);
}

std::string Repeat(const std::string &text, std::size_t count) {
  std::string all;
  for (std::size_t index = 0; index < count; ++index) {
    all += text;
  }
  return all;
}

TEST(ElementPaths, HaveTheNamesAsTheyAreWritten) {
  EXPECT_EQ("/a", PathOfLast("<a/>"));
  EXPECT_EQ("/p:a/q:b/c", PathOfLast("<p:a><q:b><c/></q:b></p:a>"));
}

TEST(ElementPaths, CountElementsOfTheSameName) {
  EXPECT_EQ("/a/b", PathOfLast("<a><c/><p:b/>text<!-- b --><b/></a>"));
  EXPECT_EQ("/a/b[2]", PathOfLast("<a><b/><c/><b/></a>"));
  EXPECT_EQ("/a/b[3]/c[2]", PathOfLast("<a><b/><b/><b><c/><c/></b></a>"));
}

TEST(ElementPaths, DoNotCountBeyondAThousandSiblings) {
  EXPECT_EQ("/a/b[1001]", PathOfLast("<a>" + Repeat("<b/>", 1000) + "<b/></a>"));
  EXPECT_EQ("/a/b[?]", PathOfLast("<a>" + Repeat("<b/>", 1001) + "<b/></a>"));
  EXPECT_EQ("/a/c[?]", PathOfLast("<a>" + Repeat("<b/>", 1001) + "<c/></a>"));
}

TEST(ElementPaths, ShortenLongPathsOfParents) {
  const std::string name(255, 'n');
  const auto nested = [](const std::string &outer, const std::string &inner) {
    return "<" + outer + "><" + inner + "><b/></" + inner + "></" + outer + ">";
  };
  EXPECT_EQ("/" + name + "/" + name + "/b", PathOfLast(nested(name, name)));
  EXPECT_EQ("/.../b", PathOfLast(nested(name, name + "n")));
}

TEST(ElementPaths, OfSiblingsAndTheirParentAgreeInAnyOrder) {
  const ParsedDocument document("<a><b/><b><c/></b></a>");
  const ElementNode *const second = AsElement(document.Root().GetFirstChild()->GetNextSibling());
  ElementPaths paths;
  EXPECT_EQ("/a/b[2]/c", paths.Of(*AsElement(second->GetFirstChild())));
  EXPECT_EQ("/a/b", paths.Of(*AsElement(document.Root().GetFirstChild())));
  EXPECT_EQ("/a/b[2]", paths.Of(*second));
  EXPECT_EQ("/a", paths.Of(document.Root()));
}

} // namespace
