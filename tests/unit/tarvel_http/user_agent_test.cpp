// SPDX-License-Identifier: Apache-2.0
// The user agent over streams that a test controls. integration/transport tests it over sockets.

#include "support/throws_message.h"
#include "unit/tarvel_http/user_agent_fixture.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/user_agent.h>

#include <gtest/gtest.h>

#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace Tarvel::Http {
namespace {

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

TEST_F(UserAgentTest, CannotBeMadeWithoutASpecificationOrACookieStoreNorWithAPool) {
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

/// A host's own stream that reports that it is secure.
class SecureStream final : public AnsweringStream {
public:
  using AnsweringStream::AnsweringStream;
  bool IsSecure() const noexcept override { return true; }
};

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
