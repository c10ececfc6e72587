// SPDX-License-Identifier: Apache-2.0

#include "xml/form_text.h"

#include "support/parsed_document.h"

#include <tarvel/core/message_formatter.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Tarvel::MessageFormatter;
using Testing::ParsedDocument;

std::string TextOfElement(std::string_view namespaceUri) {
  return MessageFormatter::ASPrint("%1", ElementOfName{{namespaceUri, "e"}});
}

TEST(ElementOfName, HasTheUsualPrefixOfItsNamespace) {
  EXPECT_EQ("element saml:e", TextOfElement(Namespaces::SAML));
  EXPECT_EQ("element ds:e", TextOfElement(Namespaces::DS));
  EXPECT_EQ("element xsi:e", TextOfElement(Namespaces::XSI));
  EXPECT_EQ("element del:e", TextOfElement(Namespaces::DELEGATION));
  EXPECT_EQ("element rsa:e", TextOfElement(Namespaces::RSA_SAML2));
  EXPECT_EQ("element {urn:other}e", TextOfElement("urn:other"));
  EXPECT_EQ("element e", TextOfElement(""));
}

TEST(ElementOfName, HasNoMoreThanTheBeginningOfALongNamespace) {
  const std::string uri(3000, 'u');
  EXPECT_EQ("element {" + uri.substr(0, 1024) + "... (1976 more bytes)}e", TextOfElement(uri));
}

TEST(AttributesOfNames, ListsRequiredThenOptionalNames) {
  using Names = AttributesOfNames<std::string_view>;
  EXPECT_EQ("no attributes", MessageFormatter::ASPrint("%1", Names{{}, {}}));
  EXPECT_EQ("A, B", MessageFormatter::ASPrint("%1", Names{{"A", "B"}, {}}));
  EXPECT_EQ("A, B (optional), C (optional)", MessageFormatter::ASPrint("%1", Names{{"A"}, {"B", "C"}}));
  EXPECT_EQ("B (optional)", MessageFormatter::ASPrint("%1", Names{{}, {"B"}}));
}

TEST(AttributesOfNames, ListsQualifiedNames) {
  using Names = AttributesOfNames<QNameView>;
  EXPECT_EQ("xsi:type, {urn:a}b, Count (optional)",
            MessageFormatter::ASPrint("%1", Names{{XSI_TYPE, QNameView("urn:a", "b")}, {LocalName("Count")}}));
}

TEST(WhatIsAt, StatesTheKindOfTheNode) {
  const ParsedDocument document("<a:r xmlns:a='urn:a'>text<?pi?></a:r>");
  const Tarvel::Xml::Node *const text = document.Root().GetFirstChild();
  EXPECT_EQ("element a:r", MessageFormatter::ASPrint("%1", WhatIsAt{&document.Root()}));
  EXPECT_EQ("text", MessageFormatter::ASPrint("%1", WhatIsAt{text}));
  EXPECT_EQ("processing instruction", MessageFormatter::ASPrint("%1", WhatIsAt{text->GetNextSibling()}));
  EXPECT_EQ("", MessageFormatter::ASPrint("%1", WhatIsAt{nullptr}));
}

} // namespace
