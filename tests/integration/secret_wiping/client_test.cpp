// SPDX-License-Identifier: Apache-2.0
// No password of a credential may remain in the heap after an operation of the client, however the operation ends.
#include "integration/secret_wiping/freed_memory.h"
#include "support/data_file.h"
#include "support/operation_forms.h"
#include "support/posting_server.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/scripted_server.h"
#include "support/soap_responses.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <optional>
#include <string>
#include <tuple>
#include <utility>

namespace SsoClient {
namespace {

using namespace Testing;

const char LONG_PASSWORD[] = "correct-horse-battery-staple-and-more-than-fits-into-the-string-itself";
const char SHORT_PASSWORD[] = "tr0ub4dor";

/// Answers without reading the request, because this process must have no copy of it except the client's.
ScriptedServer::Script Answers(const std::string &body) {
  return [body](ServerConnection &connection) {
    connection.Handshake();
    connection.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(body.size()) +
                     "\r\n\r\n" + body);
    connection.WaitForInterrupt();
  };
}

ScriptedServer::Script Stalls() {
  return [](ServerConnection &connection) {
    connection.Handshake();
    connection.WaitForInterrupt();
  };
}

struct SentRequests final : OperationObserver {
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { count.Add(); }
  EventCount count;
};

class PasswordOfAClient : public testing::TestWithParam<std::tuple<const char *, Form, bool>> {
protected:
  const char *Password() const { return std::get<0>(GetParam()); }
  Form GetForm() const { return std::get<1>(GetParam()); }

  std::optional<TlsSettings> Tls() const {
    return std::get<2>(GetParam()) ? std::optional(TlsSettings()) : std::nullopt;
  }

  SecurityTokenServiceConfig ConfigOf(const ScriptedServer &server) const {
    SecurityTokenServiceConfig config = ConfigFor((Tls() ? std::string("https") : std::string("http")) +
                                                  "://localhost:" + std::to_string(server.GetPort()) + "/sts");
    config.sslContext = m_context.get();
    return config;
  }

  /// Acquires with the password, whose last copy is released here.
  TokenPtr Acquire(const TokenClient &client, const CallOptions &options = {}) const {
    return Testing::Acquire(GetForm(), client, PasswordCredential{"alice", Tarvel::SecretText(Password())}, Spec(),
                            options);
  }

  static TokenSpec Spec() {
    TokenSpec spec;
    spec.tokenLifetimeSec = 600;
    for (int i = 0; i < 100; ++i) { // a request that outgrows many buffers
      spec.audienceRestriction.insert("https://audience.example/" + std::to_string(i));
    }
    return spec;
  }

  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = ContextThatTrustsTheTestAuthority();
};

/// Waits until the operation with this observer has released its memory, which may be after its outcome.
void WaitForRelease(const std::weak_ptr<OperationObserver> &observer) {
  EXPECT_TRUE(Eventually([&] { return observer.expired(); }));
  EXPECT_TRUE(DrainIoThreads());
}

TEST_P(PasswordOfAClient, IsWipedAfterASuccess) {
  const ScriptedServer server(Answers(IssueResponse(ReadDataFile("tokens/bearer.xml"))), Tls());
  const TokenClient client(ConfigOf(server));
  const FreedMemoryWatch watch(Password());
  std::weak_ptr<OperationObserver> observer;
  {
    const auto sent = std::make_shared<SentRequests>();
    observer = sent;
    CallOptions options;
    options.observer = sent;
    EXPECT_EQ(Acquire(client, options)->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
  }
  WaitForRelease(observer);
  EXPECT_EQ(watch.Found(), 0);
}

TEST_P(PasswordOfAClient, IsWipedAfterAFailure) {
  const ScriptedServer server(Answers(FaultResponse("wst:FailedAuthentication", "no")), Tls());
  const TokenClient client(ConfigOf(server));
  const FreedMemoryWatch watch(Password());
  EXPECT_THROW(Acquire(client), InvalidCredentialsException);
  EXPECT_TRUE(DrainIoThreads());
  EXPECT_EQ(watch.Found(), 0);
}

TEST_P(PasswordOfAClient, IsWipedAfterACancelOrADeadline) {
  const ScriptedServer server(Stalls(), Tls());
  const TokenClient client(ConfigOf(server));
  const FreedMemoryWatch watch(Password());
  EXPECT_THROW(Acquire(client, CallOptions::WithTimeout(std::chrono::milliseconds(-1))), DeadlineExceededException);
  EXPECT_THROW(Acquire(client, CallOptions::WithTimeout(std::chrono::milliseconds(100))), DeadlineExceededException);
  std::weak_ptr<OperationObserver> observer;
  {
    const auto sent = std::make_shared<SentRequests>();
    observer = sent;
    const CancelSource cancel;
    CallOptions options;
    options.observer = sent;
    options.cancelToken = cancel.GetToken();
    const std::future<void> canceller = std::async(std::launch::async, [&] {
      sent->count.WaitFor(1);
      cancel.Cancel();
    });
    EXPECT_THROW(Acquire(client, options), CancelledException);
  }
  WaitForRelease(observer);
  EXPECT_EQ(watch.Found(), 0);
}

TEST_P(PasswordOfAClient, IsWipedWhenTheRequestCannotBeBuilt) {
  const ScriptedServer server(Stalls(), Tls());
  const TokenClient client(ConfigOf(server));
  const std::string uncarriable = std::string(Password()) + "\x01";
  const FreedMemoryWatch watch(Password());
  EXPECT_THROW(
      Testing::Acquire(GetForm(), client, PasswordCredential{"alice", Tarvel::SecretText(uncarriable)}, Spec()),
      Tarvel::InvalidArgumentException);
  EXPECT_EQ(watch.Found(), 0);
}

TEST_P(PasswordOfAClient, IsWipedAfterATokenSourceHasUsedIt) {
  const ScriptedServer server(Answers(IssueResponse(ReadDataFile("tokens/bearer.xml"))), Tls());
  const auto client = std::make_shared<const TokenClient>(ConfigOf(server));
  const char *const password = Password();
  const FreedMemoryWatch watch(password);
  {
    const TokenSource source(
        client,
        [password]() -> Credential {
          return PasswordCredential{"alice", Tarvel::SecretText(password)};
        },
        Spec());
    EXPECT_EQ(Testing::Get(GetForm(), source)->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
  }
  EXPECT_TRUE(DrainIoThreads());
  EXPECT_EQ(watch.Found(), 0);
}

INSTANTIATE_TEST_SUITE_P(Forms, PasswordOfAClient,
                         testing::Combine(testing::Values(LONG_PASSWORD, SHORT_PASSWORD), testing::ValuesIn(AllForms()),
                                          testing::Bool()),
                         [](const auto &one) {
                           return std::string(std::get<0>(one.param) == LONG_PASSWORD ? "Long" : "Short") +
                                  NameOf(std::get<1>(one.param)) + (std::get<2>(one.param) ? "Tls" : "PlainHttp");
                         });

} // namespace
} // namespace SsoClient
