// SPDX-License-Identifier: Apache-2.0
// Memory that runs out at each place in turn during an operation of the client or a call of a token source. There is exactly
// one outcome, unless the start has thrown, and the next operation succeeds.
#include "integration/scarce_resources/memory_shortage.h"
#include "support/completion.h"
#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/process_resources.h"
#include "support/soap_responses.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cstdio>
#include <functional>
#include <memory>
#include <new>
#include <set>
#include <string>

namespace Testing {
namespace {

using SsoClient::TokenClient;
using SsoClient::TokenOutcome;
using SsoClient::TokenSource;

constexpr int MAX_PIECES = 100000;
const std::string BODY = IssueResponse(ReadDataFile("tokens/bearer.xml"));

/// Answers the request of one connection with a token.
void AnswerWithAToken(ServerConnection &peer) {
  if (!peer.ReadRequest().empty()) {
    peer.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(BODY.size()) +
               "\r\n\r\n" + BODY);
  }
}

/// Records the one call of a callback, without allocating memory.
class OutcomeNote {
public:
  SsoClient::TokenCallback ForToken() {
    return [this](const TokenOutcome &outcome) {
      try {
        outcome.Get();
      } catch (const std::exception &failure) {
        std::snprintf(m_message.data(), m_message.size(), "%s", failure.what());
      }
      ++m_calls;
    };
  }

  int CountCalls() const { return m_calls; }
  bool Wait() const {
    return Eventually([this] { return m_calls > 0; });
  }
  /// The message of the failure; empty for a success.
  std::string GetMessage() const { return m_message.data(); }

private:
  std::array<char, 256> m_message{};
  std::atomic<int> m_calls{0};
};

bool IsDocumented(const std::string &message, int port) {
  return message.empty() || message == "(thrown)" || message == "std::bad_alloc" ||
         message == "There is not enough memory" ||
         message == "Cannot connect to 127.0.0.1:" + std::to_string(port) + ": there is not enough memory";
}

/// Starts operations with each allocation refused in turn.
void ExpectOneOutcomeWhereverMemoryRunsOut(Shortage shortage, int port,
                                           const std::function<void(OutcomeNote &)> &start) {
  std::set<std::string> messages;
  for (int pieces = 0;; ++pieces) {
    ASSERT_LT(pieces, MAX_PIECES);
    EXPECT_TRUE(DrainIoThreads());
    OutcomeNote note;
    const bool hasThrown = StartShortOfMemory(shortage, pieces, [&] { start(note); });
    EXPECT_TRUE(hasThrown || note.Wait()) << "piece " << pieces;
    const int refused = EndShortage();
    EXPECT_TRUE(DrainIoThreads());
    EXPECT_EQ(note.CountCalls(), hasThrown ? 0 : 1) << "piece " << pieces;
    const std::string message = hasThrown ? "(thrown)" : note.GetMessage();
    EXPECT_TRUE(IsDocumented(message, port)) << message << ", piece " << pieces;
    messages.insert(message);
    if (refused == 0) {
      EXPECT_EQ(messages.count(""), 1u);
      EXPECT_GE(messages.size(), 3u);
      return;
    }
  }
}

SsoClient::SecurityTokenServiceConfig ConfigOf(const ScriptedServer &server) {
  return ConfigFor("http://127.0.0.1:" + std::to_string(server.GetPort()) + "/sts");
}

SsoClient::Credential Password() {
  return SsoClient::PasswordCredential{"alice", Tarvel::SecretText("secret")};
}

SsoClient::TokenSpec Spec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

/// Counts the starts and the ends of operations, without allocating memory.
class CountingObserver final : public SsoClient::OperationObserver {
public:
  void OnStarted(const SsoClient::OperationInfo &) override { ++m_starts; }
  void OnEnded(const SsoClient::OperationInfo &, const SsoClient::OperationEndedEvent &) override { ++m_ends; }

  int CountStarts() const { return m_starts; }
  int CountEnds() const { return m_ends; }

private:
  std::atomic<int> m_starts{0};
  std::atomic<int> m_ends{0};
};

class ClientWithoutMemory : public testing::TestWithParam<Shortage> {
protected:
  const ScriptedServer m_server{AnswerWithAToken};
};

TEST_P(ClientWithoutMemory, HasOneOutcomeForEachOperation) {
  const TokenClient client(ConfigOf(m_server));
  const SsoClient::Credential credential = Password();
  const SsoClient::TokenSpec spec = Spec();
  client.Acquire(credential, spec); // creates what exists once per process
  const SsoClient::CancelSource cancel;
  SsoClient::CallOptions options = SsoClient::CallOptions::WithTimeout(std::chrono::minutes(10));
  options.cancelToken = cancel.GetToken();
  ExpectOneOutcomeWhereverMemoryRunsOut(GetParam(), m_server.GetPort(), [&](OutcomeNote &note) {
    client.AcquireAsync(credential, spec, options, note.ForToken());
  });
  EXPECT_TRUE(client.Acquire(credential, spec, options));
}

TEST_P(ClientWithoutMemory, ReportsTheEndOfEachOperationThatItHasReportedAsStarted) {
  const auto observer = std::make_shared<CountingObserver>();
  const TokenClient client(ConfigOf(m_server));
  const SsoClient::Credential credential = Password();
  const SsoClient::TokenSpec spec = Spec();
  SsoClient::CallOptions options;
  options.observer = observer;
  options.dialect.emplace(); // so that the call needs steps of its own
  client.Acquire(credential, spec, options);
  ExpectOneOutcomeWhereverMemoryRunsOut(GetParam(), m_server.GetPort(), [&](OutcomeNote &note) {
    client.AcquireAsync(credential, spec, options, note.ForToken());
  });
  EXPECT_EQ(observer->CountStarts(), observer->CountEnds());
}

TEST_P(ClientWithoutMemory, ReportsTheEndOfEachCallThatWaits) {
  const auto observer = std::make_shared<CountingObserver>();
  const TokenClient client(ConfigOf(m_server));
  const SsoClient::Credential credential = Password();
  const SsoClient::TokenSpec spec = Spec();
  SsoClient::CallOptions options;
  options.observer = observer;
  client.Acquire(credential, spec, options);
  bool isComplete = false;
  for (int pieces = 0; !isComplete; ++pieces) {
    ASSERT_LT(pieces, MAX_PIECES);
    StartShortOfMemory(GetParam(), pieces, [&] {
      try {
        client.Acquire(credential, spec, options);
      } catch (const std::exception &failure) {
        EXPECT_TRUE(IsDocumented(failure.what(), m_server.GetPort())) << failure.what();
      }
    });
    isComplete = EndShortage() == 0;
    EXPECT_TRUE(DrainIoThreads());
  }
  EXPECT_EQ(observer->CountStarts(), observer->CountEnds());
}

TEST_P(ClientWithoutMemory, HasOneOutcomeForEachCallOfASource) {
  const auto client = std::make_shared<const TokenClient>(ConfigOf(m_server));
  std::unique_ptr<TokenSource> source;
  const auto renewSource = [&] {
    source = std::make_unique<TokenSource>(
        client, [] { return Password(); }, Spec());
  };
  renewSource();
  source->Get();
  ExpectOneOutcomeWhereverMemoryRunsOut(GetParam(), m_server.GetPort(), [&](OutcomeNote &note) {
    renewSource();
    source->GetAsync({}, note.ForToken());
  });
  renewSource();
  EXPECT_TRUE(source->Get());
}

INSTANTIATE_TEST_SUITE_P(Shortages, ClientWithoutMemory,
                         testing::Values(Shortage::OF_ONE_PIECE, Shortage::FROM_ONE_PIECE_ON),
                         [](const testing::TestParamInfo<Shortage> &shortage) {
                           return shortage.param == Shortage::OF_ONE_PIECE ? "OfOnePiece" : "FromOnePieceOn";
                         });

} // namespace
} // namespace Testing
