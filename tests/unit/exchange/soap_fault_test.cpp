// SPDX-License-Identifier: Apache-2.0

#include "exchange/soap_fault.h"

#include "exchange/response_handler_impl.h"
#include "exchange/soap_response.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <tarvel/io/reader.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Envelope;

/// Records each fault as "{NAMESPACE} CODE: TEXT (DETAIL)".
class Recorder final : public FaultListener {
public:
  void OnFault(const Tarvel::Xml::ElementNode &fault) noexcept override {
    const SoapFault read = ReadSoapFault(fault);
    faults.push_back("{" + std::string(read.codeNamespace) + "} " + std::string(read.code) + ": " +
                     std::string(read.text) + " (" + read.detail + ")");
  }

  std::vector<std::string> faults;
};

/// The line of a listener of the response handler for a fault with these children.
std::string Heard(const std::string &children) {
  Recorder recorder;
  const auto handler = ResponseHandlerImpl().WithFaultListener(recorder);
  std::string token;
  EXPECT_THROW(
      handler->HandleAcquireTokenResponse(
          Tarvel::CreateStringReader(Envelope("<soapenv:Fault>" + children + "</soapenv:Fault>")).get(), token),
      SsoException);
  EXPECT_EQ(recorder.faults.size(), 1u);
  return recorder.faults.empty() ? "" : recorder.faults.front();
}

TEST(ReadSoapFault, ResolvesThePrefixOfTheCode) {
  EXPECT_EQ(Heard("<faultcode>wst:BadRequest</faultcode><faultstring>no</faultstring>"),
            "{http://docs.oasis-open.org/ws-sx/ws-trust/200512} wst:BadRequest: no ()");
  EXPECT_EQ(Heard("<faultcode xmlns:ns1='urn:a'>ns1:b:c</faultcode>"), "{urn:a} ns1:b:c:  ()");
  EXPECT_EQ(Heard("<faultcode>Server</faultcode>"), "{http://schemas.xmlsoap.org/soap/envelope/} Server:  ()");
}

TEST(ReadSoapFault, ReportsNoNamespaceForAnUnboundPrefix) {
  EXPECT_EQ(Heard("<faultcode>ns9:Odd</faultcode><faultstring>text</faultstring>"), "{} ns9:Odd: text ()");
}

TEST(ReadSoapFault, ReportsAFaultWithoutCode) {
  EXPECT_EQ(Heard("<faultstring>text</faultstring>"), "{} : text ()");
  EXPECT_EQ(Heard("<faultcode><x/></faultcode>"), "{} :  ()");
}

TEST(ReadSoapFault, CollectsTheTextsOfTheDetail) {
  EXPECT_EQ(Heard("<faultcode>a</faultcode><detail> one\n<x>two<y/> three </x><!-- no --><z><![CDATA[<four>]]></z>"
                  "</detail>"),
            "{http://schemas.xmlsoap.org/soap/envelope/} a:  (one two three <four>)");
  EXPECT_EQ(Heard("<faultcode>a</faultcode><detail/>"), "{http://schemas.xmlsoap.org/soap/envelope/} a:  ()");
}

TEST(ReadSoapFault, LeavesOutTheTextOfTokensSignaturesKeysAndPasswords) {
  for (const char *name :
       {"Assertion", "EncryptedData", "EncryptedAssertion", "CipherValue", "BinarySecurityToken", "BinaryExchange",
        "BinarySecret", "DigestValue", "Password", "Signature", "SignatureValue", "SignatureConfirmation"}) {
    const std::string tag = std::string("wst:") + name;
    EXPECT_EQ(
        Heard("<faultcode>a</faultcode><detail>before<" + tag + ">secret<x>secret</x></" + tag + ">after</detail>"),
        "{http://schemas.xmlsoap.org/soap/envelope/} a:  (before after)")
        << name;
  }
}

TEST(ReadSoapFault, ReadsOnlyTheFirstTextOfTheFaultString) {
  EXPECT_EQ(Heard("<faultcode>a</faultcode><faultstring>one<x/>two</faultstring>"),
            "{http://schemas.xmlsoap.org/soap/envelope/} a: one ()");
}

TEST(CheckSoapFault, ReportsTheFaultToTheListenerAndThrowsTheUsualException) {
  const std::string missing = Envelope("<soapenv:Fault/>");
  const std::string unbound = Envelope("<soapenv:Fault><faultcode>ns9:Odd</faultcode></soapenv:Fault>");
  Recorder recorder;
  const auto check = [](const std::string &response, FaultListener *listener) {
    CheckSoapFault(*ParseResponseDocument(*Tarvel::CreateStringReader(response)), listener);
  };
  for (FaultListener *listener : {static_cast<FaultListener *>(nullptr), static_cast<FaultListener *>(&recorder)}) {
    EXPECT_THROWS_MESSAGE(check(missing, listener), SsoException, "Invalid SOAP response: missing faultcode.");
    EXPECT_THROWS_MESSAGE(check(unbound, listener), ParseException,
                          "Element faultcodeat 2,279 uses undefined prefix: `ns9'");
  }
  EXPECT_EQ(recorder.faults, (std::vector<std::string>{"{} :  ()", "{} ns9:Odd:  ()"}));
}

TEST(CheckSoapFault, ReportsNothingForAResponseWithoutFault) {
  Recorder recorder;
  CheckSoapFault(*ParseResponseDocument(*Tarvel::CreateStringReader(Envelope("<Fault2/>"))), &recorder);
  CheckSoapFault(*ParseResponseDocument(*Tarvel::CreateStringReader("<a><Fault/></a>")), &recorder);
  EXPECT_EQ(recorder.faults.size(), 0u);
}

} // namespace
} // namespace SsoClient
