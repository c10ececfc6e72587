// SPDX-License-Identifier: Apache-2.0
// When a source calls its provider, and what the end of the call causes.

#include "client/credential_requests.h"

#include "unit/token_source/source_stage.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <deque>
#include <functional>
#include <memory>
#include <stdexcept>
#include <utility>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;
using testing::ElementsAre;

TEST(CredentialProvider, IsAskedForEachAcquisition) {
  SourceStage stage;
  int calls = 0;
  stage.provider = [&] { return PasswordCredential{"alice" + std::to_string(++calls), Tarvel::SecretText("x")}; };
  stage.Provide(stage.Token("first", 1000s));
  stage.Source().Invalidate("first");
  stage.Provide(stage.Token("second", 1000s));
  EXPECT_THAT(stage.issuer->GetTexts(), ElementsAre("acquire alice1", "acquire alice2"));
}

TEST(CredentialProvider, EndsTheAttemptWithWhatItThrows) {
  SourceStage stage;
  stage.provider = []() -> Credential { throw std::runtime_error("the vault is sealed"); };
  EXPECT_EQ(stage.Ask(), "another: the vault is sealed");
  EXPECT_EQ(stage.issuer->Count(), 0U);
}

TEST(CredentialProvider, ThatBlocksIsNotCalledTwiceAndTheNextAttemptGetsItsCredential) {
  SourceStage stage;
  stage.options.attemptTimeout = 5s;
  std::deque<std::function<void()>> blocked;
  stage.blocking = [&](std::function<void()> function) { blocked.push_back(std::move(function)); };
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  stage.time.Advance(5s);
  EXPECT_THAT(outcomes.Get(), ElementsAre("DeadlineExceededException: The deadline passed before the operation ended"));
  stage.time.Advance(1s);
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_EQ(blocked.size(), 1U);
  EXPECT_EQ(stage.issuer->Count(), 0U);
  blocked.front()();
  EXPECT_EQ(stage.issuer->Count(), 1U);
  stage.issuer->Answer(stage.Token("first", 1000s));
  EXPECT_EQ(stage.Ask(), "first");
}

TEST(CredentialProvider, ThatReturnsAfterTheSourceWasDestroyedCausesNoRequest) {
  SourceStage stage;
  stage.provider = [&stage] {
    stage.Close();
    EXPECT_EQ(stage.issuer.use_count(), 1) << "a provider that blocks does not keep the attempt";
    return PasswordCredential{"alice", Tarvel::SecretText("x")};
  };
  std::deque<std::function<void()>> blocked;
  stage.blocking = [&](std::function<void()> function) { blocked.push_back(std::move(function)); };
  OutcomeList outcomes;
  stage.Source().GetAsync({}, CancelToken(), outcomes.MakeCallback());
  ASSERT_EQ(blocked.size(), 1U);
  blocked.front()();
  EXPECT_THAT(outcomes.Get(),
              ElementsAre("CancelledException: The operation was cancelled because its token source was destroyed"));
  EXPECT_EQ(stage.issuer->Count(), 0U);
}

TEST(CredentialProvider, IsNotCalledAfterTheSourceWasDestroyed) {
  SourceStage stage;
  int calls = 0;
  stage.provider = [&calls] { return PasswordCredential{"alice" + std::to_string(++calls), Tarvel::SecretText("x")}; };
  std::deque<std::function<void()>> blocked;
  stage.blocking = [&](std::function<void()> function) { blocked.push_back(std::move(function)); };
  EXPECT_EQ(stage.Ask(), "waits");
  stage.Close();
  ASSERT_EQ(blocked.size(), 1U);
  blocked.front()(); // a thread that is late
  EXPECT_EQ(calls, 0);
}

TEST(CredentialProvider, ThatCannotBeCalledEndsTheAttempt) {
  SourceStage stage;
  bool isRefused = true;
  stage.blocking = [&](const std::function<void()> &function) {
    if (isRefused) {
      throw Tarvel::InvalidStateException("There is no thread");
    }
    function();
  };
  EXPECT_EQ(stage.Ask(), "another: There is no thread");
  isRefused = false;
  stage.time.Advance(1s);
  EXPECT_EQ(stage.Ask(), "waits");
  EXPECT_EQ(stage.issuer->Count(), 1U);
}

TEST(CredentialRequests, DropARequestThatComesAfterTheirEnd) {
  int calls = 0;
  const auto captured = std::make_shared<int>();
  const auto requests =
      std::make_shared<CredentialRequests>([]() -> Credential { throw std::runtime_error("it was called"); },
                                           [&calls](const std::function<void()> &) { ++calls; });
  requests->Close();
  requests->Request([captured](const auto &) { ADD_FAILURE() << "it was called back"; });
  EXPECT_EQ(calls, 0);
  EXPECT_EQ(captured.use_count(), 1);
}

TEST(CredentialRequests, DropTheCallbackWhenTheyEndDuringACall) {
  std::shared_ptr<CredentialRequests> requests;
  auto captured = std::make_shared<int>();
  const std::weak_ptr<int> watched = captured;
  const auto provider = [&]() -> Credential {
    requests->Close();
    EXPECT_TRUE(watched.expired());
    return PasswordCredential{"alice", Tarvel::SecretText("x")};
  };
  requests = std::make_shared<CredentialRequests>(provider, [](const std::function<void()> &call) { call(); });
  requests->Request([captured = std::move(captured)](const auto &) { ADD_FAILURE() << "it was called back"; });
}

} // namespace Testing
