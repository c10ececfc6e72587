// SPDX-License-Identifier: Apache-2.0

#include "crypto/recent_certificates.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <functional>
#include <string_view>
#include <vector>

namespace Tarvel::Crypto {

namespace {

constexpr std::size_t KEPT = 128; // some kilobytes each
constexpr std::size_t MAX_KEPT_BYTES = 4096;
constexpr std::size_t HASHED_BYTES =
    32; // at the end: a part of the signature, which differs from certificate to certificate

/// Each place owns one reference. A thread that uses it takes the certificate out, so no other thread releases it.
using Place = std::atomic<const Certificate *>;

// Nothing is freed at the end of the process, when OpenSSL may have cleaned itself up.
std::array<Place, KEPT> places{};

Place &PlaceOf(const std::uint8_t *data, std::size_t length) noexcept {
  const std::size_t hashed = std::min(length, HASHED_BYTES);
  const std::string_view end(reinterpret_cast<const char *>(data) + (length - hashed), hashed);
  return places[std::hash<std::string_view>()(end) % KEPT];
}

Ref<const Certificate> Take(Place &place) noexcept {
  const Certificate *const certificate = place.exchange(nullptr, std::memory_order_acquire);
  Ref<const Certificate> taken(certificate);
  if (certificate) {
    certificate->Release(); // the reference of the place; `taken` has another one
  }
  return taken;
}

/// Puts the certificate into the place, unless another thread has put one there.
void Put(Place &place, const Ref<const Certificate> &certificate) noexcept {
  const Certificate *expected = nullptr;
  certificate->AddRef();
  if (!place.compare_exchange_strong(expected, certificate.get(), std::memory_order_release,
                                     std::memory_order_relaxed)) {
    certificate->Release();
  }
}

} // namespace

Ref<const Certificate> FindRecentCertificate(const std::uint8_t *data, std::size_t length) noexcept {
  Place &place = PlaceOf(data, length);
  if (!place.load(std::memory_order_relaxed)) {
    return {};
  }
  const Ref<const Certificate> kept = Take(place);
  if (!kept) {
    return {};
  }
  Put(place, kept);
  const std::vector<std::uint8_t> &der = kept->GetDer();
  return std::equal(der.begin(), der.end(), data, data + length) ? kept : Ref<const Certificate>();
}

void KeepRecentCertificate(const Ref<const Certificate> &certificate) noexcept {
  const std::vector<std::uint8_t> &der = certificate->GetDer();
  if (der.size() <= MAX_KEPT_BYTES) {
    Place &place = PlaceOf(der.data(), der.size());
    Take(place);
    Put(place, certificate);
  }
}

void ForgetRecentCertificates() noexcept {
  for (Place &place : places) {
    Take(place);
  }
}

} // namespace Tarvel::Crypto
