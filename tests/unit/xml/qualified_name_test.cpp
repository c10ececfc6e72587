// SPDX-License-Identifier: Apache-2.0

#include "xml/qualified_name.h"

#include "support/parsed_document.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Tarvel::Xml::QName;
using Testing::ParsedDocument;

constexpr const char *XSI = "xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance'";

TEST(LocalName, IsInNoNamespace) {
  EXPECT_EQ(QName("", "Count"), LocalName("Count"));
}

TEST(QNameView, IsEqualWhenBothTextsAre) {
  const QName name("urn:a", "b");
  EXPECT_EQ(QNameView(name), QNameView("urn:a", "b"));
  EXPECT_NE(QNameView(name), QNameView("urn:c", "b"));
  EXPECT_NE(QNameView(name), QNameView("urn:a", "c"));
}

TEST(QNameView, HasTheTextOfTheName) {
  EXPECT_EQ("{urn:a}b", QNameView("urn:a", "b").ToString());
  EXPECT_EQ("b", LocalName("b").ToString());
}

TEST(ResolveQName, UsesThePrefixInScope) {
  const ParsedDocument document("<r xmlns:a='urn:outer' xmlns:b='urn:b'><e xmlns:a='urn:inner'/></r>");
  QName name;
  ResolveQName(document.Root(), "a:local", "urn:default", name);
  EXPECT_EQ(QName("urn:outer", "local"), name);
  ResolveQName(document.Child("e"), "a:local", "urn:default", name);
  EXPECT_EQ(QName("urn:inner", "local"), name);
  ResolveQName(document.Child("e"), "b:local", "urn:default", name);
  EXPECT_EQ(QName("urn:b", "local"), name);
}

TEST(ResolveQName, EndsThePrefixAtTheFirstColon) {
  const ParsedDocument document("<r xmlns:a='urn:a'/>");
  QName name;
  ResolveQName(document.Root(), "a:b:c", "", name);
  EXPECT_EQ(QName("urn:a", "b:c"), name);
}

TEST(ResolveQName, UsesTheGivenNamespaceForANameWithoutColon) {
  const ParsedDocument document("<r xmlns='urn:in-scope'/>");
  QName name;
  ResolveQName(document.Root(), "local", "urn:given", name);
  EXPECT_EQ(QName("urn:given", "local"), name);
  ResolveQName(document.Root(), "", "", name);
  EXPECT_EQ(QName("", ""), name);
}

TEST(ResolveQName, ReportsElementAndPlaceOfAnUndefinedPrefix) {
  const ParsedDocument document("<a:r xmlns:a='urn:a'>\n  <a:e/></a:r>");
  QName name("urn:before", "before");
  EXPECT_THROWS_MESSAGE(ResolveQName(document.Child("e"), "p:local", "", name), ParseException,
                        "Element a:eat 2,3 uses undefined prefix: `p'");
  EXPECT_EQ(QName("urn:before", "before"), name);
}

TEST(ElementQNameIs, ComparesLocalNameAndBoundNamespace) {
  const ParsedDocument document("<a:r xmlns:a='urn:a'/>");
  EXPECT_TRUE(ElementQNameIs(&document.Root(), "r", "urn:a"));
  EXPECT_FALSE(ElementQNameIs(&document.Root(), "s", "urn:a"));
  EXPECT_FALSE(ElementQNameIs(&document.Root(), "a:r", "urn:a"));
  EXPECT_FALSE(ElementQNameIs(&document.Root(), "r", "urn:A"));
  EXPECT_FALSE(ElementQNameIs(&document.Root(), "r", ""));
  EXPECT_FALSE(ElementQNameIs(nullptr, "r", "urn:a"));
}

TEST(ElementQNameIs, UsesTheDefaultNamespaceForAnElementWithoutPrefix) {
  const ParsedDocument document("<r xmlns='urn:a'/>");
  EXPECT_TRUE(ElementQNameIs(&document.Root(), "r", "urn:a"));
}

TEST(ElementQNameIs, IsFalseForAnUnboundPrefix) {
  const ParsedDocument document("<r><p:e/></r>");
  EXPECT_FALSE(ElementQNameIs(&document.Child("e"), "e", ""));
  EXPECT_FALSE(ElementQNameIs(&document.Child("e"), "e", "urn:a"));
}

bool RootTypeIs(const std::string &attributes, const QName &type) {
  const ParsedDocument document("<r " + attributes + "/>");
  return ElementXsiTypeIs(document.Root(), type);
}

TEST(ElementXsiTypeIs, IsFalseWithoutTheAttribute) {
  EXPECT_FALSE(RootTypeIs("", QName("", "")));
  EXPECT_FALSE(RootTypeIs("type='T'", QName("", "T")));
}

TEST(ElementXsiTypeIs, ResolvesThePrefixOfTheValue) {
  const std::string attributes = std::string(XSI) + " xmlns:a='urn:a' xsi:type='a:T'";
  EXPECT_TRUE(RootTypeIs(attributes, QName("urn:a", "T")));
  EXPECT_FALSE(RootTypeIs(attributes, QName("urn:a", "U")));
  EXPECT_FALSE(RootTypeIs(attributes, QName("urn:b", "T")));
}

TEST(ElementXsiTypeIs, ResolvesAValueWithoutPrefixAgainstTheDefaultNamespace) {
  const QName type("urn:oasis:names:tc:SAML:2.0:assertion", "KeyInfoConfirmationDataType");
  const std::string attributes = std::string(XSI) + " xsi:type='KeyInfoConfirmationDataType'";
  EXPECT_TRUE(RootTypeIs(attributes + " xmlns='urn:oasis:names:tc:SAML:2.0:assertion'", type));
  EXPECT_FALSE(RootTypeIs(attributes, type));
  EXPECT_TRUE(RootTypeIs(attributes, QName("", "KeyInfoConfirmationDataType")));
}

TEST(ElementXsiTypeIs, RefusesAnUndefinedPrefix) {
  EXPECT_THROWS_MESSAGE(RootTypeIs(std::string(XSI) + " xsi:type='p:T'", QName("", "T")), ParseException,
                        "Element rat 1,1 uses undefined prefix: `p'");
}

} // namespace
