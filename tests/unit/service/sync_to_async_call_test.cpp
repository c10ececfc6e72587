// SPDX-License-Identifier: Apache-2.0

#include "service/sync_to_async_call.h"

#include "support/counting_token.h"
#include "support/recorded_log.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <boost/optional.hpp>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <stdexcept>
#include <string>

namespace SsoClient {
namespace {

using TokenPtr = std::shared_ptr<const SamlToken>;

TEST(SyncCallToResultFunc, ReportsTheResultAndNoException) {
  const TokenPtr token = std::make_shared<Testing::CountingToken>();
  int calls = 0;
  SyncCallToResultFunc([&] { return token; },
                       [&](const TokenPtr &result, const Tarvel::Exception *failure) {
                         ++calls;
                         EXPECT_EQ(result, token);
                         EXPECT_EQ(failure, nullptr);
                       },
                       TokenPtr());
  EXPECT_EQ(calls, 1);
}

TEST(SyncCallToResultFunc, ReportsTheCaughtExceptionItselfWithTheFailureValue) {
  int calls = 0;
  SyncCallToResultFunc([]() -> bool { throw ParseException("refused"); },
                       [&](const boost::optional<bool> &result, const Tarvel::Exception *failure) {
                         ++calls;
                         EXPECT_FALSE(result);
                         EXPECT_THROWS_MESSAGE(failure->Throw(), ParseException, "refused");
                         EXPECT_TRUE(std::current_exception()); // the exception is still being handled
                       },
                       boost::optional<bool>());
  EXPECT_EQ(calls, 1);
}

TEST(SyncCallToResultFunc, PassesOnAnExceptionOfAnotherKindWithoutCallingBack) {
  int calls = 0;
  const auto count = [&](const boost::optional<bool> &, const Tarvel::Exception *) { ++calls; };
  EXPECT_THROWS_MESSAGE(
      SyncCallToResultFunc([]() -> bool { throw std::range_error("not ours"); }, count, boost::optional<bool>()),
      std::range_error, "not ours");
  EXPECT_THROW(SyncCallToResultFunc(std::function<bool()>(), count, boost::optional<bool>()), std::bad_function_call);
  EXPECT_EQ(calls, 0);
}

TEST(SyncCallToResultFunc, PassesOnAnExceptionOfTheCallbackAndDoesNotCallItAgain) {
  int calls = 0;
  const auto throwing = [&](const boost::optional<bool> &, const Tarvel::Exception *) {
    ++calls;
    throw SsoException("of the callback");
  };
  EXPECT_THROWS_MESSAGE(SyncCallToResultFunc([] { return true; }, throwing, boost::optional<bool>()), SsoException,
                        "of the callback");
  EXPECT_EQ(calls, 1);
  EXPECT_THROWS_MESSAGE(
      SyncCallToResultFunc([]() -> bool { throw ParseException("of the call"); }, throwing, boost::optional<bool>()),
      SsoException, "of the callback");
  EXPECT_EQ(calls, 2);
}

TEST(SyncToAsyncCall, EndsTheWorkItemWithTheExceptionOfAnEmptyCall) {
  const Testing::RecordedLog log;
  SyncToAsyncCall(std::function<TokenPtr()>(),
                  [](const TokenPtr &, const Tarvel::Exception *) { ADD_FAILURE() << "called back"; });
  ASSERT_TRUE(log.WaitForLines(1));
  EXPECT_EQ(log.Lines(), std::vector<std::string>{"Tarvel 8 An exception left a work item of the thread pool: "
                                                  "std::bad_function_call: bad_function_call"});
}

TEST(PassByRefHelper, RefersToTheObjectItselfAndKeepsItAlive) {
  auto number = std::make_shared<int>(5);
  const std::weak_ptr<int> watched = number;
  {
    const PassByRefHelper<int> helper(number);
    number.reset();
    int &reference = helper;
    EXPECT_EQ(&reference, watched.lock().get());
  }
  EXPECT_TRUE(watched.expired());
}

TEST(PassByRefHelper, ThrowsWhenThereIsNoObject) {
  const PassByRefHelper<int> helper(nullptr);
  EXPECT_THROWS_MESSAGE(static_cast<void>(static_cast<int &>(helper)), Tarvel::InvalidArgumentException,
                        "Invalid argument : a required object may not be NULL");
}

} // namespace
} // namespace SsoClient
