// SPDX-License-Identifier: Apache-2.0
// The asynchronous form of each operation against the development service, with everything released after the call.
#include "integration/service/service_client.h"
#include "support/operation_outcome.h"
#include "support/process_resources.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;
using TokenPtr = std::shared_ptr<const SamlToken>;

struct AsyncOperation {
  const char *name;
  ExpectedFields fields; ///< of the token, if the operation returns one
  const char *success;
  const char *failure; ///< the failure when the answer is a SOAP fault
  std::function<void(const SecurityTokenService &, const TokenPtr &, const OperationOutcome &)> start;
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
  static constexpr char alice[] = "{Name: alice; Domain:corp.example}";
  static constexpr char client[] = "{Name: client; Domain:corp.example}";
  static constexpr char noToken[] = "null and credentials: Authentication failed: a fault was asked for";
  return {
      {"AcquireTokenAsync", AlicesHeld(), alice, noToken,
       [](const Service &service, const TokenPtr &, const OperationOutcome &outcome) {
         service.AcquireTokenAsync(ALICE, PASSWORD, SpecFor(3600), outcome.ForToken());
       }},
      {"AcquireTokenByCertificateAsync", FieldsOfCertificate("client"), client, noToken,
       [](const Service &service, const TokenPtr &, const OperationOutcome &outcome) {
         service.AcquireTokenByCertificateAsync(SpecFor(3600), outcome.ForToken());
       }},
      {"AcquireTokenByTokenAsync", AlicesHeld(), alice, noToken,
       [](const Service &service, const TokenPtr &held, const OperationOutcome &outcome) {
         service.AcquireTokenByTokenAsync(held, SpecFor(3600), outcome.ForToken());
       }},
      {"ValidateSubjectAsync",
       {},
       "true",
       "empty and credentials: Authentication failed: a fault was asked for",
       [](const Service &service, const TokenPtr &held, const OperationOutcome &outcome) {
         service.ValidateSubjectAsync(held, outcome.ForValidity());
       }},
      {"RenewTokenAsync",
       [] {
         ExpectedFields fields = AlicesHeld();
         fields.renewable = true;
         return fields;
       }(),
       alice, noToken,
       [](const Service &service, const TokenPtr &held, const OperationOutcome &outcome) {
         service.RenewTokenAsync(held, 3600, outcome.ForToken());
       }},
  };
}

class EachAsyncOperationOverTls : public testing::TestWithParam<AsyncOperation> {
protected:
  /// Starts the operation with a token, on a service at `url`, and releases everything except the TLS context.
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
  const OperationOutcome m_outcome{};
};

TEST_P(EachAsyncOperationOverTls, CallsBackOnceOnAnotherThreadAfterEverythingIsReleased) {
  StartAndRelease(RunningService().GetUrl());
  ASSERT_TRUE(m_outcome.IsOver());
  EXPECT_EQ(m_outcome.Wait(), std::vector<std::string>{GetParam().success});
  EXPECT_EQ(m_outcome.Threads().count(std::this_thread::get_id()), 0u);
  if (GetParam().success != std::string("true")) {
    EXPECT_EQ(Compare(m_outcome.GetToken(), GetParam().fields, m_begin), "");
  }
  EXPECT_TRUE(Eventually([this] { return m_held.expired(); }));
}

TEST_P(EachAsyncOperationOverTls, CallsBackOnceWithTheFaultOfTheService) {
  StartAndRelease(RunningService().FaultUrl("soap-fault-FailedAuthentication"));
  ASSERT_TRUE(m_outcome.IsOver());
  EXPECT_EQ(m_outcome.Wait(), std::vector<std::string>{GetParam().failure});
  EXPECT_EQ(m_outcome.Threads().count(std::this_thread::get_id()), 0u);
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenService, EachAsyncOperationOverTls, testing::ValuesIn(AsyncOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

} // namespace
} // namespace SsoClient
