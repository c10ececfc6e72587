// SPDX-License-Identifier: Apache-2.0

#include "integration/service_load/canned_service.h"

#include "exchange/request.h"
#include "support/identity.h"
#include "support/soap_responses.h"

#include <ssoclient/create_saml_token.h>

#include <utility>

namespace Testing {

namespace {

std::string HttpResponse(const std::string &body) {
  return "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" +
         body;
}

bool Asks(const std::string &request, const char *action) {
  return request.find("SOAPAction: \"" + std::string(action) + "\"\r\n") != std::string::npos;
}

} // namespace

CannedService::CannedService(std::function<void()> beforeAnswer)
    : m_beforeAnswer(std::move(beforeAnswer)), m_issued(HttpResponse(IssueResponse(ReadDataFile("tokens/bearer.xml")))),
      m_renewed(HttpResponse(RenewResponse(ReadDataFile("tokens/bearer.xml")))),
      m_valid(HttpResponse(ValidateResponse("http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid"))),
      m_context(ContextThatTrustsTheTestAuthority()),
      m_server([this](ServerConnection &peer) { Serve(peer); }, TlsSettings()) {}

SsoClient::SecurityTokenServiceConfig CannedService::GetConfig() const {
  SsoClient::SecurityTokenServiceConfig config =
      ConfigFor("https://localhost:" + std::to_string(m_server.GetPort()) + "/sts");
  config.holderOfKeyConfig = HolderIdentity();
  config.sslContext = m_context.get();
  return config;
}

void CannedService::Serve(ServerConnection &peer) const {
  if (!peer.Handshake()) {
    return;
  }
  const std::string request = peer.ReadRequest();
  m_beforeAnswer();
  using SsoClient::Request;
  peer.Write(Asks(request, Request::ISSUE)      ? m_issued
             : Asks(request, Request::RENEW)    ? m_renewed
             : Asks(request, Request::VALIDATE) ? m_valid
                                                : "this is no request");
}

std::shared_ptr<const SsoClient::SamlToken> HeldToken() {
  return SsoClient::CreateSamlToken(ReadDataFile("tokens/holder-of-key.xml"),
                                    {Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))});
}

} // namespace Testing
