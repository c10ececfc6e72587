// SPDX-License-Identifier: Apache-2.0

#include "operation/returned_tokens.h"

#include "operation/caught_exception.h"

#include <ssoclient/exceptions.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/signature.h>

namespace SsoClient {

ReturnedTokens::ReturnedTokens(const Tarvel::Crypto::CertificateList &trustedCertificates,
                               const ServiceOptions &options)
    : m_verifier(trustedCertificates, options.verifyOptions), m_sink(options.refusedTokenSink) {}

std::shared_ptr<const SamlToken> ReturnedTokens::Verify(const std::string &xml, OperationEvents &events) const {
  try {
    return m_verifier.Verify(xml);
  } catch (const InvalidTokenException &) {
    HandOver(xml, events);
    throw;
  } catch (const Tarvel::Xml::XMLParseException &) {
    HandOver(xml, events);
    throw;
  } catch (const Tarvel::Xml::Security::XmlSecurityException &) {
    HandOver(xml, events);
    throw;
  }
}

void ReturnedTokens::HandOver(const std::string &xml, OperationEvents &events) const noexcept {
  events.HideToken(xml);
  if (!m_sink) {
    return;
  }
  try {
    m_sink(xml);
  } catch (...) {
    SecretMask mask; // the text of the exception may contain the token
    mask.AddToken(xml);
    LogCaughtException(events.GetId(), "The sink of refused tokens", mask);
  }
}

} // namespace SsoClient
