// SPDX-License-Identifier: Apache-2.0

#include "exchange/soap_response.h"

#include "support/soap_responses.h"
#include "support/throws_message.h"
#include "unit/exchange/acquired_token.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <utility>

namespace SsoClient {
namespace {

using Testing::Acquire;
using Testing::Envelope;
using Testing::FaultResponse;

/// A text with a declared charset.
class DeclaredReader final : public Tarvel::Reader {
public:
  DeclaredReader(const std::string &text, std::string charset)
      : m_text(Tarvel::CreateStringReader(text)), m_charset(std::move(charset)) {}
  std::size_t Read(char *buffer, std::size_t length) override { return m_text->Read(buffer, length); }
  std::string GetDeclaredCharset() const override { return m_charset; }

private:
  const Tarvel::Ref<Tarvel::Reader> m_text;
  const std::string m_charset;
};

TEST(ParseResponseDocument, ReportsTheDeclaredCharsetOfTextThatIsNotXml) {
  const std::string refusal = "Response is not well-formed XML: the document is not UTF-8 at line 1, column 4";
  struct Case {
    const char *charset;
    std::string message;
  };
  for (const Case &declared :
       {Case{"windows-1252", refusal + " (charset windows-1252)"}, Case{"US-ASCII", refusal + " (charset US-ASCII)"},
        Case{"utf-8", refusal}, Case{"UTF-8", refusal}, Case{"Utf8", refusal}, Case{"", refusal}}) {
    EXPECT_THROWS_MESSAGE(ParseResponseDocument(*Tarvel::MakeRef<DeclaredReader>("<a>\xFC</a>", declared.charset)),
                          SsoException, declared.message);
  }
}

TEST(ParseResponseDocument, IgnoresTheDeclaredCharsetOfXml) {
  const auto document = ParseResponseDocument(*Tarvel::MakeRef<DeclaredReader>("<a/>", "windows-1252"));
  EXPECT_EQ(document->GetName(), "a");
}

TEST(CheckSoapFault, RecognisesFailedAuthenticationByEachOfItsThreeNames) {
  for (const char *code : {"wst:FailedAuthentication", "wst:InvalidSecurityToken", "wsse:InvalidSecurityToken"}) {
    EXPECT_THROWS_MESSAGE(Acquire(FaultResponse(code, "Wrong password")), InvalidCredentialsException,
                          "Authentication failed: Wrong password");
  }
}

TEST(CheckSoapFault, ResolvesThePrefixByTheDeclarationsAtTheFaultCode) {
  EXPECT_THROWS_MESSAGE(
      Acquire("<Envelope><Body><Fault><faultcode xmlns:f='http://docs.oasis-open.org/ws-sx/ws-trust/200512'>"
              "f:FailedAuthentication</faultcode></Fault></Body></Envelope>"),
      InvalidCredentialsException, "Authentication failed");
}

TEST(CheckSoapFault, IgnoresTheDefaultNamespaceForAFaultCodeWithoutPrefix) {
  EXPECT_THROWS_MESSAGE(Acquire("<Envelope xmlns='http://docs.oasis-open.org/ws-sx/ws-trust/200512'><Body><Fault>"
                                "<faultcode>FailedAuthentication</faultcode></Fault></Body></Envelope>"),
                        SsoException, "Unexpected SOAP fault: FailedAuthentication; request failed.");
}

TEST(CheckSoapFault, AddsNothingForAFaultStringThatIsEmptyMissingOrNotText) {
  const std::string code = "<faultcode>wst:FailedAuthentication</faultcode>";
  for (const char *text : {"", "<faultstring/>", "<faultstring></faultstring>", "<faultstring><b>x</b></faultstring>",
                           "<faultstring><!-- x -->y</faultstring>"}) {
    EXPECT_THROWS_MESSAGE(Acquire(Envelope("<Fault>" + code + text + "</Fault>")), InvalidCredentialsException,
                          "Authentication failed");
  }
}

TEST(CheckSoapFault, ReportsAnyOtherCodeAsItIsWrittenWithoutTheFaultString) {
  struct {
    const char *code;
    const char *message;
  } const cases[] = {
      {"wsse:FailedAuthentication", "Unexpected SOAP fault: wsse:FailedAuthentication; request failed."},
      {"soapenv:FailedAuthentication", "Unexpected SOAP fault: soapenv:FailedAuthentication; request failed."},
      {"wst:failedauthentication", "Unexpected SOAP fault: wst:failedauthentication; request failed."},
      {"wst:FailedAuthentication ", "Unexpected SOAP fault: wst:FailedAuthentication ; request failed."},
      {"wst:RequestFailed", "Unexpected SOAP fault: wst:RequestFailed; request failed."},
      {"FailedAuthentication", "Unexpected SOAP fault: FailedAuthentication; request failed."},
      {"soapenv:Server", "Unexpected SOAP fault: soapenv:Server; request failed."},
      {"Server", "Unexpected SOAP fault: Server; request failed."},
  };
  for (const auto &expected : cases) {
    EXPECT_THROWS_MESSAGE(Acquire(FaultResponse(expected.code, "secret detail")), SsoException, expected.message);
  }
}

TEST(CheckSoapFault, RefusesAFaultWithoutFaultCodeText) {
  for (const char *code : {"", "<faultcode/>", "<faultcode><b>wst:FailedAuthentication</b></faultcode>",
                           "<faultcode><!-- x -->wst:FailedAuthentication</faultcode>"}) {
    EXPECT_THROWS_MESSAGE(Acquire(Envelope("<Fault>" + std::string(code) + "<faultstring>x</faultstring></Fault>")),
                          SsoException, "Invalid SOAP response: missing faultcode.");
  }
}

TEST(CheckSoapFault, RefusesAFaultCodeWhosePrefixIsNotBound) {
  EXPECT_THROWS_MESSAGE(Acquire("<Envelope><Body><Fault>\n<faultcode>p:Server</faultcode></Fault></Body></Envelope>"),
                        ParseException, "Element faultcodeat 2,1 uses undefined prefix: `p'");
}

} // namespace
} // namespace SsoClient
