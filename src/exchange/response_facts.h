// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ResponseFacts`, what the transport reports about a response in addition to its body.

#pragma once

#include <cstddef>
#include <string>

namespace SsoClient {

/// The defaults mean that there was no response. Texts are as the service wrote them.
struct ResponseFacts {
  int status = 0; ///< the HTTP status
  std::string reason;
  std::string contentType;
  std::size_t octets = 0;    ///< of the body as it was received
  std::string retryAfter{};  ///< the value of the header `Retry-After`; empty if there is none
  bool hasConnected = false; ///< whether a connection was made, so that the service may have received the request
};

} // namespace SsoClient
