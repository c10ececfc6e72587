// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the sender of a token has proved.

#pragma once

#include <ssoclient/export.h>

#include <cstdint>

namespace SsoClient {

/// What the sender of a token has proved.
enum class ProofKind : std::int32_t {
  BEARER = 0,        ///< nothing except that it has the token
  MESSAGE_SIGNATURE, ///< that it has the token's key: it signed the message or request with it
  TLS_CERTIFICATE    ///< that it has the token's key: it authenticated the connection with it
};

/// Whether a replay guard has accepted the message or request.
enum class ReplayProtection : std::int32_t {
  NOT_GUARDED = 0, ///< there is no replay guard, or nothing was signed
  GUARDED          ///< the replay guard has received it for the first time
};

/// The name of a proof: "bearer", "message-signature" or "tls-certificate".
SSOCLIENT_API const char *GetProofName(ProofKind proof) noexcept;

} // namespace SsoClient
