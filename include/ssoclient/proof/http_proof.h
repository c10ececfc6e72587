// SPDX-License-Identifier: Apache-2.0
/// @file
/// `VerifyHttpProof`, with which an HTTP service checks that the sender of a request may use the token in it.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/proof/exceptions.h>
#include <ssoclient/proof/http_request.h>
#include <ssoclient/proof/proof_kind.h>
#include <ssoclient/proof/replay_guard.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_verifier.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// What a service requires of a request, in addition to a token that its `TokenVerifier` accepts.
struct HttpProofOptions {
  TokenHeader tokenHeader;                  ///< where the token is
  std::vector<std::string> requiredHeaders; ///< header fields that must be covered, in addition to the usual ones
  std::int64_t clockToleranceSec = 60;      ///< as in `MessageVerifierOptions`
  std::int64_t maxAgeSec = 300;             ///< as in `MessageVerifierOptions`
  std::shared_ptr<ReplayGuard> replayGuard; ///< null for no guard
};

/// An accepted request.
struct VerifiedHttpRequest {
  std::shared_ptr<const SamlToken> token;         ///< never null
  ProofKind proof = ProofKind::MESSAGE_SIGNATURE; ///< what the sender proved
  std::vector<std::string> covered;               ///< the covered components, such as "@method", in their order
  Tarvel::System::DateTime created;               ///< when the request was signed
  ReplayProtection replay = ReplayProtection::NOT_GUARDED; ///< whether a replay guard has accepted the request
};

/// Verifies the token of a request and its signature by the token's key (RFC 9421) (...)
SSOCLIENT_API VerifiedHttpRequest VerifyHttpProof(const HttpRequest &request, const TokenVerifier &tokens,
                                                  const HttpProofOptions &options = {});

} // namespace SsoClient
