// SPDX-License-Identifier: Apache-2.0
/// @file
/// How an HTTP answer is sent: in which pieces, when, and what happens to the connection afterwards.

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

/// How to send the answer with the fault. A connection that the client does not keep open is closed afterwards.
Delivery Deliver(const HttpAnswer &answer, const Fault &fault, bool keepOpen);

/// Whether the fault sends nothing of the answer. The request need not be processed then.
bool IgnoresRequest(DeliveryFault fault);

} // namespace DevSts
