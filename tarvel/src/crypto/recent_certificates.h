// SPDX-License-Identifier: Apache-2.0
/// @file
/// The certificates that were decoded last.
///
/// Each token of a holder of key contains the holder's certificate, and decoding one takes OpenSSL three times as long as
/// checking a signature. A service receives many tokens of few holders, so a few certificates are kept, with the contexts
/// for checking signatures that belong to them. They are kept until the process ends, and other certificates replace them.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>

#include <cstddef>
#include <cstdint>

namespace Tarvel::Crypto {

/// The kept certificate with this encoding; null if there is none. This function and the next are safe on any thread, and also
/// after `fork`: they take no lock.
Ref<const Certificate> FindRecentCertificate(const std::uint8_t *data, std::size_t length) noexcept;

/// Keeps `certificate` in the place of another one, unless it is very long.
void KeepRecentCertificate(const Ref<const Certificate> &certificate) noexcept;

/// Releases all kept certificates, so that the next ones are decoded again. For tests.
void ForgetRecentCertificates() noexcept;

} // namespace Tarvel::Crypto
