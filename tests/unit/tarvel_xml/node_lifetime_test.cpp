// SPDX-License-Identifier: Apache-2.0
// The lifetime of nodes, deep and wide trees, and use on several threads.

#include "nodes.h"
#include "support/xml_tree.h"

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

namespace Tarvel::Xml {
namespace {

using ::Testing::DescribeTree;
using ::Testing::Lookup;
using ::Testing::MakeElement;
using ::Testing::ParseDocument;
using ::Testing::WriteElement;

TEST(Node, KeepsItsWholeTreeAlive) {
  Ref<const Node> inner;
  {
    const auto document = ParseDocument("<a x='1'><b>text &amp; more</b></a>");
    inner = Ref<const Node>(document->GetDocumentElement()->FindChildElement("b")->GetFirstChild());
  }
  EXPECT_EQ(DescribeTree(*inner->GetRoot()), "(1:a @1:x=1:1(1:b text=11:text & more))");
}

TEST(Node, KeepsAppendedTreesAliveFromEitherEnd) {
  Ref<const Node> fromAbove;
  Ref<const Node> fromBelow;
  {
    const Ref<ElementNode> a = MakeElement("a");
    const auto document = ParseDocument("<b><c/></b>");
    a->AppendChild(document->GetDocumentElement());
    fromAbove = a;
    fromBelow = Ref<const Node>(a->FindChildElement("b")->FindChildElement("c"));
  }
  const Node *const root = fromBelow->GetRoot();
  fromAbove.reset();
  EXPECT_EQ(DescribeTree(*root), "(1:a(1:b(1:c)))");
}

TEST(Node, LeaksNoTreesAppendedCrosswise) {
  // Arenas that owned each other here would leak, which the leak checker of the sanitizer build reports.
  const auto first = ParseDocument("<a><x/></a>");
  const auto second = ParseDocument("<b><y/></b><!--c-->");
  const Ref<ElementNode> third = MakeElement("d");
  second->GetDocumentElement()->FindChildElement("y")->AppendChild(third.get());
  Node *const comment = second->GetDocumentElement()->GetNextSibling();
  first->GetDocumentElement()->FindChildElement("x")->AppendChild(second->GetDocumentElement());
  third->AppendChild(comment);
  EXPECT_EQ(DescribeTree(*first->GetDocumentNode()), "(1:a(1:x(1:b(1:y(1:d comment=1:c)))))");
}

TEST(Node, IsComposedAndFreedAtADepthOfAHundredThousandWithoutRecursion) {
  constexpr int DEPTH = 100'000;
  Ref<ElementNode> top = MakeElement("a");
  const ElementNode *const bottom = top.get();
  for (int i = 1; i < DEPTH; ++i) {
    const Ref<ElementNode> above = MakeElement("a");
    above->AppendChild(top.get());
    top = above;
  }
  EXPECT_EQ(bottom->GetRoot(), top.get());
  EXPECT_EQ(Lookup(*bottom, "p"), "unbound");
  EXPECT_EQ(WriteElement(*top).size(), std::size_t{DEPTH} * 7);
}

TEST(Node, AcceptsAHundredThousandChildrenInLinearTime) {
  const Ref<ElementNode> top = MakeElement("a");
  for (int i = 0; i < 100'000; ++i) {
    top->AppendChild(MakeElement("b").get());
  }
  EXPECT_EQ(WriteElement(*top).size(), 100'000u * 7 + 7);
}

TEST(Node, IsReadAndSharedByManyThreads) {
  const auto document = ParseDocument("<p:a xmlns:p='urn:p'><b x='1'>text</b><p:c/></p:a>");
  document->GetDocumentElement()->AppendChild(MakeElement("d", "p").get());
  const std::string expected = WriteElement(*document->GetDocumentElement());
  std::atomic<int> wrong{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 500; ++i) {
        const Ref<const Document> shared = document;
        const Ref<const ElementNode> child(shared->GetDocumentElement()->FindChildElement(QName("urn:p", "d")));
        wrong += !child || WriteElement(*AsElement(child->GetParent())) != expected;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrong, 0);
}

TEST(Node, IsParsedOnManyThreadsAtOnce) {
  std::atomic<int> wrong{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&wrong, t] {
      for (int i = 0; i < 200; ++i) {
        const std::string text = "<a" + std::to_string(t) + ">" + std::to_string(i) + "</a" + std::to_string(t) + ">";
        wrong += WriteElement(*ParseDocument(text)->GetDocumentElement()) != text;
        try {
          ParseDocument(text + "<");
          ++wrong;
        } catch (const XMLParseException &) {
          continue;
        }
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrong, 0);
}

} // namespace
} // namespace Tarvel::Xml
