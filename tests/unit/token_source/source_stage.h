// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SourceStage`, a token source whose clocks, service, provider and threads a test controls.

#pragma once

#include "client/token_source_core.h"
#include "unit/token_source/dated_token.h"
#include "unit/token_source/manual_time.h"

#include <chrono>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace Testing {

/// A service that answers when the test calls `Answer`.
class ManualIssuer final : public SsoClient::TokenIssuer {
public:
  struct Request {
    std::string text; ///< "acquire USER" or "renew TOKEN LIFETIME"
    SsoClient::CallOptions options;
    SsoClient::TokenCallback callback;
  };

  void Acquire(const SsoClient::Credential &credential, const SsoClient::TokenSpec &spec,
               const SsoClient::CallOptions &options, SsoClient::TokenCallback callback) const override;
  void Renew(const std::shared_ptr<const SsoClient::SamlToken> &token, std::int64_t lifetimeSec,
             const SsoClient::CallOptions &options, SsoClient::TokenCallback callback) const override;

  /// The requests so far, as texts, in order.
  std::vector<std::string> GetTexts() const;
  std::size_t Count() const { return GetTexts().size(); }
  /// Calls `function` with the text of each later request, in place of keeping it.
  void OnRequest(std::function<void(const std::string &text)> function);
  /// The requests that have been neither answered nor cancelled.
  std::size_t CountOpen() const;

  /// What cancels the oldest request that has not been answered.
  SsoClient::CancelToken GetCancelToken() const;

  /// Answers the oldest request that has not been answered.
  void Answer(const SsoClient::TokenOutcome &outcome);

  /// Drops the requests that have not been answered. Their callbacks share the issuer.
  void Forget();

private:
  void Add(Request request) const;

  mutable std::mutex m_mutex; // guards all that follows
  mutable std::deque<Request> m_open;
  mutable std::vector<std::string> m_texts;
  std::function<void(const std::string &text)> m_onRequest;
};

/// The outcomes of calls: "ID" of a token, or "CLASS: MESSAGE".
class OutcomeList {
public:
  SsoClient::TokenCallback MakeCallback();
  std::vector<std::string> Get() const;

private:
  struct State {
    std::mutex mutex;
    std::vector<std::string> texts;
  };
  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

std::string DescribeOutcome(const SsoClient::TokenOutcome &outcome);

/// Makes the source when it is first used, so a test can change `options` before. Callbacks run on the thread that ends
/// the call, and the provider runs on the thread that starts the attempt, unless the test changes that.
class SourceStage {
public:
  SourceStage();
  SourceStage(const SourceStage &) = delete;
  SourceStage &operator=(const SourceStage &) = delete;
  ~SourceStage();

  ManualTime time;
  const std::shared_ptr<ManualIssuer> issuer = std::make_shared<ManualIssuer>();
  SsoClient::TokenSourceOptions options;
  SsoClient::CredentialProvider provider;
  SsoClient::Executor blocking;
  std::shared_ptr<const SsoClient::TokenCacheFile> cache;
  double random = 0;                 ///< the value of each random number of the source
  std::function<void()> whileLocked; ///< called for each random number, while the source is locked

  SsoClient::TokenSourceCore &Source();

  /// Destroys the source as its owner does.
  void Close();

  /// A token that is issued now and ends after `lifetime`.
  std::shared_ptr<const SsoClient::SamlToken> Token(const std::string &id, std::chrono::nanoseconds lifetime,
                                                    DatedToken::Kind kind = DatedToken::Kind::BEARER) const;

  /// The outcome of a call that starts now: `DescribeOutcome`, or "waits".
  std::string Ask(const SsoClient::GetOptions &getOptions = {});

  /// Makes the source get the token.
  void Provide(const std::shared_ptr<const SsoClient::SamlToken> &token);

private:
  std::shared_ptr<SsoClient::TokenSourceCore> m_source;
};

/// The outcome of a request that fails.
SsoClient::TokenOutcome Failure(const std::string &message);

} // namespace Testing
