// SPDX-License-Identifier: Apache-2.0

#include "delivery.h"

#include "time_text.h"

#include <algorithm>

namespace DevSts {

namespace {

// One byte more than 16 MiB, the most that a client can be expected to accept.
constexpr std::size_t OVERSIZE_BYTES = 16U * 1024 * 1024 + 1;
constexpr std::size_t DRIP_PIECES = 40;

const char *ReasonPhrase(int status) {
  switch (status) {
  case 200:
    return "OK";
  case 400:
    return "Bad Request";
  case 404:
    return "Not Found";
  case 405:
    return "Method Not Allowed";
  case 413:
    return "Payload Too Large";
  case 415:
    return "Unsupported Media Type";
  case 431:
    return "Request Header Fields Too Large";
  case 500:
    return "Internal Server Error";
  case 503:
    return "Service Unavailable";
  default:
    return "Status";
  }
}

std::string Head(const HttpAnswer &answer, const std::string &contentLength, bool keepOpen) {
  return "HTTP/1.1 " + std::to_string(answer.status) + " " + ReasonPhrase(answer.status) +
         "\r\nDate: " + HttpTimeText(Now()) + "\r\nContent-Type: " + answer.contentType +
         "\r\nContent-Length: " + contentLength + "\r\nConnection: " + (keepOpen ? "keep-alive" : "close") + "\r\n\r\n";
}

Delivery Single(std::string bytes, DeliveryEnd end) {
  Delivery delivery;
  delivery.steps.push_back({std::chrono::milliseconds(0), std::move(bytes)});
  delivery.end = end;
  return delivery;
}

Delivery Drip(const std::string &bytes, int seconds, DeliveryEnd end) {
  Delivery delivery;
  const std::size_t size = std::max<std::size_t>(1, (bytes.size() + DRIP_PIECES - 1) / DRIP_PIECES);
  const std::chrono::milliseconds delay(seconds * 1000 / static_cast<int>(DRIP_PIECES));
  for (std::size_t at = 0; at < bytes.size(); at += size) {
    delivery.steps.push_back({delay, bytes.substr(at, size)});
  }
  delivery.end = end;
  return delivery;
}

std::string Oversized(HttpAnswer answer) {
  answer.body.resize(OVERSIZE_BYTES, ' ');
  return Head(answer, std::to_string(answer.body.size()), false) + answer.body;
}

std::string BadStatus(int status) {
  const HttpAnswer answer{status, "text/plain", "This status was asked for.\n"};
  return Head(answer, std::to_string(answer.body.size()), false) + answer.body;
}

} // namespace

bool IgnoresRequest(DeliveryFault fault) {
  return fault == DeliveryFault::STALL || fault == DeliveryFault::RESET || fault == DeliveryFault::OVERSIZE ||
         fault == DeliveryFault::BAD_STATUS || fault == DeliveryFault::GARBAGE;
}

Delivery Deliver(const HttpAnswer &answer, const Fault &fault, bool keepOpen) {
  const std::string head = Head(answer, std::to_string(answer.body.size()), keepOpen);
  const std::string whole = head + answer.body;
  const DeliveryEnd end = keepOpen ? DeliveryEnd::KEEP_OPEN : DeliveryEnd::CLOSE;
  switch (fault.delivery) {
  case DeliveryFault::STALL:
    return {{}, DeliveryEnd::STALL};
  case DeliveryFault::DELAY:
    return {{{std::chrono::seconds(fault.number), whole}}, end};
  case DeliveryFault::DRIP:
    return Drip(whole, fault.number, end);
  case DeliveryFault::RESET:
    return {{}, DeliveryEnd::RESET};
  case DeliveryFault::RESET_IN_HEADER:
    return Single(head.substr(0, head.size() / 2), DeliveryEnd::RESET);
  case DeliveryFault::RESET_IN_BODY:
    return Single(head + answer.body.substr(0, answer.body.size() / 2), DeliveryEnd::RESET);
  case DeliveryFault::TRUNCATE:
    return Single(head + answer.body.substr(0, answer.body.size() / 2), DeliveryEnd::CLOSE);
  case DeliveryFault::OVERSIZE:
    return Single(Oversized(answer), DeliveryEnd::CLOSE);
  case DeliveryFault::BAD_STATUS:
    return Single(BadStatus(fault.number), DeliveryEnd::CLOSE);
  case DeliveryFault::BAD_CONTENT_LENGTH:
    return Single(Head(answer, "many", false) + answer.body, DeliveryEnd::CLOSE);
  case DeliveryFault::GARBAGE:
    return Single("\x01\x02 this is not HTTP\r\n\r\n", DeliveryEnd::CLOSE);
  case DeliveryFault::NONE:
    break;
  }
  return Single(whole, end);
}

} // namespace DevSts
