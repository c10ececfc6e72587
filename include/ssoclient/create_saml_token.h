// SPDX-License-Identifier: Apache-2.0
/// @file
/// Turns token XML into a verified `SamlToken`.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <cstdint>
#include <memory>
#include <string>

namespace SsoClient {

/// The tolerance that the factories without one use, in seconds.
constexpr std::int64_t DEFAULT_CLOCK_TOLERANCE_SEC = 600;

/// Parses, checks and verifies the SAML 2.0 assertion in `xml`. The token's `ToXml` is `xml`, byte for byte.
/// @param trustedCertificates the keys that the token may be signed with. Trust is in the key: the validity dates of the
///        certificates are not judged. A null reference in the list trusts nothing.
/// @param clockToleranceSec how far this machine's clock may be off, in seconds; a negative one narrows the window in
///        which a token is accepted.
/// @throws Tarvel::Xml::XMLParseException when `xml` is not a well-formed document.
/// @throws ParseException when it is not an assertion of the accepted form, is inconsistent, expired or not valid yet.
/// @throws InvalidSignatureException when none of the trusted keys made its signature, when it was changed since, or
///         when the signature is outside the accepted profile: another algorithm, more than ten references, an
///         identifier that no element bears, or more than one; or when a trusted key is not used: an RSA key of fewer than
///         2048 bits or with an exponent that is even or 1.
/// @throws Tarvel::OutOfMemoryException or std::bad_alloc when memory runs out, and Tarvel::InvalidStateException when
///         OpenSSL has cleaned itself up because the process ends. None of these is a verdict on the token.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlToken(const std::string &xml, const Tarvel::Crypto::CertificateList &trustedCertificates,
                std::int64_t clockToleranceSec);

/// The same with `DEFAULT_CLOCK_TOLERANCE_SEC`.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlToken(const std::string &xml, const Tarvel::Crypto::CertificateList &trustedCertificates);

/// The same with one trusted certificate, which the call shares only while it lasts.
SSOCLIENT_API std::shared_ptr<const SamlToken> CreateSamlToken(const std::string &xml,
                                                               const Tarvel::Crypto::Certificate *certificate);

/// As `CreateSamlToken`, from an `Assertion` element that is parsed already and that may be part of a larger document.
/// The token's `ToXml` is the canonical form (inclusive Canonical XML 1.0) of the element. It can say another thing than
/// the token does, which is read from the tree: blanks that a comment parts from a value are part of the value there, and
/// it has the `xml:` attributes that the element inherits, with which `CreateSamlToken` refuses it. The element's tree must
/// not be changed during the call; the token does not keep it.
/// @throws Tarvel::Xml::Security::XmlSecurityException when the element has no canonical form.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlTokenFromDom(const Tarvel::Xml::ElementNode &element,
                       const Tarvel::Crypto::CertificateList &trustedCertificates, std::int64_t clockToleranceSec);

/// The same with `DEFAULT_CLOCK_TOLERANCE_SEC`.
SSOCLIENT_API std::shared_ptr<const SamlToken>
CreateSamlTokenFromDom(const Tarvel::Xml::ElementNode &element,
                       const Tarvel::Crypto::CertificateList &trustedCertificates);

} // namespace SsoClient
