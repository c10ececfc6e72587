// SPDX-License-Identifier: Apache-2.0
// A host program that performs the steps in its arguments, one after the other.
#include "support/completion.h"
#include "support/data_file.h"
#include "support/outliving_thread.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/core/exception.h>
#include <tarvel/crypto/system_configuration.h>
#include <tarvel/ssl/ssl_context.h>

#include <openssl/crypto.h>
#include <openssl/ssl.h>

#include <cstdio>
#include <cstdlib>
#include <functional>
#include <iostream>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <unistd.h>

namespace {

using Tarvel::Ref;
using Testing::DataPath;
using Testing::ReadDataFile;

// After this time, a signal ends a step that would wait for ever. The server ends its connections after 30 seconds.
constexpr unsigned PATIENCE_SECONDS = 20;

int g_port = 0;

std::string ClassOf(const std::exception &failure) {
  const auto is = [&failure](auto *null) { return dynamic_cast<decltype(null)>(&failure) != nullptr; };
  if (is(static_cast<const SsoClient::InvalidSignatureException *>(nullptr))) {
    return "InvalidSignatureException";
  }
  if (is(static_cast<const SsoClient::CommunicationException *>(nullptr))) {
    return "CommunicationException";
  }
  if (is(static_cast<const SsoClient::SsoException *>(nullptr))) {
    return "SsoException";
  }
  if (is(static_cast<const Tarvel::InvalidStateException *>(nullptr))) {
    return "InvalidStateException";
  }
  if (is(static_cast<const Tarvel::Crypto::CryptoException *>(nullptr))) {
    return "CryptoException";
  }
  return is(static_cast<const Tarvel::Ssl::SSLException *>(nullptr)) ? "SSLException" : "another exception";
}

void Report(const std::string &what, const std::function<void()> &operation) {
  std::string outcome = "done";
  try {
    operation();
  } catch (const std::exception &failure) {
    outcome = ClassOf(failure) + ": " + failure.what();
  }
  std::cout << what << ": " << outcome << std::endl;
}

Ref<Tarvel::Ssl::SSLContext> CreateTrustingContext() {
  const auto context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(DataPath("tls/authority.crt"));
  return context;
}

class Connection {
public:
  explicit Connection(const Ref<Tarvel::Ssl::SSLContext> &context) {
    const auto socket = Tarvel::System::CreateTcpClientSocket();
    Testing::Completion connected;
    socket->AsyncConnect("127.0.0.1", g_port, connected.ForEnd());
    connected.Wait();
    m_stream = context->CreateStream(socket, "localhost:" + std::to_string(g_port));
  }

  std::string Handshake() {
    Testing::Completion handshake;
    m_stream->AsyncHandshake("localhost", "", handshake.ForEnd());
    return Describe(handshake);
  }

  Testing::Completion BeginRead() {
    Testing::Completion read;
    m_stream->AsyncReadSome(m_buffer, sizeof m_buffer, read.ForTransfer());
    return read;
  }

  std::string Read() { return Describe(BeginRead()); }

  std::string Write() {
    Testing::Completion written;
    m_stream->AsyncWrite("request", 7, written.ForTransfer());
    return Describe(written);
  }

  void Close() { m_stream->Close(); }

  static std::string Describe(const Testing::Completion &completion) {
    const std::string message = completion.GetMessage();
    return (completion.FailedWith<Tarvel::InvalidStateException>() ? "InvalidStateException: " : "") + message +
           (completion.GetCalls() == 1 ? "" : " (not called once)");
  }

private:
  Ref<Tarvel::Ssl::SSLStream> m_stream;
  char m_buffer[16];
};

/// Created before OpenSSL's state, so it is destroyed after that.
class Host {
public:
  ~Host() {
    if (m_worker.joinable()) {
      m_worker.join();
    }
    for (const std::function<void()> &step : atEnd) {
      step();
    }
  }

  void Start(std::function<void()> work) {
    m_worker = std::thread([work = std::move(work)] {
      Testing::BeginOutlivingThread();
      work();
    });
  }

  std::vector<std::function<void()>> atEnd;

private:
  std::thread m_worker;
};
Host g_host;

/// The test writes to the standard input when the server has received what it expects. From then on the operation waits
/// for the server.
void WaitForServer() {
  char byte = 0;
  while (read(STDIN_FILENO, &byte, 1) < 0) {
  }
  // Twice: the step that sent those bytes may not have ended, and its end starts one more step.
  Testing::DrainIoThreads();
  Testing::DrainIoThreads();
}

std::shared_ptr<const SsoClient::SamlToken> AcquireToken(const Ref<Tarvel::Ssl::SSLContext> &context) {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = "https://localhost:" + std::to_string(g_port) + "/sts";
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(DataPath("tokens/sts-rsa.crt"));
  config.sslContext = context.get();
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return SsoClient::CreateSecurityTokenService(config)->AcquireToken("alice", "secret", spec);
}

void AskService() {
  const auto context = CreateTrustingContext();
  g_host.Start([context] { Report("worker", [&] { AcquireToken(context); }); });
  WaitForServer();
}

void WaitInHandshake() {
  const auto connection = std::make_shared<Connection>(CreateTrustingContext());
  g_host.Start([connection] { std::cout << "handshake: " << connection->Handshake() << std::endl; });
  WaitForServer();
}

void WaitInRead() {
  const auto connection = std::make_shared<Connection>(CreateTrustingContext());
  connection->Handshake();
  const Testing::Completion read = connection->BeginRead();
  g_host.Start([connection, read] {
    std::cout << "read: " << Connection::Describe(read) << std::endl;
    std::cout << "read again: " << connection->Read() << std::endl;
  });
  WaitForServer();
}

void BeginAtEnd() {
  const auto context = CreateTrustingContext();
  const auto connection = std::make_shared<Connection>(context);
  connection->Handshake();
  const auto fresh = std::make_shared<Connection>(context);
  g_host.atEnd.emplace_back([=] {
    std::cout << "read: " << connection->Read() << std::endl;
    std::cout << "write: " << connection->Write() << std::endl;
    std::cout << "handshake: " << fresh->Handshake() << std::endl;
    connection->Close();
    Report("stream", [&] { const Connection another(context); });
    Report("context", [] { CreateTrustingContext(); });
    Report("trust", [&] { context->TrustSystemStore(); });
    Report("request", [&] { AcquireToken(context); });
  });
}

void VerifyAtEnd() {
  const auto trusted = Tarvel::Crypto::LoadCertificates(DataPath("tokens/sts-rsa.crt"));
  const auto verify = [trusted](const std::string &name) {
    SsoClient::CreateSamlToken(ReadDataFile("tokens/" + name + ".xml"), trusted);
  };
  Report("verification", [&] { verify("bearer"); });
  g_host.atEnd.emplace_back([=] {
    Report("verification", [&] { verify("bearer"); });
    Report("verification with a certificate", [&] { verify("holder-of-key"); });
  });
}

void FirstUseAtEnd() {
  OPENSSL_init_crypto(OPENSSL_INIT_LOAD_CRYPTO_STRINGS, nullptr);
  g_host.atEnd.emplace_back(
      [] { Report("first use", [] { Tarvel::Crypto::LoadCertificates(DataPath("tokens/sts-rsa.crt")); }); });
}

void Handshake() {
  std::cout << "handshake: " << Connection(CreateTrustingContext()).Handshake() << std::endl;
}

/// Uses OpenSSL once in each way.
void UseEverything() {
  const auto answer = [] { return std::string("open sesame"); };
  Report("verification", [] {
    SsoClient::CreateSamlToken(ReadDataFile("tokens/holder-of-key.xml"),
                               Tarvel::Crypto::LoadCertificates(DataPath("tokens/sts-rsa.crt")));
  });
  for (const char *const name :
       {"rsa2048.key", "p256-encrypted.key", "p256-traditional-encrypted.key", "p256.key.der"}) {
    Report(name, [&] { Tarvel::Crypto::LoadPrivateKey(DataPath(std::string("crypto/") + name), answer); });
  }
  Report("URI", [&] { Tarvel::Crypto::LoadPrivateKey("file:" + DataPath("crypto/p256.key"), answer); });
  Report("key store", [&] { Tarvel::Crypto::LoadKeyStore(DataPath("crypto/p256.p12"), answer); });
  Report("client certificate", [] {
    CreateTrustingContext()->SetClientCertificate(Tarvel::Crypto::LoadCertificates(DataPath("tls/client.crt")).front(),
                                                  Tarvel::Crypto::LoadPrivateKey(DataPath("tls/client.key")),
                                                  Tarvel::Crypto::LoadCertificates(DataPath("tls/intermediate.crt")));
  });
  Handshake();
}

void AskForConfigurationOnManyThreads() {
  std::vector<std::thread> threads;
  for (int i = 0; i < 8; ++i) {
    threads.emplace_back(Tarvel::Crypto::UseSystemConfiguration);
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
}

void LoadConfigurationOfHost() {
  if (OPENSSL_init_ssl(OPENSSL_INIT_LOAD_CONFIG, nullptr) != 1) {
    std::cout << "the host cannot initialise OpenSSL" << std::endl;
  }
}

struct Step {
  const char *name;
  void (*run)();
};

constexpr Step STEPS[] = {
    {"ask-service", AskService},
    {"wait-in-handshake", WaitInHandshake},
    {"wait-in-read", WaitInRead},
    {"begin-at-end", BeginAtEnd},
    {"verify-at-end", VerifyAtEnd},
    {"first-use-at-end", FirstUseAtEnd},
    {"handshake", Handshake},
    {"use-everything", UseEverything},
    {"host-loads-configuration", LoadConfigurationOfHost},
    {"use-system-configuration", [] { Report("configuration", Tarvel::Crypto::UseSystemConfiguration); }},
    {"on-many-threads", AskForConfigurationOnManyThreads},
};

} // namespace

int main(int argc, char **argv) {
  alarm(PATIENCE_SECONDS);
  g_port = std::atoi(argv[1]);
  for (int i = 2; i < argc; ++i) {
    for (const Step &step : STEPS) {
      if (step.name == std::string(argv[i])) {
        step.run();
      }
    }
  }
  return 0;
}
