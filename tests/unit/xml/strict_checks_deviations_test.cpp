// SPDX-License-Identifier: Apache-2.0
// What the strict checks report to a sink that does not throw. DeviationsOf also expects that the first deviation is
// the exception of a sink that throws.
#include "xml/strict_checks.h"

#include "support/parsed_document.h"
#include "support/recorded_deviations.h"
#include "xml/qualified_name.h"
#include "xml/refuse.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;
using Tarvel::System::DateTime;

using Deviations = std::vector<ExpectedDeviation>;

constexpr const char *START = "<a:r xmlns:a='urn:a' xmlns:saml='urn:oasis:names:tc:SAML:2.0:assertion'>";

TEST(RequireElementQNameOfCursor, ReportsNothingWhenTheElementIsThere) {
  const ParsedDocument document("<a:r xmlns:a='urn:a'/>");
  EXPECT_EQ(Deviations{}, DeviationsOf([&](DeviationSink &sink) {
              EXPECT_TRUE(RequireElementQName(document.Cursor(), "r", "urn:a", sink));
            }));
}

/// What is reported when the first child of the element should be a `saml:Subject`.
Deviations ReportOfFirstChild(const std::string &content) {
  const ParsedDocument document(START + content + "</a:r>");
  return DeviationsOf([&](DeviationSink &sink) {
    EXPECT_FALSE(RequireElementQName(document.Cursor().GetChild(), "Subject", Namespaces::SAML, sink));
  });
}

TEST(RequireElementQNameOfCursor, ReportsTheElementFoundInstead) {
  EXPECT_EQ((Deviations{{"Expected element 'Subject' not found.", "saml:Issuer", "", "element saml:Subject",
                         "element saml:Issuer"}}),
            ReportOfFirstChild("<saml:Issuer/>"));
  EXPECT_EQ((Deviations{{"Element 'Subject' has unexpected namespace", "Subject", "", "element saml:Subject",
                         "element Subject"}}),
            ReportOfFirstChild("<Subject/>"));
  EXPECT_EQ((Deviations{{"Element 'a:Subject' has unexpected namespace", "a:Subject", "", "element saml:Subject",
                         "element {urn:a}Subject"}}),
            ReportOfFirstChild("<a:Subject/>"));
}

TEST(RequireElementQNameOfCursor, ReportsTheParentWhenThereIsNoElement) {
  const std::string message = "Expected element 'Subject' not found.";
  EXPECT_EQ((Deviations{{message, "a:r", "", "element saml:Subject", ""}}), ReportOfFirstChild("<!-- note -->"));
  EXPECT_EQ((Deviations{{message, "a:r", "", "element saml:Subject", "text"}}), ReportOfFirstChild("x"));
  EXPECT_EQ((Deviations{{message, "a:r", "", "element saml:Subject", "processing instruction"}}),
            ReportOfFirstChild("<?pi?>"));
}

TEST(RequireElementQNameOfCursor, ReportsNoPlaceWhenThereIsNoTree) {
  const NodeFilterIterator nowhere(nullptr, std::make_shared<SkipWsAndCommentsFilter>());
  EXPECT_EQ((Deviations{{"Expected element 'r' not found.", "", "", "element {urn:a}r", ""}}),
            DeviationsOf([&](DeviationSink &sink) { RequireElementQName(nowhere, "r", "urn:a", sink); }));
}

TEST(RequireEmptyElement, ReportsOnlyTheFirstContent) {
  const ParsedDocument document("<r><e/>text<e/></r>");
  EXPECT_EQ((Deviations{{"Element 'r' must be empty", "r", "", "no content", "element e"}}),
            DeviationsOf([&](DeviationSink &sink) { RequireEmptyElement(document.Cursor(), sink); }));
}

TEST(RequireNoFurtherNode, ReportsEachNodeWithItsPlace) {
  const ParsedDocument document("<r><e/><!-- note -->text <f/></r>");
  EXPECT_EQ((Deviations{{"too much: 100%%", "e", "", "no further element", "element e"},
                        {"too much: 100%%", "r", "", "no further element", "text"},
                        {"too much: 100%%", "f", "", "no further element", "element f"}}),
            DeviationsOf([&](DeviationSink &sink) {
              RequireNoFurtherNode(document.Cursor().GetChild(), "too much: 100%%", sink);
            }));
}

TEST(RequireNoAttributes, ReportsEachAttribute) {
  const ParsedDocument document("<r xmlns:a='urn:a' A='1' a:B='2'/>");
  EXPECT_EQ((Deviations{{"Unexpected attributes on element 'r'", "r", "A", "no attributes", "1"},
                        {"Unexpected attributes on element 'r'", "r", "a:B", "no attributes", "2"}}),
            DeviationsOf([&](DeviationSink &sink) { RequireNoAttributes(document.Root(), sink); }));
}

TEST(RequireElementAttributesNames, ReportsMissingAttributesFirstThenEachUnexpectedOne) {
  const ParsedDocument document("<r D='4' B='2' E='5'/>");
  const std::string allowed = "A, B, C, O (optional)";
  EXPECT_EQ((Deviations{{"Node 'r is missing required attribute 'A'", "r", "A", allowed, ""},
                        {"Node 'r is missing required attribute 'C'", "r", "C", allowed, ""},
                        {"Unexpected attributes on element 'r'", "r", "D", allowed, "4"},
                        {"Unexpected attributes on element 'r'", "r", "E", allowed, "5"}}),
            DeviationsOf([&](DeviationSink &sink) {
              RequireElementAttributesNames(document.Root(), {"A", "B", "C"}, {"O"}, sink);
            }));
}

TEST(RequireNoAttributes, ShortensAValue) {
  const ParsedDocument document("<r A='" + std::string(5000, 'x') + "'/>");
  const Deviations found = DeviationsOf([&](DeviationSink &sink) { RequireNoAttributes(document.Root(), sink); });
  ASSERT_EQ(1u, found.size());
  EXPECT_EQ(std::string(1024, 'x') + "... (3976 more bytes)", found[0].found);
}

TEST(RequireElementAttributesQNames, ReportsUnexpectedThenMissingAttributesAndUnboundPrefixes) {
  const ParsedDocument document("<r xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance' xsi:nil='1' p:q='2' Count='3'"
                                " Other='4'/>");
  const std::string allowed = "xsi:type, Size, Count (optional)";
  const std::string xsi = "{http://www.w3.org/2001/XMLSchema-instance}";
  EXPECT_EQ(
      (Deviations{{"Unexpected attribute '" + xsi + "nil' on element 'r'", "r", "xsi:nil", allowed, "1"},
                  {"Element rat 1,1 uses undefined prefix: `p'", "r", "p:q", "a declared prefix", "p:q"},
                  {"Unexpected attribute 'Other' on element 'r'", "r", "Other", allowed, "4"},
                  {"Node 'r is missing required attribute '" + xsi + "type'", "r", "type", allowed, ""},
                  {"Node 'r is missing required attribute 'Size'", "r", "Size", allowed, ""}}),
      DeviationsOf([&](DeviationSink &sink) {
        RequireElementAttributesQNames(document.Root(), {XSI_TYPE, LocalName("Size")}, {LocalName("Count")}, sink);
      }));
}

TEST(RequireElementAttributesQNames, IgnoresUnexpectedAttributesOfTheGivenNames) {
  const ParsedDocument document("<r xmlns:a='urn:a' a:x='1' x='2'/>");
  EXPECT_EQ((Deviations{{"Unexpected attribute 'x' on element 'r'", "r", "x", "no attributes", "2"}}),
            DeviationsOf([&](DeviationSink &sink) {
              RequireElementAttributesQNames(document.Root(), {}, {}, sink,
                                             [](const QNameView &name) { return name == QNameView("urn:a", "x"); });
            }));
}

Deviations ReportOfText(const std::string &content) {
  const ParsedDocument document("<r>" + content + "</r>");
  return DeviationsOf([&](DeviationSink &sink) {
    std::string text = "before";
    EXPECT_FALSE(RequireTextualContent(document.Cursor(), text, sink));
    EXPECT_EQ("before", text);
  });
}

TEST(RequireTextualContent, ReportsTheNodeThatIsNotText) {
  const std::string message = "Element 'r' must only have textual content (but has extra children or is empty).";
  EXPECT_EQ((Deviations{{message, "r", "", "one text", ""}}), ReportOfText(" "));
  EXPECT_EQ((Deviations{{message, "r", "", "one text", "element e"}}), ReportOfText("<e/>"));
  EXPECT_EQ((Deviations{{message, "r", "", "one text", "element e"}}), ReportOfText("text<e/>"));
  EXPECT_EQ((Deviations{{message, "r", "", "one text", "text"}}), ReportOfText("te<!-- note -->xt"));
}

TEST(RequireTextualContent, ReturnsWhetherTheTextWasRead) {
  const ParsedDocument document("<r>text</r>");
  std::string text;
  EXPECT_TRUE(RequireTextualContent(document.Cursor(), text));
  EXPECT_EQ("text", text);
}

TEST(GetDateAttribute, ReportsATextThatIsNotADateAndKeepsTheDate) {
  const ParsedDocument document("<r At='tomorrow'/>");
  EXPECT_EQ((Deviations{{"r/@At is not a date", "r", "At", "a date of the form xsd:dateTime", "tomorrow"}}),
            DeviationsOf([&](DeviationSink &sink) {
              DateTime date("2001-01-01T00:00:00Z");
              RecordedDeviations other;
              EXPECT_FALSE(GetDateAttribute(document.Root(), "At", date, other));
              EXPECT_EQ(DateTime("2001-01-01T00:00:00Z"), date);
              GetDateAttribute(document.Root(), "At", date, sink);
            }));
}

TEST(GetDateAttribute, DoesNotReportAMissingAttributeAgain) {
  const ParsedDocument document("<r/>");
  DateTime date("2001-01-01T00:00:00Z");
  RecordedDeviations sink;
  EXPECT_FALSE(GetDateAttribute(document.Root(), "At", date, sink));
  EXPECT_TRUE(sink.all.empty());
  EXPECT_EQ(DateTime("2001-01-01T00:00:00Z"), date);
}

TEST(GetDateAttribute, ReturnsWhetherTheDateWasRead) {
  const ParsedDocument document("<r At='2026-01-01T00:00:00Z'/>");
  DateTime date;
  EXPECT_TRUE(GetDateAttribute(document.Root(), "At", date, ThrowingSink()));
  EXPECT_EQ(DateTime("2026-01-01T00:00:00Z"), date);
}

TEST(GetBoolAttribute, ReportsATextThatIsNotABooleanAndKeepsTheFlag) {
  const ParsedDocument document("<r Flag='yes'/>");
  bool flag = true;
  EXPECT_EQ((Deviations{{"r/@Flag is not a Boolean", "r", "Flag", "true, 1, false or 0", "yes"}}),
            DeviationsOf([&](DeviationSink &sink) { GetBoolAttribute(document.Root(), "Flag", flag, sink); }));
  EXPECT_TRUE(flag);
}

TEST(GetULongOptionalAttribute, ReportsATextThatIsNotANumberAndKeepsTheNumber) {
  const ParsedDocument document("<r Count='-1'/>");
  boost::optional<std::uint64_t> count = std::uint64_t{99};
  EXPECT_EQ(
      (Deviations{{"r/@Count is not a non-negative integer.", "r", "Count", "a non-negative integer", "-1"}}),
      DeviationsOf([&](DeviationSink &sink) { GetULongOptionalAttribute(document.Root(), "Count", count, sink); }));
  EXPECT_EQ(99u, count.value());
}

TEST(ElementXsiTypeIs, ReportsAnUnboundPrefixAndIsFalse) {
  const ParsedDocument document("<r xmlns:x='http://www.w3.org/2001/XMLSchema-instance' x:type='p:T'/>");
  EXPECT_EQ((Deviations{{"Element rat 1,1 uses undefined prefix: `p'", "r", "x:type", "a declared prefix", "p:T"}}),
            DeviationsOf([&](DeviationSink &sink) {
              EXPECT_FALSE(ElementXsiTypeIs(document.Root(), QNameView("", "T"), sink));
            }));
}

/// An argument that counts how often it becomes a text.
struct Counted {
  int &count;
};
std::string FormatMessageArgument(const Counted &counted) {
  ++counted.count;
  return "made";
}

TEST(Refuse, MakesNoTextForAFullSink) {
  const ParsedDocument document("<r/>");
  int made = 0;
  const Counted text{made};
  RecordedDeviations sink(1);
  Refuse(sink, document.Root(), text, text, "%1", text);
  EXPECT_EQ(3, made);
  Refuse(sink, document.Root(), text, text, "%1", text);
  EXPECT_EQ(3, made);
  EXPECT_EQ(1u, sink.all.size());
  EXPECT_EQ(1u, sink.unlisted);
}

} // namespace
