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

/// What kind of token to ask for. Fields are set directly; they are judged when a request is built from them.
struct SSOCLIENT_API TokenSpec {
  /// Which subject confirmation is wanted.
  enum Confirmation : std::int32_t {
    CONFIRMATION_DEFAULT = 0, ///< holder-of-key when the service has a holder-of-key identity configured, else bearer
    CONFIRMATION_NONE = 1     ///< always a bearer token
  };

  TokenSpec();
  TokenSpec(const TokenSpec &other);
  TokenSpec(TokenSpec &&other) noexcept; ///< leaves the audience set and the advice list of `other` empty
  ~TokenSpec();

  std::int64_t tokenLifetimeSec = 0;         ///< requested lifetime in seconds; a request needs a positive one
  std::set<std::string> audienceRestriction; ///< audiences to which the token is to be restricted; empty: none
  std::vector<Advice> advice;                ///< advice to be placed into the token, in order
  bool delegable = false;                    ///< the token is to be delegable
  boost::optional<std::string> delegateTo;   ///< principal to which the token is to be delegated, if any
  bool renewable = false;                    ///< the token is to be renewable
  Confirmation confirmation = CONFIRMATION_DEFAULT;
};

} // namespace SsoClient
