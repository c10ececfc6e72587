// SPDX-License-Identifier: Apache-2.0
// Neither a password nor a response may remain in the heap: each piece of memory is searched when it is freed.
#include "compose/ws_security.h"
#include "exchange/request_builder_impl.h"
#include "exchange/soap_response.h"
#include "integration/secret_wiping/freed_memory.h"
#include "integration/transport/service_stand_in.h"
#include "support/identity.h"
#include "support/recorded_events.h"
#include "support/rendezvous.h"
#include "support/service_stand_ins.h"
#include "xml/xml_text.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/secret_text.h>
#include <tarvel/core/secure_wipe.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <memory>
#include <optional>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {
namespace {

const char LONG_PASSWORD[] = "correct-horse-battery-staple-and-more-than-fits-into-the-string-itself";
const char SHORT_PASSWORD[] = "tr0ub4dor";

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  for (int i = 0; i < 100; ++i) { // a request that outgrows many buffers
    spec.audienceRestriction.insert("https://audience.example/" + std::to_string(i));
  }
  return spec;
}

/// Answers each request without keeping a copy, which would contain the password.
class ForgetfulTransport final : public Transport {
public:
  std::shared_ptr<TransportSession> CreateSession() const override { return std::make_shared<Session>(); }

private:
  class Session final : public TransportSession {
  public:
    void SendRequest(const Request &request, Tarvel::Ref<Tarvel::Reader> &response) override {
      Testing::FollowMemory(request.body.data());
      response = Tarvel::CreateStringReader("issued:");
    }
    void SendRequestAsync(const Request &, const Completion &, Tarvel::Ref<Tarvel::System::ScheduledItem> &) override {}
  };
};

class FreedMemory : public testing::TestWithParam<const char *> {};

TEST_P(FreedMemory, IsFoundToContainASecretThatWasNotWiped) {
  const Testing::FreedMemoryWatch watch(GetParam());
  delete new std::string(std::string(GetParam()) + std::string(100, 'x'));
  EXPECT_GT(watch.Found(), 0);
}

TEST_P(FreedMemory, ContainsNoPasswordOfADestroyedRequest) {
  const RequestBuilderImpl plain(boost::none);
  const RequestBuilderImpl identified(Testing::HolderIdentity());
  const std::string password = GetParam();
  const TokenSpec spec = Spec();
  const Testing::FreedMemoryWatch watch(GetParam());
  for (const RequestBuilderImpl *const builder : {&plain, &identified}) {
    Request request;
    builder->BuildUserPassTokenRequest("alice", password, spec, request);
    ASSERT_NE(request.body.find(password), std::string::npos);
    Request copy = request;
    request = Request();
    builder->BuildUserPassTokenRequest("alice", password, spec, copy);
  }
  EXPECT_EQ(watch.Found(), 0);
}

// The whole request fits into one buffer. The later parts of a longer request would overwrite that buffer.
TEST_P(FreedMemory, ContainsNoPasswordOfADestroyedShortRequest) {
  const RequestBuilderImpl builder(boost::none);
  const std::string password = GetParam();
  TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  const Testing::FreedMemoryWatch watch(GetParam());
  {
    Request request;
    builder.BuildUserPassTokenRequest("alice", password, spec, request);
    ASSERT_NE(request.body.find(password), std::string::npos);
  }
  EXPECT_EQ(watch.Found(), 0);
}

TEST_P(FreedMemory, ContainsNoPasswordOfARequestThatCannotBeBuilt) {
  const RequestBuilderImpl builder(boost::none);
  const std::string password = GetParam();
  const std::string uncarriable = password + "\x01";
  TokenSpec spec = Spec();
  const Testing::FreedMemoryWatch watch(GetParam());
  Request request;
  EXPECT_THROW(builder.BuildUserPassTokenRequest("alice", uncarriable, spec, request),
               Tarvel::InvalidArgumentException);
  spec.delegateTo = std::string("\x01");
  EXPECT_THROW(builder.BuildUserPassTokenRequest("alice", password, spec, request), Tarvel::InvalidArgumentException);
  EXPECT_EQ(watch.Found(), 0);
}

TEST_P(FreedMemory, ContainsTheWipedRequestBeforeTheResponseIsRead) {
  const std::string password = GetParam();
  const TokenSpec spec = Spec();
  bool wasFreed = false;
  const auto handler = std::make_shared<const Testing::ResponseHandlerStandIn>(
      [&wasFreed] { wasFreed = Testing::IsFollowedMemoryFreed(); });
  const SecurityTokenServiceImpl service(std::make_shared<const RequestBuilderImpl>(boost::none),
                                         std::make_shared<const ForgetfulTransport>(), handler,
                                         Tarvel::Crypto::CertificateList());
  const Testing::FreedMemoryWatch watch(GetParam());
  service.AcquireToken("alice", password, spec);
  EXPECT_TRUE(wasFreed);
  EXPECT_EQ(watch.Found(), 0);
}

// For an observer, the operation copies the password, to remove it from the events.
TEST_P(FreedMemory, ContainsNoPasswordOfAnObservedOperation) {
  const std::string password = GetParam();
  const TokenSpec spec = Spec();
  ServiceOptions options;
  const auto observer = std::make_shared<Testing::RecordedEvents>();
  options.observer = observer;
  const SecurityTokenServiceImpl service(
      std::make_shared<const RequestBuilderImpl>(boost::none), std::make_shared<const ForgetfulTransport>(),
      std::make_shared<const Testing::ResponseHandlerStandIn>(), Tarvel::Crypto::CertificateList(), options);
  const Testing::FreedMemoryWatch watch(GetParam());
  service.AcquireToken("alice", password, spec);
  EXPECT_EQ(watch.Found(), 0);
  EXPECT_EQ(observer->Lines().back(), "ended");
}

TEST_P(FreedMemory, ContainsNoTextThatWasKeptAsASecret) {
  const std::string password = GetParam();
  const Testing::FreedMemoryWatch watch(GetParam());
  auto text = std::make_unique<Tarvel::SecretText>(password);
  auto copy = std::make_unique<Tarvel::SecretText>(*text);
  text.reset();
  EXPECT_EQ(copy->Get(), password);
  copy.reset();
  EXPECT_EQ(watch.Found(), 0);
}

TEST_P(FreedMemory, ContainsNoPasswordOfACompletedAsynchronousOperation) {
  const std::string password = GetParam();
  const TokenSpec spec = Spec();
  const auto over = std::make_shared<Testing::EventCount>();
  const Testing::FreedMemoryWatch watch(GetParam());
  auto transport = std::shared_ptr<ForgetfulTransport>(new ForgetfulTransport, [over](ForgetfulTransport *object) {
    delete object;
    over->Add();
  });
  auto service = std::make_shared<SecurityTokenServiceImpl>(
      std::make_shared<const RequestBuilderImpl>(boost::none), transport,
      std::make_shared<const Testing::ResponseHandlerStandIn>(), Tarvel::Crypto::CertificateList());
  transport.reset();
  service->AcquireTokenAsync("alice", password, spec,
                             [](const std::shared_ptr<const SamlToken> &, const Tarvel::Exception *) {});
  service.reset();
  ASSERT_TRUE(over->WaitFor(1)); // the operation releases the service after the password
  EXPECT_EQ(watch.Found(), 0);
}

/// Posts the secret, first without padding and then after much of it, to a service that never reads it. This process
/// must have no copy except the test's.
int CountFindsOfPosts(const char *secret, const Testing::ScriptedServer::Script &script,
                      std::optional<Testing::TlsSettings> tls, std::int64_t timeout) {
  Testing::ServiceStandIn service(script, tls, timeout);
  const Testing::FreedMemoryWatch watch(secret);
  for (const std::string &padding : {std::string(), std::string(40000, 'x')}) {
    auto request = std::make_unique<Request>(Testing::SampleRequest());
    request->body.reserve(padding.size() + std::strlen(secret));
    request->body.assign(padding).append(secret);
    Testing::AskForOutcome(*service.CreateSession(), *request);
  }
  EXPECT_TRUE(Testing::DrainIoThreads());
  return watch.Found();
}

TEST_P(FreedMemory, ContainsNoPasswordOfARequestThatWasSent) {
  const auto answer = [](Testing::ServerConnection &connection) {
    connection.Handshake();
    connection.Write(Testing::Response("200 OK", "<answer/>"));
    connection.WaitForInterrupt();
  };
  EXPECT_EQ(CountFindsOfPosts(GetParam(), answer, std::nullopt, Testing::NO_TIMEOUT), 0);
  EXPECT_EQ(CountFindsOfPosts(GetParam(), answer, Testing::TlsSettings(), Testing::NO_TIMEOUT), 0);
}

TEST_P(FreedMemory, ContainsNoPasswordOfARequestThatFailed) {
  constexpr std::int64_t SHORT = 200000; // microseconds
  const auto stall = [](Testing::ServerConnection &connection) {
    connection.Handshake();
    connection.WaitForInterrupt();
  };
  const auto reset = [](Testing::ServerConnection &connection) { connection.Reset(); };
  EXPECT_EQ(CountFindsOfPosts(GetParam(), stall, std::nullopt, SHORT), 0);
  EXPECT_EQ(CountFindsOfPosts(GetParam(), stall, Testing::TlsSettings(), SHORT), 0);
  EXPECT_EQ(CountFindsOfPosts(GetParam(), reset, std::nullopt, Testing::NO_TIMEOUT), 0);
  EXPECT_EQ(CountFindsOfPosts(GetParam(), reset, Testing::TlsSettings(), Testing::NO_TIMEOUT), 0);
}

enum class Reading { NOT, IN_PIECES, WHOLE, AS_XML };

/// Lets a service answer with these pieces, which outlive it, and counts the copies that this process leaves in freed
/// memory.
int CountFindsOfAnswers(const char *secret, const std::vector<std::string> &pieces,
                        const std::optional<Testing::TlsSettings> &tls, Reading reading) {
  const auto script = [&pieces](Testing::ServerConnection &connection) {
    connection.Handshake();
    connection.ReadRequest();
    for (const std::string &piece : pieces) {
      connection.Write(piece);
    }
  };
  Testing::ServiceStandIn service(script, tls);
  const Testing::FreedMemoryWatch watch(secret);
  try {
    Tarvel::Ref<Tarvel::Reader> response;
    service.CreateSession()->SendRequest(Testing::SampleRequest(), response);
    if (reading == Reading::IN_PIECES) {
      char buffer[7];
      while (response->Read(buffer, sizeof buffer) > 0) {
      }
    }
    if (reading == Reading::WHOLE) {
      std::string text = response->ReadToEnd(Tarvel::Http::MAX_BODY_BYTES);
      EXPECT_NE(text.find(secret), std::string::npos);
      Tarvel::SecureWipe(text);
    }
    if (reading == Reading::AS_XML) {
      EXPECT_THROW(CheckSoapFault(*ParseResponseDocument(*response)), SsoException);
    }
  } catch (const CommunicationException &) { // for wrong responses; NOLINT(bugprone-empty-catch)
  }
  EXPECT_TRUE(Testing::DrainIoThreads());
  return watch.Found();
}

/// The secret in a SOAP message that is too long for a string's inline buffer, between much padding or none.
std::string AnswerWithSecret(const char *secret, std::size_t padding) {
  return "<e:Envelope xmlns:e=\"http://schemas.xmlsoap.org/soap/envelope/\"><!--" + std::string(padding, 'x') +
         "--><e:Body><e:Fault><faultcode>e:Server</faultcode><detail>" + secret + "</detail></e:Fault></e:Body><!--" +
         std::string(padding, 'x') + "--></e:Envelope>";
}

std::vector<std::string> InPieces(const std::string &bytes, std::size_t length) {
  std::vector<std::string> pieces;
  for (std::size_t at = 0; at < bytes.size(); at += length) {
    pieces.push_back(bytes.substr(at, length));
  }
  return pieces;
}

std::string InChunks(const std::string &body, std::size_t length) {
  std::ostringstream chunks;
  for (const std::string &piece : InPieces(body, length)) {
    chunks << std::hex << piece.size() << "\r\n" << piece << "\r\n";
  }
  return chunks.str() + "0\r\n\r\n";
}

TEST_P(FreedMemory, ContainsNothingOfAResponse) {
  const std::string ok = "HTTP/1.1 200 OK\r\n";
  for (const std::size_t padding : {std::size_t(0), std::size_t(200000)}) {
    const std::string body = AnswerWithSecret(GetParam(), padding);
    const std::size_t pieceLength = padding / 3 + 1000;
    for (const std::string &bytes :
         {ok + "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body, ok + "\r\n" + body,
          ok + "Transfer-Encoding: chunked\r\n\r\n" + InChunks(body, 5000),
          ok + "Content-Type: text/xml;charset=latin1\r\n\r\n<?xml version='1.0' encoding='latin1'?>" + body,
          ok + "Content-Type: text/xml;charset=latin1\r\n\r\n" + body + "<!--\xFC-->"}) {
      const std::vector<std::string> pieces = InPieces(bytes, pieceLength);
      for (const Reading reading : {Reading::NOT, Reading::IN_PIECES, Reading::WHOLE, Reading::AS_XML}) {
        EXPECT_EQ(CountFindsOfAnswers(GetParam(), pieces, std::nullopt, reading), 0);
        EXPECT_EQ(CountFindsOfAnswers(GetParam(), pieces, Testing::TlsSettings(), reading), 0);
      }
    }
  }
}

TEST_P(FreedMemory, ContainsNothingOfARefusedResponse) {
  const std::string body = AnswerWithSecret(GetParam(), 0);
  for (const std::string &bytes :
       {"HTTP/1.1 503 Down\r\n\r\n" + body, "HTTP/1.1 200 OK\r\nContent-Length: 100000\r\n\r\n" + body,
        "HTTP/1.1 200 OK\r\nContent-Length: many\r\n\r\n" + body,
        "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n" + InChunks(body, 100).substr(0, body.size()),
        "HTTP/1.1 200 OK\r\nContent-Encoding: gzip\r\n\r\n" + body, body}) {
    for (const std::size_t length : {std::size_t(100000), std::size_t(20)}) {
      const std::vector<std::string> pieces = InPieces(bytes, length);
      EXPECT_EQ(CountFindsOfAnswers(GetParam(), pieces, std::nullopt, Reading::NOT), 0) << bytes;
      EXPECT_EQ(CountFindsOfAnswers(GetParam(), pieces, Testing::TlsSettings(), Reading::NOT), 0) << bytes;
    }
  }
}

enum class LastRead { ENDS, THROWS };

/// Returns the text in pieces, as a file does.
class PieceReader final : public Tarvel::Reader {
public:
  PieceReader(const std::string &text, LastRead last) : m_text(text), m_last(last) {}
  std::size_t Read(char *buffer, std::size_t length) override {
    const std::size_t count = m_text.copy(buffer, std::min<std::size_t>(length, 1000), m_position);
    if (count == 0 && m_last == LastRead::THROWS) {
      throw Tarvel::IOException("broken");
    }
    m_position += count;
    return count;
  }

private:
  const std::string &m_text;
  const LastRead m_last;
  std::size_t m_position = 0;
};

TEST_P(FreedMemory, ContainsNothingOfATextThatWasReadOrParsed) {
  for (const std::size_t padding : {std::size_t(0), std::size_t(200000)}) {
    const std::string text = AnswerWithSecret(GetParam(), padding);
    const Testing::FreedMemoryWatch watch(GetParam());
    Tarvel::CreateStringReader(text);
    char buffer[7];
    Tarvel::CreateStringReader(text)->Read(buffer, sizeof buffer);
    Tarvel::SecureWipe(buffer, sizeof buffer);
    std::string read = Tarvel::MakeRef<PieceReader>(text, LastRead::ENDS)->ReadToEnd(text.size());
    EXPECT_EQ(read, text);
    Tarvel::SecureWipe(read);
    Tarvel::Ref<Tarvel::Xml::Document> document;
    ParseXML(text, document);
    document.reset();
    EXPECT_EQ(watch.Found(), 0);
  }
}

TEST_P(FreedMemory, ContainsNothingOfATextThatCouldNotBeReadToItsEnd) {
  for (const std::size_t padding : {std::size_t(0), std::size_t(200000)}) {
    const std::string text = AnswerWithSecret(GetParam(), padding);
    const Testing::FreedMemoryWatch watch(GetParam());
    EXPECT_THROW(Tarvel::MakeRef<PieceReader>(text, LastRead::THROWS)->ReadToEnd(text.size()), Tarvel::IOException);
    EXPECT_EQ(watch.Found(), 0);
  }
}

// The tree of an accepted document keeps its texts, and is not overwritten.
TEST_P(FreedMemory, ContainsNothingOfADocumentThatIsRefusedAfterReferencesWereReplaced) {
  const std::string secret = GetParam();
  for (const std::string &text : {"<a x='&amp;" + secret + "' x=''/>", "<a>&amp;" + secret + "&", "<a><!--\r" + secret,
                                  "<a><?t \r" + secret, "<a x='&lt;' y='&lt;" + secret + "' <"}) {
    const Testing::FreedMemoryWatch watch(GetParam());
    Tarvel::Ref<Tarvel::Xml::Document> document;
    EXPECT_THROW(ParseXML(text, document), Tarvel::Xml::XMLParseException);
    EXPECT_EQ(watch.Found(), 0) << text;
  }
}

INSTANTIATE_TEST_SUITE_P(LongAndShort, FreedMemory, testing::Values(LONG_PASSWORD, SHORT_PASSWORD),
                         [](const auto &password) { return password.param == LONG_PASSWORD ? "Long" : "Short"; });

TEST(SecureWipe, OverwritesAndEmptiesATextWithTheRestOfALongerValue) {
  std::string text = LONG_PASSWORD;
  text.resize(3); // the rest remains in memory
  const char *const memory = text.data();
  const std::size_t bytes = text.capacity();
  Tarvel::SecureWipe(text);
  EXPECT_EQ(text, "");
  ASSERT_EQ(text.data(), memory);
  EXPECT_EQ(std::string_view(memory, bytes), std::string(bytes, '\0'));
}

TEST(SecureWipe, OverwritesAListOfBytesAndAcceptsAnEmptyOne) {
  std::vector<std::uint8_t> bytes = {1, 2, 3};
  const std::uint8_t *const memory = bytes.data();
  Tarvel::SecureWipe(bytes);
  EXPECT_TRUE(bytes.empty());
  EXPECT_EQ(std::string(memory, memory + 3), std::string(3, '\0'));
  Tarvel::SecureWipe(bytes);
  std::vector<std::uint8_t> empty;
  Tarvel::SecureWipe(empty);
  Tarvel::SecureWipe(nullptr, 0);
}

} // namespace
} // namespace SsoClient
