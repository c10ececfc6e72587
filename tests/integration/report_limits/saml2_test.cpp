// SPDX-License-Identifier: Apache-2.0
// In the profile SAML2, the memory for verifying or explaining a document grows at most in proportion to its length, up
// to the maximum length. Each document is filled with pieces of one kind that only this profile reads, or that it reads
// in another way than the profile STRICT.

#include "explained.h"

#include "bench/hostile_pieces.h"
#include "integration/token_attacks/heap_octets.h"
#include "support/data_file.h"
#include "support/sanitized.h"

#include <ssoclient/token_verifier.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <exception>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Reports {
namespace {

using Bench::Always;
using Bench::Piece;
using Bench::Repeat;
using Bench::Thin;

constexpr std::size_t MIB = 1024u * 1024;
constexpr std::size_t MAX_HEAP = 160 * MIB;           // of a verification, in addition to the text
constexpr std::size_t MAX_HEAP_OF_REPORT = 240 * MIB; // of a report, in addition to the text
// In a principal, an octet of a qualifier can become three octets. A report has the principal and the qualifier.
constexpr std::size_t MAX_HEAP_OF_ENCODED = 320 * MIB;

/// The token form-many-statements.xml, with one text replaced by as many pieces as the length allows.
struct Saml2Document {
  const char *name;
  std::string replaced;
  std::string begin;
  Piece piece;
  std::string end;
  std::size_t pieces = 0; // the maximum number; 0 for no limit
  std::size_t maxHeapOfReport = MAX_HEAP_OF_REPORT;
};

void PrintTo(const Saml2Document &document, std::ostream *out) {
  *out << document.name;
}

std::string MakeDocument(const Saml2Document &document, std::size_t octets) {
  const std::string token = Testing::ReadDataFile("saml2/form-many-statements.xml");
  const std::size_t place = token.find(document.replaced);
  if (place == std::string::npos) {
    throw std::logic_error("nothing to replace: " + document.replaced);
  }
  const std::string rest = document.end + token.substr(place + document.replaced.size());
  std::string xml = token.substr(0, place) + document.begin;
  xml.reserve(octets);
  for (std::size_t index = 0; document.pieces == 0 || index < document.pieces; ++index) {
    const std::string piece = document.piece(index);
    if (xml.size() + piece.size() + rest.size() > octets) {
      break;
    }
    xml += piece;
  }
  return xml + rest;
}

const std::string NO_CONDITIONS = " NotOnOrAfter=\"2120-01-01T00:00:00Z\"/>";
const std::string CONDITIONS = " NotOnOrAfter=\"2120-01-01T00:00:00Z\">";
const std::string END = "</saml:Conditions>";
const std::string CONFIRMATION = "<saml:SubjectConfirmation Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"/>";
const std::string NAME = "<saml:NameID>alice</saml:NameID>";
const std::string STATEMENT = "<saml:AttributeStatement>";
const std::string ATTRIBUTE = "<saml:Attribute Name=\"role\">";
const std::string VALUE = "<saml:AttributeValue>auditor</saml:AttributeValue>";
const std::string AUTHORITIES = "</saml:AuthnContext>";

Piece Audiences() {
  return [](std::size_t i) { return "<saml:Audience>" + Bench::Name(i) + "</saml:Audience>"; };
}

std::string Holder(const std::string &keyInfo) {
  return "<saml:SubjectConfirmation "
         "Method=\"urn:oasis:names:tc:SAML:2.0:cm:holder-of-key\"><saml:SubjectConfirmationData>" +
         keyInfo + "</saml:SubjectConfirmationData></saml:SubjectConfirmation>";
}

std::string KeyInfo(const std::string &content) {
  return "<k:KeyInfo xmlns:k=\"http://www.w3.org/2000/09/xmldsig#\">" + content + "</k:KeyInfo>";
}

std::string CertificateOfHolder() {
  const std::string pem = Testing::ReadDataFile("tokens/holder.crt");
  const std::size_t begin = pem.find('\n');
  return "<k:X509Data><k:X509Certificate>" + pem.substr(begin, pem.rfind("-----END") - begin) +
         "</k:X509Certificate></k:X509Data>";
}

// Long because each document is an entry of its own.
std::vector<Saml2Document> Documents() {
  const std::string restriction = "<saml:AudienceRestriction>";
  const std::string restrictionEnd = "</saml:AudienceRestriction>";
  const std::string delegation = "<saml:Condition xmlns:d=\"urn:oasis:names:tc:SAML:2.0:conditions:delegation\" "
                                 "xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" "
                                 "i:type=\"d:DelegationRestrictionType\">";
  const std::string delegate = "<d:Delegate DelegationInstant=\"2020-01-01T00:00:00Z\"><saml:NameID";
  const std::string weakKey = "<k:KeyValue><k:RSAKeyValue><k:Modulus>AQAB</k:Modulus><k:Exponent>AQAB</k:Exponent>"
                              "</k:RSAKeyValue></k:KeyValue>";
  return {
      {"Attributes", STATEMENT, STATEMENT, Thin("<saml:Attribute Name='a'~/>", 2), ""},
      {"AttributesWithEveryName", STATEMENT, STATEMENT,
       Thin("<saml:Attribute Name='a' NameFormat='b' FriendlyName='c'~/>", 4), ""},
      {"AttributesWithValues", STATEMENT, STATEMENT,
       Thin("<saml:Attribute Name='a'~><saml:AttributeValue>a</saml:AttributeValue></saml:Attribute>", 4), ""},
      {"ForeignXmlAttributes", ATTRIBUTE, "",
       Always("<saml:Attribute Name='a' xmlns:x='urn:x'" +
              Repeat(200, [](std::size_t i) { return " x:" + Bench::Name(i) + "='0123456789'"; }) + "/>"),
       ATTRIBUTE},
      {"Values", VALUE, "", Thin("<saml:AttributeValue~>a</saml:AttributeValue>", 2), VALUE},
      {"EmptyValues", VALUE, "", Thin("<saml:AttributeValue~/>", 1), VALUE},
      {"ValuesWithElements", VALUE, "", Thin("<saml:AttributeValue~><a/></saml:AttributeValue>", 2), VALUE},
      {"OneDeepValue", VALUE, "<saml:AttributeValue>",
       Always(Repeat(240, Always("<abcdefgh>")) + Repeat(240, Always("</abcdefgh>"))), "</saml:AttributeValue>"},
      {"GroupsWithoutDomain", ATTRIBUTE,
       "<saml:Attribute Name=\"http://www.rsa.com/schemas/attr-names/2009/01/GroupIdentity\">",
       Thin("<saml:AttributeValue~>a</saml:AttributeValue>", 2), ""},
      {"AttributeStatements", STATEMENT, "",
       Thin("<saml:AttributeStatement~><saml:Attribute Name='a'/></saml:AttributeStatement>", 3), STATEMENT},
      {"Authorities", AUTHORITIES, "", Thin("<saml:AuthenticatingAuthority~>a</saml:AuthenticatingAuthority>", 2),
       AUTHORITIES},
      {"LongAuthorities", AUTHORITIES, "",
       Always("<saml:AuthenticatingAuthority>0123456789abcdef</saml:AuthenticatingAuthority>"), AUTHORITIES},
      {"Audiences", NO_CONDITIONS, CONDITIONS + restriction, Audiences(), restrictionEnd + END},
      {"AudiencesOfOneOfTwoRestrictions", NO_CONDITIONS,
       CONDITIONS + restriction + "<saml:Audience>x</saml:Audience>" + restrictionEnd + restriction, Audiences(),
       restrictionEnd + END},
      {"AudiencesOfAThousandRestrictions", NO_CONDITIONS, CONDITIONS,
       [=](std::size_t i) {
         return restriction + Repeat(380, [i](std::size_t j) { return Audiences()(380 * i + j); }) + restrictionEnd;
       },
       END, 1000},
      {"AudiencesOfAProxy", NO_CONDITIONS, CONDITIONS + "<saml:ProxyRestriction>", Audiences(),
       "</saml:ProxyRestriction>" + END},
      {"RestrictionsBeyondTheLimit", NO_CONDITIONS, CONDITIONS,
       Thin("<saml:AudienceRestriction~><saml:Audience>a</saml:Audience></saml:AudienceRestriction>", 3), END},
      {"ConfirmationsBeyondTheLimit", CONFIRMATION, "", Thin("<saml:SubjectConfirmation Method='a'~/>", 2),
       CONFIRMATION},
      {"StatementsBeyondTheLimit", STATEMENT, "",
       Thin("<saml:AuthnStatement AuthnInstant='2020-01-01T00:00:00Z'~><saml:AuthnContext><saml:AuthnContextClassRef>a"
            "</saml:AuthnContextClassRef></saml:AuthnContext></saml:AuthnStatement>",
            5),
       STATEMENT},
      {"ConfirmationsWithLongRecipients", CONFIRMATION, "",
       Always("<saml:SubjectConfirmation Method='urn:oasis:names:tc:SAML:2.0:cm:bearer'><saml:SubjectConfirmationData "
              "Recipient='" +
              std::string(16'000, 'r') + "'/></saml:SubjectConfirmation>"),
       "", 1000},
      {"ConfirmationsWithCertificates", CONFIRMATION, "", Always(Holder(KeyInfo(CertificateOfHolder()))), "", 1000},
      {"KeysThatAreTooShort", CONFIRMATION, "", Always(Holder(Repeat(75, Always(KeyInfo(weakKey))))), CONFIRMATION,
       1000},
      {"KeyValuesOfOneKeyInfo", CONFIRMATION,
       "<saml:SubjectConfirmation "
       "Method=\"urn:oasis:names:tc:SAML:2.0:cm:holder-of-key\"><saml:SubjectConfirmationData>"
       "<k:KeyInfo xmlns:k=\"http://www.w3.org/2000/09/xmldsig#\">",
       Always(weakKey), "</k:KeyInfo></saml:SubjectConfirmationData></saml:SubjectConfirmation>" + CONFIRMATION},
      {"ContentOfConfirmationData", CONFIRMATION,
       "<saml:SubjectConfirmation Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"><saml:SubjectConfirmationData>",
       Thin("<a~/>", 1), "</saml:SubjectConfirmationData></saml:SubjectConfirmation>"},
      {"Delegates", NO_CONDITIONS, CONDITIONS + delegation, Always(delegate + ">a</saml:NameID></d:Delegate>"),
       "</saml:Condition>" + END},
      {"DelegatesWithQualifiers", NO_CONDITIONS, CONDITIONS + delegation,
       Always(delegate +
              " Format='AAAAAAAAAAAAAAAAAAAAAAAA' NameQualifier='AAAAAAAAAAAAAAAAAAAAAAAAAAAAAA'>a</saml:NameID>"
              "</d:Delegate>"),
       "</saml:Condition>" + END},
      {"OneLongName", NAME, "<saml:NameID>", Always("A"), "</saml:NameID>"},
      {"OneLongQualifierThatMustBeEncoded", NAME, "<saml:NameID NameQualifier='", Always("A"), "'>a</saml:NameID>", 0,
       MAX_HEAP_OF_ENCODED},
      {"OneLongFormatThatMustBeEncoded", NAME, "<saml:NameID Format='", Always("A"), "'>a</saml:NameID>", 0,
       MAX_HEAP_OF_ENCODED},
      {"OneLongFormatOfADelegate", NO_CONDITIONS, CONDITIONS + delegation + delegate + " Format='", Always("A"),
       "'>a</saml:NameID></d:Delegate></saml:Condition>" + END},
      {"Advice", NO_CONDITIONS, NO_CONDITIONS + "<saml:Advice>", Thin("<a~/>", 1), "</saml:Advice>"},
      {"AdviceWithAssertions", NO_CONDITIONS, NO_CONDITIONS + "<saml:Advice>",
       [](std::size_t i) { return "<saml:Assertion ID='nested-" + Bench::Name(i) + "'/>"; }, "</saml:Advice>"},
  };
}

SsoClient::TokenVerifier MakeVerifier() {
  SsoClient::VerifyOptions options;
  options.profile = SsoClient::TokenProfile::SAML2;
  return SsoClient::TokenVerifier(
      {Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile("tokens/sts-rsa.crt"))}, options);
}

struct Cost {
  std::string refusal;
  std::size_t allocated = 0;
  std::size_t peak = 0;
};

/// What it costs to verify `xml`, or to explain it.
Cost Measure(const std::string &xml, bool isExplained) {
  static const SsoClient::TokenVerifier verifier = [] {
    SsoClient::TokenVerifier made = MakeVerifier();
    made.Explain(Testing::ReadDataFile("saml2/holder-rsa-value.xml")); // prepares what a process prepares only once
    return made;
  }();
  Cost cost;
  const Attacks::HeapCount heap;
  try {
    if (isExplained) {
      cost.refusal = verifier.Explain(xml).refusal;
    } else {
      verifier.Verify(xml);
    }
  } catch (const std::exception &failure) {
    cost.refusal = failure.what();
  }
  cost.allocated = heap.GetAllocated();
  cost.peak = heap.GetPeak();
  return cost;
}

/// With sanitizers, documents of the full size would take minutes. They are for the other builds, which also have the heap
/// to which the limits apply.
constexpr std::size_t LARGEST =
    Testing::IS_SANITIZED ? Tarvel::Xml::MAX_DOCUMENT_BYTES / 8 : Tarvel::Xml::MAX_DOCUMENT_BYTES;

class Saml2LargestDocument : public testing::TestWithParam<Saml2Document> {
protected:
  void ExpectACostInProportion(bool isExplained, std::size_t maxHeap) const {
    const std::string smallXml = MakeDocument(GetParam(), LARGEST / 4);
    const std::string largeXml = MakeDocument(GetParam(), LARGEST);
    const Cost small = Measure(smallXml, isExplained);
    const Cost large = Measure(largeXml, isExplained);
    EXPECT_FALSE(large.refusal.empty());
    EXPECT_EQ(std::string::npos, large.refusal.find("more than 1048576 nodes")) << large.refusal;
    EXPECT_LT(large.allocated, 6 * small.allocated) << small.allocated;
    EXPECT_LE(large.peak, maxHeap) << large.refusal.substr(0, 200);
  }
};

TEST_P(Saml2LargestDocument, IsVerifiedAtACostInProportion) {
  ExpectACostInProportion(false, MAX_HEAP);
}

TEST_P(Saml2LargestDocument, IsExplainedAtACostInProportion) {
  ExpectACostInProportion(true, GetParam().maxHeapOfReport);
}

INSTANTIATE_TEST_SUITE_P(Of, Saml2LargestDocument, testing::ValuesIn(Documents()),
                         [](const auto &document) { return std::string(document.param.name); });

} // namespace
} // namespace Reports
