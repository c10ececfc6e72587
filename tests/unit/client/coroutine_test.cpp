// SPDX-License-Identifier: Apache-2.0
// Coroutines that wait for operations.
#include "client_setup.h"

#ifdef SSOCLIENT_HAS_COROUTINES

#include "support/coroutine_types.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Testing::Alice;
using Testing::ClientOn;
using Testing::EagerTask;
using Testing::EventCount;
using Testing::Eventually;
using Testing::LazyTask;
using Testing::ScriptedTransport;
using Testing::SpecFor;
using Strings = std::vector<std::string>;
using TokenPtr = std::shared_ptr<const SamlToken>;

constexpr const char *SUBJECT = "{Name: alice; Domain:corp.example}";

/// What became of coroutines, on any thread.
struct Results {
  void Add(std::string text) {
    {
      const std::lock_guard<std::mutex> lock(mutex);
      texts.push_back(std::move(text));
    }
    added.Add();
  }
  Strings Wait(int count = 1) {
    EXPECT_TRUE(added.WaitFor(count));
    return Get();
  }
  Strings Get() {
    const std::lock_guard<std::mutex> lock(mutex);
    return texts;
  }

  std::mutex mutex;
  Strings texts;
  EventCount added;
};

std::string ToText(const TokenPtr &token) {
  return token->GetSubject().ToString();
}

std::string ToText(bool isValid) {
  return isValid ? "true" : "false";
}

template <typename Value>
EagerTask Await(Awaitable<Value> awaitable, Results &results) {
  std::string text;
  try {
    text = ToText(co_await awaitable);
  } catch (...) {
    text = Testing::Describe(std::current_exception());
  }
  results.Add(std::move(text));
}

/// A scripted transport, a client on it, and what became of its coroutines.
struct World {
  explicit World(ScriptedTransport::Script script)
      : transport(std::make_shared<ScriptedTransport>(std::move(script))), client(ClientOn(transport)) {}

  const std::shared_ptr<ScriptedTransport> transport;
  std::shared_ptr<TokenClient> client;
  Results results;
};

TEST(AwaitableOfTheClient, ReturnsTheResultOfEachOperation) {
  World world([](const Request &request, int) -> boost::optional<Testing::Reply> {
    return Testing::Success(request.body.rfind("Validate", 0) == 0 ? "valid:true"
                            : request.body.rfind("Renew", 0) == 0  ? "renewed:" + Testing::BearerXml()
                                                                   : "issued:" + Testing::BearerXml());
  });
  const EagerTask acquired = Await(world.client->AcquireAwaitable(Alice(), SpecFor(60)), world.results);
  EXPECT_EQ(world.results.Wait(1), Strings{SUBJECT});
  acquired.WaitUntilDone();
  const EagerTask renewed = Await(world.client->RenewAwaitable(Testing::HolderToken(), 60), world.results);
  EXPECT_EQ(world.results.Wait(2).back(), SUBJECT);
  renewed.WaitUntilDone();
  const EagerTask validated = Await(world.client->ValidateAwaitable(Testing::HolderToken()), world.results);
  EXPECT_EQ(world.results.Wait(3).back(), "true");
  validated.WaitUntilDone();
}

TEST(AwaitableOfTheClient, ThrowsFailuresInTheirOwnClass) {
  World world([](const Request &, int) -> boost::optional<Testing::Reply> { return Testing::NoConnection(); });
  const EagerTask unreachable = Await(world.client->AcquireAwaitable(Alice(), SpecFor(60)), world.results);
  EXPECT_EQ(world.results.Wait(1).back().substr(0, 24), "CommunicationException: ");
  unreachable.WaitUntilDone();
  const EagerTask wrong = Await(world.client->ValidateAwaitable(nullptr), world.results);
  EXPECT_EQ(world.results.Wait(2).back().substr(0, 26), "InvalidArgumentException: ");
  wrong.WaitUntilDone();
}

TEST(AwaitableOfTheClient, StartsNothingUntilItIsAwaited) {
  World world(Testing::Issue);
  { const auto dropped = world.client->AcquireAwaitable(Alice(), SpecFor(60)); }
  const EagerTask task = Await(world.client->AcquireAwaitable(Alice(), SpecFor(60)), world.results);
  task.WaitUntilDone();
  EXPECT_EQ(world.transport->Sent().size(), 1u);
}

TEST(AwaitableOfTheClient, CancelsTheRequestWhenTheCoroutineIsDestroyed) {
  World world(Testing::Hold);
  {
    const EagerTask task = Await(world.client->AcquireAwaitable(Alice(), SpecFor(60)), world.results);
    ASSERT_TRUE(world.transport->WaitForSent(1));
  }
  EXPECT_TRUE(Eventually([&] { return world.transport->CountCancelled() == 1; }));
  EXPECT_TRUE(Eventually([&] { return world.transport->CountOpenSessions() == 0; }));
  EXPECT_EQ(world.results.Get(), Strings{}) << "continued";
}

TEST(AwaitableOfTheClient, EndsWhenTheTokenOfItsOptionsIsCancelled) {
  World world(Testing::Hold);
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  const EagerTask task = Await(world.client->AcquireAwaitable(Alice(), SpecFor(60), options), world.results);
  ASSERT_TRUE(world.transport->WaitForSent(1));
  source.Cancel();
  EXPECT_EQ(world.results.Wait(), Strings{Testing::CANCELLED});
  task.WaitUntilDone();
}

TEST(AwaitableOfTheClient, EndsWhenTheClientIsDestroyed) {
  World world(Testing::Hold);
  const EagerTask task = Await(world.client->AcquireAwaitable(Alice(), SpecFor(60)), world.results);
  ASSERT_TRUE(world.transport->WaitForSent(1));
  world.client.reset();
  EXPECT_EQ(world.results.Wait(), Strings{Testing::DESTROYED});
  task.WaitUntilDone();
}

TEST(AwaitableOfTheClient, EndsAtOnceWhenTheClientWasDestroyedBefore) {
  World world(Testing::Issue);
  Awaitable<TokenPtr> awaitable = world.client->AcquireAwaitable(Alice(), SpecFor(60));
  world.client.reset();
  const EagerTask task = Await(std::move(awaitable), world.results);
  EXPECT_EQ(world.results.Wait(), Strings{Testing::DESTROYED});
  task.WaitUntilDone();
  EXPECT_EQ(world.transport->Sent(), Strings{});
}

EagerTask AwaitOn(TokenClient &client, const CallOptions &options, std::thread::id &seen, Results &results) {
  const TokenPtr token = co_await client.AcquireAwaitable(Alice(), SpecFor(60), options);
  seen = std::this_thread::get_id();
  results.Add(ToText(token));
}

TEST(AwaitableOfTheClient, ContinuesTheCoroutineOnTheExecutor) {
  World world(Testing::Issue);
  EventCount queued;
  std::function<void()> queue;
  CallOptions options;
  options.executor = [&](std::function<void()> function) {
    queue = std::move(function);
    queued.Add();
  };
  std::thread::id seen;
  const EagerTask task = AwaitOn(*world.client, options, seen, world.results);
  ASSERT_TRUE(queued.WaitFor(1));
  EXPECT_EQ(world.results.Get(), Strings{});
  queue();
  EXPECT_EQ(world.results.Get(), Strings{SUBJECT});
  EXPECT_EQ(seen, std::this_thread::get_id());
}

LazyTask<TokenPtr> AcquireLazily(TokenClient &client) {
  co_return co_await client.AcquireAwaitable(Alice(), SpecFor(60));
}

EagerTask AcquireTwice(TokenClient &client, Results &results) {
  const TokenPtr first = co_await AcquireLazily(client);
  const TokenPtr second = co_await AcquireLazily(client);
  results.Add(ToText(first) + ToText(second));
}

TEST(AwaitableOfTheClient, WorksWithinOtherCoroutines) {
  World world(Testing::Issue);
  const EagerTask task = AcquireTwice(*world.client, world.results);
  EXPECT_EQ(world.results.Wait(), Strings{std::string(SUBJECT) + SUBJECT});
  task.WaitUntilDone();
}

TEST(AwaitableOfTheClient, ServesManyCoroutinesEvenIfSomeAreDestroyed) {
  constexpr int COUNT = 300;
  World world(Testing::Hold);
  std::vector<std::unique_ptr<EagerTask>> tasks;
  for (int i = 0; i < COUNT; ++i) {
    tasks.push_back(
        std::make_unique<EagerTask>(Await(world.client->AcquireAwaitable(Alice(), SpecFor(60)), world.results)));
  }
  ASSERT_TRUE(world.transport->WaitForSent(COUNT));
  for (std::size_t i = 0; i < tasks.size(); i += 3) {
    tasks[i].reset();
  }
  EXPECT_TRUE(Eventually([&] { return world.transport->CountCancelled() == COUNT / 3; }));
  world.transport->AnswerHeld(Testing::Success("issued:" + Testing::BearerXml()));
  EXPECT_EQ(world.results.Wait(COUNT - COUNT / 3), Strings(COUNT - COUNT / 3, SUBJECT));
  for (const std::unique_ptr<EagerTask> &task : tasks) {
    if (task) {
      task->WaitUntilDone();
    }
  }
  EXPECT_TRUE(Eventually([&] { return world.transport->CountOpenSessions() == 0; }));
}

} // namespace
} // namespace SsoClient

#endif
