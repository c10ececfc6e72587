// SPDX-License-Identifier: Apache-2.0
// The user agent over streams that a test controls. integration/transport tests it over sockets.

#include "support/completion.h"
#include "support/throws_message.h"
#include "system/io_engine.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/user_agent.h>

#include <boost/asio/post.hpp>
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <mutex>
#include <new>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

namespace Tarvel::Http {
namespace {

constexpr std::int64_t LONG = 60 * 1000000;

/// Answers at the first read. A write never ends before the stream is closed.
class AnsweringStream : public System::Stream {
public:
  explicit AnsweringStream(std::string answer) : m_answer(std::move(answer)) {}

  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override {
    const std::size_t count = m_answer.copy(buffer, length);
    m_answer.erase(0, count);
    boost::asio::post(System::GetIoContext(), [handler, count] { handler(count, nullptr); });
  }

  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_written.assign(bytes, length);
    ++m_writes;
    m_write = std::move(handler);
  }

  /// What the last write was to send.
  std::string GetWritten() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_written;
  }

  int GetWriteCount() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_writes;
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
  std::string m_written;
  int m_writes = 0;
};

/// A host's own stream that encrypts, or so it says.
class SecureStream final : public AnsweringStream {
public:
  using AnsweringStream::AnsweringStream;
  bool IsSecure() const noexcept override { return true; }
};

/// Connects to one stream; without one it throws.
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
    return CreateHttpUserAgent(MakeRef<OneStreamSpec>(stream), m_cookies);
  }

  static Ref<ClientRequest> Post() {
    Ref<ClientRequest> request = CreateHttpRequest("POST", "/");
    request->WriteBody("body");
    return request;
  }

  /// What the user agent writes to `stream` for a request.
  std::string Send(const Ref<AnsweringStream> &stream) {
    const Ref<UserAgent> agent = Create(stream);
    agent->StartRequest(Post(), nullptr, m_pending);
    agent->WaitForRequest(m_pending, LONG, m_response);
    return stream->GetWritten();
  }

  const Ref<CookieStore> m_cookies = CreateCookieStore();
  Ref<PendingRequestItem> m_pending;
  Ref<ClientResponse> m_response;
};

TEST_F(UserAgentTest, AcceptsAnAnswerThatArrivesBeforeTheRequestIsSent) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 413 Too Large\r\nContent-Length: 4\r\n\r\nbody"));
  agent->StartRequest(Post(), nullptr, m_pending);
  agent->WaitForRequest(m_pending, LONG, m_response);
  EXPECT_EQ(m_response->GetStatusCode(), 413);
  EXPECT_EQ(m_response->GetReasonPhrase(), "Too Large");
  EXPECT_EQ(m_response->ReadToEnd(100), "");
  EXPECT_TRUE(m_pending->IsDone());
}

TEST_F(UserAgentTest, ReturnsTheHeadersAndTheBodyInPieces) {
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

TEST_F(UserAgentTest, ReturnsALatin1BodyAsUtf8AndItsHeadersUnchanged) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nContent-Type: text/xml;charset=iso-8859-1\r\n"
                                                     "Content-Length: 1\r\n\r\n\xFC"));
  agent->StartRequest(Post(), nullptr, m_pending);
  agent->WaitForRequest(m_pending, LONG, m_response);
  EXPECT_EQ(m_response->GetDeclaredCharset(), "iso-8859-1");
  std::string value;
  EXPECT_TRUE(m_response->GetHeader("Content-Type", value));
  EXPECT_EQ(value, "text/xml;charset=iso-8859-1");
  EXPECT_EQ(m_response->ReadToEnd(100), "\xC3\xBC");
}

TEST_F(UserAgentTest, ReturnsABodyWithoutCharsetUnchanged) {
  const auto agent = Create(MakeRef<AnsweringStream>("HTTP/1.1 200 OK\r\nContent-Length: 1\r\n\r\n\xFC"));
  agent->StartRequest(Post(), nullptr, m_pending);
  agent->WaitForRequest(m_pending, LONG, m_response);
  EXPECT_EQ(m_response->GetDeclaredCharset(), "");
  EXPECT_EQ(m_response->ReadToEnd(100), "\xFC");
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

TEST_F(UserAgentTest, RefusesObjectsThatItCannotUse) {
  const auto agent = Create(MakeRef<AnsweringStream>(""));
  EXPECT_THROWS_MESSAGE(agent->StartRequest(nullptr, nullptr, m_pending), InvalidArgumentException,
                        "Invalid argument : the HTTP request was not made by CreateHttpRequest.");
  EXPECT_THROWS_MESSAGE(agent->WaitForRequest(nullptr, LONG, m_response), InvalidArgumentException,
                        "Invalid argument : the item to wait for is not a started HTTP request.");
}

TEST_F(UserAgentTest, IsNotMadeWithoutASpecificationOrACookieStoreOrWithAPool) {
  const std::string needed = "Invalid argument : a user agent needs a connection specification and a cookie store.";
  const Ref<ConnectionSpec> spec = MakeRef<OneStreamSpec>(nullptr);
  Ref<UserAgent> agent;
  EXPECT_THROWS_MESSAGE(CreateHttpUserAgent(spec, nullptr, nullptr, agent), InvalidArgumentException, needed);
  EXPECT_THROWS_MESSAGE(CreateHttpUserAgent(nullptr, m_cookies, nullptr, agent), InvalidArgumentException, needed);
  EXPECT_THROWS_MESSAGE(CreateHttpUserAgent(spec, nullptr), InvalidArgumentException, needed);
  EXPECT_THROWS_MESSAGE(CreateHttpUserAgent(nullptr, m_cookies), InvalidArgumentException, needed);
  class Pool final : public ConnectionPool {};
  EXPECT_THROWS_MESSAGE(
      CreateHttpUserAgent(spec, m_cookies, MakeRef<Pool>(), agent), InvalidArgumentException,
      "Invalid argument : a user agent opens one connection for each request; connection pools are not offered.");
  EXPECT_FALSE(agent);
}

constexpr const char *SETS_COOKIES = "HTTP/1.1 200 OK\r\nSet-Cookie: c=d; Path=/\r\nContent-Length: 0\r\n\r\n";

TEST_F(UserAgentTest, SendsSecureCookiesOverAHostsOwnStreamThatIsSecure) {
  m_cookies->SetFromHeader("a=b; Secure; Path=/", "sts.example", "/", true);
  m_cookies->SetFromHeader("plain=1; Path=/", "sts.example", "/", true);
  EXPECT_EQ(Send(MakeRef<SecureStream>(SETS_COOKIES)), "POST / HTTP/1.1\r\n"
                                                       "Host: sts.example:80\r\n"
                                                       "User-Agent: tarvel\r\n"
                                                       "Cookie: a=b; plain=1\r\n"
                                                       "Accept-Encoding: identity\r\n"
                                                       "Connection: close\r\n"
                                                       "Content-Length: 4\r\n"
                                                       "\r\n"
                                                       "body");
}

TEST_F(UserAgentTest, SendsNoSecureCookiesOverAHostsOwnStreamThatDoesNotSayItIsSecure) {
  m_cookies->SetFromHeader("a=b; Secure; Path=/", "sts.example", "/", true);
  m_cookies->SetFromHeader("plain=1; Path=/", "sts.example", "/", true);
  EXPECT_EQ(Send(MakeRef<AnsweringStream>(SETS_COOKIES)), "POST / HTTP/1.1\r\n"
                                                          "Host: sts.example\r\n"
                                                          "User-Agent: tarvel\r\n"
                                                          "Cookie: plain=1\r\n"
                                                          "Accept-Encoding: identity\r\n"
                                                          "Connection: close\r\n"
                                                          "Content-Length: 4\r\n"
                                                          "\r\n"
                                                          "body");
}

TEST_F(UserAgentTest, ReportsToTheCookieStoreWhetherTheStreamIsSecure) {
  class RecordingCookies final : public CookieStore {
  public:
    void SetFromHeader(std::string_view, std::string_view, std::string_view, bool isSecure) override {
      wasSecure = isSecure;
    }
    std::string GetHeader(std::string_view, std::string_view, bool) const override { return {}; }
    std::size_t GetCount() const override { return 0; }

    std::optional<bool> wasSecure;
  };
  const auto answer = [this](const Ref<System::Stream> &stream) {
    const auto cookies = MakeRef<RecordingCookies>();
    const Ref<UserAgent> agent = CreateHttpUserAgent(MakeRef<OneStreamSpec>(stream), cookies);
    agent->StartRequest(Post(), nullptr, m_pending);
    agent->WaitForRequest(m_pending, LONG, m_response);
    return cookies->wasSecure;
  };
  EXPECT_EQ(answer(MakeRef<SecureStream>(SETS_COOKIES)), true);
  EXPECT_EQ(answer(MakeRef<AnsweringStream>(SETS_COOKIES)), false);
}

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
} // namespace Tarvel::Http
