// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/create_saml_token.h>

#include <ssoclient/token_verifier.h>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Crypto::CertificateList;
using Tarvel::Xml::ElementNode;

TokenVerifier VerifierFor(const CertificateList &trusted, std::int64_t clockToleranceSec) {
  VerifyOptions options;
  options.clockToleranceSec = clockToleranceSec;
  return TokenVerifier(trusted, options);
}

} // namespace

std::shared_ptr<const SamlToken> CreateSamlToken(const std::string &xml, const CertificateList &trustedCertificates,
                                                 std::int64_t clockToleranceSec) {
  return VerifierFor(trustedCertificates, clockToleranceSec).Verify(xml);
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
  return VerifierFor(trustedCertificates, clockToleranceSec).Verify(element);
}

std::shared_ptr<const SamlToken> CreateSamlTokenFromDom(const ElementNode &element,
                                                        const CertificateList &trustedCertificates) {
  return CreateSamlTokenFromDom(element, trustedCertificates, DEFAULT_CLOCK_TOLERANCE_SEC);
}

} // namespace SsoClient
