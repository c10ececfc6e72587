// SPDX-License-Identifier: Apache-2.0
/// @file
/// `FaultListener`, which receives the SOAP fault of a response before the fault becomes an exception.

#pragma once

#include <tarvel/xml/node.h>

namespace SsoClient {

/// A listener belongs to one operation, and is called on the operation's thread.
class FaultListener {
public:
  /// The response is a fault. The function does not throw, because the fault's own exception is thrown next.
  virtual void OnFault(const Tarvel::Xml::ElementNode &fault) noexcept = 0;

protected:
  FaultListener() = default;
  FaultListener(const FaultListener &) = default;
  FaultListener &operator=(const FaultListener &) = default;
  ~FaultListener() = default;
};

} // namespace SsoClient
