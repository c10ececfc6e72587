// SPDX-License-Identifier: Apache-2.0
// What happens when a parser returns nothing, or an object that is not a document. The platform's parser never does so.
#include "xml/xml_text.h"

#include "support/throws_message.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <optional>

using Tarvel::Ref;
using Tarvel::Xml::XMLHandler;
using Tarvel::Xml::XMLParser;

namespace {

std::optional<Ref<Tarvel::Object>> g_result;

class ParserOfOneResult final : public XMLParser {
public:
  Ref<Tarvel::Object> Parse(Tarvel::Reader &) override { return *g_result; }
};

class SomeObject final : public Tarvel::Object {};

/// While it exists, every parse returns `result`.
class ScopedParseResult {
public:
  explicit ScopedParseResult(const Ref<Tarvel::Object> &result) { g_result = result; }
  ScopedParseResult(const ScopedParseResult &) = delete;
  ScopedParseResult &operator=(const ScopedParseResult &) = delete;
  ~ScopedParseResult() { g_result.reset(); }
};

} // namespace

// The first of these is the platform's function. The linker redirects the library's calls of it to the second.

#define CREATE_PARSER "_ZN6Tarvel3Xml15CreateXMLParserERKNS_3RefINS0_10XMLHandlerEEE"

Ref<XMLParser> RealCreateParser(const Ref<XMLHandler> &handler) asm("__real_" CREATE_PARSER);
Ref<XMLParser> ReplacedCreateParser(const Ref<XMLHandler> &handler) asm("__wrap_" CREATE_PARSER);
Ref<XMLParser> ReplacedCreateParser(const Ref<XMLHandler> &handler) {
  if (g_result) {
    return Tarvel::MakeRef<ParserOfOneResult>();
  }
  return RealCreateParser(handler);
}

namespace {

TEST(ParseXML, SetsNoDocumentWhenTheParserReturnsNothing) {
  Ref<Tarvel::Xml::Document> document;
  SsoClient::ParseXML("<first/>", document);
  ASSERT_TRUE(document);
  const ScopedParseResult nothing(nullptr);
  SsoClient::ParseXML("<second/>", document);
  EXPECT_FALSE(document);
}

TEST(ParseXML, RefusesAResultThatIsNotADocument) {
  Ref<Tarvel::Xml::Document> document;
  const ScopedParseResult other(Tarvel::MakeRef<SomeObject>());
  EXPECT_THROWS_MESSAGE(
      SsoClient::ParseXML("<r/>", document), Tarvel::TypeMismatchException,
      "Type mismatch : expected Tarvel::Xml::Document, but the object is (anonymous namespace)::SomeObject");
}

TEST(CreateSamlToken, RefusesATextForWhichTheParserReturnsNothing) {
  const ScopedParseResult nothing(nullptr);
  EXPECT_THROWS_MESSAGE(SsoClient::CreateSamlToken("<r/>", Tarvel::Crypto::CertificateList()),
                        SsoClient::ParseException, "Expected element 'Assertion' not found.");
}

} // namespace
