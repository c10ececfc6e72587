// SPDX-License-Identifier: Apache-2.0

#include "http/client_request_impl.h"

#include "support/throws_message.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <string>

namespace Tarvel::Http {
namespace {

const std::string BAD_PATH =
    "Invalid argument : the path of an HTTP request does not begin with '/', or contains a blank, a "
    "fragment, a control character or one that is not ASCII.";

std::string SerialiseRequest(const Ref<ClientRequest> &request, const std::string &cookies = "") {
  return Serialise(dynamic_cast<ClientRequestImpl &>(*request).Take(), "sts.example", cookies).Get();
}

TEST(ClientRequest, IsSerialisedAsACompleteMessage) {
  const Ref<ClientRequest> request = CreateHttpRequest("POST", "/STS?a=b");
  request->SetHeader("Content-Type", "text/xml");
  request->SetHeader("SOAPAction", "\"a\"");
  request->WriteBody("<env");
  request->WriteBody("elope/>");
  EXPECT_EQ(SerialiseRequest(request, "c=d; e=f"), "POST /STS?a=b HTTP/1.1\r\n"
                                                   "Host: sts.example\r\n"
                                                   "User-Agent: tarvel\r\n"
                                                   "Content-Type: text/xml\r\n"
                                                   "SOAPAction: \"a\"\r\n"
                                                   "Cookie: c=d; e=f\r\n"
                                                   "Accept-Encoding: identity\r\n"
                                                   "Connection: close\r\n"
                                                   "Content-Length: 11\r\n"
                                                   "\r\n"
                                                   "<envelope/>");
}

TEST(ClientRequest, StatesALengthOfZeroForAnEmptyPost) {
  const Ref<ClientRequest> request = CreateHttpRequest("POST", "/");
  EXPECT_NE(SerialiseRequest(request).find("\r\nContent-Length: 0\r\n\r\n"), std::string::npos);
}

TEST(ClientRequest, StatesNoLengthForAMethodWithoutABody) {
  const Ref<ClientRequest> request = CreateHttpRequest("GET", "/");
  EXPECT_EQ(SerialiseRequest(request).find("Content-Length"), std::string::npos);
}

TEST(ClientRequest, ReplacesAnEarlierHeaderOfTheSameNameInAnyLetterCase) {
  const Ref<ClientRequest> request = CreateHttpRequest("GET", "/");
  request->SetHeader("X-One", "1");
  request->SetHeader("user-agent", "mine");
  request->SetHeader("x-one", "2");
  const std::string message = SerialiseRequest(request);
  EXPECT_NE(message.find("X-One: 2\r\nuser-agent: mine\r\n"), std::string::npos) << message;
  EXPECT_EQ(message.find("User-Agent"), std::string::npos) << message;
}

TEST(ClientRequest, RefusesAHeaderThatWouldEndItsLine) {
  const Ref<ClientRequest> request = CreateHttpRequest("POST", "/");
  for (const std::string &value :
       {std::string("a\r\nX-Evil: 1"), std::string("a\rb"), std::string("a\nb"), std::string("a\tb"),
        std::string("a\0b", 3), std::string("a\x7F"), std::string("\x1B[2J")}) {
    EXPECT_THROWS_MESSAGE(request->SetHeader("SOAPAction", value), InvalidArgumentException,
                          "Invalid argument : the value of the HTTP header SOAPAction contains a control character.");
  }
  for (const std::string &name : {std::string(), std::string("A B"), std::string("A:"), std::string("A\r\nB"),
                                  std::string("A\0", 2), std::string("\xC3\xBC"), std::string("A(")}) {
    EXPECT_THROWS_MESSAGE(request->SetHeader(name, "x"), InvalidArgumentException,
                          "Invalid argument : the name of an HTTP header is not a token.");
  }
}

TEST(ClientRequest, RefusesHeadersThatTheUserAgentSets) {
  const Ref<ClientRequest> request = CreateHttpRequest("POST", "/");
  for (const std::string name :
       {"Host", "content-length", "Transfer-Encoding", "Connection", "Cookie", "Accept-Encoding", "Expect"}) {
    EXPECT_THROWS_MESSAGE(request->SetHeader(name, "x"), InvalidArgumentException,
                          "Invalid argument : the HTTP header " + name + " is set by the user agent.");
  }
}

TEST(ClientRequest, CanBeStartedOnlyOnce) {
  const Ref<ClientRequest> request = CreateHttpRequest("POST", "/");
  SerialiseRequest(request);
  EXPECT_THROWS_MESSAGE(SerialiseRequest(request), InvalidStateException, "The HTTP request has been started already");
}

TEST(CreateHttpRequest, RefusesTextThatIsNotAllowedInTheRequestLine) {
  Ref<ClientRequest> request;
  for (const std::string &path :
       {std::string(), std::string("x"), std::string("http://h/"), std::string("*"), std::string("/a b"),
        std::string("/a HTTP/1.1\r\nX: y"), std::string("/a\r"), std::string("/a\n"), std::string("/a\t"),
        std::string("/a\0", 3), std::string("/a#b"), std::string("/\xC3\xBC"), std::string("/\x7F")}) {
    EXPECT_THROWS_MESSAGE(CreateHttpRequest("POST", path, request), InvalidArgumentException, BAD_PATH);
  }
  for (const std::string &method :
       {std::string(), std::string("PO ST"), std::string("POST\r\n"), std::string("P\0", 2)}) {
    EXPECT_THROWS_MESSAGE(CreateHttpRequest(method, "/", request), InvalidArgumentException,
                          "Invalid argument : the method of an HTTP request is not a token.");
  }
  EXPECT_FALSE(request);
}

TEST(CreateHttpRequest, ReturnsARequestForEachCall) {
  const Ref<ClientRequest> request = CreateHttpRequest("PUT", "/a");
  const Ref<ClientRequest> other = CreateHttpRequest("PUT", "/b");
  EXPECT_EQ(SerialiseRequest(request).substr(0, 17), "PUT /a HTTP/1.1\r\n");
  EXPECT_EQ(SerialiseRequest(other).substr(0, 17), "PUT /b HTTP/1.1\r\n");
  EXPECT_THROWS_MESSAGE(CreateHttpRequest("POST", "no-slash"), InvalidArgumentException, BAD_PATH);
}

} // namespace
} // namespace Tarvel::Http
