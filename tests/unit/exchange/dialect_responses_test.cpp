// SPDX-License-Identifier: Apache-2.0
// How the switches of a dialect change what is read from responses.
#include "exchange/response_handler_impl.h"

#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Collection;
using Testing::Envelope;
using Testing::FaultResponse;
using Testing::Requested;
using Testing::ResponseElement;

const char UNEXPECTED[] = "Unexpected XML format";
const std::string STATUS =
    "<wst:Status><wst:Code>http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid</wst:Code></wst:Status>";
const std::string EXCHANGE = "<wst:BinaryExchange>AQID</wst:BinaryExchange>";
const std::string SAML_TYPE = "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>";

std::string Token(const std::string &id) {
  return Requested("<Assertion ID='" + id + "'/>");
}

ServiceDialect AnyResponse() {
  ServiceDialect dialect;
  dialect.acceptsAnyResponse = true;
  return dialect;
}

ServiceDialect WithFault(const std::string &namespaceUri, const std::string &localName) {
  ServiceDialect dialect;
  dialect.credentialFaults = {{"urn:first", "First"}, {namespaceUri, localName}};
  return dialect;
}

/// The identifier of the assertion in canonical form.
std::string IdIn(const std::string &assertion) {
  const std::size_t start = assertion.find(" ID=\"") + 5;
  return assertion.substr(start, assertion.find('"', start) - start);
}

std::string Acquired(const ServiceDialect &dialect, const std::string &response) {
  std::string token;
  ResponseHandlerImpl(dialect).HandleAcquireTokenResponse(Tarvel::CreateStringReader(response).get(), token);
  return IdIn(token);
}

std::string Renewed(const ServiceDialect &dialect, const std::string &response) {
  std::string token;
  ResponseHandlerImpl(dialect).HandleRenewTokenResponse(Tarvel::CreateStringReader(response).get(), token);
  return IdIn(token);
}

bool IsValid(const ServiceDialect &dialect, const std::string &response) {
  return ResponseHandlerImpl(dialect).HandleValidateSubjectResponse(Tarvel::CreateStringReader(response).get());
}

SPNegoResponse Leg(const ServiceDialect &dialect, const std::string &response) {
  SPNegoResponse leg;
  ResponseHandlerImpl(dialect).HandleSPNegoResponse(Tarvel::CreateStringReader(response).get(), leg);
  return leg;
}

TEST(AnyResponse, IsFoundInAndOutsideACollectionForEachOperation) {
  const std::string issued = ResponseElement(Token("_1"));
  const std::string judged = ResponseElement(STATUS);
  for (const std::string &response : {Envelope(issued), Envelope(Collection(issued))}) {
    EXPECT_EQ(Acquired(AnyResponse(), response), "_1");
    EXPECT_EQ(Renewed(AnyResponse(), response), "_1");
  }
  EXPECT_TRUE(IsValid(AnyResponse(), Envelope(judged)));
  EXPECT_TRUE(IsValid(AnyResponse(), Envelope(Collection(judged))));
}

TEST(AnyResponse, IsFoundOnlyInItsPlaceWithoutTheSwitch) {
  const std::string issued = ResponseElement(Token("_1"));
  EXPECT_THROWS_MESSAGE(Acquired({}, Envelope(issued)), SsoException, UNEXPECTED);
  EXPECT_THROWS_MESSAGE(Renewed({}, Envelope(Collection(issued))), SsoException, UNEXPECTED);
  EXPECT_THROWS_MESSAGE(IsValid({}, Envelope(Collection(ResponseElement(STATUS)))), SsoException, UNEXPECTED);
  EXPECT_THROWS_MESSAGE(Leg({}, Envelope(ResponseElement(SAML_TYPE + Token("_1"), " Context='c'"))), SsoException,
                        UNEXPECTED);
}

TEST(AnyResponse, IsSearchedFirstInTheUsualPlaceOfTheOperation) {
  const std::string both =
      Envelope(ResponseElement(Token("_body")) + Collection(ResponseElement(Token("_collection"))));
  EXPECT_EQ(Acquired(AnyResponse(), both), "_collection");
  EXPECT_EQ(Renewed(AnyResponse(), both), "_body");
}

TEST(AnyResponse, IsRefusedWithoutAResponseElement) {
  for (const std::string &response : {Envelope(""), Envelope(Token("_1")), Envelope(Collection(Token("_1")))}) {
    EXPECT_THROWS_MESSAGE(Acquired(AnyResponse(), response), SsoException, UNEXPECTED);
    EXPECT_THROWS_MESSAGE(Renewed(AnyResponse(), response), SsoException, UNEXPECTED);
    EXPECT_THROWS_MESSAGE(IsValid(AnyResponse(), response), SsoException, UNEXPECTED);
    EXPECT_THROWS_MESSAGE(Leg(AnyResponse(), response), SsoException, UNEXPECTED);
  }
}

TEST(AnyResponse, EndsANegotiationWithTheTokenWhereverItIs) {
  const std::string last = ResponseElement(SAML_TYPE + EXCHANGE + Token("_1"), " Context='c'");
  for (const std::string &response : {Envelope(last), Envelope(Collection(last))}) {
    const SPNegoResponse leg = Leg(AnyResponse(), response);
    EXPECT_EQ(IdIn(leg.tokenXml), "_1");
    EXPECT_EQ(leg.contextId, "c");
    EXPECT_EQ(leg.leg, (std::vector<std::uint8_t>{1, 2, 3}));
  }
}

TEST(AnyResponse, ContinuesANegotiationWithALegWhereverItIs) {
  const std::string next = ResponseElement(EXCHANGE, " Context='c'");
  for (const std::string &response : {Envelope(next), Envelope(Collection(next))}) {
    const SPNegoResponse leg = Leg(AnyResponse(), response);
    EXPECT_EQ(leg.tokenXml, "");
    EXPECT_EQ(leg.contextId, "c");
    EXPECT_EQ(leg.leg, (std::vector<std::uint8_t>{1, 2, 3}));
  }
  EXPECT_THROWS_MESSAGE(Leg(AnyResponse(), Envelope(Collection(ResponseElement("", " Context='c'")))), SsoException,
                        UNEXPECTED);
}

TEST(RequestedTokenType, IsRequiredAtTheEndOfANegotiation) {
  const auto end = [](const std::string &type) {
    return Envelope(
        Collection(ResponseElement("<wst:TokenType>" + type + "</wst:TokenType>" + Token("_1"), " Context='c'")));
  };
  ServiceDialect dialect;
  dialect.tokenType = "urn:type";
  EXPECT_EQ(IdIn(Leg(dialect, end("urn:type")).tokenXml), "_1");
  EXPECT_THROWS_MESSAGE(Leg(dialect, end("urn:oasis:names:tc:SAML:2.0:assertion")), SsoException,
                        "Invalid token type: urn:oasis:names:tc:SAML:2.0:assertion (expected: urn:type");
  EXPECT_THROWS_MESSAGE(Leg({}, end("urn:type")), SsoException,
                        "Invalid token type: urn:type (expected: urn:oasis:names:tc:SAML:2.0:assertion");
}

TEST(CredentialFault, MeansRefusedCredentialsInItsNamespaceOnly) {
  const ServiceDialect dialect = WithFault("urn:faults", "Denied");
  const auto named = [](const std::string &namespaceUri, const std::string &localName) {
    return Envelope("<soapenv:Fault xmlns:x='" + namespaceUri + "'><faultcode>x:" + localName +
                    "</faultcode><faultstring>no</faultstring></soapenv:Fault>");
  };
  EXPECT_THROWS_MESSAGE(Acquired(dialect, named("urn:faults", "Denied")), InvalidCredentialsException,
                        "Authentication failed: no");
  EXPECT_THROWS_MESSAGE(Renewed(dialect, named("urn:first", "First")), InvalidCredentialsException,
                        "Authentication failed: no");
  EXPECT_THROWS_MESSAGE(Acquired(dialect, named("urn:other", "Denied")), SsoException,
                        "Unexpected SOAP fault: x:Denied; request failed.");
  EXPECT_THROWS_MESSAGE(Acquired(dialect, named("urn:faults", "denied")), SsoException,
                        "Unexpected SOAP fault: x:denied; request failed.");
  EXPECT_THROWS_MESSAGE(IsValid({}, named("urn:faults", "Denied")), SsoException,
                        "Unexpected SOAP fault: x:Denied; request failed.");
}

TEST(CredentialFault, IsAddedToThoseThatAlwaysMeanRefusedCredentials) {
  const ServiceDialect dialect = WithFault("urn:faults", "Denied");
  for (const char *const code : {"wst:FailedAuthentication", "wst:InvalidSecurityToken", "wsse:InvalidSecurityToken"}) {
    EXPECT_THROWS_MESSAGE(Acquired(dialect, FaultResponse(code, "no")), InvalidCredentialsException,
                          "Authentication failed: no");
  }
}

TEST(CredentialFault, OfCxfIsFailedAuthenticationAndNotTheGeneralSecurityError) {
  const ServiceDialect dialect = GetServiceDialect("cxf");
  EXPECT_THROWS_MESSAGE(Acquired(dialect, FaultResponse("wsse:FailedAuthentication", "no")),
                        InvalidCredentialsException, "Authentication failed: no");
  EXPECT_THROWS_MESSAGE(Acquired({}, FaultResponse("wsse:FailedAuthentication", "no")), SsoException,
                        "Unexpected SOAP fault: wsse:FailedAuthentication; request failed.");
  const std::string general = Envelope("<soapenv:Fault xmlns:ns1='http://ws.apache.org/wss4j'>"
                                       "<faultcode>ns1:SecurityError</faultcode></soapenv:Fault>");
  EXPECT_THROWS_MESSAGE(Acquired(dialect, general), SsoException,
                        "Unexpected SOAP fault: ns1:SecurityError; request failed.");
}

TEST(DialectOfAHandler, IsKeptByItsCopyWithAListener) {
  class Listener final : public FaultListener {
  public:
    void OnFault(const Tarvel::Xml::ElementNode &) noexcept override { ++count; }
    int count = 0;
  } listener;
  const auto handler = ResponseHandlerImpl(WithFault("urn:faults", "Denied")).WithFaultListener(listener);
  const std::string fault =
      Envelope("<soapenv:Fault xmlns:x='urn:faults'><faultcode>x:Denied</faultcode></soapenv:Fault>");
  std::string token;
  EXPECT_THROWS_MESSAGE(handler->HandleAcquireTokenResponse(Tarvel::CreateStringReader(fault).get(), token),
                        InvalidCredentialsException, "Authentication failed");
  EXPECT_EQ(listener.count, 1);
}

TEST(ResponseWithAddressing, IsReadLikeOneWithoutAddressing) {
  std::string response = Envelope(Collection(ResponseElement(Token("_1"))));
  const std::string header = "<soapenv:Header/>";
  response.replace(response.find(header), header.size(),
                   "<soapenv:Header><wsa:Action xmlns:wsa='http://www.w3.org/2005/08/addressing'>urn:a</wsa:Action>"
                   "<wsa:RelatesTo xmlns:wsa='http://www.w3.org/2005/08/addressing'>urn:b</wsa:RelatesTo>"
                   "</soapenv:Header>");
  ServiceDialect addressing;
  addressing.addressing = true;
  EXPECT_EQ(Acquired(addressing, response), "_1");
  EXPECT_EQ(Acquired({}, response), "_1");
}

} // namespace
} // namespace SsoClient
