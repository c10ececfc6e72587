// SPDX-License-Identifier: Apache-2.0

#include "front.h"

#include "files.h"

#include <ssoclient/asio/async_client.h>
#include <ssoclient/exceptions.h>
#include <tarvel/xml/parser.h>

#include <boost/asio/use_awaitable.hpp>

#include <exception>
#include <stdexcept>
#include <utility>

namespace Example {

namespace {

/// The new token allows only what is needed: it is for one service, and ends soon.
SsoClient::TokenSpec DelegationSpec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 5 * 60;
  spec.delegateTo = std::string(FRONT_NAME);
  spec.audienceRestriction = {FILES_AUDIENCE};
  spec.confirmation = SsoClient::TokenSpec::CONFIRMATION_NONE; // the other service cannot check the proof of a key
  return spec;
}

} // namespace

Front::Front(const SsoClient::SecurityTokenServiceConfig &config, unsigned short filesPort)
    : m_client(config), m_verifier(config.signingCertificates),
      m_thumbprint(config.holderOfKeyConfig->certificate->GetSha256Thumbprint()), m_filesPort(filesPort) {}

/// The token service exchanges a token only for the program that has the token's key.
void Front::RequireOurKey(const SsoClient::SamlToken &token) const {
  const Tarvel::Crypto::Certificate *const certificate = token.GetConfirmationCertificate();
  if (!certificate || certificate->GetSha256Thumbprint() != m_thumbprint) {
    throw SsoClient::ParseException("the token is not bound to the key of this service");
  }
}

boost::asio::awaitable<Reply> Front::ActFor(std::string xml, TimePoint deadline) const {
  const auto token = m_verifier.Verify(xml);
  RequireOurKey(*token);

  // No thread waits here: the coroutine continues on its own executor when the token service has answered, or at the
  // deadline. If the coroutine is destroyed first, the operation is cancelled.
  SsoClient::CallOptions options;
  options.deadline = deadline;
  const auto delegated = co_await SsoClient::Asio::AsyncAcquire(m_client, SsoClient::TokenCredential{token},
                                                                DelegationSpec(), options, boost::asio::use_awaitable);

  co_return co_await Post(m_filesPort, delegated->ToXml(), deadline);
}

boost::asio::awaitable<Reply> Front::Answer(std::string body, TimePoint deadline) const {
  try {
    co_return co_await ActFor(std::move(body), deadline);
  } catch (const SsoClient::InvalidTokenException &error) {
    co_return Reply{401, std::string("refused: ") + error.what()};
  } catch (const Tarvel::Xml::XMLParseException &) {
    co_return Reply{401, "refused: this is not a token"};
  } catch (const SsoClient::DeadlineExceededException &) {
    co_return Reply{504, "the token service did not answer in time"};
  } catch (const SsoClient::CommunicationException &error) {
    co_return Reply{503, std::string("the token service cannot be reached: ") + error.what()};
  } catch (const std::exception &error) {
    co_return Reply{502, std::string("failed: ") + error.what()};
  }
}

} // namespace Example
