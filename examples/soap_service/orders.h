// SPDX-License-Identifier: Apache-2.0
/// @file
/// A web service that accepts orders from callers that prove who they are.

#pragma once

#include "http_server.h"

#include <ssoclient/proof/message_verifier.h>

#include <cstddef>
#include <string>

namespace Example {

class Orders {
public:
  /// @param trusted the certificates that the token service signs with
  /// @param audience the address of this service in tokens
  /// @param remembered how many messages can be remembered at once
  Orders(const Tarvel::Crypto::CertificateList &trusted, const std::string &audience, std::size_t remembered);

  /// Answers one message with a message. Any number of threads may call it at once.
  Reply Answer(const std::string &message) const;

private:
  Reply Place(const SsoClient::VerifiedMessage &message) const;

  const SsoClient::MessageVerifier m_verifier;
};

} // namespace Example
