// SPDX-License-Identifier: Apache-2.0

#include "proof/replay_check.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/crypto/message_digest.h>

#include <algorithm>
#include <exception>
#include <string>

namespace SsoClient {

namespace {

/// The guard's answer. What it throws becomes a `ReplayGuardException`.
ReplayGuard::Answer Ask(ReplayGuard &guard, const MessageIdentifier &identifier,
                        const Tarvel::System::DateTime &until) {
  try {
    return guard.Remember(identifier, until);
  } catch (const std::exception &exception) {
    throw ReplayGuardException(std::string("The replay guard failed: ") + exception.what());
  } catch (...) {
    throw ReplayGuardException("The replay guard failed");
  }
}

} // namespace

MessageIdentifier IdentifyMessage(std::string_view signedAs, const std::vector<std::uint8_t> &signedDigest,
                                  const Tarvel::Crypto::VerifyingKey &key) {
  // Other parts always make another text: `signedAs` ends at the first line end, and the thumbprint always has the same
  // length.
  std::string text(signedAs);
  text += '\n';
  text += key.GetSha256Thumbprint();
  text.append(signedDigest.begin(), signedDigest.end());
  const std::vector<std::uint8_t> digest = Tarvel::Crypto::ComputeDigest(Tarvel::Crypto::HashAlgorithm::SHA256, text);
  MessageIdentifier identifier{};
  std::copy_n(digest.begin(), identifier.size(), identifier.begin());
  return identifier;
}

void RequireFirstReceipt(ReplayGuard &guard, const MessageIdentifier &identifier,
                         const Tarvel::System::DateTime &until) {
  switch (Ask(guard, identifier, until)) {
  case ReplayGuard::Answer::FIRST:
    // At `until` the guard may have forgotten an earlier receipt, and it may have answered only then.
    if (!(Tarvel::System::GetUtcDateTime() < until)) {
      throw StaleMessageException("The message became too old before the replay guard had answered");
    }
    return;
  case ReplayGuard::Answer::REPEATED:
    throw RepeatedMessageException("The message was received before");
  case ReplayGuard::Answer::UNAVAILABLE:
    break;
  }
  throw ReplayGuardException("The replay guard is full or cannot be reached, so the message is refused");
}

} // namespace SsoClient
