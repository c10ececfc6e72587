// SPDX-License-Identifier: Apache-2.0
// A token source over a client, against the development service over TLS.
#include "integration/service/service_client.h"
#include "support/operation_forms.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/throws_message.h"
#include "support/work_folder.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;

class OneSource : public testing::Test {
protected:
  std::unique_ptr<TokenSource> Source(const TokenSpec &spec = SpecFor(3600), const TokenSourceOptions &options = {},
                                      const std::string &identity = "") {
    const auto client = std::make_shared<const TokenClient>(ConfigFor(*m_context, identity, m_service.GetUrl()));
    return std::make_unique<TokenSource>(
        client,
        [this]() -> Credential {
          const std::lock_guard<std::mutex> lock(m_mutex);
          ++m_asked;
          return PasswordCredential{ALICE, Tarvel::SecretText(m_password)};
        },
        spec, options);
  }

  void SetPassword(const std::string &password) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_password = password;
  }
  int CountAsked() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_asked;
  }

  /// How often the service has logged `text`.
  int CountLogged(const std::string &text) const {
    const std::string log = m_service.GetLog();
    int count = 0;
    for (std::size_t at = log.find(text); at != std::string::npos; at = log.find(text, at + 1)) {
      ++count;
    }
    return count;
  }

  /// The service logs a token before it answers.
  void ExpectIssued(int count) const { EXPECT_EQ(CountLogged("issued _"), count) << m_service.GetLog(); }

  /// One for each test, because a shared service could still log what earlier tests sent to it.
  const DevSts m_service;
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = TrustingContext();

private:
  std::mutex m_mutex;
  std::string m_password = PASSWORD;
  int m_asked = 0;
};

class SourceOverTls : public OneSource, public testing::WithParamInterface<Form> {};

TEST_P(SourceOverTls, ReturnsOneTokenAsLongAsItIsFresh) {
  const auto source = Source();
  const TokenPtr first = Get(GetParam(), *source);
  EXPECT_EQ(first->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
  for (int i = 0; i < 100; ++i) {
    EXPECT_EQ(Get(GetParam(), *source), first);
  }
  ExpectIssued(1);
  EXPECT_EQ(CountAsked(), 1);
}

TEST_P(SourceOverTls, ReturnsAnotherTokenAfterAnInvalidation) {
  const auto source = Source();
  const TokenPtr first = Get(GetParam(), *source);
  source->Invalidate("_unknown");
  EXPECT_EQ(Get(GetParam(), *source), first);
  source->Invalidate(first->GetId());
  const TokenPtr second = Get(GetParam(), *source);
  EXPECT_NE(second->GetId(), first->GetId());
  source->Invalidate(first->GetId()); // late, from another thread whose call was refused
  EXPECT_EQ(Get(GetParam(), *source), second);
  ExpectIssued(2);
}

TEST_P(SourceOverTls, UsesANewPasswordAtTheNextAttempt) {
  TokenSourceOptions options;
  options.firstBackOff = std::chrono::milliseconds(1);
  options.longestBackOff = std::chrono::milliseconds(1);
  const auto source = Source(SpecFor(3600), options);
  SetPassword("looking-glass");
  EXPECT_THROWS_MESSAGE(Get(GetParam(), *source), InvalidCredentialsException,
                        "Authentication failed: unknown user or wrong password");
  SetPassword(PASSWORD);
  EXPECT_TRUE(Eventually([&] {
    try {
      return Get(GetParam(), *source) != nullptr;
    } catch (const InvalidCredentialsException &) { // within the back-off
      return false;
    }
  }));
  ExpectIssued(1);
}

TEST_P(SourceOverTls, SharesItsTokenThroughAFile) {
  const WorkFolder folder;
  TokenSourceOptions options;
  options.cache.emplace();
  options.cache->path = folder / "token";
  options.cache->owner = ALICE;
  const TokenPtr first = Get(GetParam(), *Source(SpecFor(3600), options));
  for (int i = 0; i < 5; ++i) {
    EXPECT_EQ(Get(GetParam(), *Source(SpecFor(3600), options))->GetId(), first->GetId());
  }
  ExpectIssued(1);
  EXPECT_NE(Get(GetParam(), *Source(SpecFor(1800), options))->GetId(), first->GetId()) << "another spec";
  const auto source = Source(SpecFor(1800), options);
  const TokenPtr refused = Get(GetParam(), *source);
  source->Invalidate(refused->GetId());
  EXPECT_NE(Get(GetParam(), *source)->GetId(), refused->GetId());
  ExpectIssued(3);
  EXPECT_EQ(folder.Names(), std::set<std::string>{"token"});
}

INSTANTIATE_TEST_SUITE_P(Forms, SourceOverTls, testing::ValuesIn(AllForms()),
                         [](const auto &form) { return NameOf(form.param); });

TEST_F(OneSource, SendsOneRequestForManyThreads) {
  const auto source = Source();
  std::vector<std::future<TokenPtr>> futures;
  Gate gate;
  for (int i = 0; i < 16; ++i) {
    futures.push_back(std::async(std::launch::async, [&] {
      gate.Pass();
      return source->Get();
    }));
  }
  ASSERT_TRUE(gate.WaitForArrivals(16));
  gate.Open();
  std::set<TokenPtr> tokens;
  for (std::future<TokenPtr> &future : futures) {
    tokens.insert(future.get());
  }
  EXPECT_EQ(tokens.size(), 1u);
  ExpectIssued(1);
}

// The token becomes due after two seconds, while the test waits for the renewal. Its lifetime is much longer, so that the
// token has not expired when a thread or the service is late.
TEST_F(OneSource, RenewsByItself) {
  TokenSpec spec = SpecFor(20);
  spec.renewable = true;
  TokenSourceOptions options;
  options.refreshAt = 0.1;
  options.jitter = 0;
  const auto source = Source(spec, options, "client");
  const auto changes = std::make_shared<EventCount>(); // the function may still run when the test has ended
  const ChangeRegistration registration = source->OnChange([changes](const TokenPtr &) { changes->Add(); });
  const TokenPtr first = source->Get();
  source->Get(); // without this call, the source would not refresh by itself
  ASSERT_TRUE(changes->WaitFor(2));
  EXPECT_NE(source->Get()->GetId(), first->GetId());
  EXPECT_GT(CountLogged("renewed, issued _"), 0) << m_service.GetLog();
}

TEST_F(OneSource, EndsTheCallsThatWaitWhenItIsDestroyed) {
  const auto client = std::make_shared<const TokenClient>(ConfigFor(*m_context, "", m_service.FaultUrl("stall")));
  auto source = std::make_unique<TokenSource>(
      client,
      []() -> Credential {
        return PasswordCredential{ALICE, Tarvel::SecretText(PASSWORD)};
      },
      SpecFor(60));
  std::vector<std::future<TokenPtr>> futures;
  for (int i = 0; i < 10; ++i) {
    futures.push_back(source->GetFuture());
  }
  source.reset();
  for (std::future<TokenPtr> &future : futures) {
    EXPECT_THROW(Await(std::move(future)), CancelledException);
  }
}

} // namespace
} // namespace SsoClient
