// SPDX-License-Identifier: Apache-2.0
// A service that stalls: a leg of a negotiation times out after 40 seconds, another request does not. The library has
// no setting that shortens these times, so this test takes that long.
#include "integration/service/service_client.h"
#include "support/rendezvous.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/gss_negotiation_context.h>

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <memory>
#include <string>

namespace SsoClient {
namespace {

using namespace Testing;

bool IsRefusedByTheService(const std::function<void()> &ask) {
  try {
    ask();
  } catch (const CommunicationException &) {
    return false;
  } catch (const SsoException &) {
    return true;
  }
  return false;
}

TEST(StallingService, MakesALegTimeOutAfterFortySecondsButNoOtherRequest) {
  const std::int64_t begin = NowInMilliseconds();
  std::string outcome;
  EventCount called;
  const ServiceClient slow("", RunningService().FaultUrl("stall-then-answer-42"));
  slow->AcquireTokenAsync(ALICE, PASSWORD, SpecFor(3600),
                          [&](const std::shared_ptr<const SamlToken> &token, const Tarvel::Exception *failure) {
                            outcome = failure ? failure->what() : Compare(token, {}, begin);
                            called.Add();
                          });

  const auto context = TrustingContext();
  const auto negotiation = InternalApi::CreateGssNegotiationContext(
      ConfigFor(*context, "", RunningService().FaultUrl("stall/once/leg")), SpecFor(3600));
  const auto start = std::chrono::steady_clock::now();
  EXPECT_THROWS_MESSAGE(negotiation->NegotiateToken({1, 2, 3}), CommunicationException,
                        "No response from localhost:" + std::to_string(RunningService().GetPort()) +
                            " within 40 seconds");
  EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::seconds(40));
  // The same context still works: the service answers now, although it refuses bytes that are not a negotiation token.
  EXPECT_TRUE(IsRefusedByTheService([&] { negotiation->NegotiateToken({1, 2, 3}); }));

  // Answered after 42 seconds.
  ASSERT_TRUE(called.WaitFor(1));
  EXPECT_EQ(outcome, "");
}

} // namespace
} // namespace SsoClient
