// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OperationOutcome`, the results with which asynchronous operations called their completions.

#pragma once

#include "support/process_resources.h"
#include "support/rendezvous.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>

#include <boost/optional.hpp>

#include <gtest/gtest.h>

#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <typeinfo>
#include <vector>

namespace Testing {

/// Makes completions, which may outlive it. All of them record their results here.
class OperationOutcome {
public:
  SsoClient::SecurityTokenService::TokenCompletion ForToken() const {
    return [state = m_state](const Token &token, const Tarvel::Exception *failure) {
      state->Note(token ? token->GetSubject().ToString() : "null", token, failure);
    };
  }
  SsoClient::SecurityTokenService::ValidityCompletion ForValidity() const {
    return [state = m_state](const boost::optional<bool> &valid, const Tarvel::Exception *failure) {
      state->Note(!valid ? "empty" : *valid ? "true" : "false", nullptr, failure);
    };
  }

  /// Waits for `count` calls of completions and returns their results, in order: "RESULT" for a success, "RESULT and
  /// CLASS: MESSAGE" for a failure.
  std::vector<std::string> Wait(int count = 1) const {
    EXPECT_TRUE(m_state->called.WaitFor(count));
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->results;
  }

  /// The token that arrived last.
  std::shared_ptr<const SsoClient::SamlToken> GetToken() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->token;
  }

  /// The threads on which the completions ran.
  std::set<std::thread::id> Threads() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->threads;
  }

  /// Waits until all completions are destroyed, which ends the operations' work; false when that takes too long.
  bool IsOver() const {
    return Eventually([this] { return m_state.use_count() == 1; });
  }

private:
  using Token = std::shared_ptr<const SsoClient::SamlToken>;

  struct State {
    void Note(const std::string &result, const Token &issued, const Tarvel::Exception *failure) {
      {
        const std::lock_guard<std::mutex> lock(mutex);
        results.push_back(result + (failure ? " and " + Describe(*failure) : ""));
        token = issued;
        threads.insert(std::this_thread::get_id());
      }
      called.Add();
    }

    static std::string Describe(const Tarvel::Exception &failure) {
      const bool isCredentials = typeid(failure) == typeid(SsoClient::InvalidCredentialsException);
      const bool isArgument = typeid(failure) == typeid(Tarvel::InvalidArgumentException);
      return std::string(isCredentials ? "credentials"
                         : isArgument  ? "argument"
                                       : typeid(failure).name()) +
             ": " + failure.what();
    }

    std::mutex mutex;
    std::vector<std::string> results;
    Token token;
    std::set<std::thread::id> threads;
    EventCount called;
  };

  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

} // namespace Testing
