// SPDX-License-Identifier: Apache-2.0

#include "crypto/openssl_errors.h"

#include <tarvel/crypto/certificate.h>

#include <openssl/err.h>

#include <array>
#include <cerrno>
#include <utility>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t ERROR_TEXT_BYTES = 256; // enough, according to OpenSSL's documentation

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

// OpenSSL does not always queue the error of a failed allocation: the queue itself may lack memory, or OpenSSL removes the
// error before it tries something else. But `malloc` has set errno, and OpenSSL's computations do not reset it.
OpenSslErrorScope::OpenSslErrorScope() noexcept : m_hostErrno(errno) {
  errno = 0;
  if (ERR_peek_last_error_all(&m_newestHostError, nullptr, nullptr, nullptr, nullptr) == 0) {
    m_newestHostError = nullptr;
  }
  ERR_set_mark();
}

// In an empty queue OpenSSL sets no mark; popping to the mark then empties the queue, which is the state to restore.
OpenSslErrorScope::~OpenSslErrorScope() {
  const bool ranOut = errno == ENOMEM; // stays visible to an enclosing scope
  ERR_pop_to_mark();
  errno = ranOut ? ENOMEM : m_hostErrno;
}

void OpenSslErrorScope::Note(unsigned long code, const char *data, int flags) const {
  m_newest = code;
  m_ranOutOfMemory = m_ranOutOfMemory || ERR_GET_REASON(code) == ERR_R_MALLOC_FAILURE;
  m_text.append(m_text.empty() ? "" : "; ").append(DescribeError(code, data, flags));
}

void OpenSslErrorScope::Collect() const {
  m_ranOutOfMemory = m_ranOutOfMemory || errno == ENOMEM;
  const char *data = nullptr;
  int flags = 0;
  if (!m_newestHostError) {
    while (const unsigned long code = ERR_get_error_all(nullptr, nullptr, nullptr, &data, &flags)) {
      Note(code, data, flags);
    }
    return;
  }
  if (const unsigned long newest = PeekNewest(); newest != 0 && newest != m_newest) {
    ERR_peek_last_error_data(&data, &flags);
    Note(newest, data, flags);
  }
}

bool OpenSslErrorScope::RanOutOfMemory() const {
  Collect();
  return m_ranOutOfMemory;
}

void OpenSslErrorScope::RequireMemory() const {
  if (RanOutOfMemory()) {
    throw OutOfMemoryException();
  }
}

unsigned long OpenSslErrorScope::PeekNewest() const noexcept {
  const char *entry = nullptr;
  const unsigned long newest = ERR_peek_last_error_all(&entry, nullptr, nullptr, nullptr, nullptr);
  return newest == 0 || entry == m_newestHostError ? m_newest : newest;
}

std::string OpenSslErrorScope::TakeText() const {
  Collect();
  return std::exchange(m_text, {});
}

std::string OpenSslErrorScope::Describe(const std::string &message) const {
  RequireMemory();
  const std::string text = TakeText();
  return text.empty() ? message : message + ": " + text;
}

void OpenSslErrorScope::Throw(const std::string &message) const {
  throw CryptoException(Describe(message));
}

} // namespace Tarvel::Crypto
