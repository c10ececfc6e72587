// SPDX-License-Identifier: Apache-2.0
// A host whose first static object uses all main functions of the library, before any static object of the library, or
// of Asio in it, is initialised. It prints with C functions, because the C++ streams are static objects too.
#include <ssoclient/create_saml_token.h>
#include <ssoclient/descriptions.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/ssl/ssl_context.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <future>
#include <memory>
#include <string>

namespace {

using TokenPtr = std::shared_ptr<const SsoClient::SamlToken>;

bool g_isMainRunning = false;

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

void Print(const char *what, const std::string &outcome) {
  std::printf("%s %s: %s\n", g_isMainRunning ? "main" : "early", what, outcome.c_str());
  std::fflush(stdout);
}

template <typename Use>
void Report(const char *what, const Use &use) {
  try {
    Print(what, use());
  } catch (const std::exception &failure) {
    Print(what, failure.what());
  }
}

Tarvel::Crypto::CertificateList Trusted() {
  return Tarvel::Crypto::LoadCertificates(DataPath("tokens/sts-rsa.crt"));
}

std::string Verify(const char *token) {
  return SsoClient::CreateSamlToken(ReadData(token), Trusted())->GetSubject().ToString();
}

std::shared_ptr<const SsoClient::SecurityTokenService> ServiceAt(const char *url,
                                                                 const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context) {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = std::getenv(url);
  config.signingCertificates = Trusted();
  config.sslContext = context.get();
  return SsoClient::CreateSecurityTokenService(config);
}

void UseService(const char *url) {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(DataPath("tls/authority.crt"));
  const auto service = ServiceAt(url, context);
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  Report(url, [&] { return service->AcquireToken("alice", "secret", spec)->GetSubject().ToString(); });
  Report(url, [&] {
    std::promise<std::string> outcome;
    service->AcquireTokenAsync("alice", "secret", spec,
                               [&outcome](const TokenPtr &token, const Tarvel::Exception *failure) {
                                 outcome.set_value(failure ? failure->what() : token->GetSubject().ToString());
                               });
    return outcome.get_future().get();
  });
}

void UseAll() {
  for (const char *const token : {"tokens/bearer.xml", "tokens/holder-of-key.xml", "tokens/full.xml",
                                  "tokens/delegated.xml", "tokens/signed-by-other.xml"}) {
    Report(token, [token] { return Verify(token); });
  }
  for (const char *const url : {"HTTP", "HTTPS", "REFUSING", "RESETTING"}) {
    UseService(url);
  }
}

/// With this priority it is initialised before the static objects of all other files.
struct EarlyUse {
  EarlyUse() { UseAll(); }
};

[[gnu::init_priority(101)]] const EarlyUse g_earlyUse;

} // namespace

int main() {
  g_isMainRunning = true;
  UseAll();
}
