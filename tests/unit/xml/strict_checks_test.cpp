// SPDX-License-Identifier: Apache-2.0

#include "xml/strict_checks.h"

#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "xml/qualified_name.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using Tarvel::System::DateTime;
using Tarvel::Xml::QName;
using Testing::ParsedDocument;

TEST(RequireElementQName, ReturnsTheElement) {
  const ParsedDocument document("<a:r xmlns:a='urn:a'/>");
  EXPECT_EQ(&document.Root(), &RequireElementQName(&document.Root(), "r", "urn:a"));
}

TEST(RequireElementQName, ReportsTheExpectedElementWhenThereIsNoneOrAnother) {
  const ParsedDocument document("<a:r xmlns:a='urn:a'/>");
  EXPECT_THROWS_MESSAGE(RequireElementQName(nullptr, "Issuer", "urn:a"), ParseException,
                        "Expected element 'Issuer' not found.");
  EXPECT_THROWS_MESSAGE(RequireElementQName(&document.Root(), "Issuer", "urn:a"), ParseException,
                        "Expected element 'Issuer' not found.");
}

TEST(RequireElementQName, ReportsAnElementInAnotherNamespace) {
  const ParsedDocument document("<a:r xmlns:a='urn:a'><p:e/></a:r>");
  EXPECT_THROWS_MESSAGE(RequireElementQName(&document.Root(), "r", "urn:b"), ParseException,
                        "Element 'a:r' has unexpected namespace");
  EXPECT_THROWS_MESSAGE(RequireElementQName(&document.Child("e"), "e", "urn:a"), ParseException,
                        "Element 'p:e' has unexpected namespace");
  EXPECT_THROWS_MESSAGE(RequireElementQName(&document.Child("e"), "e", ""), ParseException,
                        "Element 'p:e' has unexpected namespace");
}

TEST(RequireEmptyElement, AllowsCommentsAndWhiteSpace) {
  for (const std::string text : {"<r/>", "<r></r>", "<r> <!-- note -->\n\t</r>"}) {
    const ParsedDocument document(text);
    EXPECT_NO_THROW(RequireEmptyElement(document.Cursor())) << text;
  }
}

TEST(RequireEmptyElement, RefusesAnyOtherContent) {
  for (const std::string text : {"<a:r xmlns:a='urn:a'>x</a:r>", "<a:r xmlns:a='urn:a'><e/></a:r>",
                                 "<a:r xmlns:a='urn:a'> <!-- note --><?pi?></a:r>"}) {
    const ParsedDocument document(text);
    EXPECT_THROWS_MESSAGE(RequireEmptyElement(document.Cursor()), ParseException, "Element 'a:r' must be empty");
  }
}

TEST(RequireNoFurtherNode, RefusesElementsAndText) {
  const ParsedDocument document("<r><e/>text</r>");
  NodeFilterIterator child = document.Cursor().GetChild();
  EXPECT_THROWS_MESSAGE(RequireNoFurtherNode(child, "too much"), ParseException, "too much");
  EXPECT_THROWS_MESSAGE(RequireNoFurtherNode(child.MoveToSibling(), "too much"), ParseException, "too much");
  EXPECT_NO_THROW(RequireNoFurtherNode(child.MoveToSibling(), "too much"));
}

TEST(RequireNoAttributes, AllowsNamespaceDeclarations) {
  for (const std::string text : {"<r/>", "<r xmlns='urn:a'/>", "<r xmlns:saml='urn:a' xmlns:b='urn:b'/>"}) {
    const ParsedDocument document(text);
    EXPECT_NO_THROW(RequireNoAttributes(document.Root())) << text;
  }
}

TEST(RequireNoAttributes, RefusesEveryOtherAttribute) {
  for (const std::string attribute : {"ID='1'", "xmlnsx='1'", "xml:lang='en'", "a:ID='1'"}) {
    const ParsedDocument document("<a:r xmlns:a='urn:a' " + attribute + "/>");
    EXPECT_THROWS_MESSAGE(RequireNoAttributes(document.Root()), ParseException,
                          "Unexpected attributes on element 'a:r'");
  }
}

TEST(RequireElementAttributesNames, AcceptsRequiredAndOptionalAttributes) {
  for (const std::string text : {"<r A='' B='2'/>", "<r C='3' B='2' A='1'/>", "<r xmlns:x='urn:x' A='1' B='2'/>"}) {
    const ParsedDocument document(text);
    EXPECT_NO_THROW(RequireElementAttributesNames(document.Root(), {"A", "B"}, {"C"})) << text;
  }
}

TEST(RequireElementAttributesNames, ReportsTheFirstMissingAttributeInTheOrderOfTheList) {
  const ParsedDocument document("<r D='4'/>");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesNames(document.Root(), {"A", "B"}, {}), ParseException,
                        "Node 'r is missing required attribute 'A'");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesNames(document.Root(), {"D", "B", "A"}, {}), ParseException,
                        "Node 'r is missing required attribute 'B'");
}

TEST(RequireElementAttributesNames, DoesNotReportTheNameOfAnUnexpectedAttribute) {
  const ParsedDocument document("<r A='1' B='2'/>");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesNames(document.Root(), {"A"}, {"C"}), ParseException,
                        "Unexpected attributes on element 'r'");
}

TEST(RequireElementAttributesNames, ComparesNamesAsTheyAreWritten) {
  const ParsedDocument document("<r xmlns:a='urn:a' a:A='1'/>");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesNames(document.Root(), {"A"}, {}), ParseException,
                        "Node 'r is missing required attribute 'A'");
  EXPECT_NO_THROW(RequireElementAttributesNames(document.Root(), {"a:A"}, {}));
}

const QName TYPE("urn:a", "type");

TEST(RequireElementAttributesQNames, AcceptsRequiredAndOptionalAttributesWithAnyPrefix) {
  for (const std::string text : {"<r xmlns:a='urn:a' a:type='1'/>", "<r xmlns:b='urn:a' Count='1' b:type='1'/>"}) {
    const ParsedDocument document(text);
    EXPECT_NO_THROW(RequireElementAttributesQNames(document.Root(), {TYPE}, {LocalName("Count")})) << text;
  }
}

TEST(RequireElementAttributesQNames, ReportsTheNameOfAnUnexpectedAttribute) {
  const ParsedDocument document("<p:r xmlns:p='urn:p' xmlns:a='urn:a' a:type='1' a:Count='2' Other='3'/>");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesQNames(document.Root(), {TYPE}, {LocalName("Count")}), ParseException,
                        "Unexpected attribute '{urn:a}Count' on element 'p:r'");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesQNames(document.Root(), {TYPE}, {QName("urn:a", "Count")}),
                        ParseException, "Unexpected attribute 'Other' on element 'p:r'");
}

TEST(RequireElementAttributesQNames, IsNotSatisfiedByAnAttributeInNoNamespace) {
  const ParsedDocument document("<r xmlns='urn:a' type='1'/>");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesQNames(document.Root(), {TYPE}, {}), ParseException,
                        "Unexpected attribute 'type' on element 'r'");
}

TEST(RequireElementAttributesQNames, ReportsTheFirstMissingAttribute) {
  const ParsedDocument document("<r xmlns:a='urn:a'/>");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesQNames(document.Root(), {TYPE, LocalName("Count")}, {}), ParseException,
                        "Node 'r is missing required attribute '{urn:a}type'");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesQNames(document.Root(), {LocalName("Count"), TYPE}, {}), ParseException,
                        "Node 'r is missing required attribute 'Count'");
}

TEST(RequireElementAttributesQNames, RefusesAnUndefinedPrefix) {
  const ParsedDocument document("<r p:type='1'/>");
  EXPECT_THROWS_MESSAGE(RequireElementAttributesQNames(document.Root(), {TYPE}, {}), ParseException,
                        "Element rat 1,1 uses undefined prefix: `p'");
}

TEST(RequireTextualContent, ReadsASingleText) {
  const auto textOf = [](const std::string &xml) {
    const ParsedDocument document(xml);
    std::string text;
    RequireTextualContent(document.Cursor(), text);
    return text;
  };
  EXPECT_EQ(" a&b ", textOf("<r> a&amp;b </r>"));
  EXPECT_EQ("text", textOf("<r>text<!-- note --></r>"));
  EXPECT_EQ("text", textOf("<r><!-- note -->text</r>"));
  EXPECT_EQ("text", textOf("<r> <!-- note -->text<!-- note -->\n</r>"));
  EXPECT_EQ("text<b>", textOf("<r>text<![CDATA[<b>]]></r>"));
}

TEST(RequireTextualContent, RefusesEverythingElse) {
  for (const std::string content :
       {"", " \n\t", "<!-- note -->", "<e/>", "text<e/>", "<e/>text", "te<!-- note -->xt", "text<?pi?>"}) {
    const ParsedDocument document("<a:r xmlns:a='urn:a'>" + content + "</a:r>");
    std::string text = "before";
    EXPECT_THROWS_MESSAGE(RequireTextualContent(document.Cursor(), text), ParseException,
                          "Element 'a:r' must only have textual content (but has extra children or is empty).");
    EXPECT_EQ("before", text) << content;
  }
}

TEST(GetTextAttribute, IsEmptyWithoutTheAttribute) {
  const ParsedDocument document("<r xmlns:a='urn:a' a:A='1' B='2'/>");
  EXPECT_EQ("", GetTextAttribute(document.Root(), "A"));
  EXPECT_EQ("2", GetTextAttribute(document.Root(), "B"));
}

TEST(GetDateAttribute, ReadsADate) {
  const ParsedDocument document("<r At='2013-05-07T11:03:01.042+02:00'/>");
  DateTime date;
  GetDateAttribute(document.Root(), "At", date);
  EXPECT_EQ(DateTime("2013-05-07T09:03:01.042Z"), date);
}

TEST(GetDateAttribute, RefusesOtherTextsAndAMissingAttribute) {
  for (const std::string text :
       {"<a:r xmlns:a='urn:a'/>", "<a:r xmlns:a='urn:a' At=''/>", "<a:r xmlns:a='urn:a' At='tomorrow'/>",
        "<a:r xmlns:a='urn:a' At='2013-05-07'/>", "<a:r xmlns:a='urn:a' At='2013-13-07T09:03:01Z'/>",
        "<a:r xmlns:a='urn:a' At=' 2013-05-07T09:03:01Z'/>"}) {
    const ParsedDocument document(text);
    DateTime date("2001-01-01T00:00:00Z");
    EXPECT_THROWS_MESSAGE(GetDateAttribute(document.Root(), "At", date), ParseException, "a:r/@At is not a date");
    EXPECT_EQ(DateTime("2001-01-01T00:00:00Z"), date);
  }
}

bool ReadFlag(const std::string &attributes) {
  const ParsedDocument document("<r " + attributes + "/>");
  bool flag = false;
  GetBoolAttribute(document.Root(), "Flag", flag);
  return flag;
}

TEST(GetBoolAttribute, ReadsBothSpellingsInAnyLetterCase) {
  for (const std::string text : {"1", "true", "TRUE", "True", "tRuE"}) {
    EXPECT_TRUE(ReadFlag("Flag='" + text + "'")) << text;
  }
  for (const std::string text : {"0", "false", "FALSE", "False"}) {
    EXPECT_FALSE(ReadFlag("Flag='" + text + "'")) << text;
  }
}

TEST(GetBoolAttribute, RefusesOtherTextsAndAMissingAttribute) {
  for (const std::string attributes :
       {"", "Flag=''", "Flag='yes'", "Flag='2'", "Flag=' true'", "Flag='01'", "flag='true'"}) {
    EXPECT_THROWS_MESSAGE(ReadFlag(attributes), ParseException, "r/@Flag is not a Boolean");
  }
}

boost::optional<std::uint64_t> ReadCount(const std::string &attributes) {
  const ParsedDocument document("<r " + attributes + "/>");
  boost::optional<std::uint64_t> count = std::uint64_t{99};
  GetULongOptionalAttribute(document.Root(), "Count", count);
  return count;
}

TEST(GetULongOptionalAttribute, IsEmptyWhenAbsent) {
  EXPECT_FALSE(ReadCount(""));
}

TEST(GetULongOptionalAttribute, ReadsDecimalDigits) {
  EXPECT_EQ(0u, ReadCount("Count='0'").value());
  EXPECT_EQ(5u, ReadCount("Count='5'").value());
  EXPECT_EQ(5u, ReadCount("Count='0005'").value());
  EXPECT_EQ(5u, ReadCount("Count='0000000000000000000000000005'").value());
  EXPECT_EQ(18446744073709551615u, ReadCount("Count='18446744073709551615'").value());
}

TEST(GetULongOptionalAttribute, RefusesWhatIsNotANumberOf64Bits) {
  for (const std::string text : {"-1", "-0", "+1", "", " 1", "1 ", "0x1", "1.0", "1e3", "1,000", "one",
                                 "18446744073709551616", "99999999999999999999999"}) {
    EXPECT_THROWS_MESSAGE(ReadCount("Count='" + text + "'"), ParseException, "r/@Count is not a non-negative integer.");
  }
}

} // namespace
