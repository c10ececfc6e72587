// SPDX-License-Identifier: Apache-2.0
// A host that ends while operations of a client over TLS are under way. MODE decides how long the client lives:
//   never-destroyed  it is never destroyed
//   static           it is a static object
//   at-exit          it is never destroyed, and a function of atexit starts and awaits another operation
//   detached         it is never destroyed, and detached threads wait for operations
#include "support/outliving_thread.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/exceptions.h>
#include <tarvel/ssl/ssl_context.h>

#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <unistd.h>

namespace {

const std::string MODE = std::getenv("MODE");

struct SentRequests final : SsoClient::OperationObserver {
  void OnRequestSent(const SsoClient::OperationInfo &, const SsoClient::RequestSentEvent &) override {
    const std::lock_guard<std::mutex> lock(mutex);
    ++count;
    changed.notify_all();
  }
  void WaitFor(int wanted) {
    std::unique_lock<std::mutex> lock(mutex);
    changed.wait(lock, [this, wanted] { return count >= wanted; });
  }
  std::mutex mutex;
  std::condition_variable changed;
  int count = 0;
};

std::shared_ptr<SentRequests> &GetSent() {
  static auto *const sent = new std::shared_ptr<SentRequests>(std::make_shared<SentRequests>());
  return *sent;
}

std::shared_ptr<SsoClient::TokenClient> MakeClient() {
  const auto context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(std::string(std::getenv("DATA")) + "/tls/authority.crt");
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = std::getenv("HTTPS");
  config.signingCertificates =
      Tarvel::Crypto::LoadCertificates(std::string(std::getenv("DATA")) + "/tokens/sts-rsa.crt");
  config.sslContext = context.get();
  SsoClient::ClientOptions options;
  options.service.observer = GetSent();
  return std::make_shared<SsoClient::TokenClient>(config, options);
}

SsoClient::Credential Password() {
  return SsoClient::PasswordCredential{"alice", Tarvel::SecretText("secret")};
}

SsoClient::TokenSpec Spec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

std::shared_ptr<SsoClient::TokenClient> &GetClient() {
  if (MODE == "never-destroyed" || MODE == "detached") {
    static auto *const client = new std::shared_ptr<SsoClient::TokenClient>(MakeClient());
    return *client;
  }
  static std::shared_ptr<SsoClient::TokenClient> client = MakeClient();
  return client;
}

/// Waits for an operation that begins shortly before or after OpenSSL releases its own data.
void AcquireAtExit() {
  try {
    GetClient()->Acquire(Password(), Spec(), SsoClient::CallOptions::WithTimeout(std::chrono::seconds(1)));
  } catch (const SsoClient::CommunicationException &) {
    std::puts("atexit: CommunicationException");
  }
}

} // namespace

int main() {
  if (MODE == "at-exit") {
    std::atexit(AcquireAtExit); // called after the static pointer is destroyed; `kept` is not destroyed
    static auto *const kept = new std::shared_ptr<SsoClient::TokenClient>(GetClient());
    static_cast<void>(kept);
  }
  constexpr int OPERATIONS = 10;
  if (MODE == "detached") {
    for (int i = 0; i < OPERATIONS; ++i) {
      std::thread([] {
        Testing::BeginOutlivingThread();
        try {
          GetClient()->Acquire(Password(), Spec());
        } catch (const SsoClient::CommunicationException &) { // the process ends; NOLINT(bugprone-empty-catch)
        }
        for (;;) {
          pause(); // a thread that ended now would release its data of OpenSSL while OpenSSL releases its own
        }
      }).detach();
    }
  } else {
    for (int i = 0; i < OPERATIONS; ++i) {
      GetClient()->AcquireAsync(Password(), Spec(), {}, [](const SsoClient::TokenOutcome &outcome) {
        if (outcome.HasValue()) {
          std::puts("a token from nowhere");
        }
      });
    }
  }
  GetSent()->WaitFor(OPERATIONS);
  std::puts("main ends");
}
