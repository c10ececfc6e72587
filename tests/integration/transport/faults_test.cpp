// SPDX-License-Identifier: Apache-2.0
// Each way in which a service, or the network on the way to it, can misbehave. The right exception is thrown at once,
// not after the time-out, and the same client works afterwards.

#include "integration/transport/service_stand_in.h"
#include "system/name_lookup.h"

#include <gtest/gtest.h>

#include <openssl/ssl.h>

#include <atomic>
#include <memory>
#include <optional>
#include <ostream>
#include <string>

namespace SsoClient {
namespace {

using Tarvel::System::AddressList;
using Testing::AskForOutcome;
using Testing::Failure;
using Testing::FaultThenAnswer;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::ServiceStandIn;
using Testing::Stopwatch;
using Testing::TlsCertificate;
using Testing::TlsSettings;

/// Longer than any of these faults takes, even under a sanitizer on a busy machine.
constexpr std::chrono::seconds AT_ONCE{20};

const std::string OK = "HTTP/1.1 200 OK\r\n";
const std::string LENGTH_5 = OK + "Content-Length: 5\r\n\r\n";
const std::string CHUNKED = OK + "Transfer-Encoding: chunked\r\n\r\n";

struct Fault {
  std::string name;
  ScriptedServer::Script script;
  std::string message; ///< with %e in place of the endpoint
};

void PrintTo(const Fault &fault, std::ostream *out) {
  *out << fault.name;
}

std::string NameOf(const testing::TestParamInfo<Fault> &info) {
  return info.param.name;
}

std::string Expand(std::string message, const std::string &endpoint) {
  for (std::size_t at = message.find("%e"); at != std::string::npos; at = message.find("%e")) {
    message.replace(at, 2, endpoint);
  }
  return message;
}

void ExpectFault(const Fault &fault, std::optional<TlsSettings> tls) {
  ServiceStandIn service(FaultThenAnswer(fault.script), tls);
  const auto session = service.CreateSession();
  const Stopwatch stopwatch;
  EXPECT_EQ(AskForOutcome(*session), Failure(Expand(fault.message, service.GetEndpoint())));
  EXPECT_LT(stopwatch.Read(), AT_ONCE);
  EXPECT_EQ(AskForOutcome(*session), "<after/>");
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), "<after/>");
}

/// Reads the request, sends these bytes, and ends the connection in an orderly way.
ScriptedServer::Script Send(const std::string &bytes) {
  return Testing::AnswerWith(bytes);
}

/// The same, but ends the connection with a reset.
ScriptedServer::Script SendAndReset(const std::string &bytes) {
  return [bytes](ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    connection.Write(bytes);
    connection.Reset();
  };
}

/// The same, but leaves the connection open.
ScriptedServer::Script SendAndStall(const std::string &bytes) {
  return [bytes](ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    connection.Write(bytes);
    connection.Stall();
  };
}

/// Sends `repeated` until the client ends the connection.
ScriptedServer::Script SendWithoutEnd(const std::string &start, const std::string &repeated) {
  return [start, repeated](ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    connection.Write(start);
    while (connection.Write(repeated)) {
    }
  };
}

const std::string BAD = "Bad response from %e: ";
const std::string RESET = "The connection to %e broke: Connection reset by peer";

// Used over plain TCP and over TLS.
const Fault MISBEHAVIOUR[] = {
    {"EndBeforeTheHeader", Send(""), BAD + "the connection ended before it"},
    {"EndWithinTheHeader", Send("HTTP/1.1 200 OK\r\nContent-"), BAD + "the connection ended within its header"},
    {"EndWithinTheBody", Send(LENGTH_5 + "hell"), BAD + "the connection ended after 4 of the body's 5 bytes"},
    {"EndWithinTheChunks", Send(CHUNKED + "5\r\nhello\r\n"), BAD + "the connection ended within the chunked body"},
    {"LengthBesideChunks", Send(OK + "Content-Length: 5\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n"),
     BAD + "its header is not HTTP/1.x (bad Transfer-Encoding)"},
    {"ContradictingLengths", Send(OK + "Content-Length: 5\r\nContent-Length: 4\r\n\r\nhello"),
     BAD + "its header is not HTTP/1.x (multiple Content-Length)"},
    {"InvalidLength", Send(OK + "Content-Length: five\r\n\r\nhello"),
     BAD + "its header is not HTTP/1.x (bad Content-Length)"},
    {"BrokenChunks", Send(CHUNKED + "x\r\nhello\r\n0\r\n\r\n"),
     BAD + "the chunked body is broken: a chunk without a size"},
    {"BodyOverTheLimit", Send(OK + "Content-Length: 16777217\r\n\r\n"), BAD + "the body is longer than 16777216 bytes"},
    {"EndlessChunks", SendWithoutEnd(CHUNKED, "10000\r\n" + std::string(65536, 'x') + "\r\n"),
     BAD + "the body is longer than 16777216 bytes"},
    {"EndlessBody", SendWithoutEnd(OK + "\r\n", std::string(65536, 'x')),
     BAD + "the body is longer than 16777216 bytes"},
    {"EndlessHeader", SendWithoutEnd(OK, "X-Field: " + std::string(500, 'x') + "\r\n"),
     BAD + "the header is longer than 65536 bytes"},
    {"EndlessStatusLine", SendWithoutEnd("HTTP/1.1 200 ", std::string(500, 'x')),
     BAD + "the header is longer than 65536 bytes"},
    {"EndlessInterimResponses", SendWithoutEnd("", "HTTP/1.1 100 Continue\r\n\r\n"),
     BAD + "it follows more than 16 interim responses"},
    {"EndlessChunkExtension", SendWithoutEnd(CHUNKED + "1;", std::string(500, 'x')),
     BAD + "the extensions and the trailer of the chunked body are longer than 65536 bytes"},
    {"CompressedContent", Send(OK + "Content-Encoding: gzip\r\nContent-Length: 3\r\n\r\n\x1f\x8b\x08"),
     BAD + "its content (status 200 OK) is encoded as \"gzip\", which was not asked for"},
    {"Garbage", Send("\x01\x02\x03\x04 this is not HTTP"), BAD + "its header is not HTTP/1.x (bad version)"},
    {"BannerOfAnotherProtocol", Send("220 mail.example ESMTP\r\n"), BAD + "its header is not HTTP/1.x (bad version)"},
    {"RefusedStatus", Send("HTTP/1.1 404 Not Found\r\nContent-Length: 4\r\n\r\nnone"),
     "Server returned error: 404 Not Found"},
    {"RefusedStatusWithEncodedPage", Send("HTTP/1.1 503 Down\r\nContent-Encoding: gzip\r\nContent-Length: 1\r\n\r\nx"),
     "Server returned error: 503 Down"},
    {"RefusedStatusWithCutPage", Send("HTTP/1.1 503 Down\r\nContent-Length: 100\r\n\r\ncut"),
     "Server returned error: 503 Down"},
    {"RefusedStatusWithStalledPage", SendAndStall("HTTP/1.1 503 Down\r\nContent-Length: 100\r\n\r\n"),
     "Server returned error: 503 Down"},
    {"RefusedStatusWithOddFraming", Send("HTTP/1.1 503 Down\r\nContent-Length: many\r\n\r\nx"),
     "Server returned error: 503 Down"},
    {"RefusedStatusWithEndlessPage", SendWithoutEnd("HTTP/1.1 503 Down\r\n\r\n", std::string(65536, 'x')),
     "Server returned error: 503 Down"},
    {"RefusedStatusWithoutAReason", Send("HTTP/1.1 404 \r\nContent-Length: 0\r\n\r\n"), "Server returned error: 404 "},
    {"RefusedStatusWithoutTheLastBlank", Send("HTTP/1.1 503\r\n\r\n"), "Server returned error: 503 "},
    {"EndAfterAnInterimResponse", Send("HTTP/1.1 100 Continue\r\n\r\n"), BAD + "the connection ended before it"},
    {"Redirect", Send("HTTP/1.1 302 Found\r\nLocation: http://127.0.0.1:1/\r\nContent-Length: 0\r\n\r\n"),
     "Server returned error: 302 Found"},
};

class TransportOverTcp : public testing::TestWithParam<Fault> {};

TEST_P(TransportOverTcp, ReportsTheFaultAtOnceAndWorksAfterwards) {
  ExpectFault(GetParam(), std::nullopt);
}

INSTANTIATE_TEST_SUITE_P(Misbehaviour, TransportOverTcp, testing::ValuesIn(MISBEHAVIOUR), NameOf);

INSTANTIATE_TEST_SUITE_P(Resets, TransportOverTcp,
                         testing::Values(Fault{"BeforeTheHeader", SendAndReset(""), RESET},
                                         Fault{"WithinTheHeader", SendAndReset("HTTP/1.1 200 OK\r\nContent-"), RESET},
                                         Fault{"AfterTheHeader", SendAndReset(LENGTH_5), RESET},
                                         Fault{"WithinTheBody", SendAndReset(LENGTH_5 + "hel"), RESET},
                                         Fault{"WithinABodyWithoutLength", SendAndReset(OK + "\r\nhel"), RESET},
                                         Fault{"WithinTheChunks", SendAndReset(CHUNKED + "5\r\nhel"), RESET}),
                         NameOf);

class TransportOverTls : public testing::TestWithParam<Fault> {};

TEST_P(TransportOverTls, ReportsTheFaultAtOnceAndWorksAfterwards) {
  ExpectFault(GetParam(), TlsSettings());
}

INSTANTIATE_TEST_SUITE_P(Misbehaviour, TransportOverTls, testing::ValuesIn(MISBEHAVIOUR), NameOf);

ScriptedServer::Script SendAndEndWithoutNotice(const std::string &bytes) {
  return [bytes](ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    connection.Write(bytes);
    connection.CloseWithoutNotice();
  };
}

const std::string BROKE = "The TLS connection to localhost broke: ";
const std::string NO_NOTICE = BROKE + "the server ended the connection without TLS's closing notice";

INSTANTIATE_TEST_SUITE_P(
    Ends, TransportOverTls,
    testing::Values(
        Fault{"WithoutNoticeBeforeTheHeader", SendAndEndWithoutNotice(""), NO_NOTICE},
        Fault{"WithoutNoticeWithinTheBody", SendAndEndWithoutNotice(LENGTH_5 + "hel"), NO_NOTICE},
        Fault{"WithoutNoticeAfterABodyWithoutLength", SendAndEndWithoutNotice(OK + "\r\nhello"), NO_NOTICE},
        Fault{"WithoutNoticeAfterAnOldBodyWithoutLength", SendAndEndWithoutNotice("HTTP/1.0 200 OK\r\n\r\nhello"),
              NO_NOTICE},
        Fault{"WithAResetBeforeTheHeader", SendAndReset(""), BROKE + RESET},
        Fault{"WithAResetWithinABodyWithoutLength", SendAndReset(OK + "\r\nhel"), BROKE + RESET},
        Fault{"WithinTheHandshake",
              [](ServerConnection &connection) {
                connection.ReadRawSome();
                connection.CloseWithoutNotice();
              },
              "The TLS handshake with localhost failed: the server ended the connection without TLS's closing "
              "notice"},
        Fault{"WithoutTlsAtAll",
              [](ServerConnection &connection) {
                connection.ReadRawSome();
                connection.WriteRaw("HTTP/1.1 400 Bad Request\r\n\r\n");
              },
              "The TLS handshake with localhost failed: error:0A00010B:SSL routines::wrong version number"}),
    NameOf);

TEST(TransportBytesAfterTheEnd, AreIgnoredInOneAndInTwoPieces) {
  const auto inTwoPieces = [](ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    connection.Write(LENGTH_5 + "hello");
    connection.Write(", world");
  };
  for (const std::optional<TlsSettings> &tls : {std::optional<TlsSettings>(), std::optional(TlsSettings())}) {
    ServiceStandIn inOne(Send(LENGTH_5 + "hello, world"), tls);
    EXPECT_EQ(AskForOutcome(*inOne.CreateSession()), "hello");
    ServiceStandIn inTwo(inTwoPieces, tls);
    EXPECT_EQ(AskForOutcome(*inTwo.CreateSession()), "hello");
  }
}

TEST(TransportOverTlsWithoutNotice, AcceptsAResponseThatIsCompleteByItsLength) {
  ServiceStandIn service(SendAndEndWithoutNotice(LENGTH_5 + "hello"), TlsSettings());
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), "hello");
}

TEST(TransportOverTlsWithNotice, AcceptsABodyThatTheNoticeEnds) {
  for (const std::string &start : {OK + "\r\n", std::string("HTTP/1.0 200 OK\r\n\r\n")}) {
    ServiceStandIn service(Send(start + "hello"), TlsSettings());
    EXPECT_EQ(AskForOutcome(*service.CreateSession()), "hello");
  }
}

/// Asks sts.example, which `first` looks up the first time; later look-ups return 127.0.0.1.
void ExpectFaultOfTheConnect(const Tarvel::System::NameLookup &first, const std::string &message) {
  ScriptedServer server(Testing::AnswerWith(Testing::Response("200 OK", "<after/>")));
  const std::string endpoint = "sts.example:" + std::to_string(server.GetPort());
  const auto lookups = std::make_shared<std::atomic<int>>(0);
  const Tarvel::System::ScopedNameLookup lookup([first, lookups](const std::string &host) {
    return (*lookups)++ == 0 ? first(host) : AddressList{boost::asio::ip::make_address("127.0.0.1")};
  });
  const HttpsClient client("http://" + endpoint, nullptr, "", Testing::NO_TIMEOUT);
  const auto session = client.CreateSession();
  const Stopwatch stopwatch;
  EXPECT_EQ(AskForOutcome(*session), Failure(Expand(message, endpoint)));
  EXPECT_LT(stopwatch.Read(), AT_ONCE);
  EXPECT_EQ(AskForOutcome(*session), "<after/>");
}

TEST(TransportConnect, ReportsARefusalAtOnceAndWorksAfterwards) {
  // The server listens over IPv4 only.
  ExpectFaultOfTheConnect([](const std::string &) { return AddressList{boost::asio::ip::make_address("::1")}; },
                          "Cannot connect to %e: Connection refused");
}

TEST(TransportConnect, ReportsAnUnknownHostAtOnceAndWorksAfterwards) {
  ExpectFaultOfTheConnect(
      [](const std::string &) -> AddressList { throw Tarvel::System::NetworkException("Name or service not known"); },
      "Cannot connect to %e: Name or service not known");
}

/// The first connection, to a server with `settings`, fails before anything of the request is sent. Then the server
/// gets the settings `repaired`, and the same client works.
/// @return the outcome of the first request.
std::string AskRefusedAndThenRepairedServer(const TlsSettings &settings, const std::string &parameter = "",
                                            const TlsSettings &repaired = {}) {
  const auto receivedRequest = std::make_shared<std::atomic<bool>>(false);
  ServiceStandIn service(FaultThenAnswer([receivedRequest](ServerConnection &connection) {
                           *receivedRequest = connection.Handshake() && !connection.ReadSome().empty();
                         }),
                         settings, Testing::NO_TIMEOUT, "localhost", parameter);
  const auto session = service.CreateSession();
  const Stopwatch stopwatch;
  std::string outcome = AskForOutcome(*session);
  EXPECT_LT(stopwatch.Read(), AT_ONCE);
  EXPECT_TRUE(Testing::Eventually([&] { return service.GetServer().GetOpenCount() == 0; }));
  EXPECT_FALSE(*receivedRequest);
  service.GetServer().ChangeTls(repaired);
  EXPECT_EQ(AskForOutcome(*session), "<after/>");
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), "<after/>");
  return outcome;
}

TEST(TransportServerIdentity, IsRefusedWithItsReasonBeforeAnythingIsSent) {
  struct Case {
    std::string certificate;
    std::string reason;
  };
  for (const Case &refused :
       {Case{"expired", "certificate has expired"}, Case{"self-signed", "self-signed certificate"},
        Case{"other-host", "hostname mismatch"}, Case{"untrusted", "unable to get local issuer certificate"}}) {
    for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
      TlsSettings settings;
      settings.certificate = refused.certificate;
      settings.minimumVersion = settings.maximumVersion = version;
      EXPECT_EQ(AskRefusedAndThenRepairedServer(settings),
                Failure("The TLS handshake with localhost failed: the server's certificate was not accepted: " +
                        refused.reason + " (certificate \"CN=" + refused.certificate + "\")"));
    }
  }
}

TEST(TransportServerIdentity, IsRefusedWithAnotherThumbprint) {
  TlsSettings expected;
  expected.certificate = "self-signed";
  const std::string right = TlsCertificate("self-signed")->GetSha256Thumbprint();
  const std::string shown = TlsCertificate("localhost")->GetSha256Thumbprint();
  EXPECT_EQ(AskRefusedAndThenRepairedServer(TlsSettings(), right, expected),
            Failure("The TLS handshake with localhost failed: the server's certificate has the SHA-256 thumbprint " +
                    shown + " instead of " + right));
}

TEST(TransportServerIdentity, NeedsNoAuthorityWithAMatchingThumbprint) {
  TlsSettings settings;
  settings.certificate = "self-signed";
  ServiceStandIn service(Send(LENGTH_5 + "hello"), settings, Testing::NO_TIMEOUT, "localhost",
                         TlsCertificate("self-signed")->GetSha256Thumbprint());
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), "hello");
}

TEST(TransportServer, IsRefusedWhenItOffersOnlyOldTls) {
  TlsSettings settings;
  settings.minimumVersion = settings.maximumVersion = TLS1_1_VERSION;
  settings.allowsWeakness = true;
  const std::string outcome = AskRefusedAndThenRepairedServer(settings);
  EXPECT_EQ(outcome.rfind(Failure("The TLS handshake with localhost failed: error:"), 0), 0u) << outcome;
}

TEST(TransportServer, RefusesAClientWithoutTheRequiredCertificate) {
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    TlsSettings settings;
    settings.demandsClient = true;
    settings.minimumVersion = settings.maximumVersion = version;
    const std::string outcome = AskRefusedAndThenRepairedServer(settings);
    EXPECT_EQ(outcome.rfind(Failure("The TLS "), 0), 0u) << outcome;
    EXPECT_NE(outcome.find(" alert "), std::string::npos) << outcome;
  }
}

TEST(TransportResumption, AbbreviatesTheHandshakeOfLaterRequests) {
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    TlsSettings settings;
    settings.minimumVersion = settings.maximumVersion = version;
    ServiceStandIn service(
        [](ServerConnection &connection) {
          if (connection.Handshake()) {
            connection.ReadRequest();
            connection.Write(Testing::Response("200 OK", connection.WasResumed() ? "resumed" : "full"));
          }
        },
        settings);
    EXPECT_EQ(AskForOutcome(*service.CreateSession()), "full");
    for (int i = 0; i < 5; ++i) {
      EXPECT_EQ(AskForOutcome(*service.CreateSession()), "resumed") << i;
    }
  }
}

} // namespace
} // namespace SsoClient
