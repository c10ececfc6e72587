// SPDX-License-Identifier: Apache-2.0

#include "support/counting_token.h"
#include "support/data_file.h"
#include "support/operation_outcome.h"
#include "support/recorded_log.h"
#include "support/rendezvous.h"
#include "support/service_stand_ins.h"
#include "support/throws_message.h"

#include <tarvel/system/thread_pool.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using Testing::CountingToken;
using Testing::EventCount;
using Testing::Gate;
using Testing::OperationOutcome;
using Testing::RecordedLog;
using Testing::ServiceOn;
using Testing::SpecFor;
using Testing::TransportStandIn;
using TokenPtr = std::shared_ptr<const SamlToken>;
using Texts = std::vector<std::string>;

/// Makes an object whose destruction is counted.
template <typename T, typename... Args>
std::shared_ptr<T> MakeCounted(const std::shared_ptr<EventCount> &destroyed, Args &&...args) {
  return std::shared_ptr<T>(new T(std::forward<Args>(args)...), [destroyed](T *object) {
    delete object;
    destroyed->Add();
  });
}

struct AsyncOperation {
  const char *name;
  const char *responseBegin;
  bool yieldsToken;
  const char *request;
  std::function<void(const SecurityTokenService &, const TokenPtr &, const OperationOutcome &)> start;
};

void PrintTo(const AsyncOperation &operation, std::ostream *out) {
  *out << operation.name;
}

std::vector<AsyncOperation> AsyncOperations() {
  using Service = SecurityTokenService;
  return {
      {"AcquireTokenAsync", "issued:", true, "1: UserPass alice pass 60",
       [](const Service &service, const TokenPtr &, const OperationOutcome &outcome) {
         service.AcquireTokenAsync("alice", "pass", SpecFor(60), outcome.ForToken());
       }},
      {"AcquireTokenByGssAsync", "leg:context||", true, "1: InitialSPNego 60 hello",
       [](const Service &service, const TokenPtr &, const OperationOutcome &outcome) {
         using Handler = Testing::NegotiationHandlerStandIn;
         const std::vector<std::shared_ptr<Testing::Bytes>> script = {Testing::Leg("hello")};
         service.AcquireTokenByGssAsync(SpecFor(60), std::make_shared<Handler>(script), outcome.ForToken());
       }},
      {"AcquireTokenByCertificateAsync", "issued:", true, "1: Certificate 60",
       [](const Service &service, const TokenPtr &, const OperationOutcome &outcome) {
         service.AcquireTokenByCertificateAsync(SpecFor(60), outcome.ForToken());
       }},
      {"AcquireTokenByTokenAsync", "issued:", true, "1: Exchange 60",
       [](const Service &service, const TokenPtr &token, const OperationOutcome &outcome) {
         service.AcquireTokenByTokenAsync(token, SpecFor(60), outcome.ForToken());
       }},
      {"ValidateSubjectAsync", "valid:true", false, "1: ValidateSubject",
       [](const Service &service, const TokenPtr &token, const OperationOutcome &outcome) {
         service.ValidateSubjectAsync(token, outcome.ForValidity());
       }},
      {"RenewTokenAsync", "renewed:", true, "1: Renew 60",
       [](const Service &service, const TokenPtr &token, const OperationOutcome &outcome) {
         service.RenewTokenAsync(token, 60, outcome.ForToken());
       }},
  };
}

class EachAsyncOperation : public testing::TestWithParam<AsyncOperation> {
protected:
  std::string Response() const {
    return GetParam().responseBegin + (GetParam().yieldsToken ? Testing::ReadDataFile("tokens/bearer.xml") : "");
  }
  std::string Result() const { return GetParam().yieldsToken ? "{Name: alice; Domain:corp.example}" : "true"; }

  const std::shared_ptr<EventCount> m_transportGone = std::make_shared<EventCount>();
  const std::shared_ptr<EventCount> m_tokenGone = std::make_shared<EventCount>();
};

TEST_P(EachAsyncOperation, RunsOnAnotherThreadAndCallsItsCompletionOnceThere) {
  const RecordedLog log;
  auto transport =
      MakeCounted<TransportStandIn>(m_transportGone, [response = Response()](const Request &) { return response; });
  const OperationOutcome outcome;
  GetParam().start(*ServiceOn(transport), std::make_shared<CountingToken>(), outcome);
  EXPECT_EQ(outcome.Wait(), Texts{Result()});
  EXPECT_EQ(transport->Sent(), Texts{GetParam().request});
  transport.reset();
  ASSERT_TRUE(m_transportGone->WaitFor(1)); // the work item has ended
  EXPECT_EQ(outcome.Wait().size(), 1u);
  EXPECT_EQ(outcome.Threads().count(std::this_thread::get_id()), 0u);
  EXPECT_EQ(log.Threads(), outcome.Threads()); // everything ran there, from the first line on
}

TEST_P(EachAsyncOperation, KeepsItsArgumentsUntilItEndsAndNoLonger) {
  const auto gate = std::make_shared<Gate>();
  auto transport = MakeCounted<TransportStandIn>(m_transportGone, [gate, response = Response()](const Request &) {
    gate->Pass();
    return response;
  });
  auto service = ServiceOn(transport);
  TokenPtr token = MakeCounted<CountingToken>(m_tokenGone);
  const OperationOutcome outcome;
  GetParam().start(*service, token, outcome);
  service.reset();
  transport.reset();
  token.reset();
  ASSERT_TRUE(gate->WaitForArrivals(1));
  EXPECT_EQ(m_transportGone->Get(), 0);
  gate->Open();
  EXPECT_EQ(outcome.Wait(), Texts{Result()});
  EXPECT_TRUE(m_transportGone->WaitFor(1));
  EXPECT_TRUE(m_tokenGone->WaitFor(1));
}

TEST_P(EachAsyncOperation, ReportsAFailureOnceWithTheExceptionAndNoResult) {
  auto transport = MakeCounted<TransportStandIn>(m_transportGone, [](const Request &) { return "fault:refused"; });
  const OperationOutcome outcome;
  GetParam().start(*ServiceOn(transport), std::make_shared<CountingToken>(), outcome);
  transport.reset();
  ASSERT_TRUE(m_transportGone->WaitFor(1));
  EXPECT_EQ(outcome.Wait(),
            Texts{std::string(GetParam().yieldsToken ? "null" : "empty") + " and credentials: refused"});
  EXPECT_EQ(outcome.Threads().count(std::this_thread::get_id()), 0u);
}

TEST_P(EachAsyncOperation, DoesNotCallItsCompletionForAnExceptionOfAnotherKind) {
  const RecordedLog log;
  const Testing::ScopedLogLevel level(63);
  auto transport = MakeCounted<TransportStandIn>(
      m_transportGone, [](const Request &) -> std::string { throw std::range_error("not ours"); });
  const OperationOutcome outcome;
  GetParam().start(*ServiceOn(transport), std::make_shared<CountingToken>(), outcome);
  transport.reset();
  ASSERT_TRUE(m_transportGone->WaitFor(1));
  ASSERT_TRUE(log.WaitForLines(1));
  EXPECT_EQ(log.Lines(),
            Texts{"Tarvel 8 An exception left a work item of the thread pool: std::range_error: not ours"});
  EXPECT_EQ(outcome.Wait(0), Texts{});
}

INSTANTIATE_TEST_SUITE_P(SecurityTokenServiceImpl, EachAsyncOperation, testing::ValuesIn(AsyncOperations()),
                         [](const auto &operation) { return std::string(operation.param.name); });

std::shared_ptr<SecurityTokenServiceImpl> ServiceThatAnswers(const std::string &response) {
  return ServiceOn(std::make_shared<TransportStandIn>([response](const Request &) { return response; }));
}

TEST(ValidateSubjectAsync, ReportsAnInvalidTokenAsAVerdictAndNotAsAFailure) {
  const OperationOutcome outcome;
  ServiceThatAnswers("valid:false")->ValidateSubjectAsync(std::make_shared<CountingToken>(), outcome.ForValidity());
  EXPECT_EQ(outcome.Wait(), Texts{"false"});
}

TEST(AcquireTokenAsync, ReportsNullAndNoExceptionWhenTheResponseContainsNoToken) {
  const OperationOutcome outcome;
  ServiceThatAnswers("issued:")->AcquireTokenAsync("alice", "pass", SpecFor(60), outcome.ForToken());
  EXPECT_EQ(outcome.Wait(), Texts{"null"});
}

TEST(AsyncOperations, ReportAMissingTokenOrHandlerAsABadArgument) {
  const auto service = ServiceThatAnswers("issued:");
  const std::string failure = "and argument: Invalid argument : a required object may not be NULL";
  const OperationOutcome tokens;
  service->AcquireTokenByTokenAsync(nullptr, SpecFor(60), tokens.ForToken());
  service->RenewTokenAsync(nullptr, 60, tokens.ForToken());
  service->AcquireTokenByGssAsync(SpecFor(60), nullptr, tokens.ForToken());
  EXPECT_EQ(tokens.Wait(3), Texts(3, "null " + failure));
  const OperationOutcome verdict;
  service->ValidateSubjectAsync(nullptr, verdict.ForValidity());
  EXPECT_EQ(verdict.Wait(), Texts{"empty " + failure});
}

TEST(AsyncOperations, LogAnExceptionOfTheCompletionAndThePoolContinues) {
  const RecordedLog log;
  const Testing::ScopedLogLevel level(63);
  const auto service = ServiceThatAnswers("issued:");
  const auto refusing = ServiceThatAnswers("fault:refused");
  const auto calls = std::make_shared<EventCount>();
  const auto throwing = [calls](const TokenPtr &, const Tarvel::Exception *failure) {
    calls->Add();
    throw SsoException(failure ? "thrown on failure" : "thrown on success");
  };
  service->AcquireTokenByCertificateAsync(SpecFor(60), throwing);
  ASSERT_TRUE(log.WaitForLines(1));
  refusing->AcquireTokenByCertificateAsync(SpecFor(60), throwing);
  ASSERT_TRUE(log.WaitForLines(2));
  const std::string line = "Tarvel 8 An exception left a work item of the thread pool: SsoClient::SsoException: ";
  EXPECT_EQ(log.Lines(), (Texts{line + "thrown on success", line + "thrown on failure"}));
  EXPECT_EQ(calls->Get(), 2); // an exception that the completion throws is not reported to it
  const OperationOutcome outcome;
  service->AcquireTokenByCertificateAsync(SpecFor(60), outcome.ForToken());
  EXPECT_EQ(outcome.Wait(), Texts{"null"});
}

TEST(AsyncOperations, LeaveAClonedExceptionToItsOwner) {
  std::unique_ptr<const Tarvel::Exception> kept;
  EventCount called;
  ServiceThatAnswers("fault:refused")
      ->AcquireTokenByCertificateAsync(SpecFor(60), [&](const TokenPtr &, const Tarvel::Exception *failure) {
        kept.reset(failure->Clone());
        called.Add();
      });
  ASSERT_TRUE(called.WaitFor(1));
  EXPECT_THROWS_MESSAGE(kept->Throw(), InvalidCredentialsException, "refused");
}

TEST(AsyncOperations, AllCompleteWhenAThousandWaitForAServiceThatStalls) {
  constexpr int OPERATIONS = 1000;
  const Testing::ScopedLogLevel level(63);
  const auto gate = std::make_shared<Gate>();
  const auto transport = std::make_shared<TransportStandIn>([gate](const Request &request) {
    gate->Pass();
    const std::string lifetime = request.body.substr(request.body.rfind(' ') + 1);
    return lifetime == "0" ? std::string("fault:refused") : "issued:";
  });
  auto service = ServiceOn(transport);
  const OperationOutcome outcome;
  for (int i = 0; i < OPERATIONS; ++i) {
    service->AcquireTokenAsync("alice", "pass", SpecFor(i % 10), outcome.ForToken());
  }
  service.reset();
  // The pool has no more threads than this; the other operations wait in its queue.
  ASSERT_TRUE(gate->WaitForArrivals(Tarvel::System::DEFAULT_THREAD_CEILING));
  EXPECT_EQ(outcome.Wait(0), Texts{});
  gate->Open();
  const Texts results = outcome.Wait(OPERATIONS);
  EXPECT_EQ(results.size(), static_cast<std::size_t>(OPERATIONS));
  EXPECT_EQ(std::count(results.begin(), results.end(), "null"), OPERATIONS * 9 / 10);
  EXPECT_EQ(std::count(results.begin(), results.end(), "null and credentials: refused"), OPERATIONS / 10);
  EXPECT_EQ(outcome.Threads().count(std::this_thread::get_id()), 0u);
  EXPECT_EQ(transport->CountSessions(), OPERATIONS);
  EXPECT_EQ(transport->CountOpenSessions(), 0);
}

} // namespace
} // namespace SsoClient
