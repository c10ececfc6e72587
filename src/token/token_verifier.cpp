// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_verifier.h>

#include "token/saml_token_impl.h"
#include "token/token_checks.h"
#include "token/token_explainer.h"

#include <tarvel/xml/security/key_info_resolver.h>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;

/// Makes the token of `source`, a text or an element.
template <typename Source>
std::shared_ptr<const SamlToken> MakeToken(const Source &source, const KeyInfoResolver &resolver,
                                           const VerifyOptions &options) {
  auto token = std::make_shared<const SamlTokenImpl>(source, resolver, options.clockToleranceSec);
  const TokenFacts &facts = token->GetFacts();
  CheckAudience(facts.audience, options, nullptr, ThrowingSink());
  CheckRequiredConfirmation(facts.confirmationMethod, options, nullptr, ThrowingSink());
  return token;
}

} // namespace

struct TokenVerifier::State {
  State(const Tarvel::Crypto::CertificateList &trusted, const VerifyOptions &verifyOptions)
      : resolver(Tarvel::Xml::Security::CreateTrustSetKeyResolver(trusted)), options(verifyOptions) {}

  const Tarvel::Ref<KeyInfoResolver> resolver;
  const VerifyOptions options;
};

TokenVerifier::TokenVerifier(const Tarvel::Crypto::CertificateList &trustedCertificates, const VerifyOptions &options)
    : m_state(std::make_shared<const State>(trustedCertificates, options)) {}

std::shared_ptr<const SamlToken> TokenVerifier::Verify(const std::string &xml) const {
  return MakeToken(xml, *m_state->resolver, m_state->options);
}

std::shared_ptr<const SamlToken> TokenVerifier::Verify(const ElementNode &element) const {
  return MakeToken(element, *m_state->resolver, m_state->options);
}

TokenReport TokenVerifier::Explain(const std::string &xml) const {
  return ExplainToken(xml, *m_state->resolver, m_state->options);
}

TokenReport TokenVerifier::Explain(const ElementNode &element) const {
  return ExplainToken(element, *m_state->resolver, m_state->options);
}

} // namespace SsoClient
