// SPDX-License-Identifier: Apache-2.0
// The user agent with streams, cookie stores and connection specifications that throw or break their contract.

#include "support/throws_message.h"
#include "system/io_engine.h"
#include "unit/tarvel_http/user_agent_fixture.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/user_agent.h>

#include <boost/asio/post.hpp>
#include <gtest/gtest.h>

#include <cstddef>
#include <functional>
#include <new>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

namespace Tarvel::Http {
namespace {

/// Reports that it has connected, but without a stream.
class StreamlessSpec final : public OneStreamSpec {
public:
  StreamlessSpec() : OneStreamSpec(nullptr) {}

  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    boost::asio::post(System::GetIoContext(), [completion] { completion(nullptr, nullptr); });
    return nullptr;
  }
};

TEST_F(UserAgentTest, ReportsASpecificationThatGivesNeitherAStreamNorAFailure) {
  const Ref<UserAgent> agent = CreateHttpUserAgent(MakeRef<StreamlessSpec>(), m_cookies);
  agent->StartRequest(Post(), nullptr, m_pending);
  EXPECT_THROWS_MESSAGE(agent->WaitForRequest(m_pending, LONG, m_response), InvalidStateException,
                        "A connection specification reported neither a stream nor a failure");
}

/// Something that foreign code may throw, and what the completion function gets then.
struct Thrown {
  std::function<void()> raise;
  std::string message;
};

const Thrown THROWN[] = {
    {[] { throw std::bad_alloc(); }, "OutOfMemoryException: There is not enough memory"},
    {[] { throw std::runtime_error("foreign"); },
     "InvalidStateException: The request to sts.example:80 failed: foreign"},
    {[] { throw 42; },
     "InvalidStateException: The request to sts.example:80 failed: an object that is not an exception was thrown"},
    {[] { throw System::TimeoutException("too late"); }, "TimeoutException: too late"},
};

std::string Describe(const Exception &exception) {
  for (const auto &[isClass, name] :
       {std::pair(dynamic_cast<const OutOfMemoryException *>(&exception) != nullptr, "OutOfMemoryException: "),
        std::pair(dynamic_cast<const InvalidStateException *>(&exception) != nullptr, "InvalidStateException: "),
        std::pair(dynamic_cast<const System::TimeoutException *>(&exception) != nullptr, "TimeoutException: ")}) {
    if (isClass) {
      return std::string(name) + exception.what();
    }
  }
  return exception.what();
}

enum class Place { WRITE, READ, COOKIES, HOST };

/// Throws at one place; otherwise it passes everything on to an `AnsweringStream`.
class ThrowingStream final : public System::Stream {
public:
  ThrowingStream(Place place, std::function<void()> raise)
      : m_place(place), m_raise(std::move(raise)),
        m_answer(MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nSet-Cookie: a=b\r\nContent-Length: 0\r\n\r\n")) {}

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    if (m_place == Place::READ) {
      m_raise();
    }
    m_answer->AsyncReadSome(buffer, length, std::move(handler));
  }
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override {
    if (m_place == Place::WRITE) {
      m_raise();
    }
    m_answer->AsyncWrite(bytes, length, std::move(handler));
  }
  void Close() noexcept override { m_answer->Close(); }

private:
  const Place m_place;
  const std::function<void()> m_raise;
  const Ref<AnsweringStream> m_answer;
};

class ThrowingCookies final : public CookieStore {
public:
  explicit ThrowingCookies(std::function<void()> raise) : m_raise(std::move(raise)) {}
  void SetFromHeader(std::string_view, std::string_view, std::string_view, bool) override { m_raise(); }
  std::string GetHeader(std::string_view, std::string_view, bool) const override { return {}; }
  std::size_t GetCount() const override { return 0; }

private:
  const std::function<void()> m_raise;
};

/// Throws when its host is requested.
class HostlessSpec final : public OneStreamSpec {
public:
  HostlessSpec(const Ref<System::Stream> &stream, std::function<void()> raise)
      : OneStreamSpec(stream), m_raise(std::move(raise)) {}
  std::string GetHost() const override {
    m_raise();
    return OneStreamSpec::GetHost();
  }

private:
  const std::function<void()> m_raise;
};

TEST_F(UserAgentTest, CallsTheCompletionFunctionOnceWhenForeignCodeThrows) {
  for (const Thrown &thrown : THROWN) {
    for (const Place place : {Place::WRITE, Place::READ, Place::COOKIES, Place::HOST}) {
      const auto stream = MakeRef<ThrowingStream>(place, thrown.raise);
      const Ref<CookieStore> cookies =
          MakeRef<ThrowingCookies>(place == Place::COOKIES ? thrown.raise : std::function<void()>([] {}));
      const Ref<ConnectionSpec> spec =
          MakeRef<HostlessSpec>(stream, place == Place::HOST ? thrown.raise : std::function<void()>([] {}));
      const Ref<UserAgent> agent = CreateHttpUserAgent(spec, cookies);
      int calls = 0;
      std::string message;
      agent->StartRequest(
          Post(),
          [&](const Exception *failure, const Ref<ClientResponse> &response, const Ref<PendingRequestItem> &) {
            ++calls;
            EXPECT_FALSE(response);
            message = failure ? Describe(*failure) : "success";
          },
          m_pending);
      EXPECT_ANY_THROW(agent->WaitForRequest(m_pending, LONG, m_response));
      EXPECT_EQ(calls, 1);
      EXPECT_EQ(message, thrown.message) << static_cast<int>(place);
    }
  }
}

/// Calls back a number of times, within the starting call, and then throws.
class HastySpec final : public OneStreamSpec {
public:
  HastySpec(const Ref<System::Stream> &stream, int calls, bool fails)
      : OneStreamSpec(stream), m_stream(stream), m_calls(calls), m_fails(fails) {}
  Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override {
    const System::NetworkException failure("failed");
    for (int i = 0; i < m_calls; ++i) {
      completion(m_fails ? nullptr : m_stream, m_fails ? &failure : nullptr);
    }
    m_kept = completion;
    throw InvalidStateException("thrown after the call");
  }
  void CallAgain() const { std::exchange(m_kept, nullptr)(m_stream, nullptr); }

private:
  const Ref<System::Stream> m_stream;
  const int m_calls;
  const bool m_fails;
  mutable ConnectCompletion m_kept;
};

TEST_F(UserAgentTest, EitherThrowsOrCallsTheCompletionFunctionOnceWhateverTheSpecificationDoes) {
  for (const int connectCalls : {0, 1, 2}) {
    for (const bool fails : {false, true}) {
      const auto stream = MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n");
      const auto spec = MakeRef<HastySpec>(stream, connectCalls, fails);
      const Ref<UserAgent> agent = CreateHttpUserAgent(spec, m_cookies);
      int calls = 0;
      const auto count = [&](const Exception *, const Ref<ClientResponse> &, const Ref<PendingRequestItem> &) {
        ++calls;
      };
      if (connectCalls == 0) {
        EXPECT_THROWS_MESSAGE(agent->StartRequest(Post(), count, m_pending), InvalidStateException,
                              "thrown after the call");
        EXPECT_FALSE(m_pending);
        spec->CallAgain();
        EXPECT_EQ(calls, 0);
        EXPECT_EQ(stream->GetWriteCount(), 0);
        continue;
      }
      agent->StartRequest(Post(), count, m_pending);
      if (fails) {
        EXPECT_THROWS_MESSAGE(agent->WaitForRequest(m_pending, LONG, m_response), System::NetworkException, "failed");
      } else {
        agent->WaitForRequest(m_pending, LONG, m_response);
      }
      spec->CallAgain();
      EXPECT_EQ(calls, 1);
      EXPECT_EQ(stream->GetWriteCount(), fails ? 0 : 1);
    }
  }
}

} // namespace
} // namespace Tarvel::Http
