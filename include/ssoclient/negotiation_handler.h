// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NegotiationHandler`, the caller's part in a GSS (SPNEGO) negotiation.

#pragma once

#include <ssoclient/export.h>

#include <cstdint>
#include <memory>
#include <vector>

namespace SsoClient {

/// Implemented by the caller, once for each negotiation. Held by a shared pointer that is made from the concrete type:
/// the interface itself cannot be deleted through.
class SSOCLIENT_API NegotiationHandler {
public:
  /// Makes the client's next leg. Called on the thread that runs the operation, one call at a time.
  /// @param serviceLeg what the service returned in the leg before; empty in the first call. Once the service has issued
  ///        the token, there is one more call with the service's final leg when that leg is not empty.
  /// @return the client's next leg, never null; the answer to the final leg is not sent. What it throws passes through to
  ///         whoever started the operation.
  virtual std::shared_ptr<std::vector<std::uint8_t>> NegotiateLeg(const std::vector<std::uint8_t> &serviceLeg) = 0;

protected:
  NegotiationHandler() = default;
  NegotiationHandler(const NegotiationHandler &) = default;
  NegotiationHandler &operator=(const NegotiationHandler &) = default;
  ~NegotiationHandler() = default;
};

} // namespace SsoClient
