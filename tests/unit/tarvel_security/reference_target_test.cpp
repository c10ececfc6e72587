// SPDX-License-Identifier: Apache-2.0

#include "xml/security/reference_target.h"

#include "documents.h"

#include <gtest/gtest.h>

#include <ctime>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel {
namespace Xml {
namespace Security {
namespace {

using ::Testing::ParseDocument;

TEST(ResolveReferences, GivesEachOfEqualReferencesTheSameNode) {
  const Ref<Document> document = ParseDocument("<r ID='a'><x Id='b'/></r>");
  const ElementNode *const root = document->GetDocumentElement();
  const Node *const x = root->GetFirstChild();
  EXPECT_EQ((std::vector<const Node *>{x, root, document->GetDocumentNode(), x, document->GetDocumentNode(), root}),
            ResolveReferences(*root, {"#b", "#a", "", "#b", "", "#a"}));
}

/// An element of which each child has an attribute that looks like an identifier, but whose prefix, the last of many, is
/// bound to another namespace.
std::string WithSeemingIdentifiers(int children) {
  std::string text = "<r ID='a'><x";
  for (int number = 0; number < 250; ++number) {
    text += " xmlns:p" + std::to_string(number) + "='urn:p'";
  }
  text += ">";
  for (int number = 0; number < children; ++number) {
    text += "<y p249:Id='a'/>";
  }
  return text + "</x></r>";
}

std::clock_t TimeOf(const ElementNode &root, const std::vector<std::string_view> &uris) {
  const std::clock_t begin = std::clock();
  EXPECT_EQ((std::vector<const Node *>(uris.size(), &root)), ResolveReferences(root, uris));
  return std::clock() - begin;
}

TEST(ResolveReferences, SearchesOnceForAnIdentifierThatIsRepeated) {
  const auto document = ParseDocument(WithSeemingIdentifiers(20'000));
  const ElementNode &root = *document->GetDocumentElement();
  const std::clock_t once = TimeOf(root, {"#a"});
  EXPECT_LT(TimeOf(root, std::vector<std::string_view>(10, "#a")), 4 * once);
}

} // namespace
} // namespace Security
} // namespace Xml
} // namespace Tarvel
