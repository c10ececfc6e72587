// SPDX-License-Identifier: Apache-2.0
/// @file
/// How an HTTP answer goes onto the wire: in which pieces, when, and what becomes of the connection.

#pragma once

#include "faults.h"

#include <chrono>
#include <string>
#include <vector>

namespace DevSts {

struct DeliveryStep {
  std::chrono::milliseconds delay{0}; ///< before the bytes
  std::string bytes;
};

enum class DeliveryEnd { KEEP_OPEN, CLOSE, RESET, STALL };

struct Delivery {
  std::vector<DeliveryStep> steps;
  DeliveryEnd end = DeliveryEnd::KEEP_OPEN;
};

struct HttpAnswer {
  int status = 200;
  std::string contentType = "text/xml; charset=utf-8";
  std::string body;
};

/// The answer, sent as the fault wants it. A connection that the client does not keep open is closed behind it.
Delivery Deliver(const HttpAnswer &answer, const Fault &fault, bool keepOpen);

/// Whether the fault needs no answer, so that the request need not be looked at.
bool IgnoresRequest(DeliveryFault fault);

} // namespace DevSts
