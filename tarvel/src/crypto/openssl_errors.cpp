// SPDX-License-Identifier: Apache-2.0

#include "crypto/openssl_errors.h"

#include <tarvel/crypto/certificate.h>

#include <openssl/err.h>

#include <array>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t ERROR_TEXT_BYTES = 256; // what OpenSSL documents as enough

std::string DescribeError(unsigned long code, const char *data, int flags) {
  std::array<char, ERROR_TEXT_BYTES> text{};
  ERR_error_string_n(code, text.data(), text.size());
  std::string described = text.data();
  if (data && *data != '\0' && (flags & ERR_TXT_STRING)) {
    described.append(" (").append(data).append(")");
  }
  return described;
}

} // namespace

OpenSslErrorScope::OpenSslErrorScope() noexcept {
  if (ERR_peek_last_error_all(&m_newestOfHost, nullptr, nullptr, nullptr, nullptr) == 0) {
    m_newestOfHost = nullptr;
  }
  ERR_set_mark();
}

// Without an entry to mark, OpenSSL sets no mark, and popping to the mark empties the queue: as it was found.
OpenSslErrorScope::~OpenSslErrorScope() {
  ERR_pop_to_mark();
}

unsigned long OpenSslErrorScope::PeekNewest() const noexcept {
  const char *entry = nullptr;
  const unsigned long newest = ERR_peek_last_error_all(&entry, nullptr, nullptr, nullptr, nullptr);
  return newest != 0 && entry == m_newestOfHost ? 0 : newest;
}

std::string OpenSslErrorScope::TakeText() const {
  const char *data = nullptr;
  int flags = 0;
  if (m_newestOfHost) {
    const unsigned long newest = PeekNewest();
    ERR_peek_last_error_data(&data, &flags);
    return newest == 0 ? std::string() : DescribeError(newest, data, flags);
  }
  std::string text;
  while (const unsigned long code = ERR_get_error_all(nullptr, nullptr, nullptr, &data, &flags)) {
    text.append(text.empty() ? "" : "; ").append(DescribeError(code, data, flags));
  }
  return text;
}

std::string OpenSslErrorScope::Describe(const std::string &message) const {
  const std::string text = TakeText();
  return text.empty() ? message : message + ": " + text;
}

void OpenSslErrorScope::Throw(const std::string &message) const {
  throw CryptoException(Describe(message));
}

} // namespace Tarvel::Crypto
