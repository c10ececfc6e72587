// SPDX-License-Identifier: Apache-2.0
/// @file
/// Messages that are received twice: their identifier, and the question to the replay guard.

#pragma once

#include <ssoclient/proof/proof_kind.h>
#include <ssoclient/proof/replay_guard.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/system/date_time.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace SsoClient {

/// What kind of signature a message has, so that no two kinds share an identifier.
namespace SignedAs {
constexpr std::string_view SOAP_MESSAGE = "SOAP message"; ///< an XML signature over parts of a SOAP message
constexpr std::string_view HTTP_REQUEST = "HTTP request"; ///< RFC 9421
} // namespace SignedAs

/// The identifier of a message that `key` has signed.
/// @param signedDigest the digest of what the signature's value signs: the canonical `SignedInfo`, or the signature
///         base of RFC 9421
/// @throws what `ComputeDigest` throws.
MessageIdentifier IdentifyMessage(std::string_view signedAs, const std::vector<std::uint8_t> &signedDigest,
                                  const Tarvel::Crypto::VerifyingKey &key);

/// Asks the guard whether the message is received for the first time. Call it last, when every other check has passed,
/// so that a message that is refused takes no place in the guard.
/// @param until the first moment at which the message is stale
/// @throws RepeatedMessageException when the guard has received the message before.
/// @throws StaleMessageException when the guard has answered at `until` or later: it may then have forgotten the
///         message.
/// @throws ReplayGuardException when it is not available, or throws.
void RequireFirstReceipt(ReplayGuard &guard, const MessageIdentifier &identifier,
                         const Tarvel::System::DateTime &until);

} // namespace SsoClient
