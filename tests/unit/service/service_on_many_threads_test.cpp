// SPDX-License-Identifier: Apache-2.0

#include "exchange/request_builder_impl.h"
#include "exchange/response_handler_impl.h"
#include "support/allocated_bytes.h"
#include "support/counting_token.h"
#include "support/identity.h"
#include "support/operations_in_turn.h"
#include "support/process_resources.h"
#include "support/repetitions.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"

#include <ssoclient/create_saml_token.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <stdexcept>
#include <string>
#include <utility>

namespace SsoClient {
namespace {

using Testing::OperationsInTurn;

/// How many more bytes may be allocated at the end: OpenSSL allocates a few on first use. A leak of one byte in each of
/// 20,000 operations would exceed it.
constexpr std::size_t MAX_GROWTH_BYTES = 16384;

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

/// Expects `count` operations to succeed and not to leak.
void ExpectNoErrorAndNoGrowth(int count, OperationsInTurn &operations, const ForgetfulTransport &transport) {
  constexpr int FIRST = 320; // after these, everything that is made once exists
  operations.RunOnSixteenThreads(FIRST);
  ASSERT_EQ(operations.GetFailure(), "");
  const std::size_t bytes = Testing::CountAllocatedBytes();
  const std::size_t descriptors = Testing::CountDescriptors();
  operations.RunOnSixteenThreads(count);
  EXPECT_EQ(operations.GetFailure(), "");
  EXPECT_EQ(operations.CountSuccesses(), FIRST + count);
  EXPECT_EQ(transport.CountSessions(), FIRST + count);
  EXPECT_EQ(transport.CountOpenSessions(), 0);
  EXPECT_EQ(Testing::CountDescriptors(), descriptors);
  EXPECT_LE(Testing::CountAllocatedBytes(), bytes + MAX_GROWTH_BYTES);
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
  ExpectNoErrorAndNoGrowth(Testing::Repetitions(20000, 2000), operations, *transport);
}

} // namespace
} // namespace SsoClient
