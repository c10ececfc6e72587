// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ResponseHandler`, which reads the responses to the service's operations.
///
/// It is an interface so that tests can replace it. The product has one implementation.

#pragma once

#include "exchange/fault_listener.h"
#include "exchange/spnego_response.h"

#include <tarvel/io/reader.h>

#include <memory>
#include <string>

namespace SsoClient {

/// Reads the response of each operation. Each call reads the whole body from the reader, which the caller owns. Any
/// number of threads may use one handler. All functions throw on a SOAP fault and on a malformed response.
class ResponseHandler {
public:
  /// Sets `tokenXml` to the token of an issue response.
  virtual void HandleAcquireTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const = 0;

  /// @return whether the service says that the token is valid.
  virtual bool HandleValidateSubjectResponse(Tarvel::Reader *response) const = 0;

  /// Sets `tokenXml` to the token of a renew response.
  virtual void HandleRenewTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const = 0;

  /// Sets all fields of `spnego` to the service's response to one leg of a negotiation.
  virtual void HandleSPNegoResponse(Tarvel::Reader *response, SPNegoResponse &spnego) const = 0;

  /// A handler that does the same, and also passes each fault to `listener`, which must outlive the returned handler.
  /// Null if this class has no such handler.
  virtual std::shared_ptr<const ResponseHandler> WithFaultListener(FaultListener &listener) const {
    static_cast<void>(listener);
    return nullptr;
  }

protected:
  ResponseHandler() = default;
  ResponseHandler(const ResponseHandler &) = default;
  ResponseHandler &operator=(const ResponseHandler &) = default;
  ~ResponseHandler() = default;
};

} // namespace SsoClient
