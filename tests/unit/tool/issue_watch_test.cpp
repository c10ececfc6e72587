// SPDX-License-Identifier: Apache-2.0

#include "issue_watch.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient::Tool {
namespace {

class EventNames final : public OperationObserver {
public:
  void OnStarted(const OperationInfo &) override { names.emplace_back("started"); }
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { names.emplace_back("request"); }
  void OnResponseReceived(const OperationInfo &, const ResponseReceivedEvent &) override {
    names.emplace_back("response");
  }
  void OnFault(const OperationInfo &, const FaultEvent &) override { names.emplace_back("fault"); }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &) override { names.emplace_back("ended"); }

  std::vector<std::string> names;
};

void Perform(IssueWatch &watch, OperationEndedEvent::Outcome outcome) {
  watch.OnStarted({});
  watch.OnRequestSent({}, {});
  watch.OnResponseReceived({}, {});
  watch.OnFault({}, {});
  OperationEndedEvent ended;
  ended.outcome = outcome;
  watch.OnEnded({}, ended);
}

TEST(IssueWatch, ReportsWhenATokenWasRequestedOnlyAfterItWasIssued) {
  IssueWatch watch(nullptr);
  EXPECT_FALSE(watch.GetAskedAt());
  Perform(watch, OperationEndedEvent::Outcome::FAILED);
  EXPECT_FALSE(watch.GetAskedAt());
  const Tarvel::System::DateTime before = Tarvel::System::GetUtcDateTime();
  Perform(watch, OperationEndedEvent::Outcome::SUCCEEDED);
  ASSERT_TRUE(watch.GetAskedAt());
  EXPECT_LE(0, watch.GetAskedAt()->MicrosecondsSince(before));
}

TEST(IssueWatch, PassesEachEventOn) {
  const auto names = std::make_shared<EventNames>();
  IssueWatch watch(names);
  Perform(watch, OperationEndedEvent::Outcome::SUCCEEDED);
  EXPECT_THAT(names->names, testing::ElementsAre("started", "request", "response", "fault", "ended"));
}

} // namespace
} // namespace SsoClient::Tool
