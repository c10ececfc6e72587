// SPDX-License-Identifier: Apache-2.0
// After each fault of the network or of the service, an operation of the client fails in each form with the same class
// and text as an operation of `SecurityTokenService`, and the next operation works.

#include "integration/client/fault_service.h"
#include "support/data_file.h"
#include "support/operation_forms.h"
#include "support/soap_responses.h"
#include "support/unavailable_port.h"

#include <ssoclient/security_token_service.h>

#include <gtest/gtest.h>

#include <ostream>
#include <string>

namespace SsoClient {
namespace {

using namespace Testing;

struct Fault {
  std::string name;
  ScriptedServer::Script script;
  std::string outcome; ///< "CLASS: " and the beginning of the text
};

void PrintTo(const Fault &fault, std::ostream *out) {
  *out << fault.name;
}

/// Writes these bytes after the request, and ends with a reset.
ScriptedServer::Script ReplyAndReset(const std::string &bytes) {
  return [bytes](ServerConnection &peer) {
    if (peer.Handshake()) {
      peer.ReadRequest();
      peer.Write(bytes);
      peer.Reset();
    }
  };
}

ScriptedServer::Script ReplyWithoutEnd(const std::string &start, const std::string &repeated) {
  return [start, repeated](ServerConnection &peer) {
    Reply(start)(peer);
    while (peer.Write(repeated)) {
    }
  };
}

std::string WithAnotherSubject(std::string token) {
  const std::string name = "alice@corp.example";
  return token.replace(token.find(name), name.size(), "admin@corp.example");
}

const std::string START = "HTTP/1.1 200 OK\r\nContent-Length: 500\r\n\r\n";

const Fault FAULTS[] = {
    {"EndBeforeTheHeader", Reply(""), "CommunicationException: Bad response from "},
    {"EndWithinTheHeader", Reply("HTTP/1.1 200 OK\r\nConte"), "CommunicationException: Bad response from "},
    {"EndWithinTheBody", Reply(START + "<a>"), "CommunicationException: Bad response from "},
    {"ResetBeforeTheHeader", ReplyAndReset(""), "CommunicationException: The "},
    {"ResetWithinTheHeader", ReplyAndReset("HTTP/1.1 200 OK\r\nConte"), "CommunicationException: The "},
    {"ResetWithinTheBody", ReplyAndReset(START + "<a>"), "CommunicationException: The "},
    {"Garbage", Reply("\x01\x02\x03 this is not HTTP"), "CommunicationException: Bad response from "},
    {"EndlessHeader", ReplyWithoutEnd("HTTP/1.1 200 OK\r\n", "X: " + std::string(500, 'x') + "\r\n"),
     "CommunicationException: Bad response from "},
    {"EndlessBody", ReplyWithoutEnd("HTTP/1.1 200 OK\r\n\r\n", std::string(65536, 'x')),
     "CommunicationException: Bad response from "},
    {"RefusedStatus", Reply(HttpResponse("404 Not Found", "none")),
     "CommunicationException: Server returned error: 404 Not Found"},
    {"Redirect", Reply(HttpResponse("302 Found", "", "Location: http://127.0.0.1:1/\r\n")),
     "CommunicationException: Server returned error: 302 Found"},
    {"UnavailableService", Reply(HttpResponse("503 Down", "")),
     "CommunicationException: Server returned error: 503 Down"},
    {"BodyThatIsNotXml", Reply(HttpResponse("200 OK", "sorry")), ""},
    {"CutXml", Reply(HttpResponse("200 OK", IssueResponse(ReadDataFile("tokens/bearer.xml")).substr(0, 2000))), ""},
    {"EmptyBody", Reply(HttpResponse("200 OK", "")), ""},
    {"AnswerToAnotherRequest", Reply(HttpResponse("200 OK", ValidateResponse("urn:code"))), ""},
    {"RefusedCredentials",
     Reply(HttpResponse("500 Internal Server Error", FaultResponse("wsse:FailedAuthentication", "wrong password"))),
     ""},
    {"OtherFault", Reply(HttpResponse("500 Internal Server Error", FaultResponse("soapenv:Server", "out of order"))),
     ""},
    {"ChangedToken",
     Reply(HttpResponse("200 OK", IssueResponse(WithAnotherSubject(ReadDataFile("tokens/bearer.xml"))))),
     "InvalidSignatureException: "},
};

class ClientFaults : public testing::TestWithParam<std::tuple<Fault, bool>> {};

TEST_P(ClientFaults, HaveTheSameOutcomeAsInSecurityTokenServiceAndTheNextOperationWorks) {
  const auto &[fault, isSecure] = GetParam();
  FaultService service(fault.script, isSecure);
  const auto synchronous = CreateSecurityTokenService(service.GetConfig());
  const std::string expected =
      OutcomeOf([&] { return synchronous->AcquireToken("alice@corp.example", "pass", AnySpec()); });
  EXPECT_EQ(expected.substr(0, fault.outcome.size()), fault.outcome);
  EXPECT_NE(expected, "token");

  const auto client = service.CreateClient();
  for (const Form form : AllForms()) {
    EXPECT_EQ(OutcomeOf([&] { return Acquire(form, *client, AnyCredential(), AnySpec()); }), expected) << NameOf(form);
  }
  service.Repair();
  for (const Form form : AllForms()) {
    EXPECT_EQ(OutcomeOf([&] { return Acquire(form, *client, AnyCredential(), AnySpec()); }), "token") << NameOf(form);
  }
}

std::string NameOfCase(const testing::TestParamInfo<std::tuple<Fault, bool>> &info) {
  return std::get<0>(info.param).name + (std::get<1>(info.param) ? "OverTls" : "OverTcp");
}

INSTANTIATE_TEST_SUITE_P(Of, ClientFaults, testing::Combine(testing::ValuesIn(FAULTS), testing::Bool()), NameOfCase);

/// Faults before there is a TLS connection.
const Fault TLS_FAULTS[] = {
    {"EndInPlaceOfTheHandshake",
     [](ServerConnection &peer) {
       peer.ReadRawSome();
       peer.CloseWithoutNotice();
     },
     "CommunicationException: "},
    {"GarbageInPlaceOfTheHandshake",
     [](ServerConnection &peer) {
       peer.ReadRawSome();
       peer.WriteRaw("HTTP/1.1 400 Bad Request\r\n\r\n");
     },
     "CommunicationException: "},
};

INSTANTIATE_TEST_SUITE_P(Before, ClientFaults, testing::Combine(testing::ValuesIn(TLS_FAULTS), testing::Values(true)),
                         NameOfCase);

TEST(ClientFault, IsReportedForARefusedConnection) {
  const UnusedPort port;
  FaultService service(Reply(""), false);
  SecurityTokenServiceConfig config = service.GetConfig();
  config.stsUrl = "http://127.0.0.1:" + std::to_string(port.GetPort()) + "/sts";
  const auto synchronous = CreateSecurityTokenService(config);
  const std::string expected =
      OutcomeOf([&] { return synchronous->AcquireToken("alice@corp.example", "pass", AnySpec()); });
  EXPECT_EQ(expected.substr(0, 24), "CommunicationException: ");
  const TokenClient client(config);
  for (const Form form : AllForms()) {
    EXPECT_EQ(OutcomeOf([&] { return Acquire(form, client, AnyCredential(), AnySpec()); }), expected) << NameOf(form);
  }
}

} // namespace
} // namespace SsoClient
