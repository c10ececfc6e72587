// SPDX-License-Identifier: Apache-2.0
// Each algorithm on generated documents, whole and in part, beside libxml2's C14N.

#include "generated_document.h"
#include "libxml2_oracle.h"

#include "support/repetitions.h"
#include "xml/security/canonical_form.h"

#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>

#include <gtest/gtest.h>

#include <ostream>

namespace {

namespace Uri = Tarvel::Xml::Security::CanonicalizationUri;
using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::Node;
using Tarvel::Xml::Security::CanonicalMethod;

const std::size_t DOCUMENTS = Testing::Repetitions<std::size_t>(10000, 1000); // for each algorithm

struct Algorithm {
  const char *name;
  std::string_view uri;
  std::uint64_t seed;
};

void PrintTo(const Algorithm &algorithm, std::ostream *out) {
  *out << algorithm.name;
}

Ref<Document> Parse(const std::string &text) {
  const Ref<Tarvel::Object> result =
      Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*Tarvel::CreateStringReader(text));
  return Ref<Document>(&dynamic_cast<Document &>(*result));
}

/// The element number `index` in document order, from 0.
const Node *ElementAt(const Document &document, std::size_t index) {
  const Node *node = document.GetDocumentNode();
  for (;;) {
    if (Tarvel::Xml::AsElement(node) && index-- == 0) {
      return node;
    }
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    while (!node->GetNextSibling()) {
      node = node->GetParent();
    }
    node = node->GetNextSibling();
  }
}

class CanonicalizerOracle : public ::testing::TestWithParam<Algorithm> {};

TEST_P(CanonicalizerOracle, WritesWhatLibxml2WritesForGeneratedDocuments) {
  Testing::RandomSource random(GetParam().seed);
  std::size_t parts = 0;
  for (std::size_t count = 0; count < DOCUMENTS; ++count) {
    const Testing::GeneratedDocument generated = Testing::GenerateDocument(random);
    const bool isPart = random.OnceIn(2);
    const bool omits = random.OnceIn(4);
    const std::size_t apexIndex = random.Below(generated.elements);
    // Not above the apex: then nothing would be left.
    const std::size_t lowest = isPart ? apexIndex : 0;
    const std::size_t omittedIndex = lowest + random.Below(generated.elements - lowest);
    CanonicalMethod method;
    ASSERT_TRUE(Tarvel::Xml::Security::FindCanonicalMethod(GetParam().uri, method));
    const std::vector<std::string> prefixes =
        method.isExclusive ? Testing::GeneratePrefixList(random) : std::vector<std::string>();
    Tarvel::Xml::Security::SetInclusivePrefixes(method, prefixes);

    const Testing::XmlDocHandle theirs = Testing::ParseWithLibxml2(generated.text);
    ASSERT_TRUE(theirs) << generated.text;
    const std::string expected =
        Testing::CanonicalFormOfLibxml2(*theirs, isPart ? Testing::ElementOfLibxml2(*theirs, apexIndex) : nullptr,
                                        omits ? Testing::ElementOfLibxml2(*theirs, omittedIndex) : nullptr,
                                        {method.isExclusive, method.withComments, prefixes});

    const Ref<Document> ours = Parse(generated.text);
    const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
    Tarvel::Xml::Security::WriteCanonicalForm(isPart ? *ElementAt(*ours, apexIndex) : *ours->GetDocumentNode(), method,
                                              omits ? ElementAt(*ours, omittedIndex) : nullptr, *writer);
    ASSERT_EQ(expected, writer->GetText())
        << "document " << count << ", part " << isPart << " " << apexIndex << ", omits " << omits << " " << omittedIndex
        << ", prefixes " << ::testing::PrintToString(prefixes) << "\n"
        << generated.text;
    parts += isPart && !expected.empty() ? 1u : 0u;
  }
  EXPECT_GT(parts, DOCUMENTS / 4);
}

constexpr Algorithm ALGORITHMS[] = {{"Inclusive", Uri::INCLUSIVE, 1},
                                    {"InclusiveWithComments", Uri::INCLUSIVE_WITH_COMMENTS, 2},
                                    {"Exclusive", Uri::EXCLUSIVE, 3},
                                    {"ExclusiveWithComments", Uri::EXCLUSIVE_WITH_COMMENTS, 4}};

INSTANTIATE_TEST_SUITE_P(All, CanonicalizerOracle, ::testing::ValuesIn(ALGORITHMS),
                         [](const auto &parameters) { return std::string(parameters.param.name); });

} // namespace
