// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading PEM text (RFC 7468 and its predecessor RFC 1421) block by block.

#pragma once

#include "crypto/openssl_errors.h"
#include "crypto/openssl_handles.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace Tarvel::Crypto {

/// One block of PEM text. It may contain a private key, so its bytes are wiped when it is destroyed.
class PemBlock {
public:
  PemBlock() = default;
  PemBlock(const PemBlock &) = delete;
  PemBlock &operator=(const PemBlock &) = delete;
  ~PemBlock() { Clear(); }

  /// The label, such as "CERTIFICATE".
  std::string_view GetLabel() const { return m_label; }
  bool IsCertificate() const { return GetLabel() == "CERTIFICATE" || GetLabel() == "X509 CERTIFICATE"; }
  bool IsPrivateKey() const { return GetLabel().ends_with("PRIVATE KEY"); }

  /// The encapsulated headers of RFC 1421, such as "Proc-Type: 4,ENCRYPTED"; empty if there are none.
  char *GetHeaders() { return m_headers; }
  unsigned char *GetData() { return m_data; }
  long GetLength() const { return m_length; }
  /// Sets the length of the plaintext after decryption in place.
  void SetLength(long length) { m_length = length; }

private:
  friend class PemReader;
  void Clear() noexcept;

  char *m_label = nullptr;
  char *m_headers = nullptr;
  unsigned char *m_data = nullptr;
  long m_length = 0;
  long m_allocated = 0;
};

/// Reads the blocks of a text one after another. The text must outlive the reader.
class PemReader {
public:
  /// @throws CryptoException when the text is longer than 16 MiB; InvalidStateException when OpenSSL has cleaned itself up;
  ///         OutOfMemoryException.
  explicit PemReader(std::string_view text);

  /// Reads the next block into `block`; false at the end of the text.
  /// @throws CryptoException when a block has begun but is not well-formed; InvalidStateException and
  ///         OutOfMemoryException like the constructor.
  bool Next(PemBlock &block);

  static bool LooksLikePem(std::string_view text) { return text.find(BEGIN_MARK) != std::string_view::npos; }

private:
  static constexpr std::string_view BEGIN_MARK = "-----BEGIN ";

  std::size_t m_blocksLeft;
  BioHandle m_bio;
};

} // namespace Tarvel::Crypto
