// SPDX-License-Identifier: Apache-2.0
// A host that ends while a request over TLS is under way on another thread. A static object waits for that thread.
#include "support/outliving_thread.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>

namespace {

/// Destroyed after OpenSSL's own state, because it is created before.
struct Worker {
  ~Worker() {
    thread.join();
    std::puts("joined");
  }
  std::thread thread;
};

[[gnu::init_priority(101)]] Worker g_worker;

std::string Acquire(const char *url) {
  const auto context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(std::string(std::getenv("DATA")) + "/tls/authority.crt");
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = std::getenv(url);
  config.signingCertificates =
      Tarvel::Crypto::LoadCertificates(std::string(std::getenv("DATA")) + "/tokens/sts-rsa.crt");
  config.sslContext = context.get();
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  try {
    return SsoClient::CreateSecurityTokenService(config)
        ->AcquireToken("alice", "secret", spec)
        ->GetSubject()
        .ToString();
  } catch (const SsoClient::CommunicationException &failure) {
    return std::string("CommunicationException: ") + failure.what();
  } catch (const Tarvel::Exception &failure) {
    return std::string("Exception: ") + failure.what();
  }
}

} // namespace

int main() {
  g_worker.thread = std::thread([] {
    Testing::BeginOutlivingThread();
    const std::string outcome = Acquire("HTTPS");
    std::printf("worker: %s\n", outcome.c_str());
  });
  // The service answers this request when the worker's request has arrived.
  const std::string outcome = Acquire("HTTP");
  std::printf("main: %s\n", outcome.c_str());
}
