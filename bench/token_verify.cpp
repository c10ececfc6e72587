// SPDX-License-Identifier: Apache-2.0
/// @file
/// Compares verifying a token with the cryptography that no verification can avoid, and with xmlsec1; one `TokenVerifier` for
/// many tokens with a call of `CreateSamlToken` for each; and the report on a token with its verification.
///
/// Keys of the JSON that are not self-explanatory: "ours" is `CreateSamlToken`. "verifier" has an entry for each number of
/// trusted certificates: "factory_us" is `CreateSamlToken`, "verifier_us" is `TokenVerifier::Verify`, both for the token of
/// 5 KB, and "ratio" divides the second by the first. "explain" has the times of `TokenVerifier::Explain` and `Verify`
/// for tokens of 5 KB and 50 KB, and "ratio" divides the first by the second.

#include "program.h"
#include "xmlsec_verifier.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/token_verifier.h>

#include <benchmark/benchmark.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>

#include <array>
#include <cstddef>
#include <cstdio>
#include <iterator>
#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Bench {

namespace {

const std::string CERTIFICATE_FILE = TOKEN_DATA_DIR "/sts-rsa.crt";
const std::string KEY_FILE = TOKEN_DATA_DIR "/sts-rsa.key";

/// A token, signed with the RSA-2048 key of `CERTIFICATE_FILE`, SHA-256 and exclusive C14N.
struct Token {
  std::string size; // "5k"
  std::string xml;
};

/// By size, the smallest first. Those above 50 KB repeat the groups of the token of 50 KB.
const std::vector<Token> &GetTokens() {
  static const std::vector<Token> tokens{
      {"2k", ReadFile(TOKEN_DATA_DIR "/bearer-minimal.xml")}, {"5k", ReadFile(TOKEN_DATA_DIR "/bearer-5k.xml")},
      {"50k", ReadFile(TOKEN_DATA_DIR "/bearer-50k.xml")},    {"150k", ReadFile(LARGE_TOKEN_DIR "/bearer-150k.xml")},
      {"500k", ReadFile(LARGE_TOKEN_DIR "/bearer-500k.xml")}, {"1500k", ReadFile(LARGE_TOKEN_DIR "/bearer-1500k.xml")},
      {"5m", ReadFile(LARGE_TOKEN_DIR "/bearer-5m.xml")}};
  return tokens;
}

/// The token of 5 KB, whose verification is compared with its peers.
const std::string &GetSmallToken() {
  return GetTokens()[1].xml;
}

constexpr int THREAD_COUNTS[] = {1, 2, 4, 8, 16};

/// The indices of the tokens of 5 KB and 50 KB in `GetTokens()`.
constexpr std::size_t EXPLAINED_TOKENS[] = {1, 2};

const Tarvel::Crypto::CertificateList &GetTrusted() {
  static const Tarvel::Crypto::CertificateList trusted = Tarvel::Crypto::LoadCertificates(CERTIFICATE_FILE);
  return trusted;
}

void VerifyByUs(benchmark::State &state, const std::string &xml) {
  const Tarvel::Crypto::CertificateList &trusted = GetTrusted();
  for (auto _ : state) {
    benchmark::DoNotOptimize(SsoClient::CreateSamlToken(xml, trusted));
  }
}

/// The files of 16 different certificates. The key of the last one made the signatures, like the oldest key of a list
/// to which new keys are added at the front.
constexpr const char *CERTIFICATE_FILES[] = {
    "tokens/other.crt",     "tokens/sts-rsa-2.crt",  "tokens/sts-rsa3072.crt", "tokens/sts-rsa-expired.crt",
    "tokens/sts-ec256.crt", "tokens/sts-ec384.crt",  "tokens/sts-ec521.crt",   "tokens/holder.crt",
    "crypto/rsa2048.crt",   "crypto/p256.crt",       "crypto/names.crt",       "tls/authority.crt",
    "tls/client.crt",       "tokens/sts-rsa-e3.crt", "tokens/sts-rsa-e1.crt",  "tokens/sts-rsa.crt"};

constexpr std::size_t KEY_COUNTS[] = {1, 2, 16};

/// The last `count` of the 16 certificates.
Tarvel::Crypto::CertificateList TrustedOf(std::size_t count) {
  Tarvel::Crypto::CertificateList trusted;
  for (std::size_t i = std::size(CERTIFICATE_FILES) - count; i < std::size(CERTIFICATE_FILES); ++i) {
    trusted.push_back(
        Tarvel::Crypto::LoadCertificates(std::string(TOKEN_DATA_DIR "/../") + CERTIFICATE_FILES[i]).front());
  }
  return trusted;
}

void VerifyByFactory(benchmark::State &state, std::size_t keys) {
  const Tarvel::Crypto::CertificateList trusted = TrustedOf(keys);
  for (auto _ : state) {
    benchmark::DoNotOptimize(SsoClient::CreateSamlToken(GetSmallToken(), trusted));
  }
}

void VerifyByVerifier(benchmark::State &state, std::size_t keys) {
  const SsoClient::TokenVerifier verifier(TrustedOf(keys));
  for (auto _ : state) {
    benchmark::DoNotOptimize(verifier.Verify(GetSmallToken()));
  }
}

void Verify(benchmark::State &state, const std::string &xml) {
  const SsoClient::TokenVerifier verifier(GetTrusted());
  for (auto _ : state) {
    benchmark::DoNotOptimize(verifier.Verify(xml));
  }
}

void Explain(benchmark::State &state, const std::string &xml) {
  const SsoClient::TokenVerifier verifier(GetTrusted());
  for (auto _ : state) {
    benchmark::DoNotOptimize(verifier.Explain(xml));
  }
}

void VerifyByXmlsec(benchmark::State &state, const std::string &xml) {
  static const XmlsecVerifier verifier(CERTIFICATE_FILE);
  for (auto _ : state) {
    if (!verifier.Verify(xml)) {
      state.SkipWithError("xmlsec1 refuses the token");
    }
  }
}

/// One digest over a token's bytes and one check of an RSA-2048 signature, with all possible preparations made.
class Limit {
public:
  Limit() {
    FILE *const file = std::fopen(KEY_FILE.c_str(), "r");
    EVP_PKEY *const key = file ? PEM_read_PrivateKey(file, nullptr, nullptr, nullptr) : nullptr;
    if (!key) {
      throw std::runtime_error("cannot read " + KEY_FILE);
    }
    std::fclose(file);
    Sign(key);
    m_verify.reset(EVP_PKEY_CTX_new_from_pkey(nullptr, key, nullptr));
    EVP_PKEY_free(key);
    EVP_PKEY_verify_init(m_verify.get());
    Prepare(m_verify.get());
  }

  bool Check(const std::string &xml) {
    std::array<unsigned char, EVP_MAX_MD_SIZE> tokenDigest{};
    EVP_DigestInit_ex2(m_digest.get(), m_sha256.get(), nullptr);
    EVP_DigestUpdate(m_digest.get(), xml.data(), xml.size());
    EVP_DigestFinal_ex(m_digest.get(), tokenDigest.data(), nullptr);
    benchmark::DoNotOptimize(tokenDigest);
    return EVP_PKEY_verify(m_verify.get(), m_signature.data(), m_signature.size(), m_signed.data(), m_signed.size()) ==
           1;
  }

private:
  template <auto FREE>
  struct Deleter {
    template <typename T>
    void operator()(T *handle) const {
      FREE(handle);
    }
  };
  using KeyContext = std::unique_ptr<EVP_PKEY_CTX, Deleter<EVP_PKEY_CTX_free>>;

  void Prepare(EVP_PKEY_CTX *context) {
    if (EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_PADDING) <= 0 ||
        EVP_PKEY_CTX_set_signature_md(context, m_sha256.get()) <= 0) {
      throw std::runtime_error("cannot prepare RSA");
    }
  }

  void Sign(EVP_PKEY *key) {
    const KeyContext context(EVP_PKEY_CTX_new_from_pkey(nullptr, key, nullptr));
    EVP_PKEY_sign_init(context.get());
    Prepare(context.get());
    std::size_t length = m_signature.size();
    if (EVP_PKEY_sign(context.get(), m_signature.data(), &length, m_signed.data(), m_signed.size()) != 1) {
      throw std::runtime_error("cannot sign");
    }
  }

  const std::unique_ptr<EVP_MD, Deleter<EVP_MD_free>> m_sha256{EVP_MD_fetch(nullptr, "SHA2-256", nullptr)};
  const std::unique_ptr<EVP_MD_CTX, Deleter<EVP_MD_CTX_free>> m_digest{EVP_MD_CTX_new()};
  const std::array<unsigned char, 32> m_signed{};
  std::array<unsigned char, 256> m_signature{};
  KeyContext m_verify;
};

void CheckLimit(benchmark::State &state, const std::string &xml) {
  Limit limit;
  for (auto _ : state) {
    if (!limit.Check(xml)) {
      state.SkipWithError("the signature does not verify");
    }
  }
}

void RegisterBenchmarks() {
  const auto add = [](const std::string &name, auto function, const std::string &xml) {
    return benchmark::RegisterBenchmark(name.c_str(), function, xml)->Unit(benchmark::kMicrosecond);
  };
  for (const auto &[size, xml] : GetTokens()) {
    add("Limit/" + size, CheckLimit, xml);
    add("CreateSamlToken/" + size, VerifyByUs, xml);
  }
  add("xmlsec1/5k", VerifyByXmlsec, GetSmallToken());
  for (const std::size_t keys : KEY_COUNTS) {
    const std::string name = "/keys:" + std::to_string(keys);
    benchmark::RegisterBenchmark(("Factory" + name).c_str(), VerifyByFactory, keys)->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark(("Verifier" + name).c_str(), VerifyByVerifier, keys)->Unit(benchmark::kMicrosecond);
  }
  for (const std::size_t index : EXPLAINED_TOKENS) {
    const auto &[size, xml] = GetTokens()[index];
    add("Verify/" + size, Verify, xml);
    add("Explain/" + size, Explain, xml);
  }
  for (const int threads : THREAD_COUNTS) {
    add("Limit/scaling", CheckLimit, GetSmallToken())->Threads(threads)->UseRealTime();
    add("CreateSamlToken/scaling", VerifyByUs, GetSmallToken())->Threads(threads)->UseRealTime();
  }
}

/// How many iterations `threads` threads together do in a second.
double Throughput(const Medians &medians, const std::string &name, int threads) {
  return 1e6 / medians.at(name + "/scaling/real_time/threads:" + std::to_string(threads)).wallUs;
}

/// The throughput of two threads divided by that of one.
double Scaling(const Medians &medians, const std::string &name) {
  return Throughput(medians, name, 2) / Throughput(medians, name, 1);
}

void WriteSizes(const Medians &medians, std::ostream &out) {
  const char *separator = "";
  for (const auto &[size, xml] : GetTokens()) {
    out << separator << "{\"bytes\": " << xml.size() << ", \"ours_us\": " << medians.at("CreateSamlToken/" + size).cpuUs
        << ", \"limit_us\": " << medians.at("Limit/" + size).cpuUs << '}';
    separator = ",\n    ";
  }
}

void WriteThreads(const Medians &medians, std::ostream &out) {
  const char *separator = "";
  for (const int threads : THREAD_COUNTS) {
    out << separator << "{\"threads\": " << threads
        << ", \"ours_per_second\": " << Throughput(medians, "CreateSamlToken", threads)
        << ", \"limit_per_second\": " << Throughput(medians, "Limit", threads) << '}';
    separator = ",\n    ";
  }
}

void WriteVerifiers(const Medians &medians, std::ostream &out) {
  const char *separator = "";
  for (const std::size_t keys : KEY_COUNTS) {
    const std::string count = std::to_string(keys);
    const double factory = medians.at("Factory/keys:" + count).cpuUs;
    const double verifier = medians.at("Verifier/keys:" + count).cpuUs;
    out << separator << "\"keys_" << count << "\": {\"factory_us\": " << factory << ", \"verifier_us\": " << verifier
        << ", \"ratio\": " << verifier / factory << '}';
    separator = ",\n    ";
  }
}

void WriteReports(const Medians &medians, std::ostream &out) {
  const char *separator = "";
  for (const std::size_t index : EXPLAINED_TOKENS) {
    const std::string &size = GetTokens()[index].size;
    const double verify = medians.at("Verify/" + size).cpuUs;
    const double explain = medians.at("Explain/" + size).cpuUs;
    out << separator << '"' << size << "\": {\"explain_us\": " << explain << ", \"verify_us\": " << verify
        << ", \"ratio\": " << explain / verify << '}';
    separator = ", ";
  }
}

// Times are microseconds of the measuring thread's CPU.
void WriteSummary(const Medians &medians, std::ostream &out) {
  const double ours = medians.at("CreateSamlToken/5k").cpuUs;
  const double limit = medians.at("Limit/5k").cpuUs;
  const double mediumOurs = medians.at("CreateSamlToken/50k").cpuUs;
  const double mediumLimit = medians.at("Limit/50k").cpuUs;
  const double scaling = Scaling(medians, "CreateSamlToken");
  const double limitScaling = Scaling(medians, "Limit");
  const auto nanosecondsPerByte = [&medians](const Token &token) {
    return medians.at("CreateSamlToken/" + token.size).cpuUs * 1000 / static_cast<double>(token.xml.size());
  };
  out << "{\n\"token_verify\": {\"ours_us\": " << ours << ", \"limit_us\": " << limit << ", \"ratio\": " << ours / limit
      << ", \"peers\": {\"xmlsec1\": " << medians.at("xmlsec1/5k").cpuUs
      << "},\n  \"at_50k\": {\"ours_us\": " << mediumOurs << ", \"limit_us\": " << mediumLimit
      << ", \"ratio\": " << mediumOurs / mediumLimit << "},\n  \"two_threads\": {\"ours\": " << scaling
      << ", \"limit\": " << limitScaling << ", \"ratio\": " << scaling / limitScaling
      << "},\n  \"by_size\": {\"5k_us\": " << ours << ", \"50k_us\": " << mediumOurs
      << ", \"5m_us\": " << medians.at("CreateSamlToken/5m").cpuUs
      << ", \"50k_ns_per_byte\": " << nanosecondsPerByte(GetTokens()[2])
      << ", \"5m_ns_per_byte\": " << nanosecondsPerByte(GetTokens().back()) << "},\n  \"sizes\": [";
  WriteSizes(medians, out);
  out << "],\n  \"threads\": [";
  WriteThreads(medians, out);
  out << "],\n  \"verifier\": {";
  WriteVerifiers(medians, out);
  out << "},\n  \"explain\": {";
  WriteReports(medians, out);
  out << "}}\n}\n";
}

} // namespace

constexpr Program PROGRAM{"token_verify", RegisterBenchmarks, WriteSummary};

} // namespace Bench

int main(int argc, char **argv) {
  return Bench::RunProgram(Bench::PROGRAM, argc, argv);
}
