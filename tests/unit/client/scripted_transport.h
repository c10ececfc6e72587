// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ScriptedTransport`, a transport without a network: a test decides when and how each request is answered.

#pragma once

#include "support/rendezvous.h"
#include "transport/transport.h"

#include <boost/optional.hpp>

#include <chrono>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace Testing {

/// The answer to a request. With a failure there is no response.
struct Reply {
  std::string body;
  std::string failure{}; ///< the text of a `CommunicationException`; empty if there is none
  SsoClient::ResponseFacts facts{200, "OK", "text/xml", 0, "", true};
};

/// A response with this body.
Reply Success(const std::string &body);
/// A failure to connect.
Reply NoConnection();
/// The status 503 with this value of Retry-After.
Reply Unavailable(const std::string &retryAfter);

/// Safe on any thread. Completions run on the platform's I/O threads.
class ScriptedTransport final : public SsoClient::Transport {
public:
  /// Returns the answer to a request. With `boost::none`, the request waits until the test answers or the client cancels.
  /// May throw.
  using Script = std::function<boost::optional<Reply>(const SsoClient::Request &request, int number)>;

  /// @param afterSending called on the thread that sends, before it returns to the client
  explicit ScriptedTransport(
      Script script, std::function<void()> afterSending = [] {});
  ScriptedTransport(const ScriptedTransport &) = delete;
  ScriptedTransport &operator=(const ScriptedTransport &) = delete;
  ~ScriptedTransport();

  std::shared_ptr<SsoClient::TransportSession> CreateSession() const override;

  /// Answers all requests that wait.
  void AnswerHeld(const Reply &reply) const;

  /// The bodies of the requests, each after the number of its session: "1: UserPass …".
  std::vector<std::string> Sent() const;
  /// Waits until that many requests have been sent.
  bool WaitForSent(int count) const;
  /// How many requests were cancelled, and how many ended at their time limit.
  int CountCancelled() const;
  int CountTimedOut() const;
  /// How many sessions have not been released.
  int CountOpenSessions() const;

private:
  struct State;
  class Session;
  class Pending;

  const std::shared_ptr<State> m_state;
};

} // namespace Testing
