// SPDX-License-Identifier: Apache-2.0
/// @file
/// Turns token XML into a verified `SamlToken`.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/verify_options.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient {

/// Parses, checks and verifies the SAML 2.0 assertion in `xml`. The token's `ToXml` is `xml`, byte for byte. Each call
/// prepares the trusted keys again. Use a `TokenVerifier` to verify many tokens, to check their audience, or to learn
/// why a token is refused.
/// @param trustedCertificates the certificates whose keys may have signed the token. The key is what is trusted: the
///        validity dates of the certificates are not checked. A null reference in the list is ignored.
/// @param clockToleranceSec how far this machine's clock may be wrong, in seconds. A negative tolerance shortens the time
///        in which a token is accepted.
/// @throws Tarvel::Xml::XMLParseException when `xml` is not a well-formed document.
/// @throws ParseException when it is not an assertion of the accepted form, is inconsistent, expired or not valid yet.
/// @throws InvalidSignatureException when none of the trusted keys made its signature; when the token was changed after it
///         was signed; when the signature is outside the accepted profile (another algorithm, more than ten references, an
///         identifier that no element has or that several have); and when the trusted key is not accepted (an RSA key of
///         fewer than 2048 bits, or with an exponent that is even or 1).
/// @throws Tarvel::OutOfMemoryException or std::bad_alloc when memory runs out, and Tarvel::InvalidStateException when
///         OpenSSL has cleaned itself up because the process ends. These say nothing about the token.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlToken(const std::string &xml, const Tarvel::Crypto::CertificateList &trustedCertificates,
                std::int64_t clockToleranceSec);

/// The same with `DEFAULT_CLOCK_TOLERANCE_SEC`.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlToken(const std::string &xml, const Tarvel::Crypto::CertificateList &trustedCertificates);

/// The same with one trusted certificate, which must be the object of a `Tarvel::Ref`. The call holds a reference to it only
/// until it returns. With null no key is trusted, so no token is accepted: a token without other faults causes an
/// InvalidSignatureException.
SSOCLIENT_API std::shared_ptr<const SamlToken> CreateSamlToken(const std::string &xml,
                                                               const Tarvel::Crypto::Certificate *certificate);

/// The same as `CreateSamlToken` for an `Assertion` element that is parsed already and may be part of a larger document.
/// The token's `ToXml` is the canonical form (inclusive Canonical XML 1.0) of the element. The token itself is read from the
/// tree, and the two can differ: in the canonical form, blanks that a comment separated from a value are part of the value,
/// and `xml:` attributes that the element inherits are attributes of the element, which `CreateSamlToken` refuses. The tree
/// must not be changed during the call. The token does not keep a reference to it.
/// @throws Tarvel::Xml::Security::XmlSecurityException when the element has no canonical form.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlTokenFromDom(const Tarvel::Xml::ElementNode &element,
                       const Tarvel::Crypto::CertificateList &trustedCertificates, std::int64_t clockToleranceSec);

/// The same with `DEFAULT_CLOCK_TOLERANCE_SEC`.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlTokenFromDom(const Tarvel::Xml::ElementNode &element,
                       const Tarvel::Crypto::CertificateList &trustedCertificates);

} // namespace SsoClient
