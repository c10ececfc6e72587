// SPDX-License-Identifier: Apache-2.0

#include "transport/https_session.h"

#include "exchange/soap_response.h"
#include "integration/transport/service_stand_in.h"
#include "support/throws_message.h"
#include "xml/xml_text.h"

#include <tarvel/core/exception.h>
#include <tarvel/http/url.h>

#include <gtest/gtest.h>

#include <future>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using Tarvel::Ref;
using Testing::AnswerWith;
using Testing::Ask;
using Testing::AskForOutcome;
using Testing::CreateTrustingContext;
using Testing::Failure;
using Testing::NO_TIMEOUT;
using Testing::Response;
using Testing::SampleRequest;
using Testing::ServerConnection;
using Testing::ServiceStandIn;
using Testing::TlsSettings;

TEST(HttpsClient, CannotBeMadeForHttpsWithoutAContext) {
  EXPECT_THROWS_MESSAGE(HttpsClient("https://sts.example/STS", nullptr, "", NO_TIMEOUT),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : HTTPS connection requested but no SSLContext provided.");
  EXPECT_THROWS_MESSAGE(HttpsClient("https://sts.example/STS", nullptr, "", NO_TIMEOUT, true),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : HTTPS connection requested but no SSLContext provided.");
}

TEST(HttpsClient, CanBeMadeForHttpWithoutAContext) {
  EXPECT_NO_THROW(HttpsClient("http://sts.example/STS", nullptr, "", NO_TIMEOUT));
  EXPECT_NO_THROW(HttpsClient("http://sts.example/STS", nullptr, "", NO_TIMEOUT, true));
}

TEST(HttpsClient, CannotBeMadeForAMalformedAddress) {
  EXPECT_THROWS_MESSAGE(HttpsClient("ftp://sts.example", nullptr, "", NO_TIMEOUT), Tarvel::Http::MalformedURLException,
                        "Malformed URL \"ftp://sts.example\": the scheme is not http or https");
}

TEST(HttpsClient, RefusesAnInternationalisedHostName) {
  EXPECT_THROWS_MESSAGE(
      HttpsClient("https://b\xC3\xBC"
                  "cher.example/",
                  nullptr, "", NO_TIMEOUT),
      Tarvel::Http::MalformedURLException,
      "Malformed URL \"https://b\xC3\xBC"
      "cher.example/\": the host name is not ASCII (an internationalised name must be in its \"xn--\" "
      "form)");
}

TEST(HttpsSession, PostsTheEnvelopeWithTheActionInQuotes) {
  std::promise<std::string> received;
  ServiceStandIn service([&](ServerConnection &connection) {
    received.set_value(connection.ReadRequest());
    connection.Write(Response("200 OK", "<response/>"));
  });
  Request request = SampleRequest("<env>\xC3\xBC</env>");
  request.soapAction = "a";
  EXPECT_EQ(Ask(*service.CreateSession(), request), "<response/>");
  EXPECT_EQ(received.get_future().get(), "POST /STS/trust HTTP/1.1\r\n"
                                         "Host: " +
                                             service.GetEndpoint() +
                                             "\r\n"
                                             "User-Agent: tarvel\r\n"
                                             "Content-Type: text/xml\r\n"
                                             "SOAPAction: \"a\"\r\n"
                                             "Accept-Encoding: identity\r\n"
                                             "Connection: close\r\n"
                                             "Content-Length: 13\r\n"
                                             "\r\n"
                                             "<env>\xC3\xBC</env>");
}

TEST(HttpsSession, PostsAndReadsLargeMessagesOverTls) {
  const std::string large(3 * 1024 * 1024, 'x');
  ServiceStandIn service(
      [&](ServerConnection &connection) {
        connection.Handshake();
        const std::string request = connection.ReadRequest();
        connection.Write(Response("200 OK", request.substr(request.find("\r\n\r\n") + 4)));
      },
      TlsSettings());
  EXPECT_EQ(Ask(*service.CreateSession(), SampleRequest(large)), large);
}

TEST(HttpsSession, RefusesAnActionThatWouldEndItsHeader) {
  ServiceStandIn service(AnswerWith(Response("200 OK", "")));
  Request request = SampleRequest();
  request.soapAction = "a\"\r\nX-Evil: 1";
  Ref<Tarvel::Reader> response;
  EXPECT_THROWS_MESSAGE(service.CreateSession()->SendRequest(request, response), Tarvel::InvalidArgumentException,
                        "Invalid argument : the value of the HTTP header SOAPAction contains a control character.");
  EXPECT_EQ(service.GetServer().GetConnectionCount(), 0);
}

TEST(HttpsSession, ReturnsTheBodyForEvery2xxAndFor500) {
  for (const std::string status : {"200 OK", "201 Created", "299 Unheard Of", "500 Internal Server Error", "500"}) {
    ServiceStandIn service(AnswerWith(Response(status + (status == "500" ? " " : ""), "<body/>")));
    EXPECT_EQ(AskForOutcome(*service.CreateSession()), "<body/>") << status;
  }
}

TEST(HttpsSession, ReturnsAnEmptyBodyForNoContent) {
  ServiceStandIn service(AnswerWith("HTTP/1.1 204 No Content\r\n\r\n"));
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), "");
}

TEST(HttpsSession, ReportsCodeAndReasonOfEveryOtherStatus) {
  for (const std::string status :
       {"101 Switching Protocols", "300 Multiple Choices", "302 Found", "304 Not Modified", "400 Bad Request",
        "401 Unauthorized", "404 Not Found", "407 Proxy Authentication Required", "499 x", "501 Not Implemented",
        "503 Service Unavailable", "599 y", "600 z"}) {
    // Redirects are not followed.
    ServiceStandIn service(AnswerWith("HTTP/1.1 " + status + "\r\nLocation: /elsewhere\r\nContent-Length: 0\r\n\r\n"));
    EXPECT_EQ(AskForOutcome(*service.CreateSession()), Failure("Server returned error: " + status));
    EXPECT_EQ(service.GetServer().GetConnectionCount(), 1);
  }
}

/// The facts that a session records about a response, as text. The outcome does not matter.
std::string FactsOf(const std::string &response) {
  ServiceStandIn service(AnswerWith(response));
  Request request = SampleRequest();
  request.facts = std::make_shared<ResponseFacts>();
  AskForOutcome(*service.CreateSession(), request);
  return std::to_string(request.facts->status) + " " + request.facts->reason + ", " + request.facts->contentType +
         ", " + std::to_string(request.facts->octets);
}

TEST(HttpsSession, NotesTheFactsOfAResponse) {
  EXPECT_EQ(FactsOf(Response("200 Fine", "<body/>", "content-type: text/xml; charset=utf-8\r\n")),
            "200 Fine, text/xml; charset=utf-8, 7");
  EXPECT_EQ(FactsOf(Response("500 Internal Server Error", "<fault/>")), "500 Internal Server Error, , 8");
  EXPECT_EQ(FactsOf("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n3\r\nabc\r\n2\r\nde\r\n0\r\n\r\n"),
            "200 OK, , 5");
  // The length is that of the body as received. In UTF-8, this body is longer.
  EXPECT_EQ(FactsOf(Response("200 OK", "\xFC\xFC", "Content-Type: text/xml;charset=latin1\r\n")),
            "200 OK, text/xml;charset=latin1, 2");
}

TEST(HttpsSession, NotesTheFactsOfAnErrorStatus) {
  EXPECT_EQ(FactsOf(Response("503 Busy", "<html/>", "Content-Type: text/html\r\n")), "503 Busy, text/html, 0");
}

TEST(HttpsSession, NotesNoFactsWithoutAResponse) {
  EXPECT_EQ(FactsOf("garbage"), "0 , , 0");
  EXPECT_EQ(FactsOf("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nshort"), "0 , , 0");
}

TEST(HttpsSession, NotesTheFactsBeforeTheCompletionOfAnAsynchronousRequest) {
  ServiceStandIn service(AnswerWith(Response("503 Busy", "", "Content-Type: text/html\r\n")));
  Request request = SampleRequest();
  request.facts = std::make_shared<ResponseFacts>();
  std::promise<int> status;
  Ref<Tarvel::System::ScheduledItem> item;
  const auto session = service.CreateSession();
  session->SendRequestAsync(
      request,
      [&, facts = request.facts](const Tarvel::Exception *, Tarvel::Reader *) { status.set_value(facts->status); },
      item);
  EXPECT_EQ(status.get_future().get(), 503);
  EXPECT_EQ(request.facts->reason, "Busy");
  EXPECT_EQ(request.facts->contentType, "text/html");
}

const char LATIN1[] = "Content-Type: text/xml; charset=\"ISO-8859-1\"\r\n";
const char DECLARATION[] = "<?xml version=\"1.0\" encoding=\"ISO-8859-1\"?>";

/// The name of the document's root and its text, or the message of the exception.
std::string ReadDocument(const std::string &response) {
  ServiceStandIn service(AnswerWith(response));
  try {
    Ref<Tarvel::Reader> reader;
    service.CreateSession()->SendRequest(SampleRequest(), reader);
    const auto root = ParseResponseDocument(*reader);
    return std::string(root->GetName()) + ": " + GetText(GetTextNode(root.get()));
  } catch (const Tarvel::Exception &exception) {
    return exception.what();
  }
}

TEST(HttpsSession, ReturnsALatin1DocumentThatCanBeParsed) {
  for (const std::string &start : {std::string(), std::string(DECLARATION)}) {
    EXPECT_EQ(ReadDocument(Response("200 OK", start + "<a>\xFC</a>", LATIN1)), "a: \xC3\xBC");
    EXPECT_EQ(ReadDocument(Response("500 Fault", start + "<a>u</a>", LATIN1)), "a: u");
  }
}

TEST(HttpsSession, ReportsTheCharsetOfADocumentThatCannotBeParsed) {
  const std::string refusal = "Response is not well-formed XML: ";
  for (const char *const charset : {"windows-1252", "us-ascii"}) {
    EXPECT_EQ(ReadDocument(
                  Response("200 OK", "<a>\xFC</a>", std::string("Content-Type: text/xml;charset=") + charset + "\r\n")),
              refusal + "the document is not UTF-8 at line 1, column 4 (charset " + charset + ")");
  }
  EXPECT_EQ(ReadDocument(Response("200 OK", "<a>\xFC</a>", "Content-Type: text/xml;charset=utf-8\r\n")),
            refusal + "the document is not UTF-8 at line 1, column 4");
  EXPECT_EQ(ReadDocument(Response("200 OK", "<a>\xFC</a>")), refusal + "the document is not UTF-8 at line 1, column 4");
  EXPECT_EQ(ReadDocument(Response("200 OK", std::string(DECLARATION) + "<a>\xC3\xBC</a>", LATIN1)),
            refusal + "the encoding 'ISO-8859-1' is declared, only UTF-8 is accepted at line 1, column 31 "
                      "(charset ISO-8859-1)");
}

TEST(HttpsSession, LetsTheParserLimitABodyThatIsLongerAsUtf8) {
  const std::string body(Tarvel::Http::MAX_BODY_BYTES, '\xFC');
  EXPECT_EQ(ReadDocument(Response("200 OK", body, LATIN1)),
            "Response is not well-formed XML: the document is longer than 16777216 bytes at line 1, column 16777217 "
            "(charset ISO-8859-1)");
}

TEST(HttpsSession, ReportsTheStatusWhateverTheCharset) {
  for (const char *const charset : {"ISO-8859-1", "windows-1252"}) {
    const std::string type = std::string("Content-Type: text/html;charset=") + charset + "\r\n";
    EXPECT_EQ(ReadDocument(Response("503 Down", "<a>\xFC</a>", type)), "Server returned error: 503 Down");
  }
}

TEST(HttpsSession, ReportsAStatusWithoutReasonWithAFinalBlank) {
  ServiceStandIn service(AnswerWith("HTTP/1.1 404 \r\nContent-Length: 0\r\n\r\n"));
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), Failure("Server returned error: 404 "));
}

TEST(HttpsSession, SkipsInterimResponses) {
  ServiceStandIn service(
      AnswerWith("HTTP/1.1 100 Continue\r\n\r\nHTTP/1.1 102 Processing\r\n\r\n" + Response("200 OK", "<body/>")));
  EXPECT_EQ(AskForOutcome(*service.CreateSession()), "<body/>");
}

TEST(HttpsSession, ReturnsAReaderThatOutlivesItsSessionAndClient) {
  Ref<Tarvel::Reader> response;
  {
    ServiceStandIn service(AnswerWith(Response("200 OK", "<body/>")));
    service.CreateSession()->SendRequest(SampleRequest(), response);
  }
  EXPECT_EQ(response->ReadToEnd(100), "<body/>");
}

/// The arguments of the asynchronous form's callback.
struct Outcome {
  std::string failure;
  std::string body;
  bool hasBoth = false;
  std::thread::id thread;
};

std::future<Outcome> AskAsync(TransportSession &session, Ref<Tarvel::System::ScheduledItem> &item) {
  const auto promise = std::make_shared<std::promise<Outcome>>();
  session.SendRequestAsync(
      SampleRequest(),
      [promise](const Tarvel::Exception *failure, Tarvel::Reader *response) {
        Outcome outcome;
        outcome.failure = failure ? failure->what() : "";
        outcome.body = response ? response->ReadToEnd(1000) : "";
        outcome.hasBoth = (failure != nullptr) == (response != nullptr);
        EXPECT_TRUE(!failure || dynamic_cast<const CommunicationException *>(failure));
        outcome.thread = std::this_thread::get_id();
        promise->set_value(outcome); // throws if called twice
      },
      item);
  return promise->get_future();
}

TEST(HttpsSession, CallsBackOnceOnAnotherThreadWithTheBody) {
  ServiceStandIn service(AnswerWith(Response("200 OK", "<body/>")));
  Ref<Tarvel::System::ScheduledItem> item;
  const Outcome outcome = AskAsync(*service.CreateSession(), item).get();
  EXPECT_EQ(outcome.failure, "");
  EXPECT_EQ(outcome.body, "<body/>");
  EXPECT_FALSE(outcome.hasBoth);
  EXPECT_NE(outcome.thread, std::this_thread::get_id());
  EXPECT_TRUE(Testing::Eventually([&] { return item->IsDone(); }));
}

TEST(HttpsSession, CallsBackOnceWithTheFailure) {
  ServiceStandIn service(AnswerWith("HTTP/1.1 503 Busy\r\nContent-Length: 4\r\n\r\nbusy"));
  Ref<Tarvel::System::ScheduledItem> item;
  const Outcome outcome = AskAsync(*service.CreateSession(), item).get();
  EXPECT_EQ(outcome.failure, "Server returned error: 503 Busy");
  EXPECT_FALSE(outcome.hasBoth);
}

TEST(HttpsSession, CallsBackOnceWhenTheItemIsCancelled) {
  ServiceStandIn service([](ServerConnection &connection) { connection.Stall(); });
  Ref<Tarvel::System::ScheduledItem> item;
  auto future = AskAsync(*service.CreateSession(), item);
  ASSERT_TRUE(Testing::Eventually([&] { return service.GetServer().GetConnectionCount() == 1; }));
  item->Cancel();
  item->Cancel();
  EXPECT_EQ(future.get().failure, "The request to " + service.GetEndpoint() + " was cancelled");
  EXPECT_TRUE(Testing::Eventually([&] { return Testing::CountConnectionsTo(service.GetServer().GetPort()) == 0; }));
}

TEST(HttpsSession, SurvivesACallbackThatThrows) {
  ServiceStandIn service(AnswerWith(Response("200 OK", "<body/>")));
  const auto session = service.CreateSession();
  Ref<Tarvel::System::ScheduledItem> item;
  session->SendRequestAsync(
      SampleRequest(),
      [](const Tarvel::Exception *, Tarvel::Reader *) { throw std::runtime_error("thrown by the test"); }, item);
  EXPECT_TRUE(Testing::Eventually([&] { return item->IsDone(); }));
  EXPECT_EQ(AskForOutcome(*session), "<body/>");
}

/// Records the Cookie header of each request, and sets cookies in its answers.
class CookieService {
public:
  explicit CookieService(std::vector<std::string> setCookies, bool tls = false)
      : m_service(
            [this, setCookies](ServerConnection &connection) {
              if (connection.Handshake()) {
                Note(connection.ReadRequest());
                std::string fields;
                for (const std::string &cookie : setCookies) {
                  fields += "Set-Cookie: " + cookie + "\r\n";
                }
                connection.Write(Response("200 OK", "", fields));
              }
            },
            tls ? std::optional(TlsSettings()) : std::nullopt) {}

  /// The cookies that the next request of `session` sends; empty when it sends none.
  std::string AskForCookies(TransportSession &session) {
    Ask(session);
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_cookies;
  }
  std::shared_ptr<TransportSession> CreateSession() const { return m_service.CreateSession(); }

private:
  void Note(const std::string &request) {
    const std::string field = "\r\nCookie: ";
    const std::size_t start = request.find(field);
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_cookies = start == std::string::npos
                    ? ""
                    : request.substr(start + field.size(), request.find('\r', start + 2) - start - field.size());
  }

  std::mutex m_mutex;
  std::string m_cookies;
  ServiceStandIn m_service; // last: its threads use the others
};

TEST(HttpsSession, SendsTheCookiesOfOneLegOnlyInLaterLegsOfItsSession) {
  CookieService service({"leg=1", "node=7; Path=/STS"});
  const auto session = service.CreateSession();
  EXPECT_EQ(service.AskForCookies(*session), "");
  EXPECT_EQ(service.AskForCookies(*session), "leg=1; node=7");
  EXPECT_EQ(service.AskForCookies(*service.CreateSession()), "");
  EXPECT_EQ(service.AskForCookies(*session), "leg=1; node=7");
}

TEST(HttpsSession, HonoursTheAttributesOfCookies) {
  CookieService service({"gone=1; Max-Age=0", "old=1; Expires=Thu, 01 Jan 1970 00:00:00 GMT", "path=1; Path=/other",
                         "secure=1; Secure", "foreign=1; Domain=other.example", "kept=1; Max-Age=3600"});
  const auto session = service.CreateSession();
  service.AskForCookies(*session);
  EXPECT_EQ(service.AskForCookies(*session), "kept=1");
}

TEST(HttpsSession, SendsASecureCookieOverTls) {
  CookieService service({"secure=1; Secure", "plain=2"}, true);
  const auto session = service.CreateSession();
  service.AskForCookies(*session);
  EXPECT_EQ(service.AskForCookies(*session), "secure=1; plain=2");
}

} // namespace
} // namespace SsoClient
