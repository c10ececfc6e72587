// SPDX-License-Identifier: Apache-2.0
/// @file
/// Stand-ins for what the service works with. They hold no state but what the test looks at, and are safe on any thread.
///
/// The request builder writes its call and the arguments into the request. The transport records requests, and answers
/// with the text that the test's function gives. The response handler reads texts of its own simple form:
/// "issued:XML", "renewed:XML", "valid:true", "valid:false", "leg:CONTEXT|BYTES|XML"; "fault:MESSAGE" is refused.

#pragma once

#include "exchange/request_builder.h"
#include "exchange/response_handler.h"
#include "exchange/transport.h"
#include "service/security_token_service_impl.h"
#include "support/data_file.h"

#include <ssoclient/exceptions.h>
#include <tarvel/crypto/certificate.h>

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace Testing {

using Bytes = std::vector<std::uint8_t>;

inline Bytes ToBytes(const std::string &text) {
  return Bytes(text.begin(), text.end());
}

inline std::string ToString(const Bytes &bytes) {
  return std::string(bytes.begin(), bytes.end());
}

class RequestBuilderStandIn final : public SsoClient::RequestBuilder {
public:
  /// @param onCall called at the beginning of each call; what it throws is the builder's refusal
  explicit RequestBuilderStandIn(std::function<void()> onCall = [] {}) : m_onCall(std::move(onCall)) {}

  void BuildUserPassTokenRequest(const std::string &username, const std::string &password,
                                 const SsoClient::TokenSpec &spec, SsoClient::Request &request) const override {
    Fill(request, "UserPass " + username + " " + password + " " + Text(spec));
  }
  void BuildInitialSPNegoRequest(const SsoClient::TokenSpec &spec, const Bytes &leg,
                                 SsoClient::Request &request) const override {
    Fill(request, "InitialSPNego " + Text(spec) + " " + ToString(leg));
  }
  void BuildContinuedSPNegoRequest(const std::string &contextId, const Bytes &leg,
                                   SsoClient::Request &request) const override {
    Fill(request, "ContinuedSPNego " + contextId + " " + ToString(leg));
  }
  void BuildCertificateTokenRequest(const SsoClient::TokenSpec &spec, SsoClient::Request &request) const override {
    Fill(request, "Certificate " + Text(spec));
  }
  void BuildExchangeTokenRequest(const SsoClient::SamlToken &, const SsoClient::TokenSpec &spec,
                                 SsoClient::Request &request) const override {
    Fill(request, "Exchange " + Text(spec));
  }
  void BuildValidateSubjectRequest(const SsoClient::SamlToken &, SsoClient::Request &request) const override {
    Fill(request, "ValidateSubject");
  }
  void BuildRenewRequest(const SsoClient::SamlToken &, std::int64_t lifetimeSec,
                         SsoClient::Request &request) const override {
    Fill(request, "Renew " + std::to_string(lifetimeSec));
  }

private:
  static std::string Text(const SsoClient::TokenSpec &spec) { return std::to_string(spec.tokenLifetimeSec); }
  void Fill(SsoClient::Request &request, const std::string &call) const {
    m_onCall();
    if (!request.soapAction.empty() || !request.body.empty()) {
      throw std::logic_error("the request was used before");
    }
    request.soapAction = "urn:action";
    request.body = call;
  }

  const std::function<void()> m_onCall;
};

/// What the service answers to a request. What it throws is the transport's failure.
using Answer = std::function<std::string(const SsoClient::Request &)>;

class TransportStandIn final : public SsoClient::Transport {
public:
  explicit TransportStandIn(Answer answer) : m_state(std::make_shared<State>(std::move(answer))) {}

  std::shared_ptr<SsoClient::TransportSession> CreateSession() const override {
    return std::make_shared<Session>(m_state);
  }

  /// The bodies of the requests, each behind the number of its session: "1: UserPass …".
  std::vector<std::string> Sent() const {
    const std::lock_guard<std::mutex> lock(m_state->mutex);
    return m_state->sent;
  }

  int CountSessions() const { return m_state->sessions; }

  /// How many sessions have not been released.
  int CountOpenSessions() const { return m_state->open; }

private:
  struct State {
    explicit State(Answer answerOfTest) : answer(std::move(answerOfTest)) {}
    const Answer answer;
    std::atomic<int> sessions{0};
    std::atomic<int> open{0};
    std::mutex mutex;
    std::vector<std::string> sent;
  };

  class Session final : public SsoClient::TransportSession {
  public:
    explicit Session(std::shared_ptr<State> state) : m_state(std::move(state)), m_number(++m_state->sessions) {
      ++m_state->open;
    }
    Session(const Session &) = delete;
    Session &operator=(const Session &) = delete;
    ~Session() { --m_state->open; }

    void SendRequest(const SsoClient::Request &request, Tarvel::Ref<Tarvel::Reader> &response) override {
      {
        const std::lock_guard<std::mutex> lock(m_state->mutex);
        m_state->sent.push_back(std::to_string(m_number) + ": " + request.body);
      }
      response = Tarvel::CreateStringReader(m_state->answer(request));
    }

    void SendRequestAsync(const SsoClient::Request &, const Completion &,
                          Tarvel::Ref<Tarvel::System::ScheduledItem> &) override {
      throw std::logic_error("the service never sends in this way");
    }

  private:
    const std::shared_ptr<State> m_state;
    const int m_number;
  };

  const std::shared_ptr<State> m_state;
};

class ResponseHandlerStandIn final : public SsoClient::ResponseHandler {
public:
  /// @param onCall called at the beginning of each call
  explicit ResponseHandlerStandIn(std::function<void()> onCall = [] {}) : m_onCall(std::move(onCall)) {}

  void HandleAcquireTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const override {
    tokenXml = ReadAfter("issued:", response);
  }
  bool HandleValidateSubjectResponse(Tarvel::Reader *response) const override {
    return ReadAfter("valid:", response) == "true";
  }
  void HandleRenewTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const override {
    tokenXml = ReadAfter("renewed:", response);
  }
  void HandleSPNegoResponse(Tarvel::Reader *response, SsoClient::SPNegoResponse &spnego) const override {
    const std::string text = ReadAfter("leg:", response);
    const std::size_t first = text.find('|');
    const std::size_t second = text.find('|', first + 1);
    spnego.contextId = text.substr(0, first);
    spnego.leg = ToBytes(text.substr(first + 1, second - first - 1));
    spnego.tokenXml = text.substr(second + 1);
  }

private:
  std::string ReadAfter(const std::string &prefix, Tarvel::Reader *response) const {
    m_onCall();
    const std::string text = response->ReadToEnd(1u << 24);
    const std::string fault = "fault:";
    if (text.compare(0, fault.size(), fault) == 0) {
      throw SsoClient::InvalidCredentialsException(text.substr(fault.size()));
    }
    if (text.compare(0, prefix.size(), prefix) != 0) {
      throw std::logic_error("asked for " + prefix + " of the response " + text);
    }
    return text.substr(prefix.size());
  }

  const std::function<void()> m_onCall;
};

/// A handler that answers with the legs of its script, null included, and records what the service sent.
class NegotiationHandlerStandIn final : public SsoClient::NegotiationHandler {
public:
  explicit NegotiationHandlerStandIn(std::vector<std::shared_ptr<Bytes>> script) : m_script(std::move(script)) {}

  std::shared_ptr<Bytes> NegotiateLeg(const Bytes &serviceLeg) override {
    received.push_back(ToString(serviceLeg));
    return m_script.at(received.size() - 1);
  }

  std::vector<std::string> received;

private:
  const std::vector<std::shared_ptr<Bytes>> m_script;
};

inline std::shared_ptr<Bytes> Leg(const std::string &text) {
  return std::make_shared<Bytes>(ToBytes(text));
}

/// The certificate that the fixture tokens are signed with.
inline Tarvel::Crypto::CertificateList TrustedCertificates() {
  return {Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))};
}

inline std::shared_ptr<SsoClient::SecurityTokenServiceImpl> ServiceOn(
    const std::shared_ptr<const SsoClient::Transport> &transport, const std::function<void()> &onResponse = [] {}) {
  return std::make_shared<SsoClient::SecurityTokenServiceImpl>(
      std::make_shared<const RequestBuilderStandIn>(), transport,
      std::make_shared<const ResponseHandlerStandIn>(onResponse), TrustedCertificates());
}

/// A spec with that lifetime in seconds.
inline SsoClient::TokenSpec SpecFor(std::int64_t lifetimeSec) {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = lifetimeSec;
  return spec;
}

} // namespace Testing
