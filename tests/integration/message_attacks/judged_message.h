// SPDX-License-Identifier: Apache-2.0
/// @file
/// Verifiers of messages, and the comparison of their verifications with their reports.

#pragma once

#include <ssoclient/proof/message_verifier.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>

#include <boost/optional.hpp>

#include <string>

namespace Messages {

/// A verifier, and the certificate with which the sender authenticated in TLS; null if it did not.
struct Receiver {
  SsoClient::MessageVerifier verifier;
  Tarvel::Ref<const Tarvel::Crypto::Certificate> peerCertificate;
};

/// The receiver of a row of expected.tsv. The options are separated by blanks.
Receiver MakeReceiver(const std::string &options);

/// What a receiver decided about a message.
struct Decision {
  boost::optional<SsoClient::VerifiedMessage> message; ///< empty if the message was refused
  std::string exceptionClass;                          ///< unqualified; empty if it was accepted
  std::string refusal;                                 ///< the exception's text
  SsoClient::MessageReport report;
  std::string contradictions; ///< what the report states differently, one on each line
};

/// Verifies a message. The report stays empty.
Decision Verify(const Receiver &receiver, const std::string &message);

/// Verifies and explains a message. The clock must not move during the call.
Decision Judge(const Receiver &receiver, const std::string &message);

} // namespace Messages
