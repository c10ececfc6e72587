// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/secure_wipe.h>

#include <string.h>

namespace Tarvel {

namespace {

/// Growing to the capacity does not allocate, and makes all of the memory part of the value.
template <typename Container>
void WipeAll(Container &container) noexcept {
  container.resize(container.capacity());
  SecureWipe(container.data(), container.size());
  container.clear();
}

} // namespace

void SecureWipe(void *data, std::size_t length) noexcept {
  if (length == 0) {
    return;
  }
  ::explicit_bzero(data, length);
}

void SecureWipe(std::string &text) noexcept {
  WipeAll(text);
}

void SecureWipe(std::vector<std::uint8_t> &bytes) noexcept {
  WipeAll(bytes);
}

} // namespace Tarvel
