// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SPNegoResponse`, the service's response to a leg of a negotiation.

#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// The responses to all legs of a negotiation have this form.
struct SPNegoResponse {
  std::string contextId;         ///< the negotiation's identifier; empty until the service returns one
  std::vector<std::uint8_t> leg; ///< the service's GSS output token of this leg; empty when it sent none
  std::string tokenXml;          ///< the issued assertion; empty until the negotiation is complete
};

} // namespace SsoClient
