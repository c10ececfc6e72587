// SPDX-License-Identifier: Apache-2.0
// Whether a failed request may have reached the server, so that sending it again might repeat its effect.

#include "user_agent_fixture.h"

#include "support/rendezvous.h"
#include "system/io_engine.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/user_agent.h>

#include <boost/asio/post.hpp>
#include <gtest/gtest.h>

#include <functional>
#include <mutex>
#include <string>
#include <utility>

namespace Tarvel::Http {
namespace {

using Testing::EventCount;

const System::NetworkException REFUSED("refused");

/// Ends the connect when the test decides.
class HeldSpec final : public OneStreamSpec {
public:
  using OneStreamSpec::OneStreamSpec;

  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_completion = std::move(completion);
    return {};
  }

  void End(const Ref<System::Stream> &stream, const Exception *failure) const {
    ConnectCompletion completion;
    {
      const std::lock_guard<std::mutex> lock(m_mutex);
      completion.swap(m_completion);
    }
    completion(stream, failure);
  }

private:
  mutable std::mutex m_mutex;
  mutable ConnectCompletion m_completion;
};

/// Breaks at the first read or write.
class BreakingStream final : public System::Stream {
public:
  void AsyncReadSome(char *, std::size_t, TransferHandler handler) override {
    boost::asio::post(System::GetIoContext(), [handler] { handler(0, &REFUSED); });
  }
  void AsyncWrite(const char *, std::size_t, TransferHandler handler) override {
    boost::asio::post(System::GetIoContext(), [handler] { handler(0, &REFUSED); });
  }
  void Close() noexcept override {}
};

class HasConnected : public UserAgentTest {
protected:
  /// Starts a request, lets `step` end or cancel it, and returns what `HasConnected` reports in the completion.
  bool ReadAfter(const std::function<void()> &step) {
    bool hasConnected = false;
    EventCount ended;
    const Ref<UserAgent> agent = CreateHttpUserAgent(m_spec, m_cookies);
    agent->StartRequest(
        Post(),
        [&](const Exception *failure, const Ref<ClientResponse> &, const Ref<PendingRequestItem> &item) {
          EXPECT_TRUE(failure);
          hasConnected = item->HasConnected();
          ended.Add();
        },
        m_pending);
    EXPECT_FALSE(m_pending->HasConnected());
    step();
    EXPECT_TRUE(ended.WaitFor(1));
    EXPECT_EQ(m_pending->HasConnected(), hasConnected) << "it changed after the completion function";
    return hasConnected;
  }

  const Ref<System::Stream> m_stream = MakeRef<BreakingStream>();
  const Ref<HeldSpec> m_spec = MakeRef<HeldSpec>(m_stream);
};

TEST_F(HasConnected, IsFalseWhenTheConnectionIsRefused) {
  EXPECT_FALSE(ReadAfter([this] { m_spec->End(nullptr, &REFUSED); }));
}

TEST_F(HasConnected, IsFalseWhenTheHandshakeOfAConnectionFails) {
  EXPECT_FALSE(ReadAfter([this] { m_spec->End(m_stream, &REFUSED); }));
}

TEST_F(HasConnected, IsFalseWhenTheRequestIsCancelledWhileItConnects) {
  EXPECT_FALSE(ReadAfter([this] {
    m_pending->Cancel();
    m_spec->End(nullptr, &REFUSED);
  }));
}

TEST_F(HasConnected, IsFalseWhenTheConnectSucceedsOnlyAfterTheRequestWasCancelled) {
  EXPECT_FALSE(ReadAfter([this] {
    m_pending->Cancel();
    m_spec->End(m_stream, nullptr);
  }));
}

TEST_F(HasConnected, IsTrueWhenTheConnectionBreaks) {
  EXPECT_TRUE(ReadAfter([this] { m_spec->End(m_stream, nullptr); }));
}

TEST_F(HasConnected, IsTrueAfterAResponse) {
  const auto stream = MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n");
  EXPECT_NE(Send(stream), "");
  EXPECT_TRUE(m_pending->HasConnected());
}

} // namespace
} // namespace Tarvel::Http
