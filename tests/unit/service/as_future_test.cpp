// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/as_future.h>

#include "support/counting_token.h"
#include "support/data_file.h"
#include "support/process_resources.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"
#include "support/service_stand_ins.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <stdexcept>
#include <string>
#include <system_error>
#include <type_traits>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::ServiceOn;
using Testing::SpecFor;
using Testing::TransportStandIn;
using Service = SecurityTokenService;
using TokenPtr = std::shared_ptr<const SamlToken>;

std::shared_ptr<TransportStandIn> TransportThatAnswers(const std::string &response) {
  return std::make_shared<TransportStandIn>([response](const Request &) { return response; });
}

std::shared_ptr<Service> ServiceThatAnswers(const std::string &response) {
  return ServiceOn(TransportThatAnswers(response));
}

std::string Issued() {
  return "issued:" + Testing::ReadDataFile("tokens/bearer.xml");
}

/// Whether the future becomes ready within 10 seconds. Only a failing test waits that long.
template <typename Result>
bool IsReady(const std::future<Result> &future) {
  return future.wait_for(std::chrono::seconds(10)) == std::future_status::ready;
}

/// Whether the future becomes ready and the operation is destroyed, so that only a test and its service share `transport`.
/// A test that catches an exception of the future needs this: libstdc++ counts the references to an exception in code that
/// ThreadSanitizer does not see, and reports a race if the operation's thread releases the last one.
template <typename Result>
bool IsOver(const std::future<Result> &future, const std::shared_ptr<TransportStandIn> &transport) {
  return IsReady(future) && Testing::Eventually([&transport] { return transport.use_count() == 2; });
}

/// The code of the `std::future_error` that the future throws, `timed_out` when the operation does not end, and no error
/// when the future has a result.
template <typename Result>
std::error_code BrokenPromiseOf(std::future<Result> future, const std::shared_ptr<TransportStandIn> &transport) {
  if (!IsOver(future, transport)) {
    return std::make_error_code(std::errc::timed_out);
  }
  try {
    future.get();
  } catch (const std::future_error &error) {
    return error.code();
  }
  return {};
}

TEST(AsFuture, GivesTheTokenThatIsAcquired) {
  auto future = AsFuture(*ServiceThatAnswers(Issued()), &Service::AcquireTokenAsync, "alice", "pass", SpecFor(60));
  static_assert(std::is_same_v<decltype(future), std::future<TokenPtr>>);
  ASSERT_TRUE(IsReady(future));
  const TokenPtr token = future.get();
  ASSERT_NE(token, nullptr);
  EXPECT_EQ(token->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
}

TEST(AsFuture, PassesTheArgumentsOfEachOperationOn) {
  const auto transport = std::make_shared<TransportStandIn>([](const Request &request) -> std::string {
    return request.body == "ValidateSubject"     ? "valid:true"
           : request.body.rfind("Renew", 0) == 0 ? "renewed:"
                                                 : "issued:";
  });
  const auto service = ServiceOn(transport);
  const TokenPtr token = std::make_shared<Testing::CountingToken>();
  const std::string name = "bob";
  EXPECT_EQ(AsFuture(*service, &Service::AcquireTokenAsync, name, "pass", SpecFor(1)).get(), nullptr);
  EXPECT_EQ(AsFuture(*service, &Service::AcquireTokenByCertificateAsync, SpecFor(2)).get(), nullptr);
  EXPECT_EQ(AsFuture(*service, &Service::AcquireTokenByTokenAsync, token, SpecFor(3)).get(), nullptr);
  EXPECT_EQ(AsFuture(*service, &Service::RenewTokenAsync, token, 4).get(), nullptr);
  EXPECT_TRUE(AsFuture(*service, &Service::ValidateSubjectAsync, token).get());
  EXPECT_EQ(transport->Sent(), (std::vector<std::string>{"1: UserPass bob pass 1", "2: Certificate 2", "3: Exchange 3",
                                                         "4: Renew 4", "5: ValidateSubject"}));
}

TEST(AsFuture, AcceptsAHandlerOfTheCallersOwnClass) {
  const auto service = ServiceThatAnswers("leg:context||" + Testing::ReadDataFile("tokens/bearer.xml"));
  const std::vector<std::shared_ptr<Testing::Bytes>> script{Testing::Leg("hello")};
  const auto handler = std::make_shared<Testing::NegotiationHandlerStandIn>(script);
  EXPECT_NE(AsFuture(*service, &Service::AcquireTokenByGssAsync, SpecFor(60), handler).get(), nullptr);
}

TEST(AsFuture, GivesTheVerdict) {
  const TokenPtr token = std::make_shared<Testing::CountingToken>();
  auto valid = AsFuture(*ServiceThatAnswers("valid:true"), &Service::ValidateSubjectAsync, token);
  static_assert(std::is_same_v<decltype(valid), std::future<bool>>);
  EXPECT_TRUE(valid.get());
  EXPECT_FALSE(AsFuture(*ServiceThatAnswers("valid:false"), &Service::ValidateSubjectAsync, token).get());
}

TEST(AsFuture, ThrowsTheFailureOfTheOperationInItsOwnClass) {
  const auto transport = TransportThatAnswers("fault:refused");
  const auto refusing = ServiceOn(transport);
  auto token = AsFuture(*refusing, &Service::AcquireTokenAsync, "alice", "pass", SpecFor(60));
  ASSERT_TRUE(IsOver(token, transport));
  EXPECT_THROWS_MESSAGE(token.get(), InvalidCredentialsException, "refused");
  auto verdict = AsFuture(*refusing, &Service::ValidateSubjectAsync, std::make_shared<Testing::CountingToken>());
  ASSERT_TRUE(IsOver(verdict, transport));
  EXPECT_THROWS_MESSAGE(verdict.get(), InvalidCredentialsException, "refused");
}

TEST(AsFuture, ThrowsTheRefusalOfANullTokenInItsOwnClass) {
  const auto transport = TransportThatAnswers("renewed:");
  const auto service = ServiceOn(transport);
  auto future = AsFuture(*service, &Service::RenewTokenAsync, nullptr, 60);
  ASSERT_TRUE(IsOver(future, transport));
  EXPECT_THROWS_MESSAGE(future.get(), Tarvel::InvalidArgumentException,
                        "Invalid argument : a required object may not be NULL");
}

TEST(AsFuture, EndsAsABrokenPromiseWhenTheCompletionIsNotCalled) {
  const Testing::RecordedLog log; // gets the lines about exceptions that leave work items
  const auto transport = std::make_shared<TransportStandIn>(
      [](const Request &) -> std::string { throw std::range_error("not a Tarvel exception"); });
  const auto service = ServiceOn(transport);
  auto token = AsFuture(*service, &Service::AcquireTokenByCertificateAsync, SpecFor(60));
  EXPECT_EQ(BrokenPromiseOf(std::move(token), transport), std::future_errc::broken_promise);
  auto verdict = AsFuture(*service, &Service::ValidateSubjectAsync, std::make_shared<Testing::CountingToken>());
  EXPECT_EQ(BrokenPromiseOf(std::move(verdict), transport), std::future_errc::broken_promise);
}

/// A service whose asynchronous operations cannot be started.
class ServiceWithoutThreads final : public SecurityTokenService {
public:
  TokenPtr AcquireToken(const std::string &, const std::string &, const TokenSpec &) const override { return nullptr; }
  TokenPtr AcquireTokenByGSS(const TokenSpec &, NegotiationHandler &) const override { return nullptr; }
  TokenPtr AcquireTokenByCertificate(const TokenSpec &) const override { return nullptr; }
  TokenPtr AcquireTokenByToken(const SamlToken &, const TokenSpec &) const override { return nullptr; }
  bool ValidateSubject(const SamlToken &) const override { return false; }
  TokenPtr RenewToken(const SamlToken &, std::int64_t) const override { return nullptr; }

  void AcquireTokenAsync(const std::string &, const std::string &, const TokenSpec &,
                         const TokenCompletion &) const override {
    Refuse();
  }
  void AcquireTokenByGssAsync(const TokenSpec &, const std::shared_ptr<NegotiationHandler> &,
                              const TokenCompletion &) const override {
    Refuse();
  }
  void AcquireTokenByCertificateAsync(const TokenSpec &, const TokenCompletion &) const override { Refuse(); }
  void AcquireTokenByTokenAsync(const TokenPtr &, const TokenSpec &, const TokenCompletion &) const override {
    Refuse();
  }
  void ValidateSubjectAsync(const TokenPtr &, const ValidityCompletion &) const override { Refuse(); }
  void RenewTokenAsync(const TokenPtr &, std::int64_t, const TokenCompletion &) const override { Refuse(); }

private:
  [[noreturn]] static void Refuse() { throw Tarvel::InvalidStateException("no thread"); }
};

TEST(AsFuture, ThrowsAtOnceWhatTheStartOfTheOperationThrows) {
  const ServiceWithoutThreads service;
  EXPECT_THROWS_MESSAGE(AsFuture(service, &Service::AcquireTokenByCertificateAsync, SpecFor(60)),
                        Tarvel::InvalidStateException, "no thread");
  EXPECT_THROWS_MESSAGE(AsFuture(service, &Service::ValidateSubjectAsync, nullptr), Tarvel::InvalidStateException,
                        "no thread");
}

TEST(AsFuture, NeitherWaitsNorFailsWhenTheFutureIsDestroyedFirst) {
  const auto gate = std::make_shared<Testing::Gate>();
  const auto transport = std::make_shared<TransportStandIn>([gate](const Request &) {
    gate->Pass();
    return "issued:";
  });
  AsFuture(*ServiceOn(transport), &Service::AcquireTokenByCertificateAsync, SpecFor(60));
  ASSERT_TRUE(gate->WaitForArrivals(1));
  gate->Open();
  // The operation ends before the test, because its log is not for the next one.
  EXPECT_TRUE(Testing::Eventually([&transport] { return transport.use_count() == 1; }));
}

} // namespace
} // namespace SsoClient
