// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_verifier.h>

#include "token/saml_token_impl.h"
#include "token/token_explainer.h"

#include <tarvel/core/exception.h>
#include <tarvel/xml/security/key_info_resolver.h>

#include <string>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;

/// Refuses an option that the profile STRICT cannot check, so that the check is not left out silently.
void RequireSaml2(bool isSet, const char *option) {
  if (isSet) {
    throw Tarvel::InvalidArgumentException(std::string("VerifyOptions::") + option + " needs the profile SAML2");
  }
}

const VerifyOptions &Consistent(const VerifyOptions &options) {
  if (options.profile != TokenProfile::SAML2) {
    RequireSaml2(!options.acceptedRecipients.empty(), "acceptedRecipients");
    RequireSaml2(options.expectedInResponseTo.has_value(), "expectedInResponseTo");
    RequireSaml2(options.senderAddress.has_value(), "senderAddress");
  }
  return options;
}

} // namespace

struct TokenVerifier::State {
  State(const Tarvel::Crypto::CertificateList &trusted, const VerifyOptions &verifyOptions)
      : resolver(Tarvel::Xml::Security::CreateTrustSetKeyResolver(trusted)), options(Consistent(verifyOptions)) {}

  const Tarvel::Ref<KeyInfoResolver> resolver;
  const VerifyOptions options;
};

TokenVerifier::TokenVerifier(const Tarvel::Crypto::CertificateList &trustedCertificates, const VerifyOptions &options)
    : m_state(std::make_shared<const State>(trustedCertificates, options)) {}

std::shared_ptr<const SamlToken> TokenVerifier::Verify(const std::string &xml) const {
  return std::make_shared<const SamlTokenImpl>(xml, *m_state->resolver, m_state->options);
}

std::shared_ptr<const SamlToken> TokenVerifier::Verify(const ElementNode &element) const {
  return std::make_shared<const SamlTokenImpl>(element, *m_state->resolver, m_state->options);
}

TokenReport TokenVerifier::Explain(const std::string &xml) const {
  return ExplainToken(xml, *m_state->resolver, m_state->options);
}

TokenReport TokenVerifier::Explain(const ElementNode &element) const {
  return ExplainToken(element, *m_state->resolver, m_state->options);
}

} // namespace SsoClient
