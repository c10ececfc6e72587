// SPDX-License-Identifier: Apache-2.0

#include "xml/security/reference_target.h"

#include "documents.h"

#include <gtest/gtest.h>

#include <string_view>
#include <utility>
#include <vector>

namespace Tarvel::Xml::Security {
namespace {

using ::Testing::ParseDocument;

TEST(ResolveReferences, ResolvesEqualReferencesToTheSameNode) {
  const Ref<Document> document = ParseDocument("<r ID='a'><x Id='b'/></r>");
  const ElementNode *const root = document->GetDocumentElement();
  const Node *const x = root->GetFirstChild();
  EXPECT_EQ((std::vector<const Node *>{x, root, document->GetDocumentNode(), x, document->GetDocumentNode(), root}),
            ResolveReferences(*root, {{"#b"}, {"#a"}, {""}, {"#b"}, {""}, {"#a"}}));
}

/// The identifiers that are searched for, each with the index of the first reference to it.
std::vector<std::pair<std::string_view, std::size_t>> SearchedFor(const std::vector<ReferenceUri> &uris) {
  std::vector<std::pair<std::string_view, std::size_t>> searched;
  for (const IdentifierSearch &search : PlanSearches(uris)) {
    searched.emplace_back(search.identifier, search.reference);
  }
  return searched;
}

TEST(PlanSearches, SearchesOnceForARepeatedIdentifier) {
  using Searches = std::vector<std::pair<std::string_view, std::size_t>>;
  EXPECT_EQ(SearchedFor(std::vector<ReferenceUri>(1000, {"#a"})), (Searches{{"a", 0}}));
  EXPECT_EQ(SearchedFor({{""}, {"#b"}, {"#a"}, {"#b"}, {""}, {"#a"}}), (Searches{{"b", 1}, {"a", 2}}));
  EXPECT_EQ(SearchedFor({{""}, {""}}), Searches{});
}

} // namespace
} // namespace Tarvel::Xml::Security
