// SPDX-License-Identifier: Apache-2.0
// HTTP: persistent connections, requests that are not SOAP posts, limits.

#include "messages.h"

#include "support/work_folder.h"

#include <gmock/gmock.h>

namespace DevStsTest {
namespace {

using testing::HasSubstr;

class Http : public testing::Test {
protected:
  int StatusOf(const std::string &bytes) {
    TlsClient client(m_service);
    client.Send(bytes);
    return client.Receive().status;
  }

  Testing::DevSts m_service;
};

TEST_F(Http, ConnectionIsKeptForFurtherRequests) {
  TlsClient client(m_service);
  for (int i = 0; i < 3; ++i) {
    const SsoClient::Request request = PasswordRequest();
    client.Send(PostBytes(request.soapAction, request.body));
    const HttpAnswer answer = client.Receive();
    EXPECT_TRUE(IsIssued(answer));
    EXPECT_THAT(answer.head, HasSubstr("\r\nConnection: keep-alive\r\n"));
    EXPECT_THAT(answer.head, HasSubstr("\r\nContent-Type: text/xml; charset=utf-8\r\n"));
  }
}

TEST_F(Http, AnswersHaveTheDate) {
  TlsClient client(m_service);
  client.Send("GET /sts HTTP/1.1\r\nHost: localhost\r\n\r\n");
  EXPECT_THAT(client.Receive().head, testing::ContainsRegex("\r\nDate: (Sun|Mon|Tue|Wed|Thu|Fri|Sat), [0-3][0-9] "
                                                            "[A-Z][a-z][a-z] 20[0-9][0-9] "
                                                            "[0-2][0-9]:[0-5][0-9]:[0-5][0-9] GMT\r\n"));
}

TEST_F(Http, ConnectionIsClosedWhenTheClientAsksForIt) {
  TlsClient client(m_service);
  const SsoClient::Request request = PasswordRequest();
  client.Send(Replaced(PostBytes(request.soapAction, request.body), "Host: ", "Connection: close\r\nHost: "));
  EXPECT_TRUE(IsIssued(client.Receive()));
  EXPECT_TRUE(client.IsClosed());
}

TEST_F(Http, OtherMethodsPathsAndMediaTypes) {
  const SsoClient::Request request = PasswordRequest();
  EXPECT_EQ(StatusOf("GET /sts HTTP/1.1\r\nHost: localhost\r\n\r\n"), 405);
  EXPECT_EQ(StatusOf(PostBytes(request.soapAction, request.body, "/")), 404);
  EXPECT_EQ(StatusOf(PostBytes(request.soapAction, request.body, "/sts/")), 404);
  EXPECT_EQ(StatusOf(PostBytes(request.soapAction, request.body, "/sts/fault/no-such-fault")), 404);
  EXPECT_EQ(StatusOf(PostBytes(request.soapAction, request.body, "/sts", "application/soap+xml")), 415);
  EXPECT_EQ(StatusOf(PostBytes(request.soapAction, request.body, "/sts", "")), 415);
  EXPECT_EQ(StatusOf(PostBytes(request.soapAction, request.body, "/sts", "Text/XML; charset=utf-8")), 200);
}

TEST(HttpInAnotherCharset, AppliesToRequestsAndAnswers) {
  const Testing::WorkFolder folder;
  const Testing::DevSts service(
      {"--charset", "iso-8859-1", "--users",
       folder.Write("users.json", R"([{"name":"zoë@corp.example","password":"ü","last":"ł"}])")});
  const auto sendPassword = [&service](const std::string &user, const std::string &password) {
    SsoClient::Request request = PasswordRequest();
    request.body = Replaced(Replaced(request.body, "alice@", user + "@"), "wonderland", password);
    return Send(service, request);
  };
  const HttpAnswer answer = sendPassword("zo\xEB", "\xFC");
  EXPECT_TRUE(IsIssued(answer));
  EXPECT_THAT(answer.head, HasSubstr("\r\nContent-Type: text/xml; charset=iso-8859-1\r\n"));
  EXPECT_THAT(answer.body, testing::StartsWith("<?xml version=\"1.0\" encoding=\"iso-8859-1\"?><"));
  EXPECT_THAT(answer.body, HasSubstr(">zo\xEB@corp.example<"));
  EXPECT_THAT(answer.body, HasSubstr(">&#322;<"));
  EXPECT_TRUE(IsIssued(sendPassword("zo&#xEB;", "&#xFC;")));
  EXPECT_FALSE(IsIssued(sendPassword("zo\xC3\xAB", "\xC3\xBC")));
}

TEST(HttpInAnotherCharset, RefusesARequestInADifferentCharset) {
  const Testing::DevSts service({"--charset", "windows-1252"});
  SsoClient::Request request = PasswordRequest();
  request.body = Replaced(request.body, "wonderland", "\x81"); // which windows-1252 does not have
  EXPECT_EQ(Send(service, request).status, 400);
  EXPECT_TRUE(IsIssued(Send(service, PasswordRequest())));
}

TEST_F(Http, OversizedBody) {
  EXPECT_EQ(StatusOf(PostBytes("", std::string(1024 * 1024 + 1, ' '))), 413);
}

TEST_F(Http, OversizedHeader) {
  EXPECT_EQ(StatusOf("POST /sts HTTP/1.1\r\nX: " + std::string(64 * 1024, 'x') + "\r\n\r\n"), 431);
}

TEST_F(Http, NotHttp) {
  EXPECT_EQ(StatusOf("\x01\x02\x03 wonderland\r\n\r\n"), 400);
}

TEST_F(Http, LengthThatIsNotANumber) {
  EXPECT_EQ(StatusOf("POST /sts HTTP/1.1\r\nContent-Length: many\r\n\r\n"), 400);
}

TEST_F(Http, ClientThatDisconnectsInTheMiddleDoesNotAffectOthers) {
  for (int i = 0; i < 20; ++i) {
    TlsClient client(m_service);
    const std::string bytes = PostBytes(SsoClient::Request::ISSUE, PasswordRequest().body);
    client.Send(bytes.substr(0, bytes.size() / 2));
  }
  EXPECT_TRUE(IsIssued(Send(m_service, PasswordRequest())));
}

} // namespace
} // namespace DevStsTest
