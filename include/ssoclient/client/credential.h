// SPDX-License-Identifier: Apache-2.0
/// @file
/// Credentials as values: password, certificate, token, negotiation.

#pragma once

#include <ssoclient/negotiation_handler.h>
#include <ssoclient/saml_token.h>
#include <tarvel/core/secret_text.h>

#include <functional>
#include <memory>
#include <string>
#include <variant>

namespace SsoClient {

/// A user's name and password.
struct PasswordCredential {
  std::string username;        ///< in the form that the service expects, for example "alice@corp.example"
  Tarvel::SecretText password; ///< overwritten when the last copy is destroyed
};

/// The holder-of-key identity of the client's configuration.
struct CertificateCredential {};

/// A token, which is exchanged for another one. The request is signed with the client's holder-of-key identity.
struct TokenCredential {
  std::shared_ptr<const SamlToken> token; ///< not null
};

/// A GSS (SPNEGO) negotiation.
struct NegotiationCredential {
  /// Makes the handler of one negotiation; called once for each attempt. This function and all functions of the handler
  /// are called on threads of the platform's pool, where they may block. What they throw ends the operation. The operation
  /// releases the handler before it delivers its result. If it is cancelled or its deadline passes while one of its steps
  /// runs, such as a function of the handler, it releases the handler when that step ends, on the thread of the step.
  std::function<std::shared_ptr<NegotiationHandler>()> makeHandler;
};

/// Any of these credentials.
using Credential = std::variant<PasswordCredential, CertificateCredential, TokenCredential, NegotiationCredential>;

} // namespace SsoClient
