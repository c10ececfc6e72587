// SPDX-License-Identifier: Apache-2.0

#include "doctor_exchange.h"
#include "doctor_texts.h"

#include "support/scripted_server.h"

#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

using Tarvel::System::DateTime;

constexpr const char *DATE = "Fri, 02 Jan 2026 12:00:00 GMT"; // at NOON

DoctorExchange Answered(int status, const std::string &reason) {
  DoctorExchange exchange;
  exchange.status = status;
  exchange.reason = reason;
  exchange.hasBody = status == 200 || status == 500;
  exchange.durationMicroseconds = 8000;
  return exchange;
}

std::string HttpText(const DoctorExchange &exchange) {
  return TextOf(CheckHttp(&exchange, ""));
}

/// The check of the clocks if the answer arrived this many seconds after the service's noon, or before it if negative.
DoctorCheck ClockOf(std::int64_t seconds, std::int64_t durationMicroseconds = 0) {
  DoctorExchange exchange = Answered(200, "OK");
  exchange.date = DATE;
  exchange.receivedAt = NOON.PlusSeconds(seconds);
  exchange.durationMicroseconds = durationMicroseconds;
  return CheckClock(&exchange);
}

TEST(CheckHttp, ShowsStatusHeadersSizeAndWhatAnswers) {
  DoctorExchange exchange = Answered(500, "Internal Server Error");
  exchange.contentType = "text/xml";
  exchange.server = "gate/1.0\x1b[2J";
  exchange.octets = 1;
  exchange.answer.kind = ServiceAnswer::Kind::SOAP_11_FAULT;
  EXPECT_EQ("http          fine      500 Internal Server Error, text/xml, 1 octet, server gate/1.0\\u001B[2J (8 ms).\n"
            "                        The answer is a SOAP 1.1 fault.\n",
            HttpText(exchange));
  EXPECT_EQ(
      R"({"name":"http","outcome":"fine","found":"500 Internal Server Error, text/xml, 1 octet, server )"
      R"(gate/1.0\\u001B[2J (8 ms). The answer is a SOAP 1.1 fault.","todo":null,"status":500,)"
      R"("reason":"Internal Server Error","contentType":"text/xml","server":"gate/1.0\\u001B[2J","location":null,)"
      R"("octets":1,"answer":"soap 1.1 fault","durationMs":8})",
      JsonOf(CheckHttp(&exchange, "")).dump());
}

TEST(CheckHttp, FailsForAnHtmlPage) {
  DoctorExchange exchange = Answered(200, "OK");
  exchange.answer.kind = ServiceAnswer::Kind::HTML;
  EXPECT_EQ("http          failed    200 OK, 0 octets (8 ms).\n"
            "                        An HTML page answers: a proxy, a page to log in, or another web server.\n"
            "              to do     Correct the host, port and path in --sts.\n",
            HttpText(exchange));
  EXPECT_EQ(ExitCode::SERVICE_FAULT, CheckHttp(&exchange, "").exitCode);
}

TEST(CheckHttp, ShowsWhereARedirectLeads) {
  DoctorExchange exchange = Answered(302, "Found");
  exchange.location = "https://login.example/\n";
  exchange.statedLength = "12";
  EXPECT_EQ(
      "http          failed    302 Found, 12 octets (8 ms).\n"
      "                        The server redirects to https://login.example/\\u000A; this client does not follow.\n"
      "              to do     If that is the token service, and not a page to log in, give its address in --sts.\n",
      HttpText(exchange));
}

TEST(CheckHttp, ExplainsTheStatus) {
  struct Case {
    int status;
    const char *text;
  };
  for (const Case &refused :
       {Case{401, "                        The server, or a proxy, asks for credentials of HTTP, which "
                  "this client does not send.\n"
                  "              to do     Have the service's address exempted from HTTP "
                  "authentication.\n"},
        Case{404, "                        There is nothing at this path.\n"
                  "              to do     Correct the path in --sts.\n"},
        Case{503, "                        The service, or a gateway before it, is not available.\n"
                  "              to do     Start the service, or look into its log.\n"},
        Case{418, "                        A token service answers with 200 or 500.\n"
                  "              to do     Correct the host, port and path in --sts.\n"}}) {
    EXPECT_EQ("http          failed    " + std::to_string(refused.status) + " (8 ms).\n" + refused.text,
              HttpText(Answered(refused.status, "")));
  }
}

TEST(CheckHttp, DistinguishesASilentServerFromOneWithAnotherProtocol) {
  DoctorExchange exchange;
  exchange.failure = "no answer";
  EXPECT_EQ("http          failed    No answer.\n"
            "              to do     Look into the service's log, correct --sts, or raise --timeout.\n",
            HttpText(exchange));
  EXPECT_EQ(ExitCode::COMMUNICATION, CheckHttp(&exchange, "").exitCode);
  exchange.hasOtherProtocol = true;
  EXPECT_EQ("http          failed    No answer.\n"
            "              to do     What answers is not a web server that this client understands. Correct the host, "
            "port and path in --sts.\n",
            HttpText(exchange));
  EXPECT_EQ(ExitCode::SERVICE_FAULT, CheckHttp(&exchange, "").exitCode);
}

TEST(CheckHttp, IsNotDoneForTheGivenReason) {
  EXPECT_EQ("http          not done  TLS has failed, so nothing was sent.\n",
            TextOf(CheckHttp(nullptr, "TLS has failed, so nothing was sent.")));
}

TEST(CheckClock, IsFineUpToAMinute) {
  EXPECT_EQ("clock         fine      The clocks agree.\n", TextOf(ClockOf(0)));
  EXPECT_EQ("clock         fine      This machine's clock is 1 second ahead of the service's.\n", TextOf(ClockOf(1)));
  EXPECT_EQ("clock         fine      This machine's clock is 60 seconds behind the service's.\n", TextOf(ClockOf(-60)));
}

TEST(CheckClock, WarnsBeyondAMinute) {
  const std::string todo = "              to do     Set this machine's clock, or have the service's set.\n";
  EXPECT_EQ("clock         warning   This machine's clock is 61 seconds ahead of the service's.\n" + todo,
            TextOf(ClockOf(61)));
  EXPECT_EQ("clock         warning   This machine's clock is 600 seconds behind the service's.\n" + todo,
            TextOf(ClockOf(-600)));
}

TEST(CheckClock, FailsBeyondTheTolerance) {
  for (const std::int64_t seconds : {601, -601}) {
    const DoctorCheck check = ClockOf(seconds);
    EXPECT_EQ(
        std::string("clock         failed    This machine's clock is 601 seconds ") +
            (seconds > 0 ? "ahead of" : "behind") +
            " the service's.\n"
            "              to do     Set this machine's clock, or have the service's set. More than 600 seconds make "
            "tokens and requests invalid.\n",
        TextOf(check));
    EXPECT_EQ(ExitCode::TOKEN_INVALID, check.exitCode);
  }
}

TEST(CheckClock, DeductsHalfTheRoundTrip) {
  EXPECT_EQ(3, JsonOf(ClockOf(10, 14'000'000)).at("differenceSeconds").get<int>());
  EXPECT_EQ(-17, JsonOf(ClockOf(-10, 14'000'000)).at("differenceSeconds").get<int>());
}

TEST(CheckClock, IsNotDoneWithoutADate) {
  DoctorExchange exchange = Answered(200, "OK");
  EXPECT_EQ("clock         not done  The answer has no header Date.\n", TextOf(CheckClock(&exchange)));
  exchange.date = "today";
  EXPECT_EQ("clock         not done  The header Date of the answer is not a date: today.\n",
            TextOf(CheckClock(&exchange)));
  EXPECT_EQ("clock         not done  There is no answer with a date.\n", TextOf(CheckClock(nullptr)));
  exchange = DoctorExchange();
  exchange.failure = "no answer";
  EXPECT_EQ("clock         not done  There is no answer with a date.\n", TextOf(CheckClock(&exchange)));
}

/// The result of an exchange with a plain HTTP server that answers with `bytes`.
DoctorExchange ExchangeWith(const std::string &bytes) {
  Testing::ScriptedServer server([&bytes](Testing::ServerConnection &peer) {
    peer.ReadRequest();
    peer.Write(bytes);
  });
  return Exchange({false, "127.0.0.1", server.GetPort(), "/sts"}, nullptr, "", 60'000'000);
}

TEST(Exchange, SendsAPostWithoutAnyCredential) {
  std::string request;
  {
    Testing::ScriptedServer server([&request](Testing::ServerConnection &peer) {
      request = peer.ReadRequest();
      peer.Write("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n");
    });
    Exchange({false, "127.0.0.1", server.GetPort(), "/sts?x=1"}, nullptr, "", 60'000'000);
    const std::string head = "POST /sts?x=1 HTTP/1.1\r\nHost: 127.0.0.1:" + std::to_string(server.GetPort()) + "\r\n";
    EXPECT_EQ(head, request.substr(0, head.size()));
  }
  EXPECT_NE(std::string::npos, request.find("\r\nContent-Type: text/xml\r\n"));
  EXPECT_NE(std::string::npos,
            request.find("\r\nSOAPAction: \"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate\"\r\n"));
  for (const char *const secret : {"Authorization", "Cookie", "Security>", "Password", "Assertion"}) {
    EXPECT_EQ(std::string::npos, request.find(secret)) << request;
  }
}

TEST(Exchange, ReadsHeadersAndBody) {
  const DoctorExchange exchange = ExchangeWith(
      "HTTP/1.1 200 Fine\r\nServer: x\r\nDate: y\r\nContent-Type: text/xml\r\nContent-Length: 4\r\n\r\n<a/>");
  EXPECT_EQ("", exchange.failure);
  EXPECT_EQ(200, exchange.status);
  EXPECT_EQ("Fine", exchange.reason);
  EXPECT_EQ("x", exchange.server);
  EXPECT_EQ("y", exchange.date);
  EXPECT_EQ("text/xml", exchange.contentType);
  EXPECT_EQ(4u, exchange.octets);
  EXPECT_EQ(ServiceAnswer::Kind::XML, exchange.answer.kind);
}

TEST(Exchange, ReportsWhatIsNotHttp) {
  EXPECT_TRUE(ExchangeWith("220 mail.example ESMTP\r\n\r\n").hasOtherProtocol);
}

TEST(Exchange, ReportsAConnectionThatEndsTooEarly) {
  EXPECT_FALSE(ExchangeWith("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nshort").hasOtherProtocol);
  EXPECT_FALSE(ExchangeWith("HTTP/1.1 200 OK\r\nContent-Le").hasOtherProtocol);
  EXPECT_FALSE(ExchangeWith("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n9\r\nshort").hasOtherProtocol);
  const DoctorExchange closed = ExchangeWith("");
  EXPECT_FALSE(closed.hasOtherProtocol);
  EXPECT_EQ("the connection ended before it", closed.failure.substr(closed.failure.rfind(": ") + 2));
}

TEST(Exchange, EndsWhenTheServiceDoesNotAnswer) {
  Testing::ScriptedServer server([](Testing::ServerConnection &peer) { peer.Stall(); });
  const DoctorExchange exchange = Exchange({false, "127.0.0.1", server.GetPort(), "/"}, nullptr, "", 50'000);
  EXPECT_NE("", exchange.failure);
  EXPECT_FALSE(exchange.hasOtherProtocol);
}

TEST(Exchange, EndsAtABodyThatIsTooLong) {
  Testing::ScriptedServer server([](Testing::ServerConnection &peer) {
    peer.ReadRequest();
    peer.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\n\r\n");
    while (peer.Write(std::string(65536, 'x'))) {
    }
  });
  const DoctorExchange exchange = Exchange({false, "127.0.0.1", server.GetPort(), "/"}, nullptr, "", 60'000'000);
  EXPECT_TRUE(exchange.hasOtherProtocol);
  EXPECT_NE(std::string::npos, exchange.failure.find("the body is longer than 16777216 bytes")) << exchange.failure;
}

} // namespace
} // namespace SsoClient::Tool
