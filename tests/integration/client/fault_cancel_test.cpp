// SPDX-License-Identifier: Apache-2.0
// An operation ends at each stage of the exchange, although the service is silent, when it is cancelled, when its
// deadline passes, and when its client is destroyed. Its connection is closed, too. In the first two cases, the client
// still exists.

#include "integration/client/fault_service.h"
#include "support/operation_forms.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/sanitized.h"
#include "system/name_lookup.h"

#include <gtest/gtest.h>

#include <boost/asio/ip/address_v4.hpp>

#include <chrono>
#include <future>
#include <memory>
#include <ostream>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;
using namespace std::chrono_literals;

/// What the service has seen. Shared with its scripts.
struct Seen {
  EventCount reached; ///< connections that are at the stage
  EventCount ended;   ///< those that the client has ended then
};

struct Stage {
  std::string name;
  bool isSecure;
  std::function<void(ServerConnection &)> reach;
};

void PrintTo(const Stage &stage, std::ostream *out) {
  *out << stage.name;
}

/// Completes the handshake, reads the request and writes these bytes.
Stage After(const std::string &name, bool isSecure, const std::string &bytes) {
  return {name, isSecure, Reply(bytes)};
}

const std::string HEADER = "HTTP/1.1 200 OK\r\nContent-Length: 100000\r\n\r\n";

const Stage STAGES[] = {
    After("BeforeTheAnswerOverTcp", false, ""),
    After("BeforeTheAnswerOverTls", true, ""),
    After("WithinTheHeaderOverTcp", false, "HTTP/1.1 200 OK\r\nCont"),
    After("WithinTheHeaderOverTls", true, "HTTP/1.1 200 OK\r\nCont"),
    After("WithinTheBodyOverTcp", false, HEADER + "<a>"),
    After("WithinTheBodyOverTls", true, HEADER + "<a>"),
    {"BeforeTheHandshake", true, [](ServerConnection &) {}},
    {"WithinTheHandshake", true,
     [](ServerConnection &peer) {
       peer.ReadRawSome();
       peer.WriteRaw("\x16\x03\x03"); // the beginning of a record
     }},
};

class SilentService : public testing::TestWithParam<Stage> {
protected:
  static std::shared_ptr<const SamlToken> Run(Form form, const TokenClient &client, const CallOptions &options) {
    return Acquire(form, client, AnyCredential(), AnySpec(), options);
  }

  /// The outcome of an operation, which runs on another thread.
  std::future<std::string> Start(Form form, const CallOptions &options) const {
    return std::async(std::launch::async, [form, options, client = m_client.get()] {
      return OutcomeOf([&] { return Run(form, *client, options); });
    });
  }

  const std::shared_ptr<Seen> m_seen = std::make_shared<Seen>();
  FaultService m_service{[stage = GetParam(), seen = m_seen](ServerConnection &peer) {
                           stage.reach(peer);
                           seen->reached.Add();
                           peer.Stall();
                           seen->ended.Add();
                         },
                         GetParam().isSecure};
  std::unique_ptr<TokenClient> m_client = m_service.CreateClient();
};

TEST_P(SilentService, LosesTheConnectionAtOnceWhenTheOperationIsCancelled) {
  int operations = 0;
  for (const Form form : AllForms()) {
    ++operations;
    const CancelSource source;
    CallOptions options;
    options.cancelToken = source.GetToken();
    std::future<std::string> outcome = Start(form, options);
    ASSERT_TRUE(m_seen->reached.WaitFor(operations));
    source.Cancel();
    EXPECT_EQ(outcome.get(), CANCELLED) << NameOf(form);
    EXPECT_TRUE(m_seen->ended.WaitFor(operations)) << NameOf(form);
  }
  m_service.Repair();
  EXPECT_EQ(OutcomeOf([&] { return Run(Form::WAITING, *m_client, {}); }), "token");
}

TEST_P(SilentService, LosesTheConnectionAtTheDeadline) {
  int operations = 0;
  for (const Form form : AllForms()) {
    ++operations;
    EXPECT_EQ(Start(form, CallOptions::WithTimeout(50ms)).get(), LATE) << NameOf(form);
  }
  // A deadline may pass before the connection is at the stage.
  EXPECT_TRUE(Eventually([this] { return m_service.GetServer().GetOpenCount() == 0; }));
  m_service.Repair();
  EXPECT_EQ(OutcomeOf([&] { return Run(Form::WAITING, *m_client, {}); }), "token");
}

TEST_P(SilentService, LosesTheConnectionWhenTheClientIsDestroyed) {
  const auto promise = std::make_shared<std::promise<TokenPtr>>();
  m_client->AcquireAsync(AnyCredential(), AnySpec(), {}, Fulfil(promise));
  auto future = m_client->AcquireFuture(AnyCredential(), AnySpec(), {});
  ASSERT_TRUE(m_seen->reached.WaitFor(2));
  m_client.reset();
  EXPECT_EQ(OutcomeOf([&] { return Await(promise->get_future()); }), CLIENT_DESTROYED);
  EXPECT_EQ(OutcomeOf([&] { return Await(std::move(future)); }), CLIENT_DESTROYED);
  EXPECT_TRUE(m_seen->ended.WaitFor(2));
}

INSTANTIATE_TEST_SUITE_P(At, SilentService, testing::ValuesIn(STAGES),
                         [](const testing::TestParamInfo<Stage> &test) { return test.param.name; });

/// A service that sends its answer byte by byte. Each byte would extend a time-out that counted from the previous byte.
class DrippingService : public testing::TestWithParam<bool> {
protected:
  FaultService m_service{[](ServerConnection &peer) {
                           Reply("HTTP/1.1 200 OK\r\nContent-Length: 100000\r\n\r\n")(peer);
                           while (peer.Write("x")) {
                             std::this_thread::sleep_for(1ms);
                           }
                         },
                         GetParam()};
  const std::unique_ptr<TokenClient> m_client = m_service.CreateClient();
};

TEST_P(DrippingService, LosesTheConnectionWhenTheOperationIsCancelled) {
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  auto future = m_client->AcquireFuture(AnyCredential(), AnySpec(), options);
  ASSERT_TRUE(Eventually([this] { return m_service.GetServer().GetOpenCount() == 1; }));
  source.Cancel();
  EXPECT_EQ(OutcomeOf([&] { return Await(std::move(future)); }), CANCELLED);
  EXPECT_TRUE(Eventually([this] { return m_service.GetServer().GetOpenCount() == 0; }));
}

TEST_P(DrippingService, LosesTheConnectionAtTheDeadline) {
  for (const Form form : AllForms()) {
    const CallOptions options = CallOptions::WithTimeout(50ms);
    EXPECT_EQ(OutcomeOf([&] { return Acquire(form, *m_client, AnyCredential(), AnySpec(), options); }), LATE)
        << NameOf(form);
  }
  EXPECT_TRUE(Eventually([this] { return m_service.GetServer().GetOpenCount() == 0; }));
}

INSTANTIATE_TEST_SUITE_P(Over, DrippingService, testing::Bool(), [](const testing::TestParamInfo<bool> &test) {
  return std::string(test.param ? "Tls" : "Tcp");
});

class ClientConnections : public testing::TestWithParam<bool> {};

TEST_P(ClientConnections, AreNotOpenedForAnOperationThatHasEndedBeforeItBegins) {
  FaultService service(Reply(TokenResponse()), GetParam());
  const auto client = service.CreateClient();
  const CancelSource source;
  source.Cancel();
  CallOptions cancelled = CallOptions::WithTimeout(-1ms);
  cancelled.cancelToken = source.GetToken();
  for (const Form form : AllForms()) {
    const auto outcome = [&](const CallOptions &options) {
      return OutcomeOf([&] { return Acquire(form, *client, AnyCredential(), AnySpec(), options); });
    };
    EXPECT_EQ(outcome(cancelled), CANCELLED) << NameOf(form);
    EXPECT_EQ(outcome(CallOptions::WithTimeout(-1ms)), LATE) << NameOf(form);
  }
  EXPECT_EQ(service.GetServer().GetConnectionCount(), 0);
  EXPECT_EQ(OutcomeOf([&] { return client->Acquire(AnyCredential(), AnySpec()); }), "token");
}

TEST_P(ClientConnections, LeaveNoDescriptorAndNoThreadAfterTwoThousandCancels) {
  constexpr int BATCH = 100;
  constexpr int BATCHES = IS_SANITIZED ? 3 : 20;
  const auto seen = std::make_shared<Seen>();
  FaultService service(
      [seen](ServerConnection &peer) {
        Reply("")(peer);
        seen->reached.Add();
        peer.Stall();
      },
      GetParam());
  const auto client = service.CreateClient();
  std::size_t descriptors = 0;
  std::size_t threads = 0;
  for (int batch = 0; batch <= BATCHES; ++batch) {
    const CancelSource source;
    CallOptions options;
    options.cancelToken = source.GetToken();
    std::vector<std::future<TokenPtr>> outcomes;
    for (int i = 0; i < BATCH; ++i) {
      outcomes.push_back(client->AcquireFuture(AnyCredential(), AnySpec(), options));
    }
    ASSERT_TRUE(seen->reached.WaitFor((batch + 1) * BATCH));
    source.Cancel();
    for (auto &outcome : outcomes) {
      ASSERT_EQ(OutcomeOf([&] { return Await(std::move(outcome)); }), CANCELLED);
    }
    ASSERT_TRUE(Eventually([&] { return service.GetServer().GetOpenCount() == 0; }));
    if (batch == 0) { // all threads that later operations use have started
      std::size_t previous = 0;
      ASSERT_TRUE(Eventually([&] { return std::exchange(previous, CountDescriptors()) == CountDescriptors(); }));
      descriptors = CountDescriptors();
      threads = CountThreads();
    }
  }
  EXPECT_TRUE(Eventually([&] { return CountDescriptors() <= descriptors; })) << CountDescriptors() << descriptors;
  EXPECT_TRUE(Eventually([&] { return CountThreads() <= threads; })) << CountThreads() << " " << threads;
}

INSTANTIATE_TEST_SUITE_P(Over, ClientConnections, testing::Bool(), [](const testing::TestParamInfo<bool> &test) {
  return std::string(test.param ? "Tls" : "Tcp");
});

/// A resolver that does not answer before the gate opens.
class SilentResolver : public testing::Test {
protected:
  SilentResolver()
      : m_lookup([gate = m_gate](const std::string &) {
          gate->Pass();
          return Tarvel::System::AddressList{boost::asio::ip::address_v4::loopback()};
        }) {}
  ~SilentResolver() override { m_gate->Open(); }

  const std::shared_ptr<Gate> m_gate = std::make_shared<Gate>();
  FaultService m_service{Reply(TokenResponse()), false};

private:
  const Tarvel::System::ScopedNameLookup m_lookup;
};

TEST_F(SilentResolver, DoesNotDelayOperationsThatAreCancelledLateOrWithoutTheirClient) {
  auto client = std::make_unique<TokenClient>(m_service.GetConfig("sts-without-answer.example"));
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  auto cancelled = client->AcquireFuture(AnyCredential(), AnySpec(), options);
  auto late = client->AcquireFuture(AnyCredential(), AnySpec(), CallOptions::WithTimeout(50ms));
  auto destroyed = client->AcquireFuture(AnyCredential(), AnySpec(), {});
  ASSERT_TRUE(m_gate->WaitForArrivals(1));
  source.Cancel();
  EXPECT_EQ(OutcomeOf([&] { return Await(std::move(cancelled)); }), CANCELLED);
  EXPECT_EQ(OutcomeOf([&] { return Await(std::move(late)); }), LATE);
  EXPECT_EQ(OutcomeOf([&] { return client->Acquire(AnyCredential(), AnySpec(), CallOptions::WithTimeout(50ms)); }),
            LATE);
  client.reset();
  EXPECT_EQ(OutcomeOf([&] { return Await(std::move(destroyed)); }), CLIENT_DESTROYED);
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 0);

  m_gate->Open();
  const TokenClient next(m_service.GetConfig("sts-without-answer.example"));
  EXPECT_EQ(OutcomeOf([&] { return next.Acquire(AnyCredential(), AnySpec()); }), "token");
  EXPECT_EQ(m_service.GetServer().GetConnectionCount(), 1);
}

} // namespace
} // namespace SsoClient
