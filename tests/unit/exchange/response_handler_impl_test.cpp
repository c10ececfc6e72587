// SPDX-License-Identifier: Apache-2.0

#include "exchange/response_handler_impl.h"

#include "support/soap_responses.h"
#include "support/throws_message.h"
#include "unit/exchange/acquired_token.h"

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
#include <vector>

namespace SsoClient {
namespace {

using Testing::Acquire;
using Testing::Collection;
using Testing::Envelope;
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
