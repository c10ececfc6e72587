// SPDX-License-Identifier: Apache-2.0

#include "support/service_stand_ins.h"

#include "support/data_file.h"

#include <ssoclient/exceptions.h>

#include <atomic>
#include <mutex>
#include <stdexcept>
#include <utility>

namespace Testing {

namespace {

std::string Text(const SsoClient::TokenSpec &spec) {
  return std::to_string(spec.tokenLifetimeSec);
}

} // namespace

Bytes ToBytes(const std::string &text) {
  return Bytes(text.begin(), text.end());
}

std::string ToString(const Bytes &bytes) {
  return std::string(bytes.begin(), bytes.end());
}

RequestBuilderStandIn::RequestBuilderStandIn(std::function<void()> onCall) : m_onCall(std::move(onCall)) {}

void RequestBuilderStandIn::BuildUserPassTokenRequest(const std::string &username, const std::string &password,
                                                      const SsoClient::TokenSpec &spec,
                                                      SsoClient::Request &request) const {
  Fill(request, "UserPass " + username + " " + password + " " + Text(spec));
}

void RequestBuilderStandIn::BuildInitialSPNegoRequest(const SsoClient::TokenSpec &spec, const Bytes &leg,
                                                      SsoClient::Request &request) const {
  Fill(request, "InitialSPNego " + Text(spec) + " " + ToString(leg));
}

void RequestBuilderStandIn::BuildContinuedSPNegoRequest(const std::string &contextId, const Bytes &leg,
                                                        SsoClient::Request &request) const {
  Fill(request, "ContinuedSPNego " + contextId + " " + ToString(leg));
}

void RequestBuilderStandIn::BuildCertificateTokenRequest(const SsoClient::TokenSpec &spec,
                                                         SsoClient::Request &request) const {
  Fill(request, "Certificate " + Text(spec));
}

void RequestBuilderStandIn::BuildExchangeTokenRequest(const SsoClient::SamlToken &, const SsoClient::TokenSpec &spec,
                                                      SsoClient::Request &request) const {
  Fill(request, "Exchange " + Text(spec));
}

void RequestBuilderStandIn::BuildValidateSubjectRequest(const SsoClient::SamlToken &,
                                                        SsoClient::Request &request) const {
  Fill(request, "ValidateSubject");
}

void RequestBuilderStandIn::BuildRenewRequest(const SsoClient::SamlToken &, std::int64_t lifetimeSec,
                                              SsoClient::Request &request) const {
  Fill(request, "Renew " + std::to_string(lifetimeSec));
}

void RequestBuilderStandIn::Fill(SsoClient::Request &request, const std::string &call) const {
  m_onCall();
  if (!request.soapAction.empty() || !request.body.empty()) {
    throw std::logic_error("the request was used before");
  }
  request.soapAction = "urn:action";
  request.body = call;
}

struct TransportStandIn::State {
  explicit State(Answer answerOfTest) : answer(std::move(answerOfTest)) {}
  const Answer answer;
  std::atomic<int> sessions{0};
  std::atomic<int> open{0};
  std::mutex mutex;
  std::vector<std::string> sent;
};

class TransportStandIn::Session final : public SsoClient::TransportSession {
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
    const std::string answer = m_state->answer(request);
    if (request.facts) {
      *request.facts = {200, "OK", "text/xml", answer.size(), "", true};
    }
    response = Tarvel::CreateStringReader(answer);
  }

  void SendRequestAsync(const SsoClient::Request &, const Completion &,
                        Tarvel::Ref<Tarvel::System::ScheduledItem> &) override {
    throw std::logic_error("the service never sends in this way");
  }

private:
  const std::shared_ptr<State> m_state;
  const int m_number;
};

TransportStandIn::TransportStandIn(Answer answer) : m_state(std::make_shared<State>(std::move(answer))) {}

std::shared_ptr<SsoClient::TransportSession> TransportStandIn::CreateSession() const {
  return std::make_shared<Session>(m_state);
}

std::vector<std::string> TransportStandIn::Sent() const {
  const std::lock_guard<std::mutex> lock(m_state->mutex);
  return m_state->sent;
}

int TransportStandIn::CountSessions() const {
  return m_state->sessions;
}

int TransportStandIn::CountOpenSessions() const {
  return m_state->open;
}

ResponseHandlerStandIn::ResponseHandlerStandIn(std::function<void()> onCall) : m_onCall(std::move(onCall)) {}

void ResponseHandlerStandIn::HandleAcquireTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const {
  tokenXml = ReadAfter("issued:", response);
}

bool ResponseHandlerStandIn::HandleValidateSubjectResponse(Tarvel::Reader *response) const {
  return ReadAfter("valid:", response) == "true";
}

void ResponseHandlerStandIn::HandleRenewTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const {
  tokenXml = ReadAfter("renewed:", response);
}

void ResponseHandlerStandIn::HandleSPNegoResponse(Tarvel::Reader *response, SsoClient::SPNegoResponse &spnego) const {
  const std::string text = ReadAfter("leg:", response);
  const std::size_t first = text.find('|');
  const std::size_t second = text.find('|', first + 1);
  spnego.contextId = text.substr(0, first);
  spnego.leg = ToBytes(text.substr(first + 1, second - first - 1));
  spnego.tokenXml = text.substr(second + 1);
}

std::string ResponseHandlerStandIn::ReadAfter(const std::string &prefix, Tarvel::Reader *response) const {
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

NegotiationHandlerStandIn::NegotiationHandlerStandIn(std::vector<std::shared_ptr<Bytes>> script)
    : m_script(std::move(script)) {}

std::shared_ptr<Bytes> NegotiationHandlerStandIn::NegotiateLeg(const Bytes &serviceLeg) {
  received.push_back(ToString(serviceLeg));
  return m_script.at(received.size() - 1);
}

std::shared_ptr<Bytes> Leg(const std::string &text) {
  return std::make_shared<Bytes>(ToBytes(text));
}

Tarvel::Crypto::CertificateList TrustedCertificates() {
  return {Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))};
}

std::shared_ptr<SsoClient::SecurityTokenServiceImpl>
ServiceOn(const std::shared_ptr<const SsoClient::Transport> &transport, const std::function<void()> &onResponse) {
  return std::make_shared<SsoClient::SecurityTokenServiceImpl>(
      std::make_shared<const RequestBuilderStandIn>(), transport,
      std::make_shared<const ResponseHandlerStandIn>(onResponse), TrustedCertificates());
}

SsoClient::TokenSpec SpecFor(std::int64_t lifetimeSec) {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = lifetimeSec;
  return spec;
}

} // namespace Testing
