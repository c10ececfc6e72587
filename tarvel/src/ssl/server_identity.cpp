// SPDX-License-Identifier: Apache-2.0

#include "ssl/server_identity.h"

#include "crypto/digest_method.h"
#include "crypto/openssl_errors.h"

#include <tarvel/core/string_util.h>
#include <tarvel/ssl/ssl_context.h>

#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <arpa/inet.h>
#include <array>
#include <string_view>

namespace Tarvel::Ssl {

namespace {

constexpr std::size_t SHA256_BYTES = 32;
constexpr std::size_t DIGITS = 2 * SHA256_BYTES;
constexpr std::size_t LENGTH_WITH_COLONS = DIGITS + SHA256_BYTES - 1;

char ToLowerAscii(char c) noexcept {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool IsLowerHexDigit(char c) noexcept {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');
}

/// The 64 digits of `text` in lower case; empty when it is not a thumbprint.
std::string NormaliseThumbprint(std::string_view text) {
  const bool hasColons = text.size() == LENGTH_WITH_COLONS;
  if (!hasColons && text.size() != DIGITS) {
    return {};
  }
  std::string digits;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (hasColons && i % 3 == 2) {
      if (text[i] != ':') {
        return {};
      }
      continue;
    }
    digits += ToLowerAscii(text[i]);
    if (!IsLowerHexDigit(digits.back())) {
      return {};
    }
  }
  return digits;
}

/// The name as it is written in certificates. They contain neither a scope, which selects an interface of this machine,
/// nor a final dot, which matters only to the resolver.
std::string NormaliseHost(std::string_view host) {
  if (host.size() > 2 && host.front() == '[' && host.back() == ']') {
    host = host.substr(1, host.size() - 2);
  }
  host = host.substr(0, host.find('%'));
  if (!host.empty() && host.back() == '.') {
    host.remove_suffix(1);
  }
  std::string name;
  for (const char c : host) {
    if (c <= ' ' || c > '~') {
      throw SSLException("the host name contains a character that is not printable ASCII");
    }
    name += ToLowerAscii(c);
  }
  return name;
}

bool IsAddress(const std::string &host) noexcept {
  in6_addr parsed{};
  return inet_pton(AF_INET, host.c_str(), &parsed) == 1 || inet_pton(AF_INET6, host.c_str(), &parsed) == 1;
}

std::string Sha256Thumbprint(const X509 *certificate) {
  const Crypto::OpenSslErrorScope errors;
  constexpr std::string_view HEX = "0123456789abcdef";
  std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
  unsigned length = 0;
  const EVP_MD *const sha256 = Crypto::GetDigestMethod(Crypto::DigestAlgorithm::SHA256);
  if (X509_digest(certificate, sha256, digest.data(), &length) != 1 || length != SHA256_BYTES) {
    errors.Throw("the thumbprint of the server's certificate cannot be computed");
  }
  std::string text;
  for (std::size_t i = 0; i < SHA256_BYTES; ++i) {
    text += HEX[digest[i] >> 4];
    text += HEX[digest[i] & 0xF];
  }
  return text;
}

} // namespace

ServerIdentity::ServerIdentity(const std::string &host, const std::string &parameter) : m_host(NormaliseHost(host)) {
  m_isAddress = IsAddress(m_host);
  if (!parameter.empty()) {
    m_thumbprint = NormaliseThumbprint(parameter);
    if (m_thumbprint.empty()) {
      throw SSLException("the SSL parameter \"" + StringUtil::Shorten(parameter) +
                         "\" is not a SHA-256 thumbprint of 64 hexadecimal digits");
    }
  }
  // For OpenSSL an empty name means that no name is checked.
  if (m_host.empty() && m_thumbprint.empty()) {
    throw SSLException("there is no host name to check the server's certificate against");
  }
}

void ServerIdentity::Apply(SSL *connection) const {
  const Crypto::OpenSslErrorScope errors;
  // RFC 6066, section 3: addresses are not permitted as server names.
  if (!m_isAddress && !m_host.empty() && SSL_set_tlsext_host_name(connection, m_host.c_str()) != 1) {
    throw SSLException(errors.Describe("the host name cannot be sent as a server name"));
  }
  if (!HasThumbprint()) {
    ApplyName(connection);
  }
}

void ServerIdentity::ApplyName(SSL *connection) const {
  const Crypto::OpenSslErrorScope errors;
  X509_VERIFY_PARAM *const checks = SSL_get0_param(connection);
  X509_VERIFY_PARAM_set_hostflags(checks, X509_CHECK_FLAG_NO_PARTIAL_WILDCARDS);
  const int applied = m_isAddress ? X509_VERIFY_PARAM_set1_ip_asc(checks, m_host.c_str())
                                  : X509_VERIFY_PARAM_set1_host(checks, m_host.data(), m_host.size());
  if (applied != 1) {
    throw SSLException(errors.Describe("the host name cannot be checked"));
  }
}

std::string ServerIdentity::RefuseByThumbprint(X509 *certificate) const {
  if (!certificate) {
    return "the server showed no certificate";
  }
  const std::string actual = Sha256Thumbprint(certificate);
  if (CRYPTO_memcmp(actual.data(), m_thumbprint.data(), DIGITS) == 0) {
    return {};
  }
  return "the server's certificate has the SHA-256 thumbprint " + actual + " instead of " + m_thumbprint;
}

} // namespace Tarvel::Ssl
