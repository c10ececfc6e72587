// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a `wst:RequestSecurityToken` asks for.

#pragma once

#include "token_facts.h"
#include "xml_tree.h"

#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace DevSts {

enum class RequestType { ISSUE, RENEW, VALIDATE };

struct TrustRequest {
  RequestType type = RequestType::ISSUE;
  std::string tokenType; ///< one of the names of a SAML 2.0 assertion; empty for a validate request
  bool wantsHolderOfKey = false;
  /// The identifier of a signature. The token must be bound to the key that made it.
  std::optional<std::string> useKey;
  /// A certificate, as Base64 of its DER form. The token must be bound to its key.
  std::optional<std::string> useKeyCertificate;
  std::chrono::milliseconds lifetime{0};
  bool renewable = false;
  bool delegable = false;
  std::optional<std::string> delegateTo;
  std::optional<std::string> onBehalfOf; ///< the party that the token must be about
  std::vector<std::string> audience;
  std::vector<AdviceEntry> advice;
  const xmlNode *target = nullptr;         ///< the assertion to renew or validate; null for an issue request
  const xmlNode *binaryExchange = nullptr; ///< a leg of a negotiation; null when there is none
};

/// The name of the request type. The SOAP action ends with it, too.
const char *RequestTypeName(RequestType type);

/// @throws Refusal (wst:InvalidRequest, wst:InvalidTimeRange)
TrustRequest ReadTrustRequest(const xmlNode &request);

} // namespace DevSts
