// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenVerifier`, which verifies tokens with trusted keys that are prepared once, and explains why a token is refused.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_report.h>
#include <ssoclient/verify_options.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <memory>
#include <string>

namespace SsoClient {

/// Verifies tokens. Immutable: any number of threads may use one verifier at once. Copies share the prepared keys, so a
/// copy is cheap. Moving copies, so there is no verifier without keys.
class SSOCLIENT_API TokenVerifier {
public:
  /// Prepares the trusted keys. The verifier keeps references to the certificates, and a copy of the options.
  /// @param trustedCertificates the certificates whose keys may have signed a token. The key is what is trusted: the
  ///        validity dates of the certificates are not checked. A null reference in the list is ignored. With an empty
  ///        list no token is accepted.
  /// @throws Tarvel::InvalidArgumentException when `options` with the profile STRICT have an accepted recipient, an
  ///         expected request or a sender's address: this profile does not read these parts of a token.
  explicit TokenVerifier(const Tarvel::Crypto::CertificateList &trustedCertificates, const VerifyOptions &options = {});

  TokenVerifier(const TokenVerifier &) noexcept = default;            ///< shares the prepared keys
  TokenVerifier &operator=(const TokenVerifier &) noexcept = default; ///< shares the prepared keys
  ~TokenVerifier() = default;

  /// Parses, checks and verifies the SAML 2.0 assertion in `xml`. The token's `ToXml` is `xml`, byte for byte.
  /// @throws Tarvel::Xml::XMLParseException when `xml` is not a well-formed document.
  /// @throws ParseException when it is not an assertion of the accepted form, is inconsistent, expired or not valid yet,
  ///         and when it does not have the audience or the confirmation that the options require.
  /// @throws InvalidSignatureException when none of the trusted keys made its signature; when the token was changed
  ///         after it was signed; when the signature is outside the accepted profile; and when the trusted key is not
  ///         accepted (`CreateSamlToken` lists the cases).
  /// @throws Tarvel::OutOfMemoryException or std::bad_alloc when memory runs out, and Tarvel::InvalidStateException when
  ///         OpenSSL has cleaned itself up because the process ends. These say nothing about the token.
  std::shared_ptr<const SamlToken> Verify(const std::string &xml) const;

  /// The same for an `Assertion` element that is parsed already and may be part of a larger document. The token's `ToXml`
  /// is the canonical form of the element (see `CreateSamlTokenFromDom`). The tree must not be changed during the call;
  /// the token does not keep a reference to it.
  /// @throws Tarvel::Xml::Security::XmlSecurityException when the element has no canonical form.
  std::shared_ptr<const SamlToken> Verify(const Tarvel::Xml::ElementNode &element) const;

  /// Runs the checks of `Verify` on `xml`, continues after a failure, and reports each check. `accepted` is true
  /// exactly when `Verify` returns a token at the same moment. Nothing in the report may be trusted: it is not a token.
  /// If `xml` is well-formed but its document element is not an assertion, the report also shows the first assertion in
  /// it, and does not accept it. A call takes linear time, but more than `Verify`, for example because it computes the
  /// digests even if no trusted key made the signature. Call it when a person wants to know why a token is refused, not
  /// for each token.
  /// @throws Tarvel::OutOfMemoryException, std::bad_alloc and Tarvel::InvalidStateException like `Verify`, and nothing else:
  ///         no text in `xml` makes it throw.
  TokenReport Explain(const std::string &xml) const;

  /// The same for an element that is parsed already. If the element has no canonical form, the check WELL_FORMED fails.
  /// The tree must not be changed during the call; the report does not keep a reference to it.
  TokenReport Explain(const Tarvel::Xml::ElementNode &element) const;

private:
  struct State;
  std::shared_ptr<const State> m_state;
};

} // namespace SsoClient
