// SPDX-License-Identifier: Apache-2.0

#include "unit/token_source/source_stage.h"

#include <ssoclient/client/exceptions.h>

#include <gtest/gtest.h>

#include <typeinfo>
#include <utility>
#include <variant>

namespace Testing {

using namespace SsoClient;

void ManualIssuer::Acquire(const Credential &credential, const TokenSpec &, const CallOptions &options,
                           TokenCallback callback) const {
  const auto *const password = std::get_if<PasswordCredential>(&credential);
  Add({"acquire " + (password ? password->username : std::string("without a password")), options, std::move(callback)});
}

void ManualIssuer::Renew(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                         const CallOptions &options, TokenCallback callback) const {
  Add({"renew " + token->GetId() + " " + std::to_string(lifetimeSec), options, std::move(callback)});
}

void ManualIssuer::Add(Request request) const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_onRequest) {
    m_onRequest(request.text);
  } else {
    m_texts.push_back(request.text);
  }
  m_open.push_back(std::move(request));
}

std::vector<std::string> ManualIssuer::GetTexts() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_texts;
}

void ManualIssuer::OnRequest(std::function<void(const std::string &text)> function) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_onRequest = std::move(function);
}

std::size_t ManualIssuer::CountOpen() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  std::size_t count = 0;
  for (const Request &request : m_open) {
    count += request.options.cancelToken.IsCancelled() ? 0U : 1U;
  }
  return count;
}

void ManualIssuer::Forget() {
  std::deque<Request> forgotten; // destroyed outside the lock
  const std::lock_guard<std::mutex> lock(m_mutex);
  forgotten.swap(m_open);
}

CancelToken ManualIssuer::GetCancelToken() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_open.at(0).options.cancelToken;
}

void ManualIssuer::Answer(const TokenOutcome &outcome) {
  Request request;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    ASSERT_FALSE(m_open.empty()) << "there is no request";
    request = std::move(m_open.front());
    m_open.pop_front();
  }
  request.callback(outcome);
}

TokenCallback OutcomeList::MakeCallback() {
  return [state = m_state](const TokenOutcome &outcome) {
    const std::lock_guard<std::mutex> lock(state->mutex);
    state->texts.push_back(DescribeOutcome(outcome));
  };
}

std::vector<std::string> OutcomeList::Get() const {
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->texts;
}

std::string DescribeOutcome(const TokenOutcome &outcome) {
  try {
    return outcome.Get()->GetId();
  } catch (const CancelledException &exception) {
    return std::string("CancelledException: ") + exception.what();
  } catch (const DeadlineExceededException &exception) {
    return std::string("DeadlineExceededException: ") + exception.what();
  } catch (const CommunicationException &exception) {
    return std::string("CommunicationException: ") + exception.what();
  } catch (const Tarvel::IOException &exception) {
    return std::string("IOException: ") + exception.what();
  } catch (const SsoException &exception) {
    return std::string(typeid(exception) == typeid(SsoException) ? "SsoException: " : "another: ") + exception.what();
  } catch (const std::exception &exception) {
    return std::string("another: ") + exception.what();
  }
}

SourceStage::SourceStage()
    : provider([] {
        return PasswordCredential{"alice", Tarvel::SecretText("secret")};
      }),
      blocking([](const std::function<void()> &function) { function(); }) {
  options.executor = [](const std::function<void()> &function) { function(); };
}

SourceStage::~SourceStage() {
  Close();
  issuer->Forget();
}

TokenSourceCore &SourceStage::Source() {
  if (!m_source) {
    TokenSpec spec;
    spec.tokenLifetimeSec = 3600;
    m_source = std::make_shared<TokenSourceCore>(
        TokenSourceSetup{time, issuer, provider, spec, options, cache, blocking, [this] {
                           if (whileLocked) {
                             whileLocked();
                           }
                           return random;
                         }});
  }
  return *m_source;
}

void SourceStage::Close() {
  if (m_source) {
    m_source->Close();
    m_source = nullptr;
  }
}

std::shared_ptr<const SamlToken> SourceStage::Token(const std::string &id, std::chrono::nanoseconds lifetime,
                                                    DatedToken::Kind kind) const {
  const std::int64_t start = ReadClocks(time).system;
  return std::make_shared<DatedToken>(
      id, start, start + std::chrono::duration_cast<std::chrono::microseconds>(lifetime).count(), kind);
}

std::string SourceStage::Ask(const GetOptions &getOptions) {
  OutcomeList outcomes;
  Source().GetAsync(getOptions, CancelToken(), outcomes.MakeCallback());
  const std::vector<std::string> texts = outcomes.Get();
  return texts.empty() ? "waits" : texts.front();
}

void SourceStage::Provide(const std::shared_ptr<const SamlToken> &token) {
  EXPECT_EQ(Ask(), "waits");
  issuer->Answer(token);
}

TokenOutcome Failure(const std::string &message) {
  return std::make_exception_ptr(CommunicationException(message));
}

} // namespace Testing
