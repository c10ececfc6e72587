// SPDX-License-Identifier: Apache-2.0

#include "message_limits.h"

#include <benchmark/benchmark.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <stdexcept>

namespace Bench {

namespace {

constexpr std::size_t RSA_2048_BYTES = 256;

template <auto FREE>
struct Deleter {
  template <typename T>
  void operator()(T *handle) const {
    FREE(handle);
  }
};

void Require(bool condition, const std::string &what) {
  if (!condition) {
    throw std::runtime_error(what);
  }
}

/// The length of the element that begins at `begin`, which contains no element of its own name.
std::size_t LengthOfElement(const std::string &text, std::size_t begin) {
  const std::string name = text.substr(begin + 1, text.find_first_of(" >", begin) - begin - 1);
  const std::size_t end = text.find("</" + name + ">", begin);
  Require(end != std::string::npos, "an element without an end: " + name);
  return end + name.size() + 3 - begin;
}

} // namespace

struct RsaLimit::State {
  using Context = std::unique_ptr<EVP_PKEY_CTX, Deleter<EVP_PKEY_CTX_free>>;

  const std::unique_ptr<EVP_MD, Deleter<EVP_MD_free>> sha256{EVP_MD_fetch(nullptr, "SHA2-256", nullptr)};
  const std::unique_ptr<EVP_MD_CTX, Deleter<EVP_MD_CTX_free>> hash{EVP_MD_CTX_new()};
  Context sign;
  Context check;
  const std::array<unsigned char, 32> digest{};
  std::array<unsigned char, RSA_2048_BYTES> signature{};
  std::string octets;
};

RsaLimit::RsaLimit(const std::string &keyFile) : m_state(std::make_unique<State>()) {
  const std::unique_ptr<FILE, int (*)(FILE *)> file(std::fopen(keyFile.c_str(), "r"), &std::fclose);
  const std::unique_ptr<EVP_PKEY, Deleter<EVP_PKEY_free>> key(
      file ? PEM_read_PrivateKey(file.get(), nullptr, nullptr, nullptr) : nullptr);
  Require(key != nullptr, "cannot read " + keyFile);
  for (State::Context *const context : {&m_state->sign, &m_state->check}) {
    context->reset(EVP_PKEY_CTX_new_from_pkey(nullptr, key.get(), nullptr));
    const int isReady =
        context == &m_state->sign ? EVP_PKEY_sign_init(context->get()) : EVP_PKEY_verify_init(context->get());
    Require(isReady > 0 && EVP_PKEY_CTX_set_rsa_padding(context->get(), RSA_PKCS1_PADDING) > 0 &&
                EVP_PKEY_CTX_set_signature_md(context->get(), m_state->sha256.get()) > 0,
            "cannot prepare RSA");
  }
  Sign();
}

RsaLimit::~RsaLimit() = default;

void RsaLimit::Sign() {
  std::size_t length = m_state->signature.size();
  Require(EVP_PKEY_sign(m_state->sign.get(), m_state->signature.data(), &length, m_state->digest.data(),
                        m_state->digest.size()) == 1,
          "OpenSSL does not sign");
}

void RsaLimit::Check() {
  Require(EVP_PKEY_verify(m_state->check.get(), m_state->signature.data(), m_state->signature.size(),
                          m_state->digest.data(), m_state->digest.size()) == 1,
          "OpenSSL does not verify");
}

void RsaLimit::Hash(std::size_t octets) {
  m_state->octets.resize(std::max(m_state->octets.size(), octets)); // grows in the first round only
  std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
  EVP_DigestInit_ex2(m_state->hash.get(), m_state->sha256.get(), nullptr);
  EVP_DigestUpdate(m_state->hash.get(), m_state->octets.data(), octets);
  EVP_DigestFinal_ex(m_state->hash.get(), digest.data(), nullptr);
  benchmark::DoNotOptimize(digest);
}

std::vector<std::size_t> ListSignedLengths(const std::string &message) {
  constexpr const char *REFERENCE = "<ds:Reference URI=\"#";
  std::vector<std::size_t> lengths;
  for (std::size_t at = message.find("<ds:SignedInfo"); at != std::string::npos;
       at = message.find("<ds:SignedInfo", at + 1)) {
    const std::string signedInfo = message.substr(at, LengthOfElement(message, at));
    lengths.push_back(signedInfo.size());
    for (std::size_t reference = signedInfo.find(REFERENCE); reference != std::string::npos;
         reference = signedInfo.find(REFERENCE, reference + 1)) {
      const std::size_t begin = reference + std::string(REFERENCE).size();
      const std::string identifier = signedInfo.substr(begin, signedInfo.find('"', begin) - begin);
      std::size_t attribute = message.find("Id=\"" + identifier + "\"");
      attribute = attribute == std::string::npos ? message.find("ID=\"" + identifier + "\"") : attribute;
      Require(attribute != std::string::npos, "nothing has the identifier " + identifier);
      std::size_t length = LengthOfElement(message, message.rfind('<', attribute));
      // A signature inside the element that it covers does not cover itself.
      const std::size_t reset = signedInfo.find("#enveloped-signature", reference);
      const bool isEnveloped = reset < signedInfo.find("</ds:Reference>", reference);
      length -= isEnveloped ? LengthOfElement(message, message.rfind("<ds:Signature", at)) : 0;
      lengths.push_back(length);
    }
  }
  return lengths;
}

} // namespace Bench
