// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SPNegoResponse`, the service's response to a leg of a negotiation.

#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// All legs of a negotiation use the same record.
struct SPNegoResponse {
  std::string contextId;         ///< the negotiation's identifier; empty until the service returns one
  std::vector<std::uint8_t> leg; ///< the service's GSS output token of this leg; empty when it sent none
  std::string tokenXml;          ///< the issued assertion; empty until the negotiation is complete
};

} // namespace SsoClient
