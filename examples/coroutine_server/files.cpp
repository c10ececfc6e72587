// SPDX-License-Identifier: Apache-2.0

#include "files.h"

#include <ssoclient/exceptions.h>
#include <tarvel/xml/parser.h>

#include <utility>
#include <vector>

namespace Example {

namespace {

SsoClient::VerifyOptions OptionsOfFiles() {
  SsoClient::VerifyOptions options;
  options.acceptedAudiences = {FILES_AUDIENCE};
  options.acceptUnrestrictedAudience = false; // a token for all services would be accepted everywhere
  return options;
}

/// The service that presents the token: it is the last one in the chain. Empty if no service acts for the subject.
std::string PresenterOf(const SsoClient::SamlToken &token) {
  const std::vector<SsoClient::Delegate> chain = token.GetDelegationChain();
  return chain.empty() ? "" : chain.back().subject.name + "@" + chain.back().subject.domain;
}

} // namespace

Files::Files(const Tarvel::Crypto::CertificateList &trusted) : m_verifier(trusted, OptionsOfFiles()) {}

boost::asio::awaitable<Reply> Files::Answer(std::string body, TimePoint) const {
  try {
    const auto token = m_verifier.Verify(body);
    if (PresenterOf(*token) != FRONT_NAME) {
      co_return Reply{403, "only for callers of " + std::string(FRONT_NAME)};
    }
    const SsoClient::PrincipalId &subject = token->GetSubject();
    co_return Reply{200, subject.name + " of " + subject.domain + " reads its files through " + FRONT_NAME};
  } catch (const SsoClient::InvalidTokenException &) {
    co_return Reply{401, "the token is refused"}; // the reason is for our own log
  } catch (const Tarvel::Xml::XMLParseException &) {
    co_return Reply{401, "this is not a token"};
  }
}

} // namespace Example
