// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares building a signed request with the one signature that every such request needs.

#include "program.h"

#include "exchange/request_builder_impl.h"

#include <ssoclient/create_saml_token.h>

#include <benchmark/benchmark.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>

#include <array>
#include <cstdio>
#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Bench {

namespace {

const std::string KEY_FILE = TOKEN_DATA_DIR "/holder.key"; // RSA-2048
constexpr std::size_t RSA_2048_BYTES = 256;

/// What requests are built from. It is made once, as in a service.
struct Client {
  const SsoClient::RequestBuilderImpl builder{
      SsoClient::HolderOfKeyConfig{Tarvel::Crypto::LoadPrivateKey(KEY_FILE),
                                   Tarvel::Crypto::LoadCertificates(TOKEN_DATA_DIR "/holder.crt").front()}};
  const std::shared_ptr<const SsoClient::SamlToken> token = SsoClient::CreateSamlToken(
      ReadFile(TOKEN_DATA_DIR "/bearer-5k.xml"), Tarvel::Crypto::LoadCertificates(TOKEN_DATA_DIR "/sts-rsa.crt"));
  SsoClient::TokenSpec spec;

  Client() { spec.tokenLifetimeSec = 3600; }
};

const Client &GetClient() {
  static const Client client;
  return client;
}

void BuildIssue(benchmark::State &state) {
  const Client &client = GetClient();
  for (auto _ : state) {
    SsoClient::Request request;
    client.builder.BuildCertificateTokenRequest(client.spec, request);
    benchmark::DoNotOptimize(request.body.data());
  }
}

void BuildExchange(benchmark::State &state) {
  const Client &client = GetClient();
  for (auto _ : state) {
    SsoClient::Request request;
    client.builder.BuildExchangeTokenRequest(*client.token, client.spec, request);
    benchmark::DoNotOptimize(request.body.data());
  }
}

/// One RSA-2048 signature over a digest that exists already, with all possible preparations made.
class Limit {
public:
  Limit() {
    const std::unique_ptr<FILE, int (*)(FILE *)> file(std::fopen(KEY_FILE.c_str(), "r"), &std::fclose);
    const std::unique_ptr<EVP_PKEY, void (*)(EVP_PKEY *)> key(
        file ? PEM_read_PrivateKey(file.get(), nullptr, nullptr, nullptr) : nullptr, &EVP_PKEY_free);
    if (!key) {
      throw std::runtime_error("cannot read " + KEY_FILE);
    }
    m_context.reset(EVP_PKEY_CTX_new_from_pkey(nullptr, key.get(), nullptr));
    if (EVP_PKEY_sign_init(m_context.get()) <= 0 ||
        EVP_PKEY_CTX_set_rsa_padding(m_context.get(), RSA_PKCS1_PADDING) <= 0 ||
        EVP_PKEY_CTX_set_signature_md(m_context.get(), EVP_sha256()) <= 0) {
      throw std::runtime_error("cannot prepare RSA");
    }
  }

  bool Sign() {
    std::size_t length = m_signature.size();
    return EVP_PKEY_sign(m_context.get(), m_signature.data(), &length, m_digest.data(), m_digest.size()) == 1;
  }

private:
  std::unique_ptr<EVP_PKEY_CTX, void (*)(EVP_PKEY_CTX *)> m_context{nullptr, &EVP_PKEY_CTX_free};
  const std::array<unsigned char, 32> m_digest{};
  std::array<unsigned char, RSA_2048_BYTES> m_signature{};
};

void SignBare(benchmark::State &state) {
  Limit limit;
  for (auto _ : state) {
    if (!limit.Sign()) {
      state.SkipWithError("OpenSSL does not sign");
    }
  }
}

void RegisterBenchmarks() {
  benchmark::RegisterBenchmark("Limit", SignBare)->Unit(benchmark::kMicrosecond);
  benchmark::RegisterBenchmark("BuildCertificateTokenRequest", BuildIssue)->Unit(benchmark::kMicrosecond);
  benchmark::RegisterBenchmark("BuildExchangeTokenRequest/5k", BuildExchange)->Unit(benchmark::kMicrosecond);
}

// Times are microseconds of the measuring thread's CPU.
void WriteSummary(const Medians &medians, std::ostream &out) {
  const double limit = medians.at("Limit").cpuUs;
  const double issue = medians.at("BuildCertificateTokenRequest").cpuUs;
  const double exchange = medians.at("BuildExchangeTokenRequest/5k").cpuUs;
  out << "{\n\"request_sign\": {\"ours_us\": " << issue << ", \"limit_us\": " << limit
      << ", \"ratio\": " << issue / limit << ",\n  \"exchange_5k\": {\"ours_us\": " << exchange
      << ", \"ratio\": " << exchange / limit << "}}\n}\n";
}

} // namespace

constexpr Program PROGRAM{"request_sign", RegisterBenchmarks, WriteSummary};

} // namespace Bench

int main(int argc, char **argv) {
  return Bench::RunProgram(Bench::PROGRAM, argc, argv);
}
