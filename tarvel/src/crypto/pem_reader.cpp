// SPDX-License-Identifier: Apache-2.0

#include "crypto/pem_reader.h"

#include <tarvel/crypto/certificate.h>

#include <openssl/err.h>
#include <openssl/pem.h>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t MAX_TEXT_BYTES = std::size_t{16} << 20;

std::size_t CountOccurrences(std::string_view text, std::string_view mark) {
  std::size_t count = 0;
  for (std::size_t at = text.find(mark); at != std::string_view::npos; at = text.find(mark, at + mark.size())) {
    ++count;
  }
  return count;
}

} // namespace

void PemBlock::Clear() noexcept {
  OPENSSL_secure_free(m_label);
  OPENSSL_secure_free(m_headers);
  OPENSSL_secure_clear_free(m_data, static_cast<std::size_t>(m_allocated));
  m_label = nullptr;
  m_headers = nullptr;
  m_data = nullptr;
  m_length = 0;
  m_allocated = 0;
}

PemReader::PemReader(std::string_view text) : m_blocksLeft(CountOccurrences(text, BEGIN_MARK)) {
  if (text.size() > MAX_TEXT_BYTES) {
    throw CryptoException("PEM text of " + std::to_string(text.size()) + " bytes is too long");
  }
  OpenSslGuard::Prepare();
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  m_bio.reset(BIO_new_mem_buf(text.data(), static_cast<int>(text.size())));
  if (!m_bio) {
    throw OutOfMemoryException();
  }
}

bool PemReader::Next(PemBlock &block) {
  block.Clear();
  if (m_blocksLeft == 0) {
    return false;
  }
  --m_blocksLeft;
  const OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  if (PEM_read_bio_ex(m_bio.get(), &block.m_label, &block.m_headers, &block.m_data, &block.m_length,
                      PEM_FLAG_SECURE | PEM_FLAG_EAY_COMPATIBLE) != 1) {
    // Throws also if OpenSSL finds no further block: a truncated begin line must not hide a certificate of a bundle.
    errors.Throw("Malformed PEM text");
  }
  block.m_allocated = block.m_length;
  return true;
}

} // namespace Tarvel::Crypto
