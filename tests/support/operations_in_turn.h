// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OperationsInTurn`, which uses one service from many threads.

#pragma once

#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service.h>

#include <atomic>
#include <exception>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace Testing {

/// Runs the five operations that exchange one message, one after the other, and checks their results.
class OperationsInTurn {
public:
  /// All references must outlive this object.
  /// @param subject the principal of the token that each operation must return; null when there is no token
  /// @param held a token to exchange, validate and renew
  OperationsInTurn(const SsoClient::SecurityTokenService &service, const char *subject,
                   const SsoClient::SamlToken &held)
      : m_service(service), m_subject(subject), m_held(held) {
    m_spec.tokenLifetimeSec = 60;
  }

  /// Runs that many operations in total, on 16 threads that begin together.
  void RunOnSixteenThreads(int count) {
    constexpr int THREADS = 16;
    std::atomic<int> ready{0};
    std::vector<std::thread> threads;
    for (int thread = 0; thread < THREADS; ++thread) {
      threads.emplace_back([&, thread] {
        for (++ready; ready < THREADS;) {
          std::this_thread::yield();
        }
        for (int i = thread; i < count; i += THREADS) {
          RunAndJudge(i);
        }
      });
    }
    for (std::thread &thread : threads) {
      thread.join();
    }
  }

  int CountSuccesses() const { return m_successes; }

  /// What was wrong with the first operation that failed; empty when all were right.
  std::string GetFailure() const {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_failure;
  }

private:
  void RunAndJudge(int i) {
    std::string failure = "operation " + std::to_string(i) + " yielded something else";
    try {
      if (Run(i)) {
        ++m_successes;
        return;
      }
    } catch (const std::exception &exception) {
      failure = exception.what();
    }
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_failure = m_failure.empty() ? failure : m_failure;
  }

  bool Run(int i) const {
    switch (i % 5) {
    case 0:
      return IsRight(m_service.AcquireToken("alice@corp.example", "pass", m_spec));
    case 1:
      return IsRight(m_service.AcquireTokenByCertificate(m_spec));
    case 2:
      return IsRight(m_service.AcquireTokenByToken(m_held, m_spec));
    case 3:
      return m_service.ValidateSubject(m_held);
    default:
      return IsRight(m_service.RenewToken(m_held, 60));
    }
  }

  bool IsRight(const std::shared_ptr<const SsoClient::SamlToken> &token) const {
    return m_subject ? token && token->GetSubject().name == m_subject : !token;
  }

  const SsoClient::SecurityTokenService &m_service;
  const char *const m_subject;
  const SsoClient::SamlToken &m_held;
  SsoClient::TokenSpec m_spec;
  std::atomic<int> m_successes{0};
  mutable std::mutex m_mutex;
  std::string m_failure;
};

} // namespace Testing
