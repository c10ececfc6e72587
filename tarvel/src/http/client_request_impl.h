// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one implementation of `ClientRequest`, and what it collects.

#pragma once

#include "http/header_syntax.h"

#include <tarvel/http/user_agent.h>

#include <string>
#include <string_view>

namespace Tarvel::Http {

/// A request without what depends on the connection. Its body is secret.
struct RequestData {
  RequestData() = default;
  RequestData(const RequestData &) = delete;
  RequestData &operator=(const RequestData &) = delete;
  RequestData(RequestData &&) noexcept = default;
  RequestData &operator=(RequestData &&) = delete;
  ~RequestData();

  std::string method;
  std::string target; ///< path and query
  HeaderFields headers;
  std::string body;
};

/// The whole message as it is sent. It is secret as the body is: the caller wipes it.
/// @param host as in the Host header. @param cookies the Cookie header, empty for none.
std::string Serialise(const RequestData &request, std::string_view host, std::string_view cookies);

class ClientRequestImpl final : public ClientRequest {
public:
  ClientRequestImpl(std::string_view method, std::string_view path);

  void SetHeader(std::string_view name, std::string_view value) override;
  void WriteBody(std::string_view bytes) override;

  /// Gives everything away, for the one start.
  /// @throws InvalidStateException when that was done before.
  RequestData Take();

private:
  ~ClientRequestImpl() override = default;

  RequestData m_data;
  bool m_isTaken = false;
};

} // namespace Tarvel::Http
