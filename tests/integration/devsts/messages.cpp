// SPDX-License-Identifier: Apache-2.0

#include "messages.h"

#include <tarvel/core/string_util.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <stdexcept>

namespace DevStsTest {

namespace {

Tarvel::Environment Ahead(std::chrono::seconds ahead) {
  return {[ahead] {
            const auto now = std::chrono::system_clock::now() + ahead;
            return std::chrono::duration_cast<std::chrono::microseconds>(now.time_since_epoch()).count();
          },
          [count = 0]() mutable { return "00000000-0000-4000-8000-" + std::to_string(100000000000 + ++count); }};
}

std::size_t Find(const std::string &text, std::string_view what, std::size_t from = 0) {
  const std::size_t at = text.find(what, from);
  if (at == std::string::npos) {
    throw std::runtime_error("'" + std::string(what) + "' is not in\n" + text);
  }
  return at;
}

} // namespace

SsoClient::HolderOfKeyConfig IdentityOf(const Testing::DevSts &service, const std::string &name) {
  return {Tarvel::Crypto::CreatePrivateKey(service.ReadStateFile(name + ".key")),
          Tarvel::Crypto::CreateCertificateFromPem(service.ReadStateFile(name + ".crt"))};
}

SsoClient::RequestBuilderImpl BuilderFor(const Testing::DevSts &service, const std::string &name) {
  return SsoClient::RequestBuilderImpl(name.empty() ? boost::optional<SsoClient::HolderOfKeyConfig>()
                                                    : IdentityOf(service, name));
}

SsoClient::TokenSpec PlainSpec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

SsoClient::TokenSpec RenewableSpec() {
  SsoClient::TokenSpec spec = PlainSpec();
  spec.renewable = true;
  spec.delegable = true;
  return spec;
}

SsoClient::Request PasswordRequest(const std::string &user, const std::string &password) {
  SsoClient::Request request;
  SsoClient::RequestBuilderImpl(boost::none).BuildUserPassTokenRequest(user, password, PlainSpec(), request);
  return request;
}

SsoClient::Request CertificateRequest(const Testing::DevSts &service, const SsoClient::TokenSpec &spec,
                                      const std::string &identity) {
  SsoClient::Request request;
  BuilderFor(service, identity).BuildCertificateTokenRequest(spec, request);
  return request;
}

std::string Replaced(std::string text, std::string_view from, std::string_view to) {
  return text.replace(Find(text, from), from.size(), to);
}

std::string Without(const std::string &text, std::string_view begin, std::string_view end) {
  const std::size_t at = Find(text, begin);
  const std::size_t stop = Find(text, end, at + begin.size()) + end.size();
  return text.substr(0, at) + text.substr(stop);
}

std::string Between(const std::string &text, std::string_view begin, std::string_view end) {
  const std::size_t at = Find(text, begin) + begin.size();
  return text.substr(at, Find(text, end, at) - at);
}

HttpAnswer Send(const Testing::DevSts &service, const SsoClient::Request &request, std::string_view target) {
  return Post(service, request.soapAction, request.body, target);
}

Testing::TokenStandIn TokenIn(const HttpAnswer &answer) {
  const std::string inside = Between(answer.body, "<saml:Assertion ", "</saml:Assertion>");
  const bool isBearer = inside.find("cm:bearer") != std::string::npos;
  return {Between(inside, " ID=\"", "\""), "<saml:Assertion " + inside + "</saml:Assertion>",
          isBearer ? SsoClient::SamlToken::BEARER : SsoClient::SamlToken::HOLDER_OF_KEY};
}

ShiftedClock::ShiftedClock(std::chrono::seconds ahead) : m_scope(Ahead(ahead)) {}

testing::AssertionResult IsRefused(const HttpAnswer &answer, const std::string &code, const std::string &reason) {
  const bool isFault = answer.status == 500 && answer.body.find(">" + code + "</faultcode>") != std::string::npos &&
                       answer.body.find("<faultstring>" + reason + "</faultstring>") != std::string::npos;
  return isFault ? testing::AssertionSuccess()
                 : testing::AssertionFailure()
                       << "expected the fault " << code << " \"" << reason << "\", got status " << answer.status << "\n"
                       << answer.body;
}

testing::AssertionResult IsIssued(const HttpAnswer &answer) {
  const bool isIssued = answer.status == 200 && answer.body.find("<saml:Assertion ") != std::string::npos;
  return isIssued ? testing::AssertionSuccess()
                  : testing::AssertionFailure() << "expected a token, got status " << answer.status << "\n"
                                                << answer.body;
}

} // namespace DevStsTest
