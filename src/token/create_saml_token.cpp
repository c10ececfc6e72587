// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/create_saml_token.h>

#include "token/saml_token_impl.h"

#include <tarvel/xml/security/key_info_resolver.h>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Crypto::CertificateList;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;

/// Resolves only to keys of `trusted`. Null references are ignored.
Ref<KeyInfoResolver> ResolverFor(const CertificateList &trusted) {
  return Tarvel::Xml::Security::CreateTrustSetKeyResolver(trusted);
}

} // namespace

std::shared_ptr<const SamlToken> CreateSamlToken(const std::string &xml, const CertificateList &trustedCertificates,
                                                 std::int64_t clockToleranceSec) {
  return std::make_shared<SamlTokenImpl>(xml, *ResolverFor(trustedCertificates), clockToleranceSec);
}

std::shared_ptr<const SamlToken> CreateSamlToken(const std::string &xml, const CertificateList &trustedCertificates) {
  return CreateSamlToken(xml, trustedCertificates, DEFAULT_CLOCK_TOLERANCE_SEC);
}

std::shared_ptr<const SamlToken> CreateSamlToken(const std::string &xml, const Certificate *certificate) {
  return CreateSamlToken(xml, CertificateList{Ref<const Certificate>(certificate)});
}

std::shared_ptr<const SamlToken> CreateSamlTokenFromDom(const ElementNode &element,
                                                        const CertificateList &trustedCertificates,
                                                        std::int64_t clockToleranceSec) {
  return std::make_shared<SamlTokenImpl>(element, *ResolverFor(trustedCertificates), clockToleranceSec);
}

std::shared_ptr<const SamlToken> CreateSamlTokenFromDom(const ElementNode &element,
                                                        const CertificateList &trustedCertificates) {
  return CreateSamlTokenFromDom(element, trustedCertificates, DEFAULT_CLOCK_TOLERANCE_SEC);
}

} // namespace SsoClient
