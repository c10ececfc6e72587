// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ServiceOptions`, what a client needs in addition to its configuration.

#pragma once

#include <ssoclient/operation_observer.h>
#include <ssoclient/service_dialect.h>
#include <ssoclient/verify_options.h>

#include <functional>
#include <memory>
#include <string>

namespace SsoClient {

/// Options of a service. Without options a service works as if all of them had their defaults.
struct ServiceOptions {
  /// Receives the text of a token that the service issued and this client refused, before the operation throws. It is
  /// called on the thread that runs the operation. **The text may be a usable bearer token for another program, so it
  /// is secret.** What the function throws is written to the log and changes nothing else.
  using RefusedTokenSink = std::function<void(const std::string &tokenXml)>;

  /// How the tokens that the service returns are verified.
  VerifyOptions verifyOptions;

  /// Follows the operations; null for none. Shared until the service and its operations are released.
  std::shared_ptr<OperationObserver> observer;

  /// Called for each refused token; empty for none.
  RefusedTokenSink refusedTokenSink;

  /// What the service expects in requests, and how its responses are read.
  ServiceDialect dialect;
};

} // namespace SsoClient
