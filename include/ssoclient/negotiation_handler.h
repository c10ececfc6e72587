// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NegotiationHandler`, the caller's part in a GSS (SPNEGO) negotiation.

#pragma once

#include <ssoclient/export.h>

#include <cstdint>
#include <memory>
#include <vector>

namespace SsoClient {

/// Implemented by the caller. Each negotiation needs its own object. Make its shared pointer from the concrete type
/// (`std::make_shared<MyHandler>()`), because a pointer to this interface cannot be deleted.
class SSOCLIENT_API NegotiationHandler {
public:
  /// Makes the client's next leg. Called on the thread that runs the operation, one call at a time. An exception ends the
  /// operation and reaches its caller unchanged.
  /// @param serviceLeg the leg that the service returned last; empty in the first call. After the service has issued the
  ///        token, there is one more call with the service's final leg, if that leg is not empty.
  /// @return the client's next leg, not null. What is returned for the final leg is not sent.
  virtual std::shared_ptr<std::vector<std::uint8_t>> NegotiateLeg(const std::vector<std::uint8_t> &serviceLeg) = 0;

protected:
  NegotiationHandler() = default;
  NegotiationHandler(const NegotiationHandler &) = default;
  NegotiationHandler &operator=(const NegotiationHandler &) = default;
  ~NegotiationHandler() = default;
};

} // namespace SsoClient
