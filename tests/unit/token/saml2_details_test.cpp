// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_details.h"

#include "support/parsed_document.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Testing::ParsedDocument;

std::string ValueOf(const std::string &content) {
  return ReadNameId(ParsedDocument("<n>" + content + "</n>").Root()).value;
}

TEST(ReadNameId, ReadsEachAttribute) {
  const ParsedDocument document(
      "<n Format=\"f\" NameQualifier=\"q\" SPNameQualifier=\"s\" SPProvidedID=\"p\" other=\"o\">v</n>");
  EXPECT_EQ((NameId{"v", std::string("f"), std::string("q"), std::string("s"), std::string("p")}),
            ReadNameId(document.Root()));
}

TEST(ReadNameId, DistinguishesAbsentAndEmptyAttributes) {
  const ParsedDocument document("<n Format=\"\" xmlns:p=\"urn:p\" p:NameQualifier=\"q\">v</n>");
  EXPECT_EQ((NameId{"v", std::string(), boost::none, boost::none, boost::none}), ReadNameId(document.Root()));
}

TEST(ReadNameId, ReadsTheTextThatTheParsersRead) {
  EXPECT_EQ("v", ValueOf("v"));
  EXPECT_EQ(" v ", ValueOf(" v "));
  EXPECT_EQ("v", ValueOf("  <!-- white space before a comment is not a part of it -->v"));
  EXPECT_EQ("a<b", ValueOf("a<![CDATA[<]]>b"));
  EXPECT_EQ(" \n ", ValueOf(" <!-- c -->\n "));
  EXPECT_EQ("", ValueOf(""));
}

TEST(ReadAttributes, ReadsNothingFromAStatementWithoutAttributes) {
  EXPECT_TRUE(ReadAttributes(AttributeStatementType()).empty());
}

} // namespace
