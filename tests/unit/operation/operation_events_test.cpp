// SPDX-License-Identifier: Apache-2.0

#include "operation/operation_events.h"

#include "exchange/response_handler_impl.h"
#include "exchange/soap_response.h"
#include "support/counting_token.h"
#include "support/fixed_environment.h"
#include "support/recorded_events.h"
#include "support/recorded_log.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"
#include "unit/operation/counted_work.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/logger.h>

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <new>
#include <stdexcept>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::RecordedEvents;
using Texts = std::vector<std::string>;

const std::string ID = "00000000-0000-4000-8000-00000000000a";

/// A session that answers with a function of the test.
class Session final : public TransportSession {
public:
  explicit Session(std::function<void(const Request &, Tarvel::Ref<Tarvel::Reader> &)> send)
      : m_send(std::move(send)) {}
  void SendRequest(const Request &request, Tarvel::Ref<Tarvel::Reader> &response) override {
    m_send(request, response);
  }
  void SendRequestAsync(const Request &, const Completion &, Tarvel::Ref<Tarvel::System::ScheduledItem> &) override {
    throw std::logic_error("not used");
  }

private:
  const std::function<void(const Request &, Tarvel::Ref<Tarvel::Reader> &)> m_send;
};

Request IssueRequest() {
  Request request;
  request.soapAction = "urn:issue";
  request.body = "<body/>";
  return request;
}

/// Runs an operation with one exchange: the transport sets these facts, calls `fail`, and answers unless `fail` throws.
Texts LinesOf(const ResponseFacts &facts, const std::function<void()> &fail) {
  RecordedEvents observer;
  OperationEvents events(&observer, "Operation", ID);
  Session session([&](const Request &request, Tarvel::Ref<Tarvel::Reader> &response) {
    *request.facts = facts;
    fail();
    response = Tarvel::CreateStringReader("answer");
  });
  try {
    events.Run([&] {
      Request request = IssueRequest();
      EXPECT_EQ(events.Send(session, request)->ReadToEnd(10), "answer");
      return 1;
    });
  } catch (...) { // the outcome is in the last line; NOLINT(bugprone-empty-catch)
  }
  return observer.Lines();
}

const std::function<void()> SUCCEED = [] {};

TEST(OperationEvents, ReportTheFactsOfAResponse) {
  EXPECT_EQ(LinesOf({200, "OK", "text/xml", 6}, SUCCEED),
            (Texts{"started Operation", "sent urn:issue", "received 200 OK, text/xml", "ended"}));
}

TEST(OperationEvents, ReportAnErrorStatusWithItsReason) {
  EXPECT_EQ(LinesOf({503, "Busy", "text/html", 0}, [] { throw CommunicationException("Server returned error: 503"); }),
            (Texts{"started Operation", "sent urn:issue", "received 503 Busy, text/html",
                   "ended CommunicationException: Server returned error: 503"}));
}

TEST(OperationEvents, ReportWhyThereIsNoResponse) {
  EXPECT_EQ(LinesOf({}, [] { throw CommunicationException("refused"); }),
            (Texts{"started Operation", "sent urn:issue", "received nothing: refused",
                   "ended CommunicationException: refused"}));
  EXPECT_EQ(LinesOf({}, [] { throw std::bad_alloc(); }),
            (Texts{"started Operation", "sent urn:issue", "received nothing: std::bad_alloc",
                   "ended bad_alloc: std::bad_alloc"}));
}

namespace Inner {
template <typename T>
struct Foreign {};
} // namespace Inner

TEST(OperationEvents, ReportTheClassOfAnExceptionThatIsNotAStandardOne) {
  EXPECT_EQ(LinesOf({}, [] { throw 7; }),
            (Texts{"started Operation", "sent urn:issue", "received nothing: ", "ended int: "}));
  EXPECT_EQ(LinesOf({}, [] { throw Inner::Foreign<std::string>(); }).back(), "ended Foreign: ");
}

TEST(OperationEvents, ReportLengthsLegAndIdentifier) {
  RecordedEvents observer;
  OperationEvents events(&observer, "Operation", ID);
  events.SetLeg(3);
  Session session([](const Request &request, Tarvel::Ref<Tarvel::Reader> &) {
    *request.facts = {200, "OK", "text/xml", 12345};
  });
  Request request = IssueRequest();
  events.Send(session, request);
  EXPECT_EQ(observer.Octets(), (std::vector<std::size_t>{7, 12345}));
  EXPECT_EQ(observer.LinesById(),
            (std::map<std::string, Texts>{
                {ID, {"started Operation", "sent urn:issue, leg 3", "received 200 OK, text/xml, leg 3"}}}));
  EXPECT_EQ(events.GetId(), ID);
}

TEST(OperationEvents, MakeAnIdentifierIfThereIsNone) {
  const Testing::FixedEnvironment environment;
  RecordedEvents observer;
  const std::string none;
  const OperationEvents events(&observer, "Operation", none);
  EXPECT_EQ(events.GetId(), "00000000-0000-4000-8000-000000000001");
}

TEST(OperationEvents, MeasureTheExchangeAndTheOperation) {
  using Clock = std::chrono::steady_clock;
  const auto wait = [](std::chrono::microseconds time) {
    const Clock::time_point end = Clock::now() + time;
    while (Clock::now() < end) {
    }
  };
  RecordedEvents observer;
  const Clock::time_point begin = Clock::now();
  OperationEvents events(&observer, "Operation", ID);
  Session session([&](const Request &, Tarvel::Ref<Tarvel::Reader> &) { wait(std::chrono::microseconds(300)); });
  events.Run([&] {
    wait(std::chrono::microseconds(200));
    Request request = IssueRequest();
    events.Send(session, request);
    return 1;
  });
  const auto all = std::chrono::duration_cast<std::chrono::microseconds>(Clock::now() - begin).count();
  const std::vector<std::int64_t> durations = observer.Durations();
  ASSERT_EQ(durations.size(), 2u);
  EXPECT_GE(durations[0], 300);
  EXPECT_GE(durations[1], durations[0] + 200);
  EXPECT_LE(durations[1], all);
}

TEST(OperationEvents, MaskSecretsInEveryText) {
  RecordedEvents observer;
  OperationEvents events(&observer, "Operation", ID);
  events.Hide("wonderland");
  Session session([&](const Request &request, Tarvel::Ref<Tarvel::Reader> &response) {
    *request.facts = {500, "bad wonderland", "text/wonderland", 1};
    response = Tarvel::CreateStringReader(Testing::Envelope(
        "<soapenv:Fault><faultcode xmlns:w='urn:wonderland'>w:wonderland</faultcode><faultstring>No wonderland"
        "</faultstring><detail>d29uZGVybGFuZA==</detail></soapenv:Fault>"));
  });
  const auto run = [&] {
    return events.Run([&] {
      Request request = IssueRequest();
      const auto response = events.Send(session, request);
      events.Receive(ResponseHandlerImpl(),
                     [&](const ResponseHandler &handler) { handler.HandleValidateSubjectResponse(response.get()); });
      throw std::logic_error("the fault was not thrown");
      return 1;
    });
  };
  // The exception itself is not masked.
  EXPECT_THROWS_MESSAGE(run(), SsoException, "Unexpected SOAP fault: w:wonderland; request failed.");
  EXPECT_EQ(observer.Lines(), (Texts{"started Operation", "sent urn:issue", "received 500 bad ***, text/***",
                                     "fault {urn:***}*** w:***: No *** (***)",
                                     "ended SsoException: Unexpected SOAP fault: w:***; request failed."}));
}

TEST(OperationEvents, CutTheTextsOfAFaultOfTenMegabytes) {
  const std::string ten(10u << 20, 'x');
  RecordedEvents observer;
  OperationEvents events(&observer, "Operation", ID);
  std::string detail;
  while (detail.size() < 10u << 18) {
    detail += "<a>y</a>";
  }
  for (const std::string &fault : {"<faultcode>" + ten + "</faultcode><faultstring>a</faultstring>",
                                   "<faultcode>a</faultcode><faultstring>" + ten + "</faultstring>",
                                   "<faultcode>a</faultcode><detail>" + detail + "</detail>"}) {
    events.OnFault(*ParseResponseDocument(*Tarvel::CreateStringReader("<f>" + fault + "</f>")));
    const FaultEvent event = observer.LastFault();
    EXPECT_LT(event.code.size() + event.codeName.size() + event.text.size() + event.detail.size(), 5000u);
    EXPECT_NE((event.code + event.text + event.detail).find(" more bytes)"), std::string::npos);
  }
}

/// Throws in every function: alternately a standard exception and another one.
class ThrowingObserver final : public OperationObserver {
public:
  void OnStarted(const OperationInfo &) override { throw std::runtime_error("started"); }
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { throw 7; }
  void OnResponseReceived(const OperationInfo &, const ResponseReceivedEvent &) override { throw std::bad_alloc(); }
  void OnFault(const OperationInfo &, const FaultEvent &) override { throw CommunicationException("fault"); }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &) override {
    ++ends;
    throw std::runtime_error("ended, secret wonderland");
  }
  int ends = 0;
};

Texts ThrowingLines() {
  const std::string begin = "SsoClient 8 opId=" + ID + " The observer's ";
  return {begin + "OnStarted threw runtime_error: started", begin + "OnRequestSent threw int",
          begin + "OnResponseReceived threw bad_alloc: std::bad_alloc"};
}

TEST(OperationEvents, LogWhatTheObserverThrowsAndKeepTheResult) {
  const Testing::RecordedLog log;
  ThrowingObserver observer;
  OperationEvents events(&observer, "Operation", ID);
  events.Hide("wonderland");
  Session session(
      [](const Request &, Tarvel::Ref<Tarvel::Reader> &response) { response = Tarvel::CreateStringReader("answer"); });
  EXPECT_EQ(events.Run([&] {
    Request request = IssueRequest();
    return events.Send(session, request)->ReadToEnd(10);
  }),
            "answer");
  Texts expected = ThrowingLines();
  expected.push_back("SsoClient 8 opId=" + ID + " The observer's OnEnded threw runtime_error: ended, secret ***");
  EXPECT_EQ(log.Lines(), expected);
  EXPECT_EQ(observer.ends, 1);
}

TEST(OperationEvents, LogWhatTheObserverThrowsAndKeepTheException) {
  const Testing::RecordedLog log;
  ThrowingObserver observer;
  OperationEvents events(&observer, "Operation", ID);
  Session session([](const Request &, Tarvel::Ref<Tarvel::Reader> &response) {
    response = Tarvel::CreateStringReader(Testing::FaultResponse("wst:FailedAuthentication", "who are you?"));
  });
  const auto run = [&] {
    events.Run([&] {
      Request request = IssueRequest();
      const auto response = events.Send(session, request);
      events.Receive(ResponseHandlerImpl(),
                     [&](const ResponseHandler &handler) { handler.HandleValidateSubjectResponse(response.get()); });
      return 1;
    });
  };
  EXPECT_THROWS_MESSAGE(run(), InvalidCredentialsException, "Authentication failed: who are you?");
  Texts expected = ThrowingLines();
  const std::string begin = "SsoClient 8 opId=" + ID + " The observer's ";
  expected.push_back(begin + "OnFault threw CommunicationException: fault");
  expected.push_back(begin + "OnEnded threw runtime_error: ended, secret wonderland");
  EXPECT_EQ(log.Lines(), expected);
  EXPECT_EQ(observer.ends, 1);
}

TEST(OperationEvents, LogNothingBelowTheLevelOfWarnings) {
  const Testing::ScopedLogLevel level(LOG_LEVEL_CONTRACT_WARNING - 1);
  const Testing::RecordedLog log;
  ThrowingObserver observer;
  const OperationEvents events(&observer, "Operation", ID);
  EXPECT_EQ(log.Lines(), Texts{});
}

TEST(OperationEvents, ComputeNothingWithoutAnObserver) {
  const Testing::CountingToken token;
  const std::string password = "a password that is longer than a string's own buffer";
  const std::vector<std::uint8_t> leg(100, 1);
  Session session([](const Request &request, Tarvel::Ref<Tarvel::Reader> &) { EXPECT_EQ(request.facts, nullptr); });
  Request request = IssueRequest();
  request.body = "<ds:SignatureValue>" + std::string(300, 'A') + "</ds:SignatureValue>";
  const ResponseHandlerImpl handler;
  const ResponseHandler *used = nullptr;
  const Testing::CountedWork before = Testing::CountWork();
  {
    OperationEvents events(nullptr, "an operation with a name that is longer than a string's own buffer", ID);
    events.Hide(password);
    events.HideToken(token);
    events.HideToken(password);
    events.HideLeg(leg);
    events.Run([&] {
      events.Send(session, request);
      events.Receive(handler, [&](const ResponseHandler &same) { used = &same; });
      return 1;
    });
  }
  const Testing::CountedWork after = Testing::CountWork();
  EXPECT_EQ(after.allocations, before.allocations);
  EXPECT_EQ(after.clockReads, before.clockReads);
  EXPECT_EQ(used, &handler);
  EXPECT_EQ(token.CountCalls(), 0);
}

TEST(OperationEvents, AllocateAndReadTheClockWithAnObserver) { // so the test above is able to fail
  RecordedEvents observer;
  const Testing::CountedWork before = Testing::CountWork();
  OperationEvents events(&observer, "an operation with a name that is longer than a string's own buffer", ID);
  events.Run([] { return 1; });
  const Testing::CountedWork after = Testing::CountWork();
  EXPECT_GT(after.allocations, before.allocations);
  EXPECT_GE(after.clockReads - before.clockReads, Testing::CAN_COUNT_CLOCK_READS ? 2 : 0);
}

/// Counts events without using memory.
class CountingObserver final : public OperationObserver {
public:
  void OnStarted(const OperationInfo &) override { ++starts; }
  void OnFault(const OperationInfo &, const FaultEvent &event) override { wasSecretShown |= Shows(event.text); }
  void OnEnded(const OperationInfo &, const OperationEndedEvent &event) override {
    ++ends;
    wasSecretShown |= Shows(event.message);
    hasFailed = event.outcome == OperationEndedEvent::Outcome::FAILED;
  }
  static bool Shows(const std::string &text) { return text.find("wonderland") != std::string::npos; }

  int starts = 0;
  int ends = 0;
  bool hasFailed = false;
  bool wasSecretShown = false;
};

TEST(OperationEvents, EndExactlyOnceAndKeepTheExceptionForEachAllocationThatFails) {
  const InvalidCredentialsException refusal("Authentication failed: not wonderland, a message longer than a buffer");
  const auto fault = ParseResponseDocument(*Tarvel::CreateStringReader(
      "<f><faultcode>a</faultcode><faultstring>it is not wonderland, you know that</faultstring></f>"));
  const std::string password = "wonderland";
  int starts = 0;
  int rounds = 0;
  for (const bool failsOnce : {true, false}) {
    for (long failing = 1; failing < 200; ++failing, ++rounds) {
      CountingObserver observer;
      bool wasKept = false;
      {
        const Testing::FailingAllocations failures(failing, failsOnce);
        OperationEvents events(&observer, "an operation with a name that is longer than a string's own buffer", ID);
        events.Hide(password);
        try {
          events.Run([&]() -> int {
            events.OnFault(*fault);
            throw refusal; // copying it needs no memory
          });
        } catch (const InvalidCredentialsException &) {
          wasKept = true;
        }
      }
      EXPECT_TRUE(wasKept) << failing;
      EXPECT_EQ(observer.ends, observer.starts) << failing;
      EXPECT_EQ(observer.hasFailed, observer.starts == 1) << failing;
      EXPECT_FALSE(observer.wasSecretShown) << failing;
      starts += observer.starts;
    }
  }
  EXPECT_GT(starts, rounds / 2); // most failures are after the start
}

} // namespace
} // namespace SsoClient
