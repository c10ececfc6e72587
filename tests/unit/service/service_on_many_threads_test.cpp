// SPDX-License-Identifier: Apache-2.0
#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "support/counting_token.h"
#include "support/identity.h"
#include "support/process_resources.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"

#include <ssoclient/create_saml_token.h>

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

constexpr int THREADS = 16;

/// How much more may be allocated at the end: the heap's own bookkeeping varies. A leak of four bytes in each of 20,000
/// operations would be more.
constexpr std::size_t MOST_BYTES_OF_GROWTH = 65536;

/// Answers each request at once and keeps nothing of it.
class ForgetfulTransport final : public Transport {
public:
  explicit ForgetfulTransport(Testing::Answer answer) : m_answer(std::move(answer)) {}

  std::shared_ptr<TransportSession> CreateSession() const override {
    ++m_sessions;
    return std::make_shared<Session>(*this);
  }

  int CountSessions() const { return m_sessions; }
  int CountOpenSessions() const { return m_openSessions; }

private:
  class Session final : public TransportSession {
  public:
    explicit Session(const ForgetfulTransport &transport) : m_transport(transport) { ++transport.m_openSessions; }
    Session(const Session &) = delete;
    Session &operator=(const Session &) = delete;
    ~Session() { --m_transport.m_openSessions; }

    void SendRequest(const Request &request, Tarvel::Ref<Tarvel::Reader> &response) override {
      response = Tarvel::CreateStringReader(m_transport.m_answer(request));
    }
    void SendRequestAsync(const Request &, const Completion &, Tarvel::Ref<Tarvel::System::ScheduledItem> &) override {
      throw std::logic_error("the service never sends in this way");
    }

  private:
    const ForgetfulTransport &m_transport;
  };

  const Testing::Answer m_answer;
  mutable std::atomic<int> m_sessions{0};
  mutable std::atomic<int> m_openSessions{0};
};

/// Runs `operation` that often in all, on 16 threads that begin together. Returns how many threw.
int RunOnManyThreads(int count, const std::function<void(int)> &operation) {
  std::atomic<int> ready{0};
  std::atomic<int> failures{0};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < THREADS; ++thread) {
    threads.emplace_back([&, thread] {
      for (++ready; ready < THREADS;) {
        std::this_thread::yield();
      }
      for (int i = thread; i < count; i += THREADS) {
        try {
          operation(i);
        } catch (...) {
          ++failures;
        }
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  return failures;
}

/// Runs all operations in turn on one service.
class OperationsInTurn {
public:
  /// @param subject whose token each operation is to yield; null for none. @param held a token to exchange, validate, renew
  OperationsInTurn(const SecurityTokenService &service, const char *subject, const SamlToken &held)
      : m_service(service), m_subject(subject), m_held(held) {}

  void Run(int i) {
    switch (i % 5) {
    case 0:
      return Judge(m_service.AcquireToken("alice@corp.example", "pass", m_spec));
    case 1:
      return Judge(m_service.AcquireTokenByCertificate(m_spec));
    case 2:
      return Judge(m_service.AcquireTokenByToken(m_held, m_spec));
    case 3:
      m_wrong += m_service.ValidateSubject(m_held) ? 0 : 1;
      return;
    default:
      return Judge(m_service.RenewToken(m_held, 60));
    }
  }

  int CountWrongResults() const { return m_wrong; }

private:
  void Judge(const std::shared_ptr<const SamlToken> &token) {
    const bool isRight = m_subject ? token && token->GetSubject().name == m_subject : !token;
    m_wrong += isRight ? 0 : 1;
  }

  const SecurityTokenService &m_service;
  const char *const m_subject;
  const SamlToken &m_held;
  const TokenSpec m_spec = Testing::SpecFor(60);
  std::atomic<int> m_wrong{0};
};

/// Expects `count` operations to succeed and to leave nothing behind.
void ExpectNoErrorAndNoGrowth(int count, OperationsInTurn &operations, const ForgetfulTransport &transport) {
  constexpr int FIRST = 320; // after which whatever is made once is there
  const auto run = [&](int i) { operations.Run(i); };
  ASSERT_EQ(RunOnManyThreads(FIRST, run), 0);
  const std::size_t bytes = Testing::CountAllocatedBytes();
  const std::size_t descriptors = Testing::CountDescriptors();
  EXPECT_EQ(RunOnManyThreads(count, run), 0);
  EXPECT_EQ(operations.CountWrongResults(), 0);
  EXPECT_EQ(transport.CountSessions(), FIRST + count);
  EXPECT_EQ(transport.CountOpenSessions(), 0);
  EXPECT_EQ(Testing::CountDescriptors(), descriptors);
  EXPECT_LE(Testing::CountAllocatedBytes(), bytes + MOST_BYTES_OF_GROWTH);
}

TEST(OneServiceOnSixteenThreads, RunsTwentyThousandOperationsWithoutErrorOrGrowth) {
  const auto transport = std::make_shared<ForgetfulTransport>([](const Request &request) {
    const auto is = [&](const char *call) { return request.body.rfind(call, 0) == 0; };
    return is("ValidateSubject") ? "valid:true" : is("Renew") ? "renewed:" : "issued:";
  });
  const auto service = Testing::ServiceOn(transport);
  const Testing::CountingToken held;
  OperationsInTurn operations(*service, nullptr, held);
  ExpectNoErrorAndNoGrowth(20000, operations, *transport);
  EXPECT_EQ(transport.use_count(), 2); // the test's and the service's
}

TEST(OneServiceOnSixteenThreads, ComposesReadsAndVerifiesTwentyThousandTimesWithoutErrorOrGrowth) {
  // Under a sanitizer a tenth of them, which takes as long as all do elsewhere.
  constexpr int OPERATIONS = Testing::IS_SANITIZED ? 2000 : 20000;
  const std::string tokenXml = Testing::ReadDataFile("tokens/bearer.xml");
  const std::string issued = Testing::IssueResponse(tokenXml);
  const std::string renewed = Testing::RenewResponse(tokenXml);
  const std::string valid = Testing::ValidateResponse("http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid");
  const auto transport = std::make_shared<ForgetfulTransport>([&](const Request &request) {
    return request.soapAction == Request::VALIDATE ? valid : request.soapAction == Request::RENEW ? renewed : issued;
  });
  const SecurityTokenServiceImpl service(std::make_shared<const RequestBuilderImpl>(Testing::HolderIdentity()),
                                         transport, std::make_shared<const ResponseHandlerImpl>(),
                                         Testing::TrustedCertificates());
  const auto held = CreateSamlToken(Testing::ReadDataFile("tokens/holder-of-key.xml"), Testing::TrustedCertificates());
  OperationsInTurn operations(service, "alice", *held);
  ExpectNoErrorAndNoGrowth(OPERATIONS, operations, *transport);
}

} // namespace
} // namespace SsoClient
