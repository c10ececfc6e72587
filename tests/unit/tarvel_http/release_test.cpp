// SPDX-License-Identifier: Apache-2.0
// When a request releases what its host has made. The test calls all handlers itself, and keeps them as long as an I/O
// thread that is late.

#include "support/throws_message.h"
#include "unit/tarvel_http/user_agent_fixture.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/user_agent.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstddef>
#include <future>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace Tarvel::Http {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

/// What one request has started, and which objects of the host have been destroyed.
struct Record {
  std::vector<std::string> destroyed;
  ConnectionSpec::ConnectCompletion connect;
  System::Stream::TransferHandler write;
  System::Stream::TransferHandler read;
  char *buffer = nullptr;
  bool isReadRefused = false;
};

/// A member of an object of the host.
class Trace {
public:
  Trace(Record &record, std::string name) : m_record(record), m_name(std::move(name)) {}
  Trace(const Trace &) = delete;
  Trace &operator=(const Trace &) = delete;
  ~Trace() { m_record.destroyed.push_back(m_name); }

  Record &GetRecord() const { return m_record; }

private:
  Record &m_record;
  const std::string m_name;
};

class HostStream final : public System::Stream {
public:
  explicit HostStream(Record &record) : m_trace(record, "stream") {}
  void AsyncReadSome(char *buffer, std::size_t, TransferHandler handler) override {
    m_trace.GetRecord().buffer = buffer;
    m_trace.GetRecord().read = std::move(handler);
    if (m_trace.GetRecord().isReadRefused) {
      throw System::NetworkException("refused");
    }
  }
  void AsyncWrite(const char *, std::size_t, TransferHandler handler) override {
    m_trace.GetRecord().write = std::move(handler);
  }
  void Close() noexcept override {}

private:
  const Trace m_trace;
};

class HostSpec final : public OneStreamSpec {
public:
  explicit HostSpec(Record &record) : OneStreamSpec(nullptr), m_trace(record, "specification") {}
  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    m_trace.GetRecord().connect = std::move(completion);
    return nullptr;
  }

private:
  const Trace m_trace;
};

class HostCookies final : public CookieStore {
public:
  explicit HostCookies(Record &record) : m_trace(record, "cookies") {}
  void SetFromHeader(std::string_view, std::string_view, std::string_view, bool) override {}
  std::string GetHeader(std::string_view, std::string_view, bool) const override { return {}; }
  std::size_t GetCount() const override { return 0; }

private:
  const Trace m_trace;
};

/// A connect that fails. The request is handling the failure when the starting call returns.
class FailingSpec final : public OneStreamSpec {
public:
  explicit FailingSpec(Record &record) : OneStreamSpec(nullptr), m_record(record) {}

  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    m_thread = std::thread([this, completion = std::move(completion)] { completion(nullptr, &m_failure); });
    m_failure.isHandled.get_future().wait();
    return MakeRef<Item>(m_record);
  }

  void EndConnect() const {
    m_failure.mayEnd.set_value();
    m_thread.join();
  }

private:
  class Item final : public System::ScheduledItem {
  public:
    explicit Item(Record &record) : m_trace(record, "item") {}
    void Cancel() noexcept override {}
    bool IsDone() const noexcept override { return true; }

  private:
    const Trace m_trace;
  };

  class Failure final : public System::NetworkException {
  public:
    Failure() : NetworkException("failed") {}
    [[noreturn]] void Throw() const override {
      isHandled.set_value();
      mayEnd.get_future().wait();
      throw System::NetworkException(*this);
    }
    mutable std::promise<void> isHandled;
    mutable std::promise<void> mayEnd;
  };

  Record &m_record;
  mutable Failure m_failure;
  mutable std::thread m_thread;
};

class UserAgentReleaseTest : public UserAgentTest {
protected:
  void TearDown() override { m_pending.reset(); }

  /// Starts a request whose host's objects nothing else shares.
  void Start() {
    const auto agent = CreateHttpUserAgent(MakeRef<HostSpec>(m_record), MakeRef<HostCookies>(m_record));
    agent->StartRequest(
        Post(),
        [this](const Exception *, const Ref<ClientResponse> &, const Ref<PendingRequestItem> &) {
          m_destroyedBefore = m_record.destroyed;
        },
        m_pending);
  }

  void Connect() { m_record.connect(MakeRef<HostStream>(m_record), nullptr); }

  void Answer() {
    static constexpr std::string_view ANSWER = "HTTP/1.1 200 OK\r\nSet-Cookie: a=b\r\nContent-Length: 0\r\n\r\n";
    m_record.read(ANSWER.copy(m_record.buffer, ANSWER.size()), nullptr);
  }

  Record m_record;
  std::vector<std::string> m_destroyedBefore; ///< before the completion function was called
};

TEST_F(UserAgentReleaseTest, ReleasesTheHostsObjectsBeforeItReportsAResponse) {
  Start();
  Connect();
  EXPECT_THAT(m_record.destroyed, IsEmpty());
  Answer();
  EXPECT_THAT(m_destroyedBefore, UnorderedElementsAre("specification", "cookies", "stream"));
}

TEST_F(UserAgentReleaseTest, ReleasesTheHostsObjectsBeforeItReportsAFailure) {
  const System::NetworkException failure("failed");
  Start();
  Connect();
  m_record.read(0, &failure);
  EXPECT_THAT(m_destroyedBefore, UnorderedElementsAre("specification", "cookies", "stream"));
}

TEST_F(UserAgentReleaseTest, ReleasesTheHostsObjectsBeforeItReportsThatItCouldNotConnect) {
  const System::NetworkException failure("failed");
  Start();
  m_record.connect(nullptr, &failure);
  EXPECT_THAT(m_destroyedBefore, UnorderedElementsAre("specification", "cookies"));
}

TEST_F(UserAgentReleaseTest, ReleasesTheHostsObjectsBeforeItReportsThatItWasCancelled) {
  Start();
  m_pending->Cancel();
  Connect();
  EXPECT_THAT(m_destroyedBefore, UnorderedElementsAre("specification", "cookies"));
  EXPECT_THAT(m_record.destroyed, UnorderedElementsAre("specification", "cookies", "stream"));
}

TEST_F(UserAgentReleaseTest, ReleasesTheItemOfAConnectThatHasEndedBeforeItsStartReturns) {
  const auto spec = MakeRef<FailingSpec>(m_record);
  CreateHttpUserAgent(spec, m_cookies)->StartRequest(Post(), nullptr, m_pending);
  EXPECT_THAT(m_record.destroyed, ElementsAre("item"));
  spec->EndConnect();
}

TEST_F(UserAgentReleaseTest, IgnoresAnAnswerOverAStreamThatHasThrown) {
  m_record.isReadRefused = true;
  Start();
  Connect();
  EXPECT_THAT(m_destroyedBefore, UnorderedElementsAre("specification", "cookies"));
  Answer();
  EXPECT_THROWS_MESSAGE(Create(nullptr)->WaitForRequest(m_pending, LONG, m_response), System::NetworkException,
                        "refused");
}

} // namespace
} // namespace Tarvel::Http
