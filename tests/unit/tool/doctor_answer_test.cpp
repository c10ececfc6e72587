// SPDX-License-Identifier: Apache-2.0

#include "doctor_answer.h"
#include "doctor_namespaces.h"
#include "doctor_texts.h"

#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

using Kind = ServiceAnswer::Kind;

constexpr const char *SOAP = "http://schemas.xmlsoap.org/soap/envelope/";
constexpr const char *TRUST = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
constexpr const char *WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr const char *WRONG_ADDRESS =
    "              to do     Correct the path in --sts: it must be the address at which "
    "the service speaks WS-Trust 1.3 in SOAP 1.1.\n";

std::string Envelope(const std::string &body) {
  return std::string("<s:Envelope xmlns:s=\"") + SOAP + "\"><s:Header/><s:Body>" + body + "</s:Body></s:Envelope>";
}

/// A fault whose code has the prefix p, bound to `uri`.
std::string Fault(const std::string &uri, const std::string &code, const std::string &text) {
  return Envelope("<s:Fault xmlns:p=\"" + uri + "\"><faultcode>" + code + "</faultcode><faultstring>" + text +
                  "</faultstring></s:Fault>");
}

std::string CheckOf(const std::string &body, const std::string &contentType = "text/xml") {
  const ServiceAnswer answer = ReadAnswer(body, contentType);
  return TextOf(CheckTrust(&answer));
}

Kind KindOf(const std::string &body, const std::string &contentType = "") {
  return ReadAnswer(body, contentType).kind;
}

TEST(ReadAnswer, RecognisesEachKind) {
  EXPECT_EQ(Kind::EMPTY, KindOf(""));
  EXPECT_EQ(Kind::EMPTY, KindOf(" \r\n\t"));
  EXPECT_EQ(Kind::HTML, KindOf("<!DOCTYPE html><html></html>"));
  EXPECT_EQ(Kind::HTML, KindOf("\n<HTML lang=en>"));
  EXPECT_EQ(Kind::HTML, KindOf("Log in", "Text/HTML; charset=utf-8"));
  EXPECT_EQ(Kind::TEXT, KindOf("Not found", "text/plain"));
  EXPECT_EQ(Kind::TEXT, KindOf(std::string(3, '\0')));
  EXPECT_EQ(Kind::MALFORMED, KindOf("<a>", "text/xml"));
  EXPECT_EQ(Kind::XML, KindOf("<a/>"));
  EXPECT_EQ(Kind::XML, KindOf("<Envelope/>"));
  EXPECT_EQ(Kind::SOAP_12, KindOf("<Envelope xmlns='http://www.w3.org/2003/05/soap-envelope'/>"));
  EXPECT_EQ(Kind::SOAP_11_MESSAGE, KindOf(Envelope("")));
  EXPECT_EQ(Kind::SOAP_11_FAULT, KindOf(Envelope("<s:Fault/>")));
  EXPECT_EQ(Kind::SOAP_11_MESSAGE, KindOf(Envelope("<Fault/>")));
}

TEST(ReadAnswer, ResolvesThePrefixOfTheFaultCode) {
  EXPECT_EQ(Tarvel::Xml::QName("urn:x", "Code"), ReadAnswer(Fault("urn:x", " p:Code\n", ""), "").faultName);
  EXPECT_EQ(Tarvel::Xml::QName(SOAP, "Client"), ReadAnswer(Fault("urn:x", "Client", ""), "").faultName);
  EXPECT_EQ(Tarvel::Xml::QName("", "Code"), ReadAnswer(Fault("urn:x", "q:Code", ""), "").faultName);
}

TEST(CheckTrust, IsFineWhenTheServiceAsksForCredentials) {
  EXPECT_EQ("ws-trust      fine      The service speaks WS-Trust, and asks for credentials.\n"
            "                        It answered with the fault {" +
                std::string(WSSE) + "}InvalidSecurity: no header.\n",
            CheckOf(Fault(WSSE, "p:InvalidSecurity", "no header")));
  for (const std::string &fault :
       {Fault(WSSE, "p:FailedAuthentication", ""),
        Fault("http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd", "p:MessageExpired", ""),
        Fault(TRUST, "p:FailedAuthentication", ""), Fault(TRUST, "p:InvalidSecurityToken", ""),
        Fault(SOAP, "p:Client", "No WS-Security header found"), Fault(SOAP, "p:Server", "Authentication is required"),
        Fault("urn:other", "p:Denied", "the element wsse:Security is missing")}) {
    EXPECT_EQ("ws-trust      fine      The service speaks WS-Trust, and asks for credentials.\n",
              CheckOf(fault).substr(0, 79))
        << fault;
  }
}

TEST(CheckTrust, IsFineForAnyFaultOfWsTrust) {
  EXPECT_EQ("ws-trust      fine      The service speaks WS-Trust, and refuses the empty request.\n"
            "                        It answered with the fault {" +
                std::string(TRUST) + "}InvalidRequest.\n",
            CheckOf(Fault(TRUST, "p:InvalidRequest", "")));
}

TEST(CheckTrust, WarnsOfAFaultThatSaysNothingAboutWsTrust) {
  EXPECT_EQ(
      "ws-trust      warning   A SOAP 1.1 service answers, but its fault does not say whether it speaks WS-Trust.\n"
      "                        It answered with the fault {" +
          std::string(SOAP) +
          "}Server: unknown operation.\n"
          "              to do     Make sure that --sts is the address of a token service.\n",
      CheckOf(Fault(SOAP, "p:Server", "unknown operation")));
}

TEST(CheckTrust, ShowsACodeWithAnUnknownPrefixAndAFaultWithoutCode) {
  EXPECT_NE(
      std::string::npos,
      CheckOf(Fault("urn:x", "q:Code", "text")).find("It answered with the fault q:Code (prefix not bound): text.\n"));
  EXPECT_NE(std::string::npos, CheckOf(Envelope("<s:Fault/>")).find("It answered with the fault no code.\n"));
}

TEST(CheckTrust, IsFineForAResponseOfWsTrust) {
  for (const char *const name : {"RequestSecurityTokenResponse", "RequestSecurityTokenResponseCollection"}) {
    EXPECT_EQ("ws-trust      fine      The service speaks WS-Trust, and answered the empty request.\n",
              CheckOf(Envelope(std::string("<") + name + " xmlns='" + TRUST + "'/>")));
  }
}

TEST(CheckTrust, FailsForAnotherVersionOfWsTrust) {
  EXPECT_EQ("ws-trust      failed    The service speaks another version of WS-Trust: "
            "http://schemas.xmlsoap.org/ws/2005/02/trust.\n" +
                std::string(WRONG_ADDRESS),
            CheckOf(Envelope("<RequestSecurityTokenResponse xmlns='http://schemas.xmlsoap.org/ws/2005/02/trust'/>")));
}

TEST(CheckTrust, FailsForEverythingElse) {
  struct Case {
    std::string body;
    std::string text;
  };
  for (const Case &other : std::vector<Case>{
           {Envelope("<a xmlns='urn:x'/>"),
            "A SOAP 1.1 service answers, but not with WS-Trust: its message contains {urn:x}a."},
           {Envelope(""), "A SOAP 1.1 service answers, but not with WS-Trust: its message contains nothing."},
           {"<Envelope xmlns='http://www.w3.org/2003/05/soap-envelope'/>",
            "The service answers in SOAP 1.2, which this client does not speak."},
           {"<a>", "The answer is not well-formed XML: the element 'a' of line 1 is not closed where the document ends "
                   "at line 1, column 4."},
           {"<a xmlns='urn:x'/>", "The answer is not SOAP, but XML with the element {urn:x}a."},
           {"", "The answer is empty, and not SOAP."},
           {"<html>", "The answer is an HTML page, and not SOAP."},
           {"hello", "The answer is neither XML nor HTML, and not SOAP."}}) {
    EXPECT_EQ("ws-trust      failed    " + other.text + "\n" + WRONG_ADDRESS, CheckOf(other.body));
    const ServiceAnswer answer = ReadAnswer(other.body, "");
    EXPECT_EQ(ExitCode::SERVICE_FAULT, CheckTrust(&answer).exitCode);
  }
}

TEST(CheckTrust, ShowsNothingThatControlsATerminalAndCutsALongText) {
  const std::string text = CheckOf(Fault(WSSE, "p:X", "\xC2\x9B" + std::string(10'000'000, 'x')));
  EXPECT_NE(std::string::npos, text.find(": \\u009B" + std::string(198, 'x') + "... (9999802 more bytes).\n"));
}

TEST(CheckTrust, IsNotDoneWithoutAnAnswer) {
  EXPECT_EQ("ws-trust      not done  There is no answer to read.\n", TextOf(CheckTrust(nullptr)));
}

TEST(CheckTrust, HasItsFactsInJson) {
  const ServiceAnswer answer = ReadAnswer(Fault("urn:x", "p:Code", "text"), "");
  const nlohmann::ordered_json json = JsonOf(CheckTrust(&answer));
  EXPECT_EQ("urn:x", json.at("faultNamespace").get<std::string>());
  EXPECT_EQ("Code", json.at("faultName").get<std::string>());
  EXPECT_EQ("text", json.at("faultText").get<std::string>());
}

TEST(ProbeMessage, AsksForNothingThatAServiceCouldActUpon) {
  EXPECT_EQ("<?xml version=\"1.0\" encoding=\"UTF-8\"?>"
            "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">"
            "<soapenv:Header></soapenv:Header><soapenv:Body>"
            "<wst:RequestSecurityToken xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\">"
            "<wst:TokenType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Status</wst:TokenType>"
            "<wst:RequestType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/Validate</wst:RequestType>"
            "</wst:RequestSecurityToken></soapenv:Body></soapenv:Envelope>",
            PROBE_MESSAGE);
}

} // namespace
} // namespace SsoClient::Tool
