// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ExplainMessage`, which makes the report on a message.

#pragma once

#include <ssoclient/proof/message_report.h>
#include <ssoclient/proof/message_verifier.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/certificate.h>

#include <string>

namespace SsoClient {

/// Runs the rules of a verification of `message` and reports each of them.
/// @param peerCertificate may be null
MessageReport ExplainMessage(const std::string &message, const TokenVerifier &tokens,
                             const MessageVerifierOptions &options, const Tarvel::Crypto::Certificate *peerCertificate);

} // namespace SsoClient
