// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RequestBuilder`, which composes the requests of the service's operations.
///
/// It is an interface so that tests can replace it. The product has one implementation.

#pragma once

#include "exchange/request.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// Composes one request for each operation. Each call fills both fields of `request`, or throws. Safe on any thread.
class RequestBuilder {
public:
  /// An issue request authenticated by user name and password.
  virtual void BuildUserPassTokenRequest(const std::string &username, const std::string &password,
                                         const TokenSpec &spec, Request &request) const = 0;

  /// An issue request with the first leg of an SPNEGO negotiation.
  virtual void BuildInitialSPNegoRequest(const TokenSpec &spec, const std::vector<std::uint8_t> &leg,
                                         Request &request) const = 0;

  /// A further leg of the negotiation with the identifier `contextId`.
  virtual void BuildContinuedSPNegoRequest(const std::string &contextId, const std::vector<std::uint8_t> &leg,
                                           Request &request) const = 0;

  /// An issue request authenticated only by the holder-of-key certificate.
  virtual void BuildCertificateTokenRequest(const TokenSpec &spec, Request &request) const = 0;

  /// An issue request authenticated by an existing token.
  virtual void BuildExchangeTokenRequest(const SamlToken &token, const TokenSpec &spec, Request &request) const = 0;

  /// A request to validate a token.
  virtual void BuildValidateSubjectRequest(const SamlToken &token, Request &request) const = 0;

  /// A request to renew a token for `lifetimeSec` seconds from now.
  virtual void BuildRenewRequest(const SamlToken &token, std::int64_t lifetimeSec, Request &request) const = 0;

protected:
  RequestBuilder() = default;
  RequestBuilder(const RequestBuilder &) = default;
  RequestBuilder &operator=(const RequestBuilder &) = default;
  ~RequestBuilder() = default;
};

} // namespace SsoClient
