// SPDX-License-Identifier: Apache-2.0

#include "compose/bound_prefix.h"

#include "compose/message_signing.h"
#include "support/fixed_environment.h"
#include "support/xml_tree.h"

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

/// An element "a" with an element "b", and these attributes.
struct Sample {
  Sample(const std::string &declarations, const std::string &below)
      : document(ParseDocument("<a " + declarations + "><b " + below + "/></a>")),
        b(*document->GetDocumentElement()->FindChildElement("b")) {}

  Tarvel::Ref<Tarvel::Xml::Document> document;
  Tarvel::Xml::ElementNode &b;
};

TEST(FindBoundPrefix, PrefersThePreferredPrefix) {
  EXPECT_EQ(FindBoundPrefix(Sample("xmlns:p=\"urn:p\"", "xmlns:q=\"urn:p\"").b, "p", "urn:p"), "p");
}

TEST(FindBoundPrefix, FindsTheNearestOtherPrefix) {
  EXPECT_EQ(FindBoundPrefix(Sample("xmlns:q=\"urn:p\"", "xmlns:r=\"urn:p\"").b, "p", "urn:p"), "r");
  EXPECT_EQ(FindBoundPrefix(Sample("xmlns:q=\"urn:p\"", "").b, "p", "urn:p"), "q");
}

TEST(FindBoundPrefix, IgnoresTheDefaultNamespaceAndPrefixesThatAreBoundAgain) {
  EXPECT_EQ(FindBoundPrefix(Sample("xmlns=\"urn:p\"", "").b, "p", "urn:p"), "");
  EXPECT_EQ(FindBoundPrefix(Sample("xmlns:q=\"urn:p\"", "xmlns:q=\"urn:q\"").b, "p", "urn:p"), "");
  EXPECT_EQ(FindBoundPrefix(Sample("xmlns:p=\"urn:p\"", "xmlns:p=\"urn:q\"").b, "p", "urn:p"), "");
  EXPECT_EQ(FindBoundPrefix(Sample("q=\"urn:p\"", "").b, "p", "urn:p"), "");
}

TEST(BindPrefix, DeclaresAPrefixThatIsNotBound) {
  const Sample free("", "x=\"1\"");
  EXPECT_EQ(BindPrefix(free.b, "p", "urn:p"), "p");
  EXPECT_EQ(WriteElement(free.b), "<b x=\"1\" xmlns:p=\"urn:p\"></b>");
  const Sample taken("xmlns:p=\"urn:1\" xmlns:p1=\"urn:2\"", "");
  EXPECT_EQ(BindPrefix(taken.b, "p", "urn:p"), "p2");
  EXPECT_EQ(WriteElement(taken.b), "<b xmlns:p2=\"urn:p\"></b>");
}

TEST(BindPrefix, ChangesNothingIfAPrefixIsBound) {
  const Sample bound("xmlns:q=\"urn:p\"", "");
  EXPECT_EQ(BindPrefix(bound.b, "p", "urn:p"), "q");
  EXPECT_EQ(WriteElement(bound.b), "<b></b>");
}

TEST(CreateWssuId, KeepsTheMeaningOfAPrefixThatIsBoundToSomethingElse) {
  const FixedEnvironment environment;
  const Sample sample("xmlns:wsu=\"urn:other\"", "wsu:Id=\"1\"");
  EXPECT_EQ(CreateWssuId(&sample.b), "b00000000-0000-4000-8000-000000000001");
  EXPECT_EQ(WriteElement(sample.b),
            "<b wsu:Id=\"1\" xmlns:wsu1=\"http://docs.oasis-open.org/wss/2004/01/"
            "oasis-200401-wss-wssecurity-utility-1.0.xsd\" wsu1:Id=\"b00000000-0000-4000-8000-000000000001\"></b>");
}

} // namespace
} // namespace SsoClient
