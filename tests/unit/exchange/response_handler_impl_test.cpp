// SPDX-License-Identifier: Apache-2.0

#include "exchange/response_handler_impl.h"

#include "exchange/soap_response.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/security/exceptions.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Collection;
using Testing::Envelope;
using Testing::FaultResponse;
using Testing::Requested;
using Testing::ResponseElement;

const char ASSERTION[] = "<saml:Assertion xmlns:saml='urn:oasis:names:tc:SAML:2.0:assertion' ID='_1'><!-- gone -->"
                         "<saml:Issuer a='1'/></saml:Assertion>";
/// The inclusive canonical form of `ASSERTION` within an envelope of `Testing::Envelope`.
const char CANONICAL_ASSERTION[] =
    R"(<saml:Assertion xmlns:saml="urn:oasis:names:tc:SAML:2.0:assertion")"
    R"( xmlns:soapenv="http://schemas.xmlsoap.org/soap/envelope/")"
    R"( xmlns:wsse="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd")"
    R"( xmlns:wst="http://docs.oasis-open.org/ws-sx/ws-trust/200512" ID="_1"><saml:Issuer a="1"></saml:Issuer>)"
    R"(</saml:Assertion>)";
const char VALID[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid";
const char INVALID[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/invalid";
const char UNEXPECTED[] = "Unexpected XML format";

std::string Acquire(const std::string &response) {
  std::string token = "before";
  ResponseHandlerImpl().HandleAcquireTokenResponse(Tarvel::CreateStringReader(response).get(), token);
  return token;
}

std::string Renew(const std::string &response) {
  std::string token = "before";
  ResponseHandlerImpl().HandleRenewTokenResponse(Tarvel::CreateStringReader(response).get(), token);
  return token;
}

std::string Validate(const std::string &response) {
  return ResponseHandlerImpl().HandleValidateSubjectResponse(Tarvel::CreateStringReader(response).get()) ? "valid"
                                                                                                         : "invalid";
}

SPNegoResponse ReadLeg(const std::string &response) {
  SPNegoResponse leg{"before", {1}, "before"};
  ResponseHandlerImpl().HandleSPNegoResponse(Tarvel::CreateStringReader(response).get(), leg);
  return leg;
}

std::string Negotiate(const std::string &response) {
  return ReadLeg(response).contextId;
}

struct Operation {
  const char *name;
  std::string (*handle)(const std::string &);
};

void PrintTo(const Operation &operation, std::ostream *out) {
  *out << operation.name;
}

/// Behaviour that all operations share.
class EachResponse : public testing::TestWithParam<Operation> {
protected:
  std::string Handle(const std::string &response) const { return GetParam().handle(response); }
};

TEST_P(EachResponse, IsRefusedWithTheParsersMessageWhenItIsNotXml) {
  EXPECT_THROWS_MESSAGE(Handle("<a><b></a>"), SsoException,
                        "Response is not well-formed XML: the element 'b' of line 1 has another end tag at line 1, "
                        "column 7");
  EXPECT_THROWS_MESSAGE(Handle(""), SsoException,
                        "Response is not well-formed XML: the document is empty at line 1, column 1");
  EXPECT_THROWS_MESSAGE(
      Handle("<!DOCTYPE a><a/>"), SsoException,
      "Response is not well-formed XML: a document type declaration is not accepted at line 1, column 1");
}

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

TEST_P(EachResponse, IsRefusedWithoutBodyWhateverElseItContains) {
  const char message[] = "Unexpected response format: missing SAOP Body.";
  EXPECT_THROWS_MESSAGE(Handle("<Envelope/>"), SsoException, message);
  EXPECT_THROWS_MESSAGE(Handle("<Envelope><Fault><faultcode>a</faultcode></Fault></Envelope>"), SsoException, message);
  EXPECT_THROWS_MESSAGE(Handle("<Body><Fault><faultcode>a</faultcode></Fault></Body>"), SsoException, message);
  EXPECT_THROWS_MESSAGE(Handle(ResponseElement("x", " xmlns:wst='w'")), SsoException, message);
}

TEST_P(EachResponse, IsRefusedWithAnEmptyBody) {
  EXPECT_THROWS_MESSAGE(Handle(Envelope("")), SsoException, UNEXPECTED);
  EXPECT_THROWS_MESSAGE(Handle(Envelope("text <!-- and a comment -->")), SsoException, UNEXPECTED);
}

TEST_P(EachResponse, HasAFaultOnlyAsAChildOfTheBody) {
  EXPECT_THROWS_MESSAGE(Handle(Envelope("<x><Fault><faultcode>a</faultcode></Fault></x>")), SsoException, UNEXPECTED);
}

TEST_P(EachResponse, ReportsAFaultEvenIfThereIsAResult) {
  const std::string fault = "<Fault><faultcode>busy</faultcode></Fault>";
  EXPECT_THROWS_MESSAGE(Handle(Envelope(Collection(ResponseElement(Requested(ASSERTION))) + fault)), SsoException,
                        "Unexpected SOAP fault: busy; request failed.");
}

INSTANTIATE_TEST_SUITE_P(ResponseHandlerImpl, EachResponse,
                         testing::Values(Operation{"Acquire", Acquire}, Operation{"Renew", Renew},
                                         Operation{"Validate", Validate}, Operation{"Negotiate", Negotiate}),
                         [](const auto &operation) { return std::string(operation.param.name); });

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

TEST(HandleAcquireTokenResponse, ReturnsTheCanonicalFormOfTheAssertionInTheResponse) {
  EXPECT_EQ(Acquire(Testing::IssueResponse(ASSERTION)), CANONICAL_ASSERTION);
}

TEST(HandleAcquireTokenResponse, ComparesOnlyLocalNamesAndUsesTheFirstElementOfAName) {
  EXPECT_EQ(Acquire("<a><Body><RequestSecurityTokenResponseCollection><RequestSecurityTokenResponse>"
                    "<RequestedSecurityToken><x xmlns='urn:x'/><Assertion/><Assertion ID='2'/></RequestedSecurityToken>"
                    "</RequestSecurityTokenResponse></RequestSecurityTokenResponseCollection></Body></a>"),
            "<Assertion></Assertion>");
}

TEST(HandleAcquireTokenResponse, DoesNotTryASecondElementOfAName) {
  EXPECT_THROWS_MESSAGE(Acquire(Envelope(Collection(ResponseElement("") + ResponseElement(Requested(ASSERTION))))),
                        SsoException, UNEXPECTED);
}

TEST(HandleAcquireTokenResponse, IgnoresTheTokenType) {
  EXPECT_EQ(Acquire(Envelope(Collection(ResponseElement("<TokenType>urn:other</TokenType>" + Requested(ASSERTION))))),
            CANONICAL_ASSERTION);
}

TEST(HandleAcquireTokenResponse, RefusesAResponseInWhichAnElementOfThePathIsMissing) {
  for (const std::string &content :
       {ResponseElement(Requested(ASSERTION)), Collection(""), Collection(ResponseElement("")),
        Collection(ResponseElement("<RequestedSecurityToken/>")), Collection(Requested(ASSERTION)),
        Collection(ResponseElement(ASSERTION)), std::string(ASSERTION)}) {
    EXPECT_THROWS_MESSAGE(Acquire(Envelope(content)), SsoException, UNEXPECTED) << content;
  }
}

TEST(HandleAcquireTokenResponse, PassesOnTheExceptionOfAnAssertionWithoutCanonicalForm) {
  EXPECT_THROWS_MESSAGE(Acquire(Testing::IssueResponse("<Assertion><p:a/></Assertion>")),
                        Tarvel::Xml::Security::XmlSecurityException,
                        "No canonical form: the prefix \"p\" is not bound at line 2, column 381");
}

TEST(HandleAcquireTokenResponse, DoesNotChangeTheTextWhenItFails) {
  std::string token = "before";
  EXPECT_THROWS_MESSAGE(
      ResponseHandlerImpl().HandleAcquireTokenResponse(Tarvel::CreateStringReader(Envelope("")).get(), token),
      SsoException, UNEXPECTED);
  EXPECT_EQ(token, "before");
}

TEST(HandleRenewTokenResponse, ReturnsTheCanonicalFormOfTheAssertion) {
  EXPECT_EQ(Renew(Testing::RenewResponse(ASSERTION)), CANONICAL_ASSERTION);
}

TEST(HandleRenewTokenResponse, RefusesACollectionAndAResponseInWhichAnElementOfThePathIsMissing) {
  for (const std::string &content :
       {Collection(ResponseElement(Requested(ASSERTION))), ResponseElement(""),
        ResponseElement("<RequestedSecurityToken/>"), ResponseElement(ASSERTION), Requested(ASSERTION)}) {
    EXPECT_THROWS_MESSAGE(Renew(Envelope(content)), SsoException, UNEXPECTED) << content;
  }
}

TEST(HandleValidateSubjectResponse, ReadsBothVerdicts) {
  EXPECT_EQ(Validate(Testing::ValidateResponse(VALID)), "valid");
  EXPECT_EQ(Validate(Testing::ValidateResponse(INVALID)), "invalid");
}

TEST(HandleValidateSubjectResponse, ReadsTextInCdataOrBeforeAComment) {
  EXPECT_EQ(Validate(Testing::ValidateResponse("<![CDATA[" + std::string(VALID) + "]]>")), "valid");
  EXPECT_EQ(Validate(Testing::ValidateResponse(std::string(VALID) + "<!-- x -->")), "valid");
}

TEST(HandleValidateSubjectResponse, RefusesAnyOtherText) {
  const std::string valid = VALID;
  for (const std::string &code : {" " + valid, valid + " ", "\n" + valid + "\n", valid + "/", std::string("valid"),
                                  std::string(), "<b>" + valid + "</b>", "<!-- x -->" + valid,
                                  std::string("http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/Valid"),
                                  std::string("http://docs.oasis-open.org/ws-sx/ws-trust/200512//status/valid"),
                                  std::string("http://docs.oasis-open.org/ws-sx/ws-trust/200512")}) {
    EXPECT_THROWS_MESSAGE(Validate(Testing::ValidateResponse(code)), SsoException, UNEXPECTED) << code;
  }
}

TEST(HandleValidateSubjectResponse, RefusesAResponseInWhichAnElementOfThePathIsMissing) {
  for (const std::string &content :
       {ResponseElement(""), ResponseElement("<Status/>"), ResponseElement("<Code>" + std::string(VALID) + "</Code>"),
        Collection(ResponseElement("<Status><Code>" + std::string(VALID) + "</Code></Status>"))}) {
    EXPECT_THROWS_MESSAGE(Validate(Envelope(content)), SsoException, UNEXPECTED) << content;
  }
}

TEST(HandleSPNegoResponse, ReadsAnIntermediateLegWithAnEmptyToken) {
  const SPNegoResponse leg = ReadLeg(Testing::IntermediateLeg("urn:ctx", "aGVs\nbG8="));
  EXPECT_EQ(leg.contextId, "urn:ctx");
  EXPECT_EQ(leg.leg, (std::vector<std::uint8_t>{'h', 'e', 'l', 'l', 'o'}));
  EXPECT_EQ(leg.tokenXml, "");
}

TEST(HandleSPNegoResponse, ReadsAFinalLegWithExchangeAndToken) {
  const SPNegoResponse leg = ReadLeg(Testing::FinalLeg("urn:ctx", "AQID", ASSERTION));
  EXPECT_EQ(leg.contextId, "urn:ctx");
  EXPECT_EQ(leg.leg, (std::vector<std::uint8_t>{1, 2, 3}));
  EXPECT_EQ(leg.tokenXml, CANONICAL_ASSERTION);
}

TEST(HandleSPNegoResponse, ReplacesEveryFieldEvenIfTheFinalLegHasNoExchange) {
  const SPNegoResponse leg = ReadLeg(Testing::FinalLeg("", "", ASSERTION));
  EXPECT_EQ(leg.contextId, "");
  EXPECT_EQ(leg.leg, std::vector<std::uint8_t>());
  EXPECT_EQ(leg.tokenXml, CANONICAL_ASSERTION);
}

TEST(HandleSPNegoResponse, ReadsAResponseOutsideTheCollectionAsIntermediateWhateverElseThereIs) {
  const std::string final = Testing::FinalLeg("final", "AQID", ASSERTION);
  const std::string intermediate = ResponseElement("<BinaryExchange>BAUG</BinaryExchange>", " Context='first'");
  const std::string body = "<soapenv:Body>";
  std::string both = final;
  both.insert(both.find(body) + body.size(), intermediate);
  EXPECT_EQ(ReadLeg(both).contextId, "first");
  EXPECT_EQ(ReadLeg(both).tokenXml, "");
}

TEST(HandleSPNegoResponse, RefusesALegWithoutContext) {
  const std::string exchange = "<BinaryExchange>AQID</BinaryExchange>";
  const std::string type = "<TokenType>urn:oasis:names:tc:SAML:2.0:assertion</TokenType>";
  for (const std::string &content :
       {ResponseElement(exchange), Collection(ResponseElement(exchange + type + Requested(ASSERTION))),
        ResponseElement(exchange, " xmlns:p='urn:p' p:Context='c'"), Collection(""), Collection(exchange)}) {
    EXPECT_THROWS_MESSAGE(ReadLeg(Envelope(content)), SsoException, UNEXPECTED) << content;
  }
}

TEST(HandleSPNegoResponse, RefusesAnIntermediateLegWithoutExchange) {
  for (const char *exchange : {"", "<BinaryExchange/>", "<BinaryExchange><b>AQID</b></BinaryExchange>"}) {
    EXPECT_THROWS_MESSAGE(ReadLeg(Envelope(ResponseElement(exchange, " Context='c'"))), SsoException, UNEXPECTED);
  }
}

TEST(HandleSPNegoResponse, RefusesBrokenBase64InBothKindsOfLeg) {
  for (const char *exchange : {"AQI", "AQ=D", "A*ID", "=", "AQIDBA=="}) {
    const bool isBroken = std::string(exchange) != "AQIDBA==";
    if (!isBroken) {
      EXPECT_NO_THROW(ReadLeg(Testing::IntermediateLeg("c", exchange)));
      continue;
    }
    EXPECT_THROWS_MESSAGE(ReadLeg(Testing::IntermediateLeg("c", exchange)), SsoException, "Base64 format exception");
    EXPECT_THROWS_MESSAGE(ReadLeg(Testing::FinalLeg("c", exchange, ASSERTION)), SsoException,
                          "Base64 format exception");
  }
}

TEST(HandleSPNegoResponse, RefusesAFinalLegWithoutToken) {
  const std::string type = "<TokenType>urn:oasis:names:tc:SAML:2.0:assertion</TokenType>";
  for (const std::string &content : {type, type + "<RequestedSecurityToken/>", type + ASSERTION}) {
    EXPECT_THROWS_MESSAGE(ReadLeg(Envelope(Collection(ResponseElement(content, " Context='c'")))), SsoException,
                          UNEXPECTED);
  }
}

TEST(HandleSPNegoResponse, ReportsTheFirstOfSeveralFaultsOfAFinalLeg) {
  const auto final = [](const char *context, const std::string &content) {
    return Envelope(Collection(ResponseElement("<BinaryExchange>AQI</BinaryExchange>" + content, context)));
  };
  EXPECT_THROWS_MESSAGE(ReadLeg(final("", Requested(ASSERTION))), SsoException, UNEXPECTED);
  EXPECT_THROWS_MESSAGE(ReadLeg(final(" Context='c'", "")), SsoException, "Base64 format exception");
  EXPECT_THROWS_MESSAGE(ReadLeg(Envelope(Collection(ResponseElement("", " Context='c'")))), SsoException, UNEXPECTED);
}

TEST(HandleSPNegoResponse, RefusesAFinalLegOfAnotherTokenTypeWithAMessageWhoseParenthesisStaysOpen) {
  const auto final = [](const std::string &type) {
    return Envelope(Collection(ResponseElement(type + Requested(ASSERTION), " Context='c'")));
  };
  EXPECT_THROWS_MESSAGE(ReadLeg(final("")), SsoException,
                        "Invalid token type:  (expected: urn:oasis:names:tc:SAML:2.0:assertion");
  EXPECT_THROWS_MESSAGE(ReadLeg(final("<TokenType>urn:other</TokenType>")), SsoException,
                        "Invalid token type: urn:other (expected: urn:oasis:names:tc:SAML:2.0:assertion");
}

TEST(HandleSPNegoResponse, DoesNotChangeTheRecordWhenItFails) {
  SPNegoResponse leg{"before", {1}, "before"};
  const std::string response = Envelope(Collection(ResponseElement(Requested(ASSERTION), " Context='c'")));
  EXPECT_THROWS_MESSAGE(ResponseHandlerImpl().HandleSPNegoResponse(Tarvel::CreateStringReader(response).get(), leg),
                        SsoException, "Invalid token type:  (expected: urn:oasis:names:tc:SAML:2.0:assertion");
  EXPECT_EQ(leg.contextId, "before");
  EXPECT_EQ(leg.leg, std::vector<std::uint8_t>{1});
  EXPECT_EQ(leg.tokenXml, "before");
}

TEST(ResponseHandlerImpl, RefusesEveryPrefixOfAResponseAsNotWellFormed) {
  const std::string response = Testing::FinalLeg("c", "AQID", ASSERTION);
  for (std::size_t length = 0; length < response.size(); ++length) {
    try {
      ReadLeg(response.substr(0, length));
      ADD_FAILURE() << "accepted the first " << length << " bytes";
    } catch (const SsoException &refusal) {
      EXPECT_EQ(std::string(refusal.what()).rfind("Response is not well-formed XML: ", 0), 0u)
          << refusal.what() << " for the first " << length << " bytes";
    }
  }
}

} // namespace
} // namespace SsoClient
