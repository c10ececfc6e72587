// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/http_proof.h>

#include "proof/content_digest.h"
#include "proof/http_signature_checks.h"
#include "proof/message_sinks.h"
#include "proof/replay_check.h"
#include "proof/token_field.h"
#include "token/confirmation_key.h"

#include <tarvel/core/exception.h>
#include <tarvel/crypto/detached_signature.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::VerifyingKey;
using Tarvel::System::DateTime;

TimeWindow WindowOf(const HttpProofOptions &options) noexcept {
  return {options.clockToleranceSec, options.maxAgeSec};
}

void RequireOptions(const HttpProofOptions &options) {
  RequireTimeWindow(WindowOf(options), "HttpProofOptions");
  RequireTokenHeader(options.tokenHeader);
  if (!std::all_of(options.requiredHeaders.begin(), options.requiredHeaders.end(), IsHttpToken)) {
    throw Tarvel::InvalidArgumentException(
        "HttpProofOptions::requiredHeaders has a text that is not the name of a header field");
  }
}

Ref<const VerifyingKey> RequireKey(const SamlToken &token) {
  if (token.GetConfirmationMethod() == SamlToken::BEARER) {
    throw InvalidProofException("The token is a bearer token, which has no key whose possession could be proved");
  }
  Ref<const VerifyingKey> key = GetConfirmationKey(token);
  if (!key) {
    throw InvalidProofException("The token has no key that can be used");
  }
  return key;
}

HttpSignatureAlgorithm RequireAlgorithm(const VerifyingKey &key) {
  HttpSignatureAlgorithm algorithm = GetHttpSignatureAlgorithm(key);
  if (!algorithm.name) {
    throw InvalidProofException("No signature by the token's key is accepted: " + algorithm.refusal);
  }
  return algorithm;
}

void CheckTimes(const HttpSignatureTimes &times, const TimeWindow &window) {
  const DateTime now = Tarvel::System::GetUtcDateTime();
  const Place nowhere(static_cast<const Tarvel::Xml::ElementNode *>(nullptr)); // not in a document
  DeviationSink &sink = ThrowingMessageSinks().time;
  CheckCreation(times.created, window, now, nowhere, sink);
  if (times.expires) {
    CheckExpiry(*times.expires, window, now, nowhere, sink);
  }
}

/// If the digest is covered, it is checked, so that content which was removed is noticed, too.
void CheckContent(const HttpRequest &request, const HttpComponents &components,
                  const std::vector<std::string> &covered) {
  if (std::find(covered.begin(), covered.end(), CONTENT_DIGEST) != covered.end()) {
    const std::string field = components.FindField(CONTENT_DIGEST).value_or("");
    CheckContentDigest(field, request.body ? std::string_view(*request.body) : std::string_view());
  }
}

ReplayProtection CheckReplay(const std::string &base, const VerifyingKey &key, const HttpSignatureTimes &times,
                             const HttpProofOptions &options) {
  if (!options.replayGuard) {
    return ReplayProtection::NOT_GUARDED;
  }
  const auto digest = Tarvel::Crypto::ComputeDigest(Tarvel::Crypto::HashAlgorithm::SHA256, base);
  RequireFirstReceipt(*options.replayGuard, IdentifyMessage(SignedAs::HTTP_REQUEST, digest, key),
                      GetStaleTime(times.created, times.expires, WindowOf(options)));
  return ReplayProtection::GUARDED;
}

} // namespace

VerifiedHttpRequest VerifyHttpProof(const HttpRequest &request, const TokenVerifier &tokens,
                                    const HttpProofOptions &options) {
  RequireOptions(options);
  const HttpComponents components(request);
  const std::string xml = ReadTokenField(components, options.tokenHeader);
  const std::vector<HttpSignature> signatures = ReadHttpSignatures(components);

  VerifiedHttpRequest verified;
  verified.token = tokens.Verify(xml);
  const Ref<const VerifyingKey> key = RequireKey(*verified.token);
  const HttpSignatureAlgorithm algorithm = RequireAlgorithm(*key);
  const HttpSignature &signature = SelectHttpSignature(signatures, *key);
  const HttpSignatureTimes times = ReadSignatureParameters(signature, algorithm);
  CheckTimes(times, WindowOf(options));

  verified.covered = ReadComponentNames(signature.input);
  RequireCoverage(request, verified.covered, options);
  const std::string base = MakeSignatureBase(components, verified.covered, signature.input);
  CheckContent(request, components, verified.covered);
  if (!Tarvel::Crypto::VerifyOctets(*key, algorithm.hash, base, signature.value)) {
    throw InvalidProofException(
        "The signature was not made by the token's key, or the request was changed after it was signed");
  }
  verified.created = times.created;
  verified.replay = CheckReplay(base, *key, times, options);
  return verified;
}

} // namespace SsoClient
