// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ResponseHandlerImpl`, which reads the response of each operation.

#pragma once

#include "exchange/response_handler.h"

#include <ssoclient/service_dialect.h>

namespace SsoClient {

/// Parses the body, turns a SOAP fault into an exception, and extracts the result of the operation. It has no state
/// except the dialect and the listener, so any number of threads may use one handler without a listener. A call that
/// throws does not change its out argument.
///
/// All functions throw
/// - `InvalidCredentialsException` when the service refused the caller's credentials,
/// - `SsoException` for every other fault, for text that is not well-formed XML, and for a response of another form,
/// - `ParseException` for a fault code whose prefix is not bound,
/// - `Tarvel::Xml::Security::XmlSecurityException` for an assertion that has no canonical form.
class ResponseHandlerImpl final : public ResponseHandler {
public:
  /// @param listener receives each fault; null for none. It must outlive the handler.
  explicit ResponseHandlerImpl(FaultListener *listener = nullptr) noexcept : m_listener(listener) {}

  /// @param dialect how the service answers; copied
  explicit ResponseHandlerImpl(const ServiceDialect &dialect, FaultListener *listener = nullptr)
      : m_dialect(dialect), m_listener(listener) {}

  void HandleAcquireTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const override;
  bool HandleValidateSubjectResponse(Tarvel::Reader *response) const override;
  void HandleRenewTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const override;
  void HandleSPNegoResponse(Tarvel::Reader *response, SPNegoResponse &spnego) const override;
  std::shared_ptr<const ResponseHandler> WithFaultListener(FaultListener &listener) const override;

private:
  template <typename Extractor>
  auto ProcessResponseWith(Tarvel::Reader &response, const Extractor &extractor) const;

  ServiceDialect m_dialect;
  FaultListener *m_listener;
};

} // namespace SsoClient
