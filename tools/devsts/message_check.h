// SPDX-License-Identifier: Apache-2.0
/// @file
/// The checks of every message before its request is read: form, timestamp, signature.

#pragma once

#include "certificate.h"
#include "refusal.h"
#include "signature_engine.h"
#include "token_facts.h"
#include "xml_tree.h"

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

namespace DevSts {

struct PasswordCredentials {
  std::string name;
  std::string password;
};

/// A message that has been checked. Nodes belong to `document`.
struct CheckedMessage {
  Document document;
  Identifiers identifiers;
  xmlNode *request = nullptr;                     ///< the one element in the body
  std::optional<PasswordCredentials> credentials; ///< not yet compared with anything
  std::optional<TokenFacts> presentedToken;       ///< from the header: issued by this service, and valid now
  /// Null when the message is not signed. Otherwise the key of this certificate has signed the body and the timestamp.
  Certificate signer;
  std::string signatureId; ///< the signature's own identifier; empty when it has none
};

/// How far clocks may differ, and which key signs tokens.
struct MessagePolicy {
  std::chrono::seconds tolerance{60};
  const SignatureKey *tokenSigner = nullptr;
};

/// @throws Refusal
CheckedMessage CheckMessage(std::string_view xml, const MessagePolicy &policy);

/// @throws Refusal (`code`) unless the token is valid now
void RequireCurrent(const TokenFacts &token, std::chrono::seconds tolerance, const FaultCode &code);

} // namespace DevSts
