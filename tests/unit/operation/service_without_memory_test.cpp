// SPDX-License-Identifier: Apache-2.0
// Lets each allocation of an observed operation fail. The operation ends as it does without an observer, or for lack of
// memory. Each start has one end, and no event shows a secret.
#include "exchange/response_handler_impl.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"
#include "unit/operation/counted_work.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <new>
#include <string>

namespace SsoClient {
namespace {

const char PASSWORD[] = "a password that does not fit into the buffer of a string";

/// Counts events without using memory.
class CountingObserver final : public OperationObserver {
public:
  void OnStarted(const OperationInfo &) override { ++starts; }
  void OnResponseReceived(const OperationInfo &, const ResponseReceivedEvent &event) override { Check(event.reason); }
  void OnFault(const OperationInfo &, const FaultEvent &event) override {
    ++faults;
    Check(event.text);
    Check(event.detail);
  }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &event) override {
    ++ends;
    Check(event.message);
  }

  int starts = 0;
  int faults = 0;
  int ends = 0;
  bool showsSecret = false;

private:
  void Check(const std::string &text) { showsSecret |= text.find("password that") != std::string::npos; }
};

enum class Outcome { REFUSED, NO_MEMORY, OTHER };

Outcome OutcomeOf(const SecurityTokenService &service, const std::string &password, const TokenSpec &spec) {
  try {
    service.AcquireToken("alice", password, spec);
  } catch (const InvalidCredentialsException &) {
    return Outcome::REFUSED;
  } catch (const std::bad_alloc &) {
    return Outcome::NO_MEMORY;
  } catch (...) { // the outcome is OTHER; NOLINT(bugprone-empty-catch)
  }
  return Outcome::OTHER;
}

TEST(ObservedServiceWithoutMemory, ReportsOneEndForEachStartAndKeepsTheOutcome) {
  const auto observer = std::make_shared<CountingObserver>();
  ServiceOptions options;
  options.observer = observer;
  const std::string response = Testing::FaultResponse("wst:FailedAuthentication", PASSWORD);
  const SecurityTokenServiceImpl service(
      std::make_shared<const Testing::RequestBuilderStandIn>(),
      std::make_shared<Testing::TransportStandIn>([&](const Request &) { return response; }),
      std::make_shared<const ResponseHandlerImpl>(), Testing::TrustedCertificates(), options);
  const std::string password = PASSWORD;
  const TokenSpec spec = Testing::SpecFor(60);
  ASSERT_EQ(OutcomeOf(service, password, spec), Outcome::REFUSED);
  const long before = Testing::CountWork().allocations;
  ASSERT_EQ(OutcomeOf(service, password, spec), Outcome::REFUSED);
  const long allocations = Testing::CountWork().allocations - before;
  for (const bool failsOnce : {true, false}) {
    int refusals = 0;
    for (long failing = 1; failing <= allocations; ++failing) {
      *observer = CountingObserver();
      Outcome outcome = Outcome::OTHER;
      {
        const Testing::FailingAllocations failures(failing, failsOnce);
        outcome = OutcomeOf(service, password, spec);
      }
      EXPECT_NE(outcome, Outcome::OTHER) << failing;
      EXPECT_EQ(observer->ends, observer->starts) << failing;
      EXPECT_LE(observer->starts, 1) << failing;
      EXPECT_FALSE(observer->showsSecret) << failing;
      refusals += outcome == Outcome::REFUSED ? 1 : 0;
    }
    // A short lack of memory often costs only events.
    EXPECT_GT(refusals, failsOnce ? allocations / 4 : 0);
  }
}

} // namespace
} // namespace SsoClient
