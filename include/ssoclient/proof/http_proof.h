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
#include <tarvel/system/date_time.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {

/// What a service requires of a request, in addition to a token that its `TokenVerifier` accepts.
struct HttpProofOptions {
  TokenHeader tokenHeader; ///< where the token is

  /// Names of header fields that must be covered, and so must be there, in addition to what must always be covered.
  std::vector<std::string> requiredHeaders;

  /// How far the clocks of sender and receiver may differ, in seconds; not negative.
  std::int64_t clockToleranceSec = 60;

  /// A request that was signed longer ago than this and the tolerance is refused, even if it expires later. In seconds;
  /// positive.
  std::int64_t maxAgeSec = 300;

  /// Refuses requests that were received before. Null for no guard.
  std::shared_ptr<ReplayGuard> replayGuard;
};

/// An accepted request. Its method, target, token and content are verified, and so are the header fields that `covered`
/// lists. Other header fields are not.
struct VerifiedHttpRequest {
  std::shared_ptr<const SamlToken> token;         ///< never null
  ProofKind proof = ProofKind::MESSAGE_SIGNATURE; ///< always this one
  std::vector<std::string> covered;               ///< the covered components, such as "@method", in their order
  Tarvel::System::DateTime created;               ///< when the request was signed, to the second
  ReplayProtection replay = ReplayProtection::NOT_GUARDED; ///< whether a replay guard has accepted the request
};

/// Verifies the token of a request and its signature by the token's key (RFC 9421). Everything in the request may come
/// from a stranger. The first reason for a refusal is thrown, in this order: the form of the request, the token, the
/// parameters of the signature, its time, what it covers, the content, the signature, and last the replay guard.
///
/// - The signature is the one whose `keyid` is the SHA-256 thumbprint of the token's key (64 lower-case hexadecimal
///   digits). If the request has only one signature, and that has no `keyid`, it is used. Other signatures are
///   ignored.
/// - The key is always the token's, and it decides the algorithm (see `SignHttpRequest`). If the signature has `alg`,
///   it must be the name of that algorithm.
/// - The signature must cover "@method"; "@target-uri", or "@scheme" and "@authority" and either "@request-target" (in
///   the form with a path) or "@path" and "@query"; the token's field; `content-digest`, if the body is not empty; and
///   `requiredHeaders`.
/// - If the signature covers `content-digest`, each digest of that field by sha-256 and sha-512 must match the body
///   (RFC 9530), and there must be at least one such digest. An unset body is treated as empty.
/// - The signature must have `created`. `expires` is checked if it is there. Unknown parameters are ignored; like all
///   parameters, they are signed.
/// - Several fields of one name are covered as one value, in which they are joined by a comma and a blank (RFC 9421,
///   section 2.1). So one field with such a comma can arrive as two: read all fields of a name, or refuse two of them.
/// - Components with parameters (such as ";sf"), unknown derived components, names in upper case and repeated
///   components are refused, and so are header fields with control characters. Folded lines are read as one line.
/// - More than 32 signatures, or a signature with more than 128 components or 32 parameters, are refused.
///
/// Takes linear time, and is safe on any thread; the replay guard may block.
/// @param tokens verifies the token. A bearer token is refused, because its sender cannot prove anything; a service
///        that accepts bearer tokens verifies them with `TokenVerifier::Verify`.
/// @throws InvalidMessageException when the request does not have the form above, or something that must be covered is
///         not.
/// @throws InvalidProofException when there is no signature by the token's key, or its `alg` is another one; when the
///         request was changed after it was signed; for a bearer token, a token without a key that can be used, and a
///         key for which there is no algorithm.
/// @throws StaleMessageException when `created` is too long ago or in the future, or `expires` has passed, also if
///         that happens before the replay guard answers.
/// @throws RepeatedMessageException, ReplayGuardException by the replay guard, which is asked only about requests that
///         are otherwise accepted.
/// @throws what `TokenVerifier::Verify` throws, for the token.
/// @throws Tarvel::InvalidArgumentException when an option is not valid.
/// @throws Tarvel::Crypto::CryptoException when OpenSSL fails; this says nothing about the request.
SSOCLIENT_API VerifiedHttpRequest VerifyHttpProof(const HttpRequest &request, const TokenVerifier &tokens,
                                                  const HttpProofOptions &options = {});

} // namespace SsoClient
