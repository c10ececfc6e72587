// SPDX-License-Identifier: Apache-2.0
/// @file
/// The harmless request, its answer over HTTP, and what the answer says about the clocks.

#pragma once

#include "doctor_answer.h"
#include "doctor_check.h"
#include "doctor_network.h"

#include <tarvel/ssl/ssl_context.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <string>

namespace SsoClient::Tool {

/// A request and what became of it.
struct DoctorExchange {
  std::string failure;           ///< why there is no answer; empty when there is one
  bool hasOtherProtocol = false; ///< there is no answer because what arrived is not HTTP
  int status = 0;
  std::string reason;
  std::string contentType;
  std::string server;
  std::string location;
  std::string date;
  std::string statedLength; ///< the header Content-Length
  bool hasBody = false;     ///< whether the client reads a body with this status
  std::size_t octets = 0;   ///< of the body
  ServiceAnswer answer;     ///< what the body is
  std::int64_t durationMicroseconds = 0;
  Tarvel::System::DateTime receivedAt; ///< by this machine's clock
};

/// Sends the request, without any credential, and waits for the answer.
/// @param context null for plain http
DoctorExchange Exchange(const DoctorTarget &target, const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context,
                        const std::string &thumbprint, std::int64_t timeoutMicroseconds);

/// Status, headers, size, and what answers. @param exchange null when no request was sent; `reason` is then why
DoctorCheck CheckHttp(const DoctorExchange *exchange, const std::string &reason);

/// The difference between this machine's clock and the service's. @param exchange null when no request was sent
DoctorCheck CheckClock(const DoctorExchange *exchange);

} // namespace SsoClient::Tool
