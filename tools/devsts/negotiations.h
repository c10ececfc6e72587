// SPDX-License-Identifier: Apache-2.0
/// @file
/// The negotiations that have begun and have not ended.

#pragma once

#include "gss_acceptor.h"
#include "token_facts.h"

#include <chrono>
#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace DevSts {

/// What the message of the first leg has asked for. The subject is known only at the end.
struct NegotiatedRequest {
  TokenFacts facts;
  std::chrono::milliseconds lifetime{0};
  std::string tokenType;
  std::optional<std::string> onBehalfOf;
};

struct NegotiationStep {
  AcceptedLeg leg;
  NegotiatedRequest request; ///< set only when the negotiation is complete
};

/// A negotiation is found by its context identifier, and removed when it is complete, refused, or a minute old. Any
/// number of threads may use this at once; when two continue one negotiation at once, one is refused.
class Negotiations {
public:
  using Clock = std::function<std::chrono::steady_clock::time_point()>;

  static constexpr std::size_t MOST_AT_ONCE = 100;
  static constexpr std::chrono::seconds LONGEST{60};

  explicit Negotiations(std::unique_ptr<const GssAcceptor> acceptor, Clock clock = std::chrono::steady_clock::now);

  /// @param context chosen by the client; no other negotiation may have the same
  /// @throws Refusal (wst:InvalidRequest, wst:RequestFailed, wst:FailedAuthentication)
  NegotiationStep Begin(const std::string &context, const std::vector<unsigned char> &leg, NegotiatedRequest request);

  /// @throws Refusal (wst:InvalidRequest, wst:FailedAuthentication)
  NegotiationStep Continue(const std::string &context, const std::vector<unsigned char> &leg);

private:
  struct Negotiation {
    std::unique_ptr<Acceptance> acceptance; ///< null while a leg is being accepted
    NegotiatedRequest request;
    std::chrono::steady_clock::time_point end;
  };

  NegotiationStep Accept(const std::string &context, const std::vector<unsigned char> &leg, Negotiation negotiation);
  void ForgetOld();

  const std::unique_ptr<const GssAcceptor> m_acceptor;
  const Clock m_clock;
  std::mutex m_mutex;
  std::map<std::string, Negotiation> m_negotiations;
};

} // namespace DevSts
