// SPDX-License-Identifier: Apache-2.0

#include "scripted_transport.h"

#include <ssoclient/exceptions.h>
#include <tarvel/system/timer.h>

#include <atomic>
#include <utility>

namespace Testing {

using SsoClient::Request;
using Tarvel::Ref;
using Tarvel::System::ScheduledItem;

Reply Success(const std::string &body) {
  Reply reply;
  reply.body = body;
  reply.facts.octets = body.size();
  return reply;
}

Reply NoConnection() {
  Reply reply;
  reply.failure = "Cannot connect to sts.test:443";
  reply.facts = {};
  return reply;
}

Reply Unavailable(const std::string &retryAfter) {
  Reply reply;
  reply.failure = "Server returned error: 503 Busy";
  reply.facts = {503, "Busy", "text/html", 0, retryAfter, true};
  return reply;
}

struct ScriptedTransport::State {
  State(Script scriptOfTest, std::function<void()> ofTest)
      : script(std::move(scriptOfTest)), afterSending(std::move(ofTest)) {}
  const Script script;
  const std::function<void()> afterSending;
  std::atomic<int> sessions{0};
  std::atomic<int> open{0};
  std::atomic<int> cancelled{0};
  std::atomic<int> timedOut{0};
  EventCount sentCount;
  std::mutex mutex; // guards what follows
  std::vector<std::string> sent;
  std::vector<Ref<Pending>> held;
};

/// A request that has been sent.
class ScriptedTransport::Pending final : public ScheduledItem {
public:
  Pending(const std::shared_ptr<State> &state, std::shared_ptr<SsoClient::ResponseFacts> facts,
          SsoClient::TransportSession::Completion completion)
      : m_state(state), m_facts(std::move(facts)), m_completion(std::move(completion)) {}

  void Cancel() noexcept override {
    if (!m_isOver.exchange(true)) {
      ++m_state->cancelled;
      Reply reply = NoConnection();
      reply.failure = "The request to sts.test:443 was cancelled";
      Complete(reply);
    }
  }
  bool IsDone() const noexcept override { return m_isOver; }

  void TimeOut() {
    if (!m_isOver.exchange(true)) {
      ++m_state->timedOut;
      Reply reply = NoConnection();
      reply.failure = "No response from sts.test:443 within 240 seconds";
      reply.facts.hasConnected = true;
      Complete(reply);
    }
  }

  void Answer(const Reply &reply) {
    if (!m_isOver.exchange(true)) {
      Complete(reply);
    }
  }

private:
  ~Pending() override = default;

  void Complete(const Reply &reply) {
    Tarvel::System::StartTimer(std::chrono::steady_clock::now(), [self = Ref<Pending>(this), reply] {
      const auto completion = std::exchange(self->m_completion, nullptr);
      *self->m_facts = reply.facts;
      if (reply.failure.empty()) {
        const Ref<Tarvel::Reader> response = Tarvel::CreateStringReader(reply.body);
        completion(nullptr, response.get());
      } else {
        const SsoClient::CommunicationException failure(reply.failure);
        completion(&failure, nullptr);
      }
    });
  }

  const std::shared_ptr<State> m_state;
  const std::shared_ptr<SsoClient::ResponseFacts> m_facts;
  SsoClient::TransportSession::Completion m_completion;
  std::atomic<bool> m_isOver{false};
};

class ScriptedTransport::Session final : public SsoClient::TransportSession {
public:
  explicit Session(std::shared_ptr<State> state) : m_state(std::move(state)), m_number(++m_state->sessions) {
    ++m_state->open;
  }
  Session(const Session &) = delete;
  Session &operator=(const Session &) = delete;
  ~Session() { --m_state->open; }

  void SendRequest(const Request &, Ref<Tarvel::Reader> &) override {
    throw std::logic_error("the client never sends in this way");
  }

  void SendRequestAsync(const Request &request, const Completion &completion, Ref<ScheduledItem> &item) override {
    int number = 0;
    {
      const std::lock_guard<std::mutex> lock(m_state->mutex);
      m_state->sent.push_back(std::to_string(m_number) + ": " + request.body);
      number = static_cast<int>(m_state->sent.size());
    }
    const boost::optional<Reply> reply = m_state->script(request, number);
    const auto pending = Tarvel::MakeRef<Pending>(m_state, request.facts, completion);
    item = pending;
    if (reply) {
      pending->Answer(*reply);
    } else {
      const std::lock_guard<std::mutex> lock(m_state->mutex);
      m_state->held.push_back(pending);
    }
    m_state->sentCount.Add();
    m_state->afterSending();
  }

  void TimeOut(ScheduledItem &item) noexcept override { dynamic_cast<Pending &>(item).TimeOut(); }

private:
  const std::shared_ptr<State> m_state;
  const int m_number;
};

ScriptedTransport::ScriptedTransport(Script script, std::function<void()> afterSending)
    : m_state(std::make_shared<State>(std::move(script), std::move(afterSending))) {}

ScriptedTransport::~ScriptedTransport() {
  std::vector<Ref<Pending>> held; // destroyed after the lock: each of them shares the state
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  held.swap(m_state->held);
}

std::shared_ptr<SsoClient::TransportSession> ScriptedTransport::CreateSession() const {
  return std::make_shared<Session>(m_state);
}

void ScriptedTransport::AnswerHeld(const Reply &reply) const {
  std::vector<Ref<Pending>> held;
  {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    held.swap(m_state->held);
  }
  for (const Ref<Pending> &pending : held) {
    pending->Answer(reply);
  }
}

std::vector<std::string> ScriptedTransport::Sent() const {
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->sent;
}

bool ScriptedTransport::WaitForSent(int count) const {
  return m_state->sentCount.WaitFor(count);
}

int ScriptedTransport::CountCancelled() const {
  return m_state->cancelled;
}

int ScriptedTransport::CountTimedOut() const {
  return m_state->timedOut;
}

int ScriptedTransport::CountOpenSessions() const {
  return m_state->open;
}

} // namespace Testing
