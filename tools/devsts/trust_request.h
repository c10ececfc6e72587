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
  bool wantsHolderOfKey = false;
  std::optional<std::string> useKey; ///< the identifier of the signature to whose key the token must be bound
  std::chrono::milliseconds lifetime{0};
  bool renewable = false;
  bool delegable = false;
  std::optional<std::string> delegateTo;
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
