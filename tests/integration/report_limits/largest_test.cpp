// SPDX-License-Identifier: Apache-2.0
// Reports on documents of the maximum length, each filled with pieces of one kind that a report must read or list.

#include "explained.h"

#include "bench/hostile_pieces.h"
#include "support/data_file.h"
#include "support/printable_text.h"
#include "support/report_texts.h"

#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Reports {
namespace {

using Bench::Always;
using Bench::Piece;
using Bench::Repeat;
using SsoClient::TokenReport;

constexpr std::size_t MIB = 1024u * 1024;
constexpr std::size_t MAX_HEAP = 240 * MIB; // at the same time, in addition to the text

/// The token bearer.xml, in which as many pieces as possible replace a text.
struct Largest {
  const char *name;
  std::string replaced;
  std::string begin;
  Piece piece;
  std::string end;
  std::size_t depth = 0; // how many elements with long names are around the token
};

void PrintTo(const Largest &document, std::ostream *out) {
  *out << document.name;
}

const std::string LONG_NAME(4000, 'n');

std::string TokenAtDepth(std::size_t depth) {
  const std::string token = Testing::ReadDataFile("tokens/bearer.xml");
  return Repeat(depth, Always("<" + LONG_NAME + ">")) + token.substr(token.find("<saml:Assertion ")) +
         Repeat(depth, Always("</" + LONG_NAME + ">"));
}

std::string MakeDocument(const Largest &document, std::size_t octets) {
  const std::string token = TokenAtDepth(document.depth);
  const std::size_t place = token.find(document.replaced);
  if (place == std::string::npos) {
    throw std::logic_error("nothing to replace: " + document.replaced);
  }
  const std::string rest = document.end + token.substr(place + document.replaced.size());
  std::string xml = token.substr(0, place) + document.begin;
  xml.reserve(octets);
  for (std::size_t index = 0;; ++index) {
    const std::string piece = document.piece(index);
    if (xml.size() + piece.size() + rest.size() > octets) {
      return xml + rest;
    }
    xml += piece;
  }
}

const std::string SUBJECT = "<saml:Subject>";
const std::string NAME = "alice@corp.example";
const std::string VALUE = "<saml:AttributeValue>corp.example\\Administrators</saml:AttributeValue>";
const std::string AUDIENCE = "<saml:Audience>https://files.corp.example/</saml:Audience>";
const std::string METHOD = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
const std::string REFERENCE = "<ds:Reference ";
const std::string KEY_INFO = "<ds:X509Data>";
const std::string STATEMENT = "<saml:AuthnStatement";

/// The element with a genuine certificate, copied from the token.
std::string CertificateElement() {
  const std::string token = Testing::ReadDataFile("tokens/bearer.xml");
  const std::size_t begin = token.find("<ds:X509Certificate>");
  const std::string end = "</ds:X509Certificate>";
  return token.substr(begin, token.find(end) + end.size() - begin);
}

// Long because each document is an entry of its own.
std::vector<Largest> Documents() {
  const std::string advice = "<saml:Advice xmlns:r=\"http://www.rsa.com/names/2009/12/std-ext/SAML2.0\">";
  const std::string delegation = "<saml:Condition xmlns:d=\"urn:oasis:names:tc:SAML:2.0:conditions:delegation\" "
                                 "xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" "
                                 "i:type=\"d:DelegationRestrictionType\">";
  return {
      {"Elements", SUBJECT, "", Bench::Thin("<a~/>", 1), SUBJECT},
      {"ElementsAtTheEnd", "</saml:Assertion>", "", Bench::Thin("<a~/>", 1), "</saml:Assertion>"},
      {"Attributes", VALUE, VALUE,
       Always("<saml:AttributeValue" +
              Repeat(250, [](std::size_t i) { return " a" + std::to_string(i) + "=\"0123456789\""; }) +
              ">a\\b</saml:AttributeValue>"),
       ""},
      {"Values", VALUE, "", Bench::Thin("<saml:AttributeValue~/>", 1), VALUE},
      {"Groups", VALUE, VALUE, Bench::Thin("<saml:AttributeValue~>a</saml:AttributeValue>", 2), ""},
      {"GenuineGroups", VALUE, VALUE, Bench::Thin("<saml:AttributeValue~>a\\b</saml:AttributeValue>", 2), ""},
      {"Audiences", AUDIENCE, "", [](std::size_t i) { return "<saml:Audience>" + Bench::Name(i) + "</saml:Audience>"; },
       ""},
      {"EmptyAudiences", AUDIENCE, AUDIENCE, Bench::Thin("<saml:Audience~/>", 1), ""},
      {"Advice", STATEMENT, advice, Bench::Thin("<r:RSAAdvice AdviceSource=\"a\"~/>", 2), "</saml:Advice>" + STATEMENT},
      {"WrongAdvice", STATEMENT, advice, Bench::Thin("<r:RSAAdvice~/>", 1), "</saml:Advice>" + STATEMENT},
      {"Delegates", "<saml:AudienceRestriction>", delegation,
       Always("<d:Delegate DelegationInstant=\"\"><saml:NameID Format=\"\">a</saml:NameID></d:Delegate>"),
       "</saml:Condition><saml:AudienceRestriction>"},
      {"Conditions", "<saml:AudienceRestriction>", "", Bench::Thin("<saml:Condition~/>", 1),
       "<saml:AudienceRestriction>"},
      {"References", REFERENCE, "",
       Always("<ds:Reference URI=\"#a\"><ds:DigestMethod Algorithm=\"a\"/><ds:DigestValue>AAAA</ds:DigestValue>"
              "</ds:Reference>"),
       REFERENCE},
      {"ReferencesToTheDocument", REFERENCE, "",
       Always("<ds:Reference URI=\"\"><ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
              "<ds:DigestValue>AAAA</ds:DigestValue></ds:Reference>"),
       REFERENCE},
      {"Transforms", "<ds:Transform ", "", Bench::Thin("<ds:Transform Algorithm=\"a\"~/>", 2), "<ds:Transform "},
      {"DeepContent", SUBJECT, "", Always(Repeat(250, Always("<abcdefgh>")) + Repeat(250, Always("</abcdefgh>"))),
       SUBJECT},
      {"Certificates", KEY_INFO, KEY_INFO, Always(CertificateElement()), ""},
      {"WrongCertificates", KEY_INFO, KEY_INFO, Bench::Thin("<ds:X509Certificate~>*</ds:X509Certificate>", 2), ""},
      {"ElementsInTheSignature", "</ds:Signature>", "", Bench::Thin("<ds:Object~/>", 1), "</ds:Signature>"},
      {"OneLongValue", METHOD, "", Always("x"), ""},
      {"OneLongValueThatControlsATerminal", METHOD, "", Always("&#x202E;&#x85;\xE2\x80\xAE&#13;"), ""},
      {"OneLongNameThatControlsATerminal", NAME, "", Always("&#x202E;&#x85;\xE2\x80\xAE&#13;"), ""},
      {"OneLongText", "<ds:DigestValue>", "<ds:DigestValue>", Always("*"), ""},
      {"LongNames", SUBJECT, "", Always("<" + LONG_NAME + "/>"), SUBJECT},
      {"FaultsDeepBelowLongNames", VALUE, "", Bench::Thin("<saml:AttributeValue~/>", 1), VALUE, 200},
  };
}

class ReportOnALargestDocument : public testing::TestWithParam<Largest> {};

TEST_P(ReportOnALargestDocument, IsShortAndCostsNoMoreThanInProportion) {
  const std::string smallXml = MakeDocument(GetParam(), 4 * MIB);
  const std::string largeXml = MakeDocument(GetParam(), Tarvel::Xml::MAX_DOCUMENT_BYTES);
  const Explained small = Explain(smallXml);
  const Explained large = Explain(largeXml);
  EXPECT_FALSE(large.report.accepted);
  EXPECT_EQ(std::string::npos, large.report.refusal.find("more than 1048576 nodes")) << large.report.refusal;
  EXPECT_LT(large.allocated, 6 * small.allocated) << small.allocated;
  // Both documents may have the maximum number of findings. The ratio does not limit the cost of each; this does.
  EXPECT_LT(large.allocated, 20 * largeXml.size());
  EXPECT_LT(large.peak, MAX_HEAP);
  EXPECT_LE(CountFindings(large.report), TokenReport::MAX_FINDINGS);
  EXPECT_LT(CountTexts(large.report), 8 * MIB);
  EXPECT_LT(SsoClient::WriteTokenReport(large.report).size(), 8 * MIB);
  for (const Testing::ReportText &text : Testing::PrintableTextsOf(large.report)) {
    ASSERT_TRUE(Testing::IsPrintable(text.text)) << text.place;
  }
}

INSTANTIATE_TEST_SUITE_P(Of, ReportOnALargestDocument, testing::ValuesIn(Documents()),
                         [](const auto &document) { return std::string(document.param.name); });

} // namespace
} // namespace Reports
