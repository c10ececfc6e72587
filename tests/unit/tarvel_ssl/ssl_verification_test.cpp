// SPDX-License-Identifier: Apache-2.0
// Which servers a client accepts, and which certificates it presents.

#include "unit/tarvel_ssl/tls_client.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <openssl/ssl.h>

#include <algorithm>
#include <cctype>
#include <future>
#include <string>
#include <vector>

namespace Tarvel::Ssl {
namespace {

using Testing::CreateTrustingContext;
using Testing::ScriptedServer;
using Testing::ServerConnection;
using Testing::TlsCertificate;
using Testing::TlsClient;
using Testing::TlsPath;
using Testing::TlsSettings;

constexpr int VERSIONS[] = {TLS1_2_VERSION, TLS1_3_VERSION};

void Answer(ServerConnection &connection) {
  if (connection.Handshake()) {
    connection.Write(connection.GetClientName() + "!");
    connection.ReadSome();
  }
}

TlsSettings Settings(const std::string &certificate, int version = 0) {
  TlsSettings settings;
  settings.certificate = certificate;
  settings.minimumVersion = settings.maximumVersion = version;
  return settings;
}

/// The message of a failed handshake with a server that presents `certificate`; empty when it succeeds.
std::string Handshake(const Ref<SSLContext> &context, const std::string &certificate, const std::string &host,
                      const std::string &parameter = "", int version = 0) {
  ScriptedServer server(Answer, Settings(certificate, version));
  TlsClient client(context, server.GetPort());
  const std::string message = client.Handshake(host, parameter);
  EXPECT_EQ(client.FailedInHandshake(), !message.empty());
  client.GetStream()->Close();
  return message;
}

TEST(SSLContext, ReportsEachReasonAgainstACertificate) {
  struct Case {
    std::string certificate;
    std::string reason;
  };
  for (const int version : VERSIONS) {
    for (const Case &refused : std::vector<Case>{{"expired", "certificate has expired"},
                                                 {"not-yet-valid", "certificate is not yet valid"},
                                                 {"self-signed", "self-signed certificate"},
                                                 {"other-host", "hostname mismatch"},
                                                 {"untrusted", "unable to get local issuer certificate"},
                                                 {"not-for-servers", "unsuitable certificate purpose"}}) {
      EXPECT_EQ(Handshake(CreateTrustingContext(), refused.certificate, "localhost", "", version),
                "The TLS handshake with localhost failed: the server's certificate was not accepted: " +
                    refused.reason + " (certificate \"CN=" + refused.certificate + "\")");
    }
  }
}

TEST(SSLContext, TrustsNothingAtFirst) {
  EXPECT_EQ(Handshake(CreateSSLContext(), "localhost", "localhost"),
            "The TLS handshake with localhost failed: the server's certificate was not accepted: unable to get local "
            "issuer certificate (certificate \"CN=localhost\")");
}

TEST(SSLContext, TrustsCertificatesFromMemory) {
  const Ref<SSLContext> context = CreateSSLContext();
  context->TrustCertificates({TlsCertificate("authority"), TlsCertificate("authority")});
  EXPECT_EQ(Handshake(context, "localhost", "localhost"), "");
}

TEST(SSLContext, TrustsAServersOwnCertificate) {
  const Ref<SSLContext> context = CreateSSLContext();
  context->TrustCertificates(
      {TlsCertificate("localhost"), TlsCertificate("self-signed"), TlsCertificate("other-host")});
  EXPECT_EQ(Handshake(context, "localhost", "localhost"), "");
  EXPECT_EQ(Handshake(context, "self-signed", "localhost"), "");
  EXPECT_NE(Handshake(context, "other-host", "localhost"), "");
}

TEST(SSLContext, DoesNotTrustTheTestAuthorityWithTheSystemStore) {
  const Ref<SSLContext> context = CreateSSLContext();
  try {
    context->TrustSystemStore();
  } catch (const Crypto::CryptoException &exception) {
    EXPECT_EQ(std::string(exception.what()).rfind("There is no system trust store at ", 0), 0u) << exception.what();
  }
  EXPECT_NE(Handshake(context, "localhost", "localhost"), "");
}

TEST(SSLContext, RefusesAFileWithoutCertificates) {
  EXPECT_THROW(CreateSSLContext()->TrustFile(TlsPath("no-such-file.crt")), IOException);
  EXPECT_THROW(CreateSSLContext()->TrustFile(TlsPath("localhost.key")), Crypto::CryptoException);
}

TEST(SSLContext, RequiresAHostName) {
  for (const char *host : {"", "."}) {
    EXPECT_EQ(Handshake(CreateTrustingContext(), "localhost", host),
              "The TLS handshake with " + std::string(host) +
                  " failed: there is no host name to check the server's certificate against");
  }
  EXPECT_EQ(
      Handshake(CreateTrustingContext(), "localhost", "local\xC3\xA9"),
      "The TLS handshake with local\xC3\xA9 failed: the host name contains a character that is not printable ASCII");
}

TEST(SSLContext, AcceptsAMatchingThumbprintInPlaceOfChainAndName) {
  for (const int version : VERSIONS) {
    for (const char *certificate : {"localhost", "self-signed", "expired", "other-host", "untrusted"}) {
      const std::string digits = TlsCertificate(certificate)->GetSha256Thumbprint();
      EXPECT_EQ(Handshake(CreateSSLContext(), certificate, "elsewhere.example", digits, version), "") << certificate;
    }
  }
}

TEST(SSLContext, AcceptsAThumbprintWithColonsAndInAnyLetterCase) {
  const std::string digits = TlsCertificate("localhost")->GetSha256Thumbprint();
  std::string upper = digits;
  std::transform(upper.begin(), upper.end(), upper.begin(),
                 [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
  std::string colons;
  for (std::size_t i = 0; i < upper.size(); i += 2) {
    colons += (colons.empty() ? "" : ":") + upper.substr(i, 2);
  }
  EXPECT_EQ(Handshake(CreateSSLContext(), "localhost", "localhost", upper), "");
  EXPECT_EQ(Handshake(CreateSSLContext(), "localhost", "localhost", colons), "");
}

TEST(SSLContext, RefusesAWrongThumbprintEvenIfTheChainIsValid) {
  const std::string wanted = TlsCertificate("other-host")->GetSha256Thumbprint();
  for (const int version : VERSIONS) {
    EXPECT_EQ(Handshake(CreateTrustingContext(), "localhost", "localhost", wanted, version),
              "The TLS handshake with localhost failed: the server's certificate has the SHA-256 thumbprint " +
                  TlsCertificate("localhost")->GetSha256Thumbprint() + " instead of " + wanted);
  }
}

TEST(SSLContext, RefusesAParameterThatIsNotAThumbprint) {
  const std::string digits = TlsCertificate("localhost")->GetSha256Thumbprint();
  std::string wrongDigit = digits;
  wrongDigit[10] = 'g';
  for (const std::string &bad : {std::string("x"), digits.substr(1), digits + "0", digits + ":", " " + digits.substr(1),
                                 wrongDigit, digits.substr(0, 40), std::string(64, ':'), std::string(95, 'a')}) {
    EXPECT_EQ(Handshake(CreateTrustingContext(), "localhost", "localhost", bad),
              "The TLS handshake with localhost failed: the SSL parameter \"" + bad +
                  "\" is not a SHA-256 thumbprint of 64 hexadecimal digits");
  }
}

TEST(SSLContext, PresentsTheClientCertificateWithItsIntermediates) {
  for (const int version : VERSIONS) {
    TlsSettings settings = Settings("localhost", version);
    settings.demandsClient = true;
    ScriptedServer server(Answer, settings);
    const Ref<SSLContext> context = CreateTrustingContext();
    context->SetClientCertificate(TlsCertificate("client"), Crypto::LoadPrivateKey(TlsPath("client.key")),
                                  {TlsCertificate("intermediate")});
    TlsClient client(context, server.GetPort());
    EXPECT_EQ(client.Handshake(), "");
    EXPECT_EQ(client.Read(), "client!");
    client.GetStream()->Close();
  }
}

TEST(SSLContext, ReportsThatAClientCertificateIsRequired) {
  for (const int version : VERSIONS) {
    TlsSettings settings = Settings("localhost", version);
    settings.demandsClient = true;
    ScriptedServer server(Answer, settings);
    TlsClient client(CreateTrustingContext(), server.GetPort());
    // With TLS 1.3 the client's handshake ends before the server examines the certificate.
    const std::string handshake = client.Handshake();
    const std::string message = version == TLS1_2_VERSION ? handshake : client.Read();
    EXPECT_EQ(message, version == TLS1_2_VERSION
                           ? "The TLS handshake with localhost failed: error:0A000410:SSL routines::sslv3 alert "
                             "handshake failure (SSL alert number 40)"
                           : "The TLS connection to localhost broke: error:0A00045C:SSL routines::tlsv13 alert "
                             "certificate required (SSL alert number 116)");
  }
}

TEST(SSLContext, RefusesAKeyThatDoesNotMatchTheCertificate) {
  EXPECT_THROW(CreateSSLContext()->SetClientCertificate(TlsCertificate("client"),
                                                        Crypto::LoadPrivateKey(TlsPath("localhost.key")), {}),
               Crypto::KeyMismatchException);
}

} // namespace
} // namespace Tarvel::Ssl
