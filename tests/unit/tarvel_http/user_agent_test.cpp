// SPDX-License-Identifier: Apache-2.0
// The user agent over streams that a test holds in its hand. Over sockets it is tested in integration/transport.

#include "support/completion.h"
#include "support/throws_message.h"
#include "system/io_engine.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/user_agent.h>

#include <boost/asio/post.hpp>
#include <gtest/gtest.h>

#include <cstdint>
#include <mutex>
#include <stdexcept>
#include <string>
#include <utility>

namespace Tarvel {
namespace Http {
namespace {

constexpr std::int64_t LONG = 60 * 1000000;

/// Answers at the first read, and never takes a written byte before it is closed.
class AnsweringStream final : public System::Stream {
public:
  explicit AnsweringStream(std::string answer) : m_answer(std::move(answer)) {}

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    const std::size_t count = m_answer.copy(buffer, length);
    m_answer.erase(0, count);
    boost::asio::post(System::GetIoContext(), [handler, count] { handler(count, nullptr); });
  }

  void AsyncWrite(const char *, std::size_t, TransferHandler handler) override {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_write = std::move(handler);
  }

  void Close() noexcept override {
    TransferHandler write;
    {
      const std::lock_guard<std::mutex> lock(m_mutex);
      write = std::exchange(m_write, nullptr);
    }
    if (write) {
      boost::asio::post(System::GetIoContext(), [write] {
        const System::NetworkException closed("closed");
        write(0, &closed);
      });
    }
  }

private:
  std::mutex m_mutex;
  std::string m_answer;
  TransferHandler m_write;
};

/// Hands out one stream; without one it throws.
class OneStreamSpec : public CustomConnectionSpec {
public:
  explicit OneStreamSpec(const Ref<System::Stream> &stream) : m_stream(stream) {}

  std::string ToString() const override { return "one stream"; }
  std::string GetHost() const override { return "sts.example"; }
  std::string GetEndpointString() const override { return "sts.example:80"; }
  bool IsReuseOnAuthErrorSupported() const override { return false; }
  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    if (!m_stream) {
      throw InvalidStateException("nothing to connect to");
    }
    boost::asio::post(System::GetIoContext(), [completion, stream = m_stream] { completion(stream, nullptr); });
    return System::CreateStreamCanceller(m_stream);
  }

private:
  const Ref<System::Stream> m_stream;
};

class UserAgentTest : public testing::Test {
protected:
  Ref<UserAgent> Create(const Ref<System::Stream> &stream) {
    Ref<CookieStore> cookies;
    CreateCookieStore("", cookies);
    Ref<UserAgent> agent;
    CreateHttpUserAgent(MakeRef<OneStreamSpec>(stream), cookies, nullptr, agent);
    return agent;
  }

  static Ref<ClientRequest> Post() {
    Ref<ClientRequest> request;
    CreateHttpRequest("POST", "/", request);
    request->WriteBody("body");
    return request;
  }

  Ref<PendingRequestItem> m_pending;
  Ref<ClientResponse> m_response;
};

TEST_F(UserAgentTest, TakesAnAnswerThatComesBeforeTheRequestIsSent) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 413 Too Large\r\nContent-Length: 4\r\n\r\nbody"));
  agent->StartRequest(Post(), nullptr, m_pending);
  agent->WaitForRequest(m_pending, LONG, m_response);
  EXPECT_EQ(m_response->GetStatusCode(), 413);
  EXPECT_EQ(m_response->GetReasonPhrase(), "Too Large");
  EXPECT_EQ(m_response->ReadToEnd(100), "");
  EXPECT_TRUE(m_pending->IsDone());
}

TEST_F(UserAgentTest, HandsOutTheHeadersAndTheBodyInPieces) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nX-One: 1\r\nx-one: 2\r\n"
                                                     "Content-Length: 5\r\n\r\nhello"));
  agent->StartRequest(Post(), nullptr, m_pending);
  agent->WaitForRequest(m_pending, LONG, m_response);
  std::string value = "before";
  EXPECT_TRUE(m_response->GetHeader("X-ONE", value));
  EXPECT_EQ(value, "1");
  EXPECT_FALSE(m_response->GetHeader("X-Two", value));
  EXPECT_EQ(value, "1");
  char buffer[3];
  EXPECT_EQ(m_response->Read(buffer, 3), 3u);
  EXPECT_EQ(std::string(buffer, 3), "hel");
  EXPECT_EQ(m_response->ReadToEnd(100), "lo");
  EXPECT_EQ(m_response->Read(buffer, 3), 0u);
}

TEST_F(UserAgentTest, CallsTheCompletionFunctionOnceBeforeTheWaitReturns) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"));
  int calls = 0;
  Ref<PendingRequestItem> seen;
  agent->StartRequest(
      Post(),
      [&](const Exception *failure, const Ref<ClientResponse> &response, const Ref<PendingRequestItem> &item) {
        ++calls;
        seen = item;
        EXPECT_EQ(failure, nullptr);
        EXPECT_TRUE(response);
        EXPECT_FALSE(item->IsDone());
      },
      m_pending);
  agent->WaitForRequest(m_pending, LONG, m_response);
  EXPECT_EQ(calls, 1);
  EXPECT_EQ(seen, m_pending);
  m_pending->Cancel();
  agent->WaitForRequest(m_pending, 0, m_response);
  EXPECT_EQ(calls, 1);
}

TEST_F(UserAgentTest, SurvivesACompletionFunctionThatThrows) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"));
  agent->StartRequest(
      Post(),
      [](const Exception *, const Ref<ClientResponse> &, const Ref<PendingRequestItem> &) {
        throw std::runtime_error("thrown by the test");
      },
      m_pending);
  agent->WaitForRequest(m_pending, LONG, m_response);
  EXPECT_EQ(m_response->GetStatusCode(), 200);
}

TEST_F(UserAgentTest, StartsNothingWhenTheSpecificationThrows) {
  const auto agent = Create(nullptr);
  bool wasCalled = false;
  EXPECT_THROWS_MESSAGE(
      agent->StartRequest(
          Post(),
          [&](const Exception *, const Ref<ClientResponse> &, const Ref<PendingRequestItem> &) { wasCalled = true; },
          m_pending),
      InvalidStateException, "nothing to connect to");
  EXPECT_FALSE(m_pending);
  EXPECT_FALSE(wasCalled);
}

TEST_F(UserAgentTest, RefusesWhatItCannotWorkWith) {
  const auto agent = Create(MakeRef<AnsweringStream>(""));
  EXPECT_THROWS_MESSAGE(agent->StartRequest(nullptr, nullptr, m_pending), InvalidArgumentException,
                        "Invalid argument : the HTTP request was not made by CreateHttpRequest.");
  EXPECT_THROWS_MESSAGE(agent->WaitForRequest(nullptr, LONG, m_response), InvalidArgumentException,
                        "Invalid argument : the item to wait for is no started HTTP request.");
  Ref<CookieStore> cookies;
  Ref<UserAgent> other;
  EXPECT_THROWS_MESSAGE(CreateHttpUserAgent(MakeRef<OneStreamSpec>(nullptr), cookies, nullptr, other),
                        InvalidArgumentException,
                        "Invalid argument : a user agent needs a connection specification and a cookie store.");
  class Pool final : public ConnectionPool {};
  CreateCookieStore("", cookies);
  EXPECT_THROWS_MESSAGE(
      CreateHttpUserAgent(MakeRef<OneStreamSpec>(nullptr), cookies, MakeRef<Pool>(), other), InvalidArgumentException,
      "Invalid argument : a user agent opens one connection for each request; connection pools are not offered.");
}

/// Says that it has connected, and has no stream to show for it.
class EmptyHandedSpec final : public OneStreamSpec {
public:
  EmptyHandedSpec() : OneStreamSpec(nullptr) {}

  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    boost::asio::post(System::GetIoContext(), [completion] { completion(nullptr, nullptr); });
    return nullptr;
  }
};

TEST_F(UserAgentTest, ReportsASpecificationThatGivesNeitherAStreamNorAFailure) {
  Ref<CookieStore> cookies;
  CreateCookieStore("", cookies);
  Ref<UserAgent> agent;
  CreateHttpUserAgent(MakeRef<EmptyHandedSpec>(), cookies, nullptr, agent);
  agent->StartRequest(Post(), nullptr, m_pending);
  EXPECT_THROWS_MESSAGE(agent->WaitForRequest(m_pending, LONG, m_response), InvalidStateException,
                        "A connection specification reported neither a stream nor a failure");
}

TEST_F(UserAgentTest, StartsARequestOnlyOnce) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"));
  const Ref<ClientRequest> request = Post();
  agent->StartRequest(request, nullptr, m_pending);
  Ref<PendingRequestItem> second;
  EXPECT_THROWS_MESSAGE(agent->StartRequest(request, nullptr, second), InvalidStateException,
                        "The HTTP request has been started already");
  agent->WaitForRequest(m_pending, LONG, m_response);
}

} // namespace
} // namespace Http
} // namespace Tarvel
