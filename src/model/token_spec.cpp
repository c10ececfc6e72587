// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_spec.h>

#include <utility>

namespace SsoClient {

TokenSpec::TokenSpec() = default;
TokenSpec::TokenSpec(const TokenSpec &other) = default;
TokenSpec::~TokenSpec() = default;

// Swapped rather than moved, because the standard does not promise that a moved-from set is empty.
TokenSpec::TokenSpec(TokenSpec &&other) noexcept
    : tokenLifetimeSec(other.tokenLifetimeSec), delegable(other.delegable), delegateTo(std::move(other.delegateTo)),
      renewable(other.renewable), confirmation(other.confirmation) {
  audienceRestriction.swap(other.audienceRestriction);
  advice.swap(other.advice);
}

} // namespace SsoClient
