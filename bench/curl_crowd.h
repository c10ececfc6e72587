// SPDX-License-Identifier: Apache-2.0
/// @file
/// Many requests at once through libcurl's multi interface. The benchmarks compare many acquisitions with them.

#pragma once

#include "curl_client.h"

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace Bench {

/// Many requests at once on the calling thread, each over a new connection, with the settings of `CurlClient`. It uses
/// the multi interface like an experienced developer: `curl_multi_socket_action` with epoll, prepared handles, and one
/// cache of names and authorities for all.
class CurlCrowd {
public:
  /// Called with the body of each response, when it is complete.
  using OnResponse = std::function<void(const std::string &body)>;

  CurlCrowd(const std::string &url, const std::string &authorityFile, const std::string &soapAction,
            const std::string &body, std::size_t requests);
  CurlCrowd(const CurlCrowd &) = delete;
  CurlCrowd &operator=(const CurlCrowd &) = delete;
  ~CurlCrowd();

  /// Posts all requests at once, and waits for the responses. @throws std::runtime_error if one of them fails.
  void PostAll(const OnResponse &onResponse);

private:
  using Clock = std::chrono::steady_clock;

  static int OnSocket(CURL *handle, curl_socket_t descriptor, int action, void *crowd, void *known);
  static int OnTimer(CURLM *multi, long milliseconds, void *crowd);

  void Post(std::size_t count, const OnResponse &onResponse);
  void Wait();
  void Finish(const OnResponse &onResponse);

  std::vector<std::unique_ptr<CurlClient>> m_clients;
  CURLM *m_multi;
  int m_poll;
  bool m_hasTimer = false;
  Clock::time_point m_timer;
  std::size_t m_pending = 0;
};

} // namespace Bench
