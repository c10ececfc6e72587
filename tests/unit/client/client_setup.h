// SPDX-License-Identifier: Apache-2.0
/// @file
/// A client over a `ScriptedTransport`, and the outcomes of its operations.

#pragma once

#include "client/client_core.h"
#include "scripted_transport.h"
#include "support/data_file.h"
#include "support/exception_class.h"
#include "support/kept_exception.h"
#include "support/process_resources.h"
#include "support/rendezvous.h"
#include "support/service_stand_ins.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/create_saml_token.h>

#include <gtest/gtest.h>

#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <typeinfo>
#include <utility>
#include <vector>

namespace Testing {

inline const std::string &BearerXml() {
  static const std::string xml = ReadDataFile("tokens/bearer.xml");
  return xml;
}

inline std::shared_ptr<const SsoClient::SamlToken> HolderToken() {
  return SsoClient::CreateSamlToken(ReadDataFile("tokens/holder-of-key.xml"), TrustedCertificates());
}

/// Answers each request with a token.
inline boost::optional<Reply> Issue(const SsoClient::Request &, int) {
  return Success("issued:" + BearerXml());
}

/// Leaves each request unanswered.
inline boost::optional<Reply> Hold(const SsoClient::Request &, int) {
  return boost::none;
}

/// The parts of a client that a test can replace.
struct ClientParts {
  SsoClient::ClientOptions options{};
  std::function<void()> onCompose = [] {};
  std::function<void()> onRead = [] {};
  const SsoClient::TimeSource *time = &SsoClient::GetSystemTimeSource();
};

inline std::shared_ptr<SsoClient::TokenClient> ClientOn(const std::shared_ptr<const SsoClient::Transport> &transport,
                                                        const ClientParts &parts = {}) {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = "http://sts.test/";
  config.signingCertificates = TrustedCertificates();
  return std::make_shared<SsoClient::TokenClient>(std::make_shared<SsoClient::ClientCore>(
      config, parts.options,
      SsoClient::ClientCore::Collaborators{std::make_shared<const RequestBuilderStandIn>(parts.onCompose), transport,
                                           std::make_shared<const ResponseHandlerStandIn>(parts.onRead), parts.time}));
}

inline SsoClient::PasswordCredential Alice() {
  return {"alice", Tarvel::SecretText("secret")};
}

/// "CLASS: MESSAGE" of an exception.
inline std::string Describe(const std::exception_ptr &failure) {
  KeepForThreadSanitizer(failure);
  try {
    std::rethrow_exception(failure);
  } catch (const std::exception &exception) {
    return SsoClient::ClassNameOf(&typeid(exception)) + ": " + exception.what();
  } catch (...) {
    return SsoClient::ClassNameOf(SsoClient::CurrentExceptionClass());
  }
}

inline std::string Describe(const SsoClient::TokenOutcome &outcome) {
  return outcome.HasValue() ? outcome.Get()->GetSubject().ToString() : Describe(outcome.GetException());
}

inline std::string Describe(const SsoClient::ValidityOutcome &outcome) {
  return outcome.HasValue() ? (outcome.Get() ? "true" : "false") : Describe(outcome.GetException());
}

/// How `call` ends: "returned", or the exception.
template <typename Call>
std::string EndOf(const Call &call) {
  try {
    call();
    return "returned";
  } catch (...) {
    return Describe(std::current_exception());
  }
}

/// Makes callbacks, and records their outcomes.
class Outcomes {
public:
  template <typename Outcome = SsoClient::TokenOutcome>
  std::function<void(const Outcome &)> Record() const {
    return [state = m_state](const Outcome &outcome) {
      {
        const std::lock_guard<std::mutex> lock(state->mutex);
        state->texts.push_back(Describe(outcome));
        state->threads.insert(std::this_thread::get_id());
      }
      state->called.Add();
    };
  }

  /// Waits for that many outcomes, and returns them.
  std::vector<std::string> Wait(int count = 1) const {
    EXPECT_TRUE(m_state->called.WaitFor(count));
    return Get();
  }
  std::vector<std::string> Get() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->texts;
  }
  std::set<std::thread::id> Threads() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->threads;
  }
  /// Waits until all callbacks are destroyed.
  bool AreReleased() const {
    return Eventually([this] { return m_state.use_count() == 1; });
  }

private:
  struct State {
    std::mutex mutex;
    std::vector<std::string> texts;
    std::set<std::thread::id> threads;
    EventCount called;
  };
  const std::shared_ptr<State> m_state = std::make_shared<State>();
};

constexpr const char *CANCELLED = "CancelledException: The operation was cancelled";
constexpr const char *LATE = "DeadlineExceededException: The deadline passed before the operation ended";
constexpr const char *DESTROYED = "CancelledException: The operation was cancelled because its client was destroyed";

} // namespace Testing
