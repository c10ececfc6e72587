// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one implementation of `ClientRequest`, and what it collects.

#pragma once

#include "http/header_syntax.h"

#include <tarvel/core/secret_text.h>
#include <tarvel/http/user_agent.h>

#include <string>
#include <string_view>

namespace Tarvel::Http {

/// The parts of a request that do not depend on the connection.
struct RequestData {
  std::string method;
  std::string target; ///< path and query
  HeaderFields headers;
  SecretText body;
};

/// The whole message as it is sent.
/// @param host for the Host header. @param cookies for the Cookie header; empty if there are none.
SecretText Serialise(const RequestData &request, std::string_view host, std::string_view cookies);

class ClientRequestImpl final : public ClientRequest {
public:
  ClientRequestImpl(std::string_view method, std::string_view path);

  void SetHeader(std::string_view name, std::string_view value) override;
  void WriteBody(std::string_view bytes) override;

  /// Moves the data out when the request starts.
  /// @throws InvalidStateException when the request has been started before.
  RequestData Take();

private:
  ~ClientRequestImpl() override = default;

  RequestData m_data;
  bool m_isTaken = false;
};

} // namespace Tarvel::Http
