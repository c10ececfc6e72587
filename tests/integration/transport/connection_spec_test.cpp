// SPDX-License-Identifier: Apache-2.0

#include "transport/connection_spec_impl.h"

#include "integration/transport/service_stand_in.h"
#include "support/completion.h"
#include "system/name_lookup.h"

#include <ssoclient/connection_spec.h>
#include <tarvel/core/message_formatter.h>

#include <gtest/gtest.h>

#include <functional>
#include <future>
#include <memory>
#include <new>
#include <stdexcept>
#include <string>
#include <utility>

namespace SsoClient {
namespace {

using Tarvel::Ref;
using Tarvel::Http::ConnectionSpec;
using Testing::CreateTrustingContext;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsSettings;

struct Connected {
  Ref<Tarvel::System::Stream> stream;
  std::string failure;
};

Connected Connect(const Ref<ConnectionSpec> &spec) {
  const auto promise = std::make_shared<std::promise<Connected>>();
  spec->AsyncConnect([promise](const Ref<Tarvel::System::Stream> &stream, const Tarvel::Exception *failure) {
    promise->set_value({stream, failure ? failure->what() : ""});
  });
  return promise->get_future().get();
}

Ref<ConnectionSpec> Plain(const std::string &host, int port, bool useDomainControllerName = false) {
  Ref<ConnectionSpec> spec;
  CreateSsoConnectionSpec(host, port, useDomainControllerName, spec);
  return spec;
}

Ref<ConnectionSpec> Tls(const std::string &host, int port, const Ref<Tarvel::Ssl::SSLContext> &context,
                        const std::string &parameter = "", bool useDomainControllerName = false) {
  Ref<ConnectionSpec> spec;
  CreateSsoSSLConnectionSpec(host, port, context, parameter, useDomainControllerName, spec);
  return spec;
}

TEST(SsoConnectionSpec, HasHostAndEndpointAsGiven) {
  for (const auto &spec : {Plain("sts.example", 443), Tls("sts.example", 443, CreateTrustingContext())}) {
    EXPECT_EQ(spec->GetHost(), "sts.example");
    EXPECT_EQ(spec->GetEndpointString(), "sts.example:443");
  }
}

TEST(SsoConnectionSpec, IsDescribedByTheAddressOfThePlainOneAndItsEndpoint) {
  const auto inner = Tarvel::MakeRef<SsoCustomConnectionSpecImpl>("sts.example", 443, false);
  const auto outer = Tarvel::MakeRef<SsoCustomSslConnectionSpecImpl>(nullptr, "", inner);
  const void *const address = inner.get();
  const std::string expected =
      Tarvel::MessageFormatter::ASPrint("<cs p:%1, SsoCustomConnectionSpec:sts.example:443>", address);
  EXPECT_EQ(inner->ToString(), expected);
  EXPECT_EQ(outer->ToString(), expected);
}

TEST(SsoConnectionSpec, DoesNotSupportReuseAfterAnAuthenticationError) {
  EXPECT_FALSE(Plain("h", 1)->IsReuseOnAuthErrorSupported());
  EXPECT_FALSE(Tls("h", 1, nullptr)->IsReuseOnAuthErrorSupported());
}

TEST(SsoConnectionSpec, TargetsTheConfiguredHostWhereNoDomainControllerIsKnown) {
  EXPECT_EQ(GetOstrelDCName(), "");
  EXPECT_EQ(Tarvel::MakeRef<SsoCustomConnectionSpecImpl>("h", 1, false)->GetConnectionTargetHost(), "h");
  EXPECT_EQ(Tarvel::MakeRef<SsoCustomConnectionSpecImpl>("h", 1, true)->GetConnectionTargetHost(), "h");
}

TEST(SsoConnectionSpec, ConnectsAndHandsTheStreamOut) {
  ScriptedServer plain([](ServerConnection &connection) { connection.Stall(); });
  ScriptedServer tls(
      [](ServerConnection &connection) {
        connection.Handshake();
        connection.Stall();
      },
      TlsSettings());
  for (const bool flag : {false, true}) {
    const Connected overTcp = Connect(Plain("localhost", plain.GetPort(), flag));
    EXPECT_EQ(overTcp.failure, "");
    ASSERT_TRUE(overTcp.stream);
    overTcp.stream->Close();
    const Connected overTls = Connect(Tls("localhost", tls.GetPort(), CreateTrustingContext(), "", flag));
    EXPECT_EQ(overTls.failure, "");
    ASSERT_NE(dynamic_cast<Tarvel::Ssl::SSLStream *>(overTls.stream.get()), nullptr);
    overTls.stream->Close();
  }
}

TEST(SsoConnectionSpec, PassesStreamAndFailureOnWhenTheConnectFails) {
  const Testing::UnusedPort unused;
  const std::string failure =
      "Cannot connect to 127.0.0.1:" + std::to_string(unused.GetPort()) + ": Connection refused";
  for (const auto &spec :
       {Plain("127.0.0.1", unused.GetPort()), Tls("127.0.0.1", unused.GetPort(), CreateTrustingContext())}) {
    const Connected connected = Connect(spec);
    EXPECT_EQ(connected.failure, failure);
    EXPECT_NE(dynamic_cast<Tarvel::System::TcpClientSocket *>(connected.stream.get()), nullptr);
  }
}

TEST(SsoConnectionSpec, PassesTheTlsStreamOnWhenTheHandshakeFails) {
  TlsSettings settings;
  settings.certificate = "expired";
  ScriptedServer server([](ServerConnection &connection) { connection.Handshake(); }, settings);
  const Connected connected = Connect(Tls("localhost", server.GetPort(), CreateTrustingContext()));
  EXPECT_EQ(connected.failure, "The TLS handshake with localhost failed: the server's certificate was not accepted: "
                               "certificate has expired (certificate \"CN=expired\")");
  ASSERT_NE(dynamic_cast<Tarvel::Ssl::SSLStream *>(connected.stream.get()), nullptr);
  connected.stream->Close();
}

TEST(SsoConnectionSpec, FailsEachConnectionWithoutAContext) {
  ScriptedServer server([](ServerConnection &connection) { connection.Stall(); });
  const Connected connected = Connect(Tls("localhost", server.GetPort(), nullptr));
  EXPECT_EQ(connected.failure, "Invalid argument : an SSL connection needs an SSLContext.");
  connected.stream->Close();
}

/// Has something else to throw where a TLS stream is made.
class ThrowingContext final : public Tarvel::Ssl::SSLContext {
public:
  explicit ThrowingContext(std::function<void()> raise) : m_raise(std::move(raise)) {}
  void TrustSystemStore() override {}
  void TrustFile(const std::string &) override {}
  void TrustCertificates(const Tarvel::Crypto::CertificateList &) override {}
  void SetClientCertificate(const Ref<const Tarvel::Crypto::Certificate> &,
                            const Ref<const Tarvel::Crypto::PrivateKey> &,
                            const Tarvel::Crypto::CertificateList &) override {}
  Ref<Tarvel::Ssl::SSLStream> CreateStream(const Ref<Tarvel::System::Stream> &, const std::string &) override {
    m_raise();
    return nullptr;
  }

private:
  const std::function<void()> m_raise;
};

TEST(SsoConnectionSpec, CallsItsCompletionForWhateverIsThrownBetweenConnectAndHandshake) {
  ScriptedServer server([](ServerConnection &connection) { connection.Stall(); });
  const std::string foreign = "The connection to localhost:" + std::to_string(server.GetPort()) + " failed: ";
  struct Case {
    std::function<void()> raise;
    std::string failure;
  };
  for (const Case &thrown : {Case{[] { throw std::bad_alloc(); }, "There is not enough memory"},
                             Case{[] { throw std::runtime_error("foreign"); }, foreign + "foreign"},
                             Case{[] { throw 42; }, foreign + "an object that is not an exception was thrown"},
                             Case{[] { throw Tarvel::Ssl::SSLException("of the platform"); }, "of the platform"}}) {
    const Connected connected =
        Connect(Tls("localhost", server.GetPort(), Tarvel::MakeRef<ThrowingContext>(thrown.raise)));
    EXPECT_EQ(connected.failure, thrown.failure);
    ASSERT_TRUE(connected.stream);
    connected.stream->Close();
  }
}

TEST(SsoConnectionSpec, CancelsTheConnectAndTheHandshake) {
  const Testing::FullPort full;
  ScriptedServer silent([](ServerConnection &connection) { connection.Stall(); });
  for (const auto &spec :
       {Plain("127.0.0.1", full.GetPort()), Tls("127.0.0.1", silent.GetPort(), CreateTrustingContext())}) {
    const auto promise = std::make_shared<std::promise<std::string>>();
    const auto item =
        spec->AsyncConnect([promise](const Ref<Tarvel::System::Stream> &, const Tarvel::Exception *failure) {
          promise->set_value(failure ? failure->what() : "");
        });
    if (spec->GetEndpointString() == "127.0.0.1:" + std::to_string(silent.GetPort())) {
      ASSERT_TRUE(Testing::Eventually([&] { return silent.GetConnectionCount() == 1; }));
    }
    item->Cancel();
    EXPECT_NE(promise->get_future().get(), "");
  }
}

} // namespace
} // namespace SsoClient
