// SPDX-License-Identifier: Apache-2.0

#include "xml/xml_text.h"

#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using SsoClient::ParseXML;
using Tarvel::Ref;
using Tarvel::Xml::Document;

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

TEST(ParseXML, ReplacesTheDocumentThatWasHeldBefore) {
  Ref<Document> document;
  ParseXML("<first/>", document);
  ParseXML("<second/>", document);
  EXPECT_EQ("second", document->GetDocumentElement()->GetName());
}

TEST(ParseXML, PassesTheParsersFailureOnAndLeavesTheDocumentAlone) {
  Ref<Document> document;
  ParseXML("<first/>", document);
  for (const std::string text : {"", "<", "<r>", "<r></s>", "text", "<r/><r/>"}) {
    EXPECT_THROW(ParseXML(text, document), Tarvel::Xml::XMLParseException) << text;
  }
  EXPECT_EQ("first", document->GetDocumentElement()->GetName());
}

} // namespace
