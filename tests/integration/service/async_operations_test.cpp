// SPDX-License-Identifier: Apache-2.0
// The asynchronous form of each operation against the development service, with everything released after the call.
#include "integration/service/service_client.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"

#include <ssoclient/exceptions.h>

#include <boost/optional.hpp>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <mutex>
#include <ostream>
#include <string>
#include <thread>
#include <typeinfo>

namespace SsoClient {
namespace {

using namespace Testing;
using TokenPtr = std::shared_ptr<const SamlToken>;

/// What a completion was told. The completions may outlive it.
class Outcome {
public:
  SecurityTokenService::TokenCompletion ForToken() const {
    return [state = m_state](const TokenPtr &token, const Tarvel::Exception *failure) {
      state->Note(token, token ? "a token" : "no token", failure);
    };
  }
  SecurityTokenService::ValidityCompletion ForValidity() const {
    return [state = m_state](const boost::optional<bool> &valid, const Tarvel::Exception *failure) {
      state->Note(nullptr, !valid ? "no verdict" : *valid ? "valid" : "not valid", failure);
    };
  }

  /// Each result, with class and message of the exception if there was one; waits for the first.
  std::string GetResults() const {
    EXPECT_TRUE(m_state->called.WaitFor(1));
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->results;
  }
  TokenPtr GetToken() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->token;
  }
  std::thread::id GetThread() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->thread;
  }
  /// Whether the last completion is gone, and with it the work; waits for that.
  bool IsOver() const {
    return Eventually([this] { return m_state.use_count() == 1; });
  }

private:
  struct State {
    void Note(const TokenPtr &issued, const std::string &result, const Tarvel::Exception *failure) {
      {
        const std::lock_guard<std::mutex> lock(mutex);
        results += result;
        if (failure) {
          const bool isCredentials = typeid(*failure) == typeid(InvalidCredentialsException);
          results += std::string(isCredentials ? ", InvalidCredentialsException: " : ", another exception: ") +
                     failure->what();
        }
        token = issued;
        thread = std::this_thread::get_id();
      }
      called.Add();
    }

    std::mutex mutex;
    std::string results;
    TokenPtr token;
    std::thread::id thread;
    EventCount called;
  };

  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

struct AsyncOperation {
  const char *name;
  ExpectedFields fields; ///< of the token, if it yields one
  const char *success;
  const char *failure; ///< that of a request with a SOAP fault for an answer
  std::function<void(const SecurityTokenService &, const TokenPtr &, const Outcome &)> start;
};

void PrintTo(const AsyncOperation &operation, std::ostream *out) {
  *out << operation.name;
}

ExpectedFields AlicesHeld() {
  ExpectedFields fields;
  fields.confirmation = "client";
  return fields;
}

std::vector<AsyncOperation> AsyncOperations() {
  using Service = SecurityTokenService;
  static constexpr char token[] = "a token";
  static constexpr char noToken[] =
      "no token, InvalidCredentialsException: Authentication failed: a fault was asked for";
  return {
      {"AcquireTokenAsync", AlicesHeld(), token, noToken,
       [](const Service &service, const TokenPtr &, const Outcome &outcome) {
         service.AcquireTokenAsync(ALICE, PASSWORD, SpecFor(3600), outcome.ForToken());
       }},
      {"AcquireTokenByCertificateAsync", FieldsOfCertificate("client"), token, noToken,
       [](const Service &service, const TokenPtr &, const Outcome &outcome) {
         service.AcquireTokenByCertificateAsync(SpecFor(3600), outcome.ForToken());
       }},
      {"AcquireTokenByTokenAsync", AlicesHeld(), token, noToken,
       [](const Service &service, const TokenPtr &held, const Outcome &outcome) {
         service.AcquireTokenByTokenAsync(held, SpecFor(3600), outcome.ForToken());
       }},
      {"ValidateSubjectAsync",
       {},
       "valid",
       "no verdict, InvalidCredentialsException: Authentication failed: a fault was asked for",
       [](const Service &service, const TokenPtr &held, const Outcome &outcome) {
         service.ValidateSubjectAsync(held, outcome.ForValidity());
       }},
      {"RenewTokenAsync",
       [] {
         ExpectedFields fields = AlicesHeld();
         fields.renewable = true;
         return fields;
       }(),
       token, noToken,
       [](const Service &service, const TokenPtr &held, const Outcome &outcome) {
         service.RenewTokenAsync(held, 3600, outcome.ForToken());
       }},
  };
}

class EachAsyncOperationOverTls : public testing::TestWithParam<AsyncOperation> {
protected:
  /// Starts the operation with a token, on a service at `url`, and lets go of all but the TLS context.
  void StartAndRelease(const std::string &url) {
    TokenSpec spec = SpecFor(3600);
    spec.renewable = true;
    TokenPtr held = ServiceClient("client")->AcquireToken(ALICE, PASSWORD, spec);
    m_held = held;
    const SecurityTokenServiceConfig config = ConfigFor(*m_context, "client", url);
    GetParam().start(*CreateSecurityTokenService(config), held, m_outcome);
  }

  const std::int64_t m_begin = NowInMilliseconds();
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = TrustingContext();
  std::weak_ptr<const SamlToken> m_held;
  const Outcome m_outcome{};
};

TEST_P(EachAsyncOperationOverTls, CallsBackOnceOnAnotherThreadThoughAllIsReleased) {
  StartAndRelease(RunningService().GetUrl());
  ASSERT_TRUE(m_outcome.IsOver());
  EXPECT_EQ(m_outcome.GetResults(), GetParam().success);
  EXPECT_NE(m_outcome.GetThread(), std::this_thread::get_id());
  if (GetParam().success == std::string("a token")) {
    EXPECT_EQ(Compare(m_outcome.GetToken(), GetParam().fields, m_begin), "");
  }
  EXPECT_TRUE(Eventually([this] { return m_held.expired(); }));
}

TEST_P(EachAsyncOperationOverTls, CallsBackOnceWithTheFaultOfTheService) {
  StartAndRelease(RunningService().FaultUrl("soap-fault-FailedAuthentication"));
  ASSERT_TRUE(m_outcome.IsOver());
  EXPECT_EQ(m_outcome.GetResults(), GetParam().failure);
  EXPECT_NE(m_outcome.GetThread(), std::this_thread::get_id());
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenService, EachAsyncOperationOverTls, testing::ValuesIn(AsyncOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

} // namespace
} // namespace SsoClient
