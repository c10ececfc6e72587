// SPDX-License-Identifier: Apache-2.0
/// @file
/// The certificates that were decoded last.
///
/// Most holder-of-key tokens contain the holder's certificate, and decoding one takes OpenSSL three times as long as
/// checking a signature. A service receives many tokens of few holders, so a few certificates are kept, with the contexts
/// for checking signatures that belong to them. Each is kept until another one replaces it, or until the process ends.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>

#include <cstddef>
#include <cstdint>

namespace Tarvel::Crypto {

/// The kept certificate with this encoding; null if there is none. This function and the next are safe on any thread, and also
/// after `fork`: they take no lock.
Ref<const Certificate> FindRecentCertificate(const std::uint8_t *data, std::size_t length) noexcept;

/// Keeps `certificate`, unless it is very long. Another one may be released for it.
void KeepRecentCertificate(const Ref<const Certificate> &certificate) noexcept;

/// Releases all kept certificates, so that the next ones are decoded again. For tests.
void ForgetRecentCertificates() noexcept;

} // namespace Tarvel::Crypto
