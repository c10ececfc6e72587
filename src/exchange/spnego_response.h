// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SPNegoResponse`, what the service's answers to the legs of one negotiation yield.

#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// One record goes through all legs of a negotiation.
struct SPNegoResponse {
  std::string contextId;         ///< the negotiation's identifier; empty until the service returns one
  std::vector<std::uint8_t> leg; ///< the service's GSS output token of this leg; empty when it sent none
  std::string tokenXml;          ///< the issued assertion; empty while the negotiation goes on
};

} // namespace SsoClient
