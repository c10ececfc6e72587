// SPDX-License-Identifier: Apache-2.0
// A host whose threads use the library while its static objects, which wait for these threads, are being destroyed.
#include <ssoclient/create_saml_token.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>
#include <tarvel/system/thread_pool.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <functional>
#include <future>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>

namespace {

using TokenPtr = std::shared_ptr<const SsoClient::SamlToken>;

std::string DataPath(const std::string &name) {
  return std::string(std::getenv("DATA")) + "/" + name;
}

std::string ReadData(const std::string &name) {
  std::string text;
  std::FILE *const file = std::fopen(DataPath(name).c_str(), "rb");
  for (int c = file ? std::fgetc(file) : EOF; c != EOF; c = std::fgetc(file)) {
    text += static_cast<char>(c);
  }
  if (file) {
    std::fclose(file);
  }
  return text;
}

void Print(const std::string &line) {
  std::printf("%s\n", line.c_str());
  std::fflush(stdout);
}

void Report(const char *what, const std::function<std::string()> &use) {
  try {
    Print(std::string(what) + ": " + use());
  } catch (const Tarvel::Exception &failure) {
    Print(std::string(what) + " failed: " + failure.what());
  }
}

/// Its destructor starts the work on another thread and waits for it.
class LateWorker {
public:
  void Begin(std::function<void()> work) {
    m_thread = std::thread([work = std::move(work), begin = m_begin.get_future()] {
      begin.wait();
      work();
    });
  }
  ~LateWorker() {
    if (m_thread.joinable()) {
      m_begin.set_value();
      m_thread.join();
      Print("joined");
    }
  }

private:
  std::promise<void> m_begin;
  std::thread m_thread;
};

/// Destroyed after everything that is created later, including OpenSSL's own state.
[[gnu::init_priority(101)]] LateWorker g_lastOfAll;

Tarvel::Crypto::CertificateList Trusted() {
  return Tarvel::Crypto::LoadCertificates(DataPath("tokens/sts-rsa.crt"));
}

void Verify(const char *token, const Tarvel::Crypto::CertificateList &trusted) {
  Report(token, [&] { return SsoClient::CreateSamlToken(ReadData(token), trusted)->GetSubject().ToString(); });
}

/// Does work that needs neither a key nor a digest.
void Compute(const TokenPtr &token) {
  Report("computed", [&] {
    std::promise<std::string> text;
    Tarvel::System::GetThreadPool()->QueueWorkItem([&] { text.set_value(token->GetSubject().ToString()); });
    return text.get_future().get();
  });
  Verify("tokens/expired.xml", {});
}

} // namespace

int main() {
  const Tarvel::Crypto::CertificateList trusted = Trusted();
  const TokenPtr token = SsoClient::CreateSamlToken(ReadData("tokens/bearer.xml"), trusted);
  // Destroyed before OpenSSL's state, which exists already.
  static LateWorker beforeOpenSsl;
  beforeOpenSsl.Begin([trusted] {
    Verify("tokens/bearer.xml", trusted);
    Verify("tokens/signed-by-other.xml", trusted);
  });
  g_lastOfAll.Begin([token] { Compute(token); });
  Print("main ends");
}
