// SPDX-License-Identifier: Apache-2.0

#include "integration/client/fault_service.h"

#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"

#include <ssoclient/client/exceptions.h>
#include <tarvel/core/exception.h>

#include <optional>
#include <typeinfo>
#include <utility>

namespace Testing {

using namespace SsoClient;

namespace {

/// The name of the exact class.
std::string NameOfClass(const std::type_info &type) {
  return type == typeid(CancelledException)            ? "CancelledException"
         : type == typeid(DeadlineExceededException)   ? "DeadlineExceededException"
         : type == typeid(CommunicationException)      ? "CommunicationException"
         : type == typeid(InvalidCredentialsException) ? "InvalidCredentialsException"
         : type == typeid(InvalidSignatureException)   ? "InvalidSignatureException"
         : type == typeid(SsoException)                ? "SsoException"
         : type == typeid(Tarvel::IOException)         ? "IOException"
                                                       : type.name();
}

} // namespace

FaultService::FaultService(ScriptedServer::Script script, bool isSecure)
    : m_isSecure(isSecure), m_context(ContextThatTrustsTheTestAuthority()), m_script(std::move(script)),
      m_server([this](ServerConnection &peer) { Serve(peer); },
               isSecure ? std::make_optional<TlsSettings>() : std::nullopt) {}

SecurityTokenServiceConfig FaultService::GetConfig(const std::string &host) const {
  SecurityTokenServiceConfig config =
      ConfigFor((m_isSecure ? "https://" : "http://") + host + ":" + std::to_string(m_server.GetPort()) + "/sts");
  config.sslContext = m_context.get();
  return config;
}

void FaultService::Repair() {
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_script = Reply(TokenResponse());
}

void FaultService::Serve(ServerConnection &peer) {
  ScriptedServer::Script script;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    script = m_script;
  }
  script(peer);
}

std::string HttpResponse(const std::string &status, const std::string &body, const std::string &fields) {
  return "HTTP/1.1 " + status + "\r\nContent-Type: text/xml\r\n" + fields +
         "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

const std::string &TokenResponse() {
  static const std::string response = HttpResponse("200 OK", IssueResponse(ReadDataFile("tokens/bearer.xml")));
  return response;
}

ScriptedServer::Script Reply(std::string bytes) {
  return [bytes = std::move(bytes)](ServerConnection &peer) {
    if (peer.Handshake()) {
      peer.ReadRequest();
      peer.Write(bytes);
    }
  };
}

Credential AnyCredential() {
  return PasswordCredential{"alice@corp.example", Tarvel::SecretText("pass")};
}

TokenSpec AnySpec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

std::string Describe(const std::exception_ptr &failure) {
  try {
    std::rethrow_exception(failure);
  } catch (const std::exception &exception) {
    return NameOfClass(typeid(exception)) + ": " + exception.what();
  }
}

std::string OutcomeOf(const std::function<std::shared_ptr<const SamlToken>()> &acquire) {
  try {
    return acquire() ? "token" : "null";
  } catch (...) {
    return Describe(std::current_exception());
  }
}

} // namespace Testing
