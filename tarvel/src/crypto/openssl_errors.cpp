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

OpenSslErrorScope::OpenSslErrorScope() noexcept : m_hostHadErrors(ERR_peek_error() != 0) {
  ERR_set_mark();
}

// Without an entry to mark, OpenSSL sets no mark, and popping to the mark empties the queue: as it was found.
OpenSslErrorScope::~OpenSslErrorScope() {
  ERR_pop_to_mark();
}

std::string OpenSslErrorScope::TakeText() const {
  const char *data = nullptr;
  int flags = 0;
  if (m_hostHadErrors) {
    const unsigned long newest = ERR_peek_last_error_data(&data, &flags);
    return DescribeError(newest, data, flags);
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
