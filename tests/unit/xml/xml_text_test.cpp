// SPDX-License-Identifier: Apache-2.0

#include "xml/xml_text.h"

#include "support/parsed_document.h"
#include "support/throws_message.h"

#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Tarvel::Ref;
using Tarvel::Xml::Document;
using Testing::ParsedDocument;

TEST(ParseXML, ReadsAText) {
  Ref<Document> document;
  ParseXML("<?xml version=\"1.0\"?><r/>", document);
  ASSERT_TRUE(document);
  EXPECT_EQ("r", document->GetDocumentElement()->GetName());
}

TEST(ParseXML, ReadsAReaderToItsEnd) {
  const Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader("<r/>\n");
  Ref<Document> document;
  ParseXML(*reader, document);
  ASSERT_TRUE(document);
  EXPECT_EQ("", reader->ReadToEnd(1));
}

TEST(ParseXML, ReplacesAnEarlierDocument) {
  Ref<Document> document;
  ParseXML("<first/>", document);
  ParseXML("<second/>", document);
  EXPECT_EQ("second", document->GetDocumentElement()->GetName());
}

TEST(ParseXML, PassesOnTheParsersExceptionAndDoesNotChangeTheDocument) {
  Ref<Document> document;
  ParseXML("<first/>", document);
  for (const std::string text : {"", "<", "<r>", "<r></s>", "text", "<r/><r/>"}) {
    EXPECT_THROW(ParseXML(text, document), Tarvel::Xml::XMLParseException) << text;
  }
  EXPECT_EQ("first", document->GetDocumentElement()->GetName());
}

TEST(GetTextNode, UsesOnlyTheFirstChild) {
  const auto textOf = [](const std::string &xml) {
    const ParsedDocument document(xml);
    return GetText(GetTextNode(&document.Root()));
  };
  EXPECT_EQ("text", textOf("<r>text</r>"));
  EXPECT_EQ(" text ", textOf("<r> text <e/></r>"));
  EXPECT_EQ("", textOf("<r><e>text</e></r>"));
  EXPECT_EQ("", textOf("<r><!-- note -->text</r>"));
  EXPECT_EQ("", textOf("<r/>"));
}

TEST(GetTextNode, IsNullForNullAndForAnElementBeforeText) {
  EXPECT_EQ(nullptr, GetTextNode(nullptr));
  const ParsedDocument document("<r><e/>text</r>");
  EXPECT_EQ(nullptr, GetTextNode(&document.Root()));
}

TEST(GetText, IsEmptyForNull) {
  EXPECT_EQ("", GetText(nullptr));
}

TEST(CanonicalElementText, IsACompleteDocument) {
  const ParsedDocument document("<r xmlns='urn:r' xmlns:p='urn:p'><p:e b='2' a='1'><!-- note --><f/></p:e></r>");
  EXPECT_EQ("<p:e xmlns=\"urn:r\" xmlns:p=\"urn:p\" a=\"1\" b=\"2\"><f></f></p:e>",
            CanonicalElementText(document.Child("e")));
}

TEST(CanonicalElementText, RefusesAnElementWithAPrefixThatIsNotBound) {
  const ParsedDocument document("<p:r/>");
  EXPECT_THROWS_MESSAGE(CanonicalElementText(document.Root()), Tarvel::Xml::Security::XmlSecurityException,
                        "No canonical form: the prefix \"p\" is not bound at line 1, column 1");
}

} // namespace
