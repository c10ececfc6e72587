// SPDX-License-Identifier: Apache-2.0
// What a probe finds out about a server.

#include "system/name_lookup.h"
#include "system/shared_lookup.h"
#include "unit/tarvel_ssl/tls_client.h"

#include "support/rendezvous.h"
#include "support/throws_message.h"
#include "support/unavailable_port.h"
#include "support/work_folder.h"

#include <tarvel/core/exception.h>
#include <tarvel/ssl/server_probe.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <exception>
#include <future>
#include <stdexcept>
#include <string>
#include <vector>

#include <netinet/in.h>
#include <openssl/ssl.h>
#include <sys/socket.h>
#include <unistd.h>

namespace Tarvel::Ssl {
namespace {

using Outcome = HandshakeProbe::Outcome;
using Kind = ServerRefusal::Kind;
using Testing::CreateTrustingContext;
using testing::ElementsAre;
using testing::IsEmpty;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using testing::StartsWith;
using Testing::TlsCertificate;
using Testing::TlsSettings;

constexpr std::int64_t PATIENCE = 60'000'000;
constexpr std::int64_t IMPATIENCE = 50'000;

/// Does the handshake, and keeps the data that the client sends after it.
class ListeningServer {
public:
  explicit ListeningServer(const TlsSettings &settings)
      : m_server([this](ServerConnection &peer) { Serve(peer); }, settings) {}

  int GetPort() const noexcept { return m_server.GetPort(); }
  /// What the first client has sent after its handshake. Waits until it sends something or ends the connection.
  std::string GetReceived() { return m_received.get_future().get(); }

private:
  void Serve(ServerConnection &peer) {
    const bool isAccepted = peer.Handshake();
    m_received.set_value(isAccepted ? peer.ReadSome() : "(no handshake)");
  }

  std::promise<std::string> m_received;
  ScriptedServer m_server; // last, because its scripts use the other members
};

TlsSettings Settings(const std::string &certificate, int version = 0) {
  TlsSettings settings;
  settings.certificate = certificate;
  settings.minimumVersion = settings.maximumVersion = version;
  settings.allowsWeakness = true;
  return settings;
}

HandshakeProbe Handshake(int port, const Ref<SSLContext> &context, const std::string &host = "localhost",
                         const std::string &parameter = "") {
  ServerProbe probe = ProbeServer(host, port, context, parameter, PATIENCE);
  if (!probe.handshake) {
    throw std::runtime_error("no handshake");
  }
  return *probe.handshake;
}

HandshakeProbe HandshakeWith(const TlsSettings &settings, const std::string &parameter = "",
                             const Ref<SSLContext> &context = CreateTrustingContext()) {
  ListeningServer server(settings);
  HandshakeProbe probe = Handshake(server.GetPort(), context, "localhost", parameter);
  const std::string received = server.GetReceived();
  EXPECT_TRUE(received.empty() || received == "(no handshake)") << received;
  return probe;
}

std::string RefusalOf(const std::string &certificate, const std::string &reason) {
  return "The TLS handshake with localhost failed: the server's certificate was not accepted: " + reason +
         " (certificate \"CN=" + certificate + "\")";
}

std::vector<Kind> KindsOf(const HandshakeProbe &probe) {
  std::vector<Kind> kinds;
  for (const ServerRefusal &refusal : probe.refusals) {
    kinds.push_back(refusal.kind);
  }
  return kinds;
}

TEST(ProbeServer, ShowsWhatAnAcceptedHandshakeAgreedOn) {
  const HandshakeProbe probe = HandshakeWith(Settings("localhost", TLS1_2_VERSION));
  EXPECT_EQ(Outcome::ACCEPTED, probe.outcome);
  EXPECT_EQ("", probe.failure);
  EXPECT_EQ("TLSv1.2", probe.version);
  EXPECT_THAT(probe.cipher, StartsWith("ECDHE-ECDSA-AES"));
  EXPECT_THAT(probe.refusals, IsEmpty());
  ASSERT_EQ(1u, probe.chain.size());
  EXPECT_EQ(1u, probe.chainLength);
  EXPECT_EQ(TlsCertificate("localhost")->GetSha256Thumbprint(), probe.chain[0]->GetSha256Thumbprint());
  ASSERT_TRUE(probe.anchor);
  EXPECT_EQ(TlsCertificate("authority")->GetSha256Thumbprint(), probe.anchor->GetSha256Thumbprint());
}

TEST(ProbeServer, RefusesAServerWithTheTextOfAConnectionAndStillShowsItsFacts) {
  struct Case {
    std::string certificate;
    std::string reason;
    Kind kind;
  };
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    for (const Case &refused :
         std::vector<Case>{{"expired", "certificate has expired", Kind::EXPIRED},
                           {"not-yet-valid", "certificate is not yet valid", Kind::NOT_YET_VALID},
                           {"self-signed", "self-signed certificate", Kind::SELF_SIGNED},
                           {"other-host", "hostname mismatch", Kind::OTHER_NAME},
                           {"localhost-rsa1024", "EE certificate key too weak", Kind::WEAK_KEY},
                           {"not-for-servers", "unsuitable certificate purpose", Kind::WRONG_PURPOSE},
                           {"untrusted", "unable to get local issuer certificate", Kind::UNKNOWN_ISSUER}}) {
      const HandshakeProbe probe = HandshakeWith(Settings(refused.certificate, version));
      EXPECT_EQ(Outcome::CERTIFICATE_REFUSED, probe.outcome) << refused.certificate;
      EXPECT_EQ(RefusalOf(refused.certificate, refused.reason), probe.failure);
      EXPECT_THAT(KindsOf(probe), ElementsAre(refused.kind)) << refused.certificate;
      EXPECT_EQ(version == TLS1_2_VERSION ? "TLSv1.2" : "TLSv1.3", probe.version);
      EXPECT_NE("", probe.cipher);
      ASSERT_EQ(1u, probe.chain.size());
      EXPECT_EQ("CN=" + refused.certificate, probe.chain[0]->GetSubject());
    }
  }
}

TEST(ProbeServer, NotesEachReasonAgainstACertificate) {
  const HandshakeProbe probe = HandshakeWith(Settings("expired"), "", CreateSSLContext());
  EXPECT_THAT(KindsOf(probe), ElementsAre(Kind::UNKNOWN_ISSUER, Kind::EXPIRED));
  ASSERT_EQ(2u, probe.refusals.size());
  EXPECT_EQ(RefusalOf("expired", "unable to get local issuer certificate"), probe.failure);
  EXPECT_EQ("the server's certificate was not accepted: certificate has expired (certificate \"CN=expired\")",
            probe.refusals[1].text);
  EXPECT_EQ(0u, probe.refusals[1].depth);
  ASSERT_TRUE(probe.refusals[1].certificate);
  EXPECT_EQ("CN=expired", probe.refusals[1].certificate->GetSubject());
  EXPECT_FALSE(probe.anchor);
}

TEST(ProbeServer, ShowsTheAnchorOfAServerThatIsRefusedForAnotherReason) {
  const HandshakeProbe probe = HandshakeWith(Settings("expired"));
  ASSERT_TRUE(probe.anchor);
  EXPECT_EQ("CN=authority", probe.anchor->GetSubject());
}

TEST(ProbeServer, AcceptsAThumbprintInPlaceOfTheChain) {
  const HandshakeProbe right =
      HandshakeWith(Settings("self-signed"), TlsCertificate("self-signed")->GetSha256Thumbprint());
  EXPECT_EQ(Outcome::ACCEPTED, right.outcome);
  EXPECT_THAT(right.refusals, IsEmpty());
  EXPECT_FALSE(right.anchor);

  const HandshakeProbe wrong =
      HandshakeWith(Settings("self-signed"), TlsCertificate("localhost")->GetSha256Thumbprint());
  EXPECT_EQ(Outcome::CERTIFICATE_REFUSED, wrong.outcome);
  EXPECT_THAT(KindsOf(wrong), ElementsAre(Kind::OTHER_THUMBPRINT));
  EXPECT_EQ("The TLS handshake with localhost failed: the server's certificate has the SHA-256 thumbprint " +
                TlsCertificate("self-signed")->GetSha256Thumbprint() + " instead of " +
                TlsCertificate("localhost")->GetSha256Thumbprint(),
            wrong.failure);
  ASSERT_EQ(1u, wrong.chain.size());
}

TEST(ProbeServer, ShowsTheChainEachTime) {
  const Ref<SSLContext> context = CreateTrustingContext();
  ScriptedServer server(
      [](ServerConnection &peer) {
        peer.Handshake();
        peer.Write("!");
        peer.Stall();
      },
      Settings("localhost", TLS1_2_VERSION));
  for (int turn = 0; turn < 3; ++turn) {
    EXPECT_EQ(1u, Handshake(server.GetPort(), context).chain.size()) << turn;
  }
}

TEST(ProbeServer, RecognisesAServerWithoutTls) {
  const auto probe = [](const std::string &answer) {
    ScriptedServer server([answer](ServerConnection &peer) {
      peer.ReadSome();
      peer.Write(answer);
    });
    return Handshake(server.GetPort(), CreateTrustingContext()).outcome;
  };
  EXPECT_EQ(Outcome::PLAIN_HTTP, probe("HTTP/1.1 400 Bad Request\r\n\r\n"));
  EXPECT_EQ(Outcome::NOT_TLS, probe("220 mail.example ESMTP ready\r\n"));
  EXPECT_EQ(Outcome::FAILED, probe(""));
}

TEST(ProbeServer, RecognisesAServerThatOffersOnlyOldVersions) {
  const HandshakeProbe probe = HandshakeWith(Settings("localhost", TLS1_1_VERSION));
  EXPECT_EQ(Outcome::NO_COMMON_VERSION, probe.outcome);
  EXPECT_EQ("", probe.cipher);
  EXPECT_THAT(probe.chain, IsEmpty());
}

/// The unencrypted beginning of a TLS 1.2 handshake: the server's hello, and the header of a message "certificate" of
/// almost 16 MiB, with the first part of its content.
std::string BeginOfEndlessChain() {
  using namespace std::string_literals;
  const std::string hello = "\x16\x03\x03\x00\x31\x02\x00\x00\x2d\x03\x03"s + std::string(32, 'r') +
                            "\x00\xc0\x2b\x00\x00\x05\xff\x01\x00\x01\x00"s;
  return hello + "\x16\x03\x03\x40\x00\x0b\xff\xff\xff\xff\xff\xfc"s + std::string(16384 - 7, 'c');
}

TEST(ProbeServer, RefusesAnEndlessChain) {
  ScriptedServer server([&](ServerConnection &peer) {
    peer.ReadSome();
    peer.Write(BeginOfEndlessChain());
    while (peer.Write(std::string("\x16\x03\x03\x40\x00", 5) + std::string(16384, 'c'))) {
    }
  });
  const HandshakeProbe probe = Handshake(server.GetPort(), CreateTrustingContext());
  EXPECT_EQ(Outcome::TOO_LONG, probe.outcome) << probe.failure;
}

TEST(ProbeServer, KeepsALimitedNumberOfCertificates) {
  const Testing::WorkFolder folder;
  std::string chain = Testing::ReadDataFile("tls/localhost.crt");
  for (int i = 0; i < 99; ++i) {
    chain += Testing::ReadDataFile("tls/intermediate.crt");
  }
  folder.Write("long.crt", chain);
  folder.Write("long.key", Testing::ReadDataFile("tls/localhost.key"));
  const std::string toRoot = "../../../../../../../../../../../../../../../..";
  const HandshakeProbe probe = HandshakeWith(Settings(toRoot + folder / "long"));
  EXPECT_EQ(Outcome::ACCEPTED, probe.outcome) << probe.failure;
  EXPECT_EQ(100u, probe.chainLength);
  EXPECT_EQ(MAX_PROBED_CERTIFICATES, probe.chain.size());
}

TEST(ProbeServer, EndsWhenAServerDoesNotAnswerTheHandshake) {
  ScriptedServer server([](ServerConnection &peer) { peer.Stall(); });
  ServerProbe probe;
  // The connect has the same limit. If it takes longer, because a thread is late, the next probe has more time.
  for (std::int64_t timeout = IMPATIENCE; !probe.handshake && timeout < PATIENCE; timeout *= 2) {
    probe = ProbeServer("127.0.0.1", server.GetPort(), CreateTrustingContext(), "", timeout);
  }
  ASSERT_TRUE(probe.handshake);
  EXPECT_EQ(Outcome::TIMED_OUT, probe.handshake->outcome);
  EXPECT_EQ("The TLS handshake with 127.0.0.1 did not end in time", probe.handshake->failure);
}

TEST(ProbeServer, TriesEachAddressAndUsesTheFirstThatAnswers) {
  ListeningServer server(Settings("localhost"));
  const System::ScopedNameLookup lookup([](const std::string &) {
    return System::AddressList{boost::asio::ip::make_address("127.0.0.2"), boost::asio::ip::make_address("127.0.0.1")};
  });
  const ServerProbe probe = ProbeServer("localhost", server.GetPort(), CreateTrustingContext(), "", PATIENCE);
  EXPECT_EQ(2u, probe.addressCount);
  ASSERT_EQ(2u, probe.addresses.size());
  EXPECT_EQ("127.0.0.2", probe.addresses[0].address);
  EXPECT_EQ(AddressProbe::Outcome::REFUSED, probe.addresses[0].outcome);
  EXPECT_EQ("Connection refused", probe.addresses[0].reason);
  EXPECT_EQ("127.0.0.1", probe.addresses[1].address);
  EXPECT_EQ(AddressProbe::Outcome::ANSWERED, probe.addresses[1].outcome);
  EXPECT_EQ("", probe.addresses[1].reason);
  ASSERT_TRUE(probe.handshake);
  EXPECT_EQ(Outcome::ACCEPTED, probe.handshake->outcome);
}

/// Accepts TCP connections at 127.0.0.3 and never reads from them.
class SilentNeighbour {
public:
  explicit SilentNeighbour(int port) : m_listener(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK + 2);
    if (::bind(m_listener, reinterpret_cast<sockaddr *>(&address), sizeof address) != 0 ||
        ::listen(m_listener, 1) != 0) {
      throw std::runtime_error("no listener at 127.0.0.3");
    }
  }
  SilentNeighbour(const SilentNeighbour &) = delete;
  SilentNeighbour &operator=(const SilentNeighbour &) = delete;
  ~SilentNeighbour() { ::close(m_listener); }

private:
  int m_listener;
};

TEST(ProbeServer, UsesTheFirstInOrderWhenSeveralAddressesAnswer) {
  ListeningServer server(Settings("localhost"));
  const SilentNeighbour neighbour(server.GetPort());
  const System::ScopedNameLookup lookup([](const std::string &) {
    return System::AddressList{boost::asio::ip::make_address("127.0.0.1"), boost::asio::ip::make_address("127.0.0.3")};
  });
  const ServerProbe probe = ProbeServer("localhost", server.GetPort(), CreateTrustingContext(), "", PATIENCE);
  ASSERT_EQ(2u, probe.addresses.size());
  EXPECT_EQ(AddressProbe::Outcome::ANSWERED, probe.addresses[0].outcome);
  EXPECT_EQ(AddressProbe::Outcome::ANSWERED, probe.addresses[1].outcome);
  ASSERT_TRUE(probe.handshake);
  EXPECT_EQ(Outcome::ACCEPTED, probe.handshake->outcome);
}

TEST(ProbeServer, TriesOnlySoManyAddresses) {
  const Testing::UnusedPort port;
  const System::ScopedNameLookup lookup(
      [](const std::string &) { return System::AddressList(1000, boost::asio::ip::make_address("127.0.0.1")); });
  const ServerProbe probe = ProbeServer("many.example", port.GetPort(), nullptr, "", PATIENCE);
  EXPECT_EQ(1000u, probe.addressCount);
  EXPECT_EQ(MAX_PROBED_ADDRESSES, probe.addresses.size());
}

TEST(ProbeServer, EndsWhenAnAddressDoesNotAnswer) {
  const Testing::FullPort port;
  const ServerProbe probe = ProbeServer("127.0.0.1", port.GetPort(), CreateTrustingContext(), "", IMPATIENCE);
  ASSERT_EQ(1u, probe.addresses.size());
  EXPECT_EQ(AddressProbe::Outcome::TIMED_OUT, probe.addresses[0].outcome);
  EXPECT_EQ("there was no answer in time", probe.addresses[0].reason);
  EXPECT_FALSE(probe.handshake);
}

TEST(ProbeServer, ReportsWhyANameHasNoAddress) {
  const System::ScopedNameLookup lookup(
      [](const std::string &) -> System::AddressList { throw System::NetworkException("Name or service not known"); });
  const ServerProbe probe = ProbeServer("nowhere.example", 443, nullptr, "", PATIENCE);
  EXPECT_EQ("Name or service not known", probe.lookupFailure);
  EXPECT_THAT(probe.addresses, IsEmpty());
  EXPECT_EQ("the port is not between 1 and 65535", ProbeServer("localhost", 0, nullptr, "", PATIENCE).lookupFailure);
}

TEST(ProbeServer, EndsWhenTheResolverDoesNotAnswer) {
  Testing::Gate resolver;
  const System::ScopedNameLookup lookup([&resolver](const std::string &) -> System::AddressList {
    resolver.Pass();
    throw System::NetworkException("late");
  });
  // The probe joins a look-up that has begun. If the probe were its only caller and gave up before it began, the
  // function above would never be called. The completion shows that the function has ended.
  Testing::EventCount ended;
  const Ref<System::ScheduledItem> other = System::StartSharedLookup(
      "slow.example", [&ended](const System::AddressList &, const std::exception_ptr &) { ended.Add(); });
  EXPECT_TRUE(resolver.WaitForArrivals(1));
  EXPECT_EQ("the resolver did not answer in time",
            ProbeServer("slow.example", 443, nullptr, "", IMPATIENCE).lookupFailure);
  resolver.Open();
  EXPECT_TRUE(ended.WaitFor(1));
}

TEST(ProbeServer, NeedsNoContextWithoutTls) {
  ScriptedServer server([](ServerConnection &peer) { peer.Stall(); });
  const ServerProbe probe = ProbeServer("localhost", server.GetPort(), nullptr, "", PATIENCE);
  EXPECT_EQ(AddressProbe::Outcome::ANSWERED, probe.addresses.back().outcome);
  EXPECT_FALSE(probe.handshake);
}

} // namespace
} // namespace Tarvel::Ssl
