// SPDX-License-Identifier: Apache-2.0

#include "negotiations.h"

#include "refusal.h"

#include <iterator>
#include <utility>

namespace DevSts {

Negotiations::Negotiations(std::unique_ptr<const GssAcceptor> acceptor, Clock clock)
    : m_acceptor(std::move(acceptor)), m_clock(std::move(clock)) {}

NegotiationStep Negotiations::Begin(const std::string &context, const std::vector<unsigned char> &leg,
                                    NegotiatedRequest request) {
  Negotiation negotiation{m_acceptor->Begin(), std::move(request), m_clock() + LONGEST};
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    ForgetOld();
    if (m_negotiations.size() >= MOST_AT_ONCE) {
      throw Refusal(Code::REQUEST_FAILED, "too many unfinished negotiations");
    }
    if (!m_negotiations.try_emplace(context, Negotiation{nullptr, {}, negotiation.end}).second) {
      throw Refusal(Code::INVALID_REQUEST, "a negotiation with that context has already begun");
    }
  }
  return Accept(context, leg, std::move(negotiation));
}

NegotiationStep Negotiations::Continue(const std::string &context, const std::vector<unsigned char> &leg) {
  Negotiation negotiation;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    ForgetOld();
    const auto found = m_negotiations.find(context);
    if (found == m_negotiations.end()) {
      throw Refusal(Code::INVALID_REQUEST, "no negotiation with that context is waiting for a leg");
    }
    if (!found->second.acceptance) {
      throw Refusal(Code::INVALID_REQUEST, "a leg of that negotiation is being accepted");
    }
    negotiation = std::move(found->second); // the entry stays, with a null acceptance
  }
  return Accept(context, leg, std::move(negotiation));
}

NegotiationStep Negotiations::Accept(const std::string &context, const std::vector<unsigned char> &leg,
                                     Negotiation negotiation) {
  NegotiationStep step;
  try {
    step.leg = negotiation.acceptance->Accept(leg);
  } catch (...) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_negotiations.erase(context);
    throw;
  }
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (step.leg.client) {
    m_negotiations.erase(context);
    step.request = std::move(negotiation.request);
  } else {
    m_negotiations[context] = std::move(negotiation);
  }
  return step;
}

void Negotiations::ForgetOld() {
  const auto now = m_clock();
  for (auto next = m_negotiations.begin(); next != m_negotiations.end();) {
    next = next->second.end < now ? m_negotiations.erase(next) : std::next(next);
  }
}

} // namespace DevSts
