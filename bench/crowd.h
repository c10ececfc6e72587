// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Crowd`, many acquisitions at once through one `TokenClient`, and what the service answers.

#pragma once

#include "support/held_server.h"

#include <ssoclient/client/cancellation.h>
#include <ssoclient/client/token_client.h>
#include <tarvel/core/ref.h>
#include <tarvel/ssl/ssl_context.h>

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>

namespace Bench {

/// The service's answer, the token in it, and the certificates that may sign it.
const std::string &GetIssueResponse();
const std::string &GetIssuedTokenXml();
const Tarvel::Crypto::CertificateList &GetTrustedCertificates();
extern const std::string CROWD_USER;
extern const std::string CROWD_PASSWORD;
SsoClient::TokenSpec GetCrowdSpec();

/// A client of a server. It has its own TLS context.
std::shared_ptr<const SsoClient::TokenClient> ConnectTo(const Testing::HeldServer &server);

/// Starts acquisitions and counts their outcomes. Keeps little memory for each, so that the growth of the process is
/// the library's memory.
class Crowd {
public:
  explicit Crowd(std::shared_ptr<const SsoClient::TokenClient> client) : m_client(std::move(client)) {}
  Crowd(const Crowd &) = delete;
  Crowd &operator=(const Crowd &) = delete;

  void Start(std::size_t count, const SsoClient::CallOptions &options = {});

  /// Waits until all started acquisitions have ended, each with the right token.
  /// @throws std::runtime_error with the first other outcome, or after two minutes
  void WaitForTokens();

private:
  /// The callbacks share it: they may be called when a failure has destroyed the crowd.
  struct Outcomes {
    std::mutex mutex; // guards all that follows
    std::condition_variable changed;
    std::size_t pending = 0;
    std::string wrong; // the first outcome that is not the right token
  };

  static void Note(Outcomes &outcomes, const SsoClient::TokenOutcome &outcome);

  const std::shared_ptr<const SsoClient::TokenClient> m_client;
  const std::shared_ptr<Outcomes> m_outcomes = std::make_shared<Outcomes>();
};

/// Waits until the server has received `count` requests in total; checks this each millisecond.
/// @throws std::runtime_error after two minutes
void WaitForRequests(const Testing::HeldServer &server, int count);

} // namespace Bench
