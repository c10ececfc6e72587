// SPDX-License-Identifier: Apache-2.0
// Each algorithm on generated documents, whole and in part, compared with libxml2's C14N and with forms written from
// expat's events. The second comparison does not use libxml2's parser at all.

#include "expat_oracle.h"
#include "generated_document.h"
#include "libxml2_oracle.h"

#include "support/repetitions.h"
#include "xml/security/canonical_form.h"

#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>

#include <gtest/gtest.h>

#include <optional>
#include <ostream>
#include <string>
#include <vector>

namespace {

namespace Uri = Tarvel::Xml::Security::CanonicalizationUri;
using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::Node;
using Tarvel::Xml::Security::CanonicalizationMethod;

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

/// What is canonicalised of a document, and how.
struct Form {
  bool isPart;
  std::size_t apex; ///< of the part
  bool omits;
  std::size_t omitted;
  CanonicalizationMethod method;
  std::vector<std::string> prefixes;
};

Form ChooseForm(Testing::RandomSource &random, std::string_view uri, std::size_t elements) {
  Form form{};
  form.isPart = random.OnceIn(2);
  form.omits = random.OnceIn(4);
  form.apex = random.Below(elements);
  // An element above the apex is not omitted, because nothing would be left.
  const std::size_t lowest = form.isPart ? form.apex : 0;
  form.omitted = lowest + random.Below(elements - lowest);
  EXPECT_TRUE(Tarvel::Xml::Security::FindCanonicalizationMethod(uri, form.method));
  if (form.method.isExclusive) {
    form.prefixes = Testing::GeneratePrefixList(random);
  }
  Tarvel::Xml::Security::SetInclusivePrefixes(form.method, form.prefixes);
  return form;
}

std::string OurForm(const std::string &text, const Form &form) {
  const Ref<Document> document = Parse(text);
  const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  Tarvel::Xml::Security::WriteCanonicalForm(
      form.isPart ? *ElementAt(*document, form.apex) : *document->GetDocumentNode(), form.method,
      form.omits ? ElementAt(*document, form.omitted) : nullptr, *writer);
  return writer->TakeText();
}

std::string Describe(const Form &form, const std::string &text) {
  return "part " + std::to_string(form.isPart) + " " + std::to_string(form.apex) + ", omits " +
         std::to_string(form.omits) + " " + std::to_string(form.omitted) + ", prefixes " +
         ::testing::PrintToString(form.prefixes) + "\n" + text;
}

class CanonicalizerOracle : public ::testing::TestWithParam<Algorithm> {};

TEST_P(CanonicalizerOracle, AgreesWithLibxml2OnGeneratedDocuments) {
  Testing::RandomSource random(GetParam().seed);
  std::size_t parts = 0;
  for (std::size_t count = 0; count < DOCUMENTS; ++count) {
    const Testing::GeneratedDocument generated = Testing::GenerateDocument(random);
    const Form form = ChooseForm(random, GetParam().uri, generated.elements);
    const Testing::XmlDocHandle theirs = Testing::ParseWithLibxml2(generated.text);
    ASSERT_TRUE(theirs) << generated.text;
    const std::string expected =
        Testing::CanonicalFormOfLibxml2(*theirs, form.isPart ? Testing::ElementOfLibxml2(*theirs, form.apex) : nullptr,
                                        form.omits ? Testing::ElementOfLibxml2(*theirs, form.omitted) : nullptr,
                                        {form.method.isExclusive, form.method.withComments, form.prefixes});
    ASSERT_EQ(expected, OurForm(generated.text, form))
        << "document " << count << ", " << Describe(form, generated.text);
    parts += form.isPart && !expected.empty() ? 1u : 0u;
  }
  EXPECT_GT(parts, DOCUMENTS / 4);
}

TEST_P(CanonicalizerOracle, AgreesWithExpatsEventsOnGeneratedDocuments) {
  Testing::RandomSource random(GetParam().seed + 100);
  std::size_t lengthy = 0;
  for (std::size_t count = 0; count < DOCUMENTS; ++count) {
    const Testing::GeneratedDocument generated = Testing::GenerateDocument(random, Testing::NamespaceNames::ANY);
    const Form form = ChooseForm(random, GetParam().uri, generated.elements);
    const std::optional<std::string> expected = Testing::CanonicalFormByExpat(
        generated.text, form.isPart ? form.apex : Testing::NO_ELEMENT, form.omits ? form.omitted : Testing::NO_ELEMENT,
        {form.method.isExclusive, form.method.withComments, form.prefixes});
    ASSERT_TRUE(expected) << generated.text;
    ASSERT_EQ(*expected, OurForm(generated.text, form))
        << "document " << count << ", " << Describe(form, generated.text);
    lengthy += expected->size() > 4096 ? 1u : 0u;
  }
  EXPECT_GT(lengthy, DOCUMENTS / 200);
}

constexpr Algorithm ALGORITHMS[] = {{"Inclusive", Uri::INCLUSIVE, 1},
                                    {"InclusiveWithComments", Uri::INCLUSIVE_WITH_COMMENTS, 2},
                                    {"Exclusive", Uri::EXCLUSIVE, 3},
                                    {"ExclusiveWithComments", Uri::EXCLUSIVE_WITH_COMMENTS, 4}};

INSTANTIATE_TEST_SUITE_P(All, CanonicalizerOracle, ::testing::ValuesIn(ALGORITHMS),
                         [](const auto &parameters) { return std::string(parameters.param.name); });

} // namespace
