// SPDX-License-Identifier: Apache-2.0

#include "unit/token/assertion_refusals.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <vector>

namespace {

using namespace SsoClient;
using namespace Testing;

TEST(AssertionRefusals, Subject) {
  const std::string name = Piece::SUBJECT_NAME;
  const std::string confirmation =
      Piece::Confirmation("bearer", std::string(Piece::DELEGATE_NAME) + Piece::BEARER_DATA);
  ExpectRefusals(BearerAssertion(),
                 {
                     {"<saml:Subject>", "<saml:Subject ID=\"\">", "Unexpected attributes on element 'saml:Subject'"},
                     {"<saml:Subject>", "<saml:Subject xmlns:saml=\"urn:other\">",
                      "Element 'saml:Subject' has unexpected namespace"},
                     {name, "", NotFound("NameID")},
                     {name, "<saml:BaseID/>", NotFound("NameID")},
                     {name, Twice(name), NotFound("SubjectConfirmation")},
                     {name + confirmation, confirmation + name, NotFound("NameID")},
                     {confirmation, "", NotFound("SubjectConfirmation")},
                     {confirmation, Twice(confirmation), "Unexpected elements after SubjectConfirmation"},
                     {confirmation, confirmation + "text", "Unexpected elements after SubjectConfirmation"},
                     {" Format=\"urn:format:subject\"", "", "Node 'saml:NameID is missing required attribute 'Format'"},
                     {"<saml:NameID Format=\"urn:format:subject\"", "<saml:NameID SPProvidedID=\"\" Format=\"\"",
                      "Unexpected attributes on element 'saml:NameID'"},
                     {"alice@corp", "", OnlyText("saml:NameID")},
                     {"alice@corp", "alice@corp<!-- cut -->.evil", OnlyText("saml:NameID")},
                     {"<saml:NameID Format=\"urn:format:subject\"", "<saml:NameID xmlns:saml=\"urn:other\" Format=\"\"",
                      "Element 'saml:NameID' has unexpected namespace"},
                 });
}

TEST(AssertionRefusals, SubjectConfirmation) {
  const std::string name = Piece::DELEGATE_NAME;
  const std::string data = Piece::BEARER_DATA;
  const std::string method = " Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\"";
  ExpectRefusals(
      BearerAssertion(),
      {
          {method, "", "Node 'saml:SubjectConfirmation is missing required attribute 'Method'"},
          {method, method + " Extra=\"\"", "Unexpected attributes on element 'saml:SubjectConfirmation'"},
          {method, " Method=\"urn:oasis:names:tc:SAML:2.0:cm:sender-vouches\"",
           "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'"},
          {method, " Method=\"\"", "Unknown subject confirmation method: ''"},
          {method, " Method=\"urn:oasis:names:tc:SAML:2.0:cm:Bearer\"",
           "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:Bearer'"},
          {name, Twice(name), NotFound("SubjectConfirmationData")},
          {"<saml:NameID Format=\"urn:format:delegate\"",
           "<saml:NameID xmlns:saml=\"urn:other\" Format=\"urn:format:delegate\"", NotFound("SubjectConfirmationData")},
          {name + data, data + name, "Unexpected elements after SubjectConfirmationData"},
          {data, "", NotFound("SubjectConfirmationData")},
          {data, Twice(data), "Unexpected elements after SubjectConfirmationData"},
          {"<saml:SubjectConfirmation ", "<saml:SubjectConfirmation xmlns:saml=\"urn:other\" ",
           "Element 'saml:SubjectConfirmation' has unexpected namespace"},
      });
}

TEST(AssertionRefusals, BearerData) {
  const std::string data = Piece::BEARER_DATA;
  const std::string date = " NotOnOrAfter=\"2026-01-01T08:00:00Z\"";
  const auto withContent = [&](const std::string &content) {
    return "<saml:SubjectConfirmationData" + date + ">" + content + "</saml:SubjectConfirmationData>";
  };
  const std::string notEmpty = "Element 'saml:SubjectConfirmationData' must be empty";
  ExpectRefusals(
      BearerAssertion(),
      {
          {date, "", "Node 'saml:SubjectConfirmationData is missing required attribute 'NotOnOrAfter'"},
          {date, date + " Recipient=\"\"", "Unexpected attributes on element 'saml:SubjectConfirmationData'"},
          {date, date + " xsi:type=\"saml:KeyInfoConfirmationDataType\"",
           "Unexpected attributes on element 'saml:SubjectConfirmationData'"},
          {date, " NotOnOrAfter=\"soon\"", "saml:SubjectConfirmationData/@NotOnOrAfter is not a date"},
          {data, withContent("<ds:KeyInfo/>"), notEmpty},
          {data, withContent("text"), notEmpty},
          {"<saml:SubjectConfirmationData", "<saml:SubjectConfirmationData xmlns:saml=\"urn:other\"",
           "Element 'saml:SubjectConfirmationData' has unexpected namespace"},
      });
}

TEST(AssertionRefusals, HolderOfKeyData) {
  const std::string type = " xsi:type=\"saml:KeyInfoConfirmationDataType\"";
  const std::string end = "</saml:SubjectConfirmationData>";
  const std::string where = "Element saml:SubjectConfirmationDataat 1,";
  const std::string base = HolderOfKeyAssertion();
  const std::size_t column = base.find("<saml:SubjectConfirmationData") + 1;
  ExpectRefusals(base, {
                           {type, "",
                            "Node 'saml:SubjectConfirmationData is missing required attribute "
                            "'{http://www.w3.org/2001/XMLSchema-instance}type'"},
                           {type, " type=\"saml:KeyInfoConfirmationDataType\"",
                            "Unexpected attribute 'type' on element 'saml:SubjectConfirmationData'"},
                           {type, type + " NotOnOrAfter=\"2026-01-01T08:00:00Z\"",
                            "Unexpected attribute 'NotOnOrAfter' on element 'saml:SubjectConfirmationData'"},
                           {type, type + " saml:NotOnOrAfter=\"\"",
                            "Unexpected attribute '{urn:oasis:names:tc:SAML:2.0:assertion}NotOnOrAfter' on element "
                            "'saml:SubjectConfirmationData'"},
                           {type, " xsi:type=\"p:KeyInfoConfirmationDataType\"",
                            where + std::to_string(column) + " uses undefined prefix: `p'"},
                           {type, " p:type=\"saml:KeyInfoConfirmationDataType\"",
                            where + std::to_string(column) + " uses undefined prefix: `p'"},
                           {type, " xsi:type=\"saml:SubjectConfirmationDataType\"",
                            "Invalid SubjectConfirmationData type: 'saml:SubjectConfirmationDataType'"},
                           {type, " xsi:type=\"KeyInfoConfirmationDataType\"",
                            "Invalid SubjectConfirmationData type: 'KeyInfoConfirmationDataType'"},
                           {type, " xsi:type=\"\"", "Invalid SubjectConfirmationData type: ''"},
                           {end, "<ds:KeyInfo/>" + end, "Unexpected elements after SubjectConfirmationData/KeyInfo"},
                           {end, "text" + end, "Unexpected elements after SubjectConfirmationData/KeyInfo"},
                           {end, end + "<saml:NameID/>", "Unexpected elements after SubjectConfirmationData"},
                           {"<ds:KeyInfo>", "<saml:Extra/><ds:KeyInfo>", NotFound("KeyInfo")},
                           {"<saml:SubjectConfirmationData", "<saml:SubjectConfirmationData xmlns:saml=\"urn:other\"",
                            "Element 'saml:SubjectConfirmationData' has unexpected namespace"},
                       });
}

TEST(AssertionRefusals, KeyInfoOfHolderOfKey) {
  const std::string keyInfo = "<ds:KeyInfo>";
  const std::string data = "<ds:X509Data>";
  const std::string certificate = "<ds:X509Certificate>";
  ExpectRefusals(
      HolderOfKeyAssertion(),
      {
          {keyInfo, "<ds:KeyInfo Id=\"\">", "Unexpected attributes on element 'ds:KeyInfo'"},
          {keyInfo, "<ds:KeyInfo xmlns:ds=\"urn:other\">", "Element 'ds:KeyInfo' has unexpected namespace"},
          {keyInfo, "<ds:KeyInfo><ds:KeyName>x</ds:KeyName>", NotFound("X509Data")},
          {data, "<ds:X509Data Id=\"\">", "Unexpected attributes on element 'ds:X509Data'"},
          {data, "<ds:X509Data xmlns:ds=\"urn:other\">", "Element 'ds:X509Data' has unexpected namespace"},
          {data, "<ds:X509Data><ds:X509SubjectName>x</ds:X509SubjectName>", NotFound("X509Certificate")},
          {certificate, "<ds:X509Certificate Id=\"\">", "Unexpected attributes on element 'ds:X509Certificate'"},
          {certificate, "<ds:X509Certificate xmlns:ds=\"urn:other\">",
           "Element 'ds:X509Certificate' has unexpected namespace"},
          {certificate, "<ds:X509Certificate><b/>", OnlyText("ds:X509Certificate")},
          {"</ds:X509Certificate>", "</ds:X509Certificate><ds:X509Certificate/>",
           "Unexpected elements after X509Certificate"},
          {"</ds:X509Data>", "</ds:X509Data><ds:X509Data/>", "Unexpected elements after X509Data"},
      });
}

TEST(AssertionRefusals, CertificateThatDoesNotDecode) {
  const auto parseWith = [](const std::string &base64) {
    Parse(ReplaceOnce(HolderOfKeyAssertion(), HolderCertificateBase64(), base64));
  };
  const std::string start = "X509Certificate does not decode: ";
  const std::string truncated = HolderCertificateBase64().substr(0, 400);
  for (const std::string &base64 : std::vector<std::string>{"*", "AAA", "AAAA", truncated}) {
    try {
      parseWith(base64);
      ADD_FAILURE() << base64;
    } catch (const ParseException &error) {
      const std::string message = error.what();
      EXPECT_EQ(start, message.substr(0, start.size()));
      EXPECT_GT(message.size(), start.size());
    }
  }
}

} // namespace
