// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenSpec`, the properties that are requested for a token.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/export.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/// The properties of a token to request. Set the fields directly; they are checked when a request is made from them.
///
/// It can be copied and moved, but not assigned: `spec = other` does not compile. Make a new one instead:
/// `TokenSpec next(spec);`.
struct SSOCLIENT_API TokenSpec {
  /// Which subject confirmation is requested.
  enum Confirmation : std::int32_t {
    CONFIRMATION_DEFAULT = 0, ///< holder-of-key if the service was created with an identity, otherwise bearer
    CONFIRMATION_NONE = 1     ///< bearer
  };

  TokenSpec();
  TokenSpec(const TokenSpec &other);
  TokenSpec(TokenSpec &&other) noexcept; ///< leaves audiences and advice of `other` empty
  ~TokenSpec();

  std::int64_t tokenLifetimeSec = 0;                ///< requested lifetime in seconds; must be positive
  std::set<std::string> audienceRestriction;        ///< restricts the token to these audiences, if any
  std::vector<Advice> advice;                       ///< advice for the token, in order
  bool delegable = false;                           ///< requests a token that may be delegated
  boost::optional<std::string> delegateTo;          ///< delegates the token to this principal
  bool renewable = false;                           ///< requests a token that may be renewed
  Confirmation confirmation = CONFIRMATION_DEFAULT; ///< requests this subject confirmation
};

} // namespace SsoClient
