// SPDX-License-Identifier: Apache-2.0
// Ten thousand acquisitions under way at once, against a service in a process of its own, which answers no request
// before all have arrived. The tests limit threads and memory, and expect exactly one right outcome of each
// acquisition.
#include "support/data_file.h"
#include "support/held_server.h"
#include "support/posting_server.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/repetitions.h"
#include "support/resident_memory.h"
#include "support/sanitized.h"
#include "support/soap_responses.h"

#include <ssoclient/client/token_client.h>

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::HeldServer;

constexpr int MANY = Testing::IS_SANITIZED ? 1'000 : 10'000;
constexpr unsigned long SPARE_DESCRIPTORS = 100;
constexpr std::size_t MOST_THREADS = 8;

/// How many acquisitions are under way at once. A full handshake takes most of a millisecond, so there are fewer over
/// TLS unless the tests run in full. The memory of each acquisition does not depend on the number.
int CountFor(HeldServer::Kind kind) {
  return kind == HeldServer::Kind::HTTP ? MANY : Testing::Repetitions(MANY, 1'000);
}

/// One byte for each acquisition, so that the memory that is measured is the library's.
class Outcomes {
public:
  explicit Outcomes(int operations) : m_operations(operations), m_calls(static_cast<std::size_t>(operations)) {}

  TokenCallback Count(int number) {
    return [this, number](const TokenOutcome &outcome) {
      ++m_calls[static_cast<std::size_t>(number)];
      try {
        if (outcome.Get()->GetSubject().ToString() == "{Name: alice; Domain:corp.example}") {
          ++m_right;
        }
      } catch (const CancelledException &) {
        ++m_cancelled;
      } catch (const std::exception &failure) {
        ADD_FAILURE() << failure.what();
      }
      m_ended.Add();
    };
  }

  bool WaitForAll() { return m_ended.WaitFor(m_operations); }
  int CountEnded() const { return m_ended.Get(); }
  int CountRight() const { return m_right; }
  int CountCancelled() const { return m_cancelled; }
  /// How many callbacks were called once.
  int CountCalledOnce() const {
    int once = 0;
    for (const std::atomic<unsigned char> &calls : m_calls) {
      once += calls == 1 ? 1 : 0;
    }
    return once;
  }

private:
  const int m_operations;
  std::vector<std::atomic<unsigned char>> m_calls;
  std::atomic<int> m_right{0};
  std::atomic<int> m_cancelled{0};
  Testing::EventCount m_ended;
};

class ManyAcquisitions : public testing::TestWithParam<HeldServer::Kind> {
protected:
  void SetUp() override {
    if (!Testing::AllowDescriptors(MANY + SPARE_DESCRIPTORS)) {
      GTEST_SKIP() << "the system does not allow a process " << MANY + SPARE_DESCRIPTORS << " descriptors";
    }
    m_server =
        std::make_unique<HeldServer>(Testing::IssueResponse(Testing::ReadDataFile("tokens/bearer.xml")), GetParam());
    SecurityTokenServiceConfig config = Testing::ConfigFor(m_server->GetUrl());
    m_context = Testing::ContextThatTrustsTheTestAuthority();
    config.sslContext = m_context.get();
    m_client = std::make_unique<TokenClient>(config);
    m_client->Acquire(m_credential, m_spec); // the library's first use, which the memory below does not include
    m_server->Hold();
  }

  void StartAll(const CancelToken &cancelToken = {}) {
    CallOptions options;
    options.cancelToken = cancelToken;
    for (int number = 0; number < m_operations; ++number) {
      m_client->AcquireAsync(m_credential, m_spec, options, m_outcomes.Count(number));
    }
    ASSERT_TRUE(Testing::Eventually([this] { return m_server->CountRequests() == 1 + m_operations; }));
  }

  const Credential m_credential = PasswordCredential{"alice@corp.example", Tarvel::SecretText(std::string("pass"))};
  const TokenSpec m_spec = [] {
    TokenSpec spec;
    spec.tokenLifetimeSec = 60;
    return spec;
  }();
  std::unique_ptr<HeldServer> m_server;
  Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  const int m_operations = CountFor(GetParam());
  Outcomes m_outcomes{m_operations};
  std::unique_ptr<TokenClient> m_client;
};

TEST_P(ManyAcquisitions, AreUnderWayAtOnceOnFewThreadsInLittleMemoryAndAllAreRight) {
  const double before = Testing::ResidentKilobytes();
  StartAll();
  const double each = (Testing::ResidentKilobytes() - before) / m_operations;
  EXPECT_LE(Testing::CountThreadsOfLibrary(), MOST_THREADS);
  EXPECT_EQ(m_outcomes.CountEnded(), 0);
  if (!Testing::IS_SANITIZED) { // a sanitizer keeps memory of its own
    EXPECT_LE(each, GetParam() == HeldServer::Kind::HTTP ? 24.0 : 64.0);
  }
  m_server->Release();
  ASSERT_TRUE(m_outcomes.WaitForAll());
  EXPECT_EQ(m_outcomes.CountRight(), m_operations);
  EXPECT_EQ(m_outcomes.CountCalledOnce(), m_operations);
  EXPECT_LE(Testing::CountThreadsOfLibrary(), MOST_THREADS);
  EXPECT_TRUE(Testing::Eventually([this] { return m_server->CountConnections() == 0; }));
}

TEST_P(ManyAcquisitions, AllEndWhenTheyAreCancelledAndCloseTheirConnections) {
  const CancelSource source;
  StartAll(source.GetToken());
  source.Cancel();
  ASSERT_TRUE(m_outcomes.WaitForAll());
  EXPECT_EQ(m_outcomes.CountCancelled(), m_operations);
  EXPECT_EQ(m_outcomes.CountCalledOnce(), m_operations);
  EXPECT_TRUE(Testing::Eventually([this] { return m_server->CountConnections() == 0; }));
}

TEST_P(ManyAcquisitions, AllEndWhenTheirClientIsDestroyed) {
  StartAll();
  m_client.reset();
  ASSERT_TRUE(m_outcomes.WaitForAll());
  EXPECT_EQ(m_outcomes.CountCancelled(), m_operations);
  EXPECT_EQ(m_outcomes.CountCalledOnce(), m_operations);
  EXPECT_TRUE(Testing::Eventually([this] { return m_server->CountConnections() == 0; }));
}

INSTANTIATE_TEST_SUITE_P(Over, ManyAcquisitions, testing::Values(HeldServer::Kind::HTTP, HeldServer::Kind::TLS),
                         [](const testing::TestParamInfo<HeldServer::Kind> &kind) {
                           return kind.param == HeldServer::Kind::HTTP ? "Http" : "Tls";
                         });

} // namespace
} // namespace SsoClient
