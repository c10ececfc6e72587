// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenDetails`, what a SAML 2.0 assertion states in addition to the results of the functions of `SamlToken`.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/// An identifier exactly as the issuer wrote it (SAML 2.0 core, section 2.2.2). An attribute that is absent is
/// `boost::none`, which differs from an empty one.
///
/// `==` compares every octet. `PrincipalId` ignores letter case, so compare the `NameId` where the format is
/// case-sensitive, such as that of persistent and transient identifiers.
struct NameId {
  std::string value;                            ///< the text
  boost::optional<std::string> format;          ///< `Format`
  boost::optional<std::string> nameQualifier;   ///< `NameQualifier`: the domain of the identifier
  boost::optional<std::string> spNameQualifier; ///< `SPNameQualifier`: the service for which it is valid
  boost::optional<std::string> spProvidedId;    ///< `SPProvidedID`: the name that the same service uses

  /// Whether both have the same octets in each field.
  friend bool operator==(const NameId &left, const NameId &right) {
    return left.value == right.value && left.format == right.format && left.nameQualifier == right.nameQualifier &&
           left.spNameQualifier == right.spNameQualifier && left.spProvidedId == right.spProvidedId;
  }
  /// The opposite.
  friend bool operator!=(const NameId &left, const NameId &right) { return !(left == right); }
};

/// One value of an attribute.
struct AttributeValue {
  std::string text;   ///< the text; if `isXml`, the exclusive canonical form of the `AttributeValue` element
  bool isXml = false; ///< whether the value contains elements
  bool isNil = false; ///< whether the value is `xsi:nil`
};

/// An attribute of the subject (SAML 2.0 core, section 2.7.3.1).
struct SamlAttribute {
  std::string name;                          ///< `Name`
  boost::optional<std::string> nameFormat;   ///< `NameFormat`
  boost::optional<std::string> friendlyName; ///< `FriendlyName`: for people only; do not decide by it
  std::vector<AttributeValue> values;        ///< in document order
};

/// A way in which the sender can prove that it may use the token (SAML 2.0 core, section 2.4.1.1).
struct ConfirmationDetails {
  std::string method;                                         ///< the URI of the method
  boost::optional<NameId> nameId;                             ///< the party that must confirm, if it is not the subject
  boost::optional<Tarvel::System::DateTime> notBefore;        ///< not usable before this instant
  boost::optional<Tarvel::System::DateTime> notOnOrAfter;     ///< no longer usable at this instant
  boost::optional<std::string> recipient;                     ///< the address to which the token may be presented
  boost::optional<std::string> inResponseTo;                  ///< the identifier of the request that this answers
  boost::optional<std::string> address;                       ///< the network address of the sender
  Tarvel::Ref<const Tarvel::Crypto::Certificate> certificate; ///< of a holder of key; null if none is stated
  /// The key of a holder of key: SubjectPublicKeyInfo in DER. Empty for other methods, and if no key is stated, or only
  /// a key value with which no signature is accepted: neither RSA with 2048 to 16384 bits and a sound exponent, nor on
  /// one of the curves P-256, P-384 and P-521.
  std::vector<std::uint8_t> publicKey;
};

/// How and when the subject authenticated (SAML 2.0 core, section 2.7.2).
struct AuthnStatementDetails {
  Tarvel::System::DateTime authnInstant;                         ///< when
  boost::optional<std::string> sessionIndex;                     ///< identifies the session at the issuer
  boost::optional<Tarvel::System::DateTime> sessionNotOnOrAfter; ///< when the session ends
  boost::optional<std::string> localityAddress;                  ///< the network address of the subject
  boost::optional<std::string> localityDnsName;                  ///< the host name of the subject
  boost::optional<std::string> contextClass;                     ///< `AuthnContextClassRef`
  boost::optional<std::string> contextDeclaration;               ///< `AuthnContextDeclRef`
  std::vector<std::string> authenticatingAuthorities;            ///< in document order
};

/// What the issuer allows a relying party that issues assertions of its own (SAML 2.0 core, section 2.5.1.6).
struct ProxyDetails {
  boost::optional<std::uint64_t> count; ///< at most so many of them in a row; `boost::none` for no limit
  std::set<std::string> audiences;      ///< the audiences that they may have; empty for no limit
};

/// What a token states, except its identifier, its period of validity, whether it may be renewed, its delegates and its
/// advice, which `SamlToken` has. Everything is a copy, which does not depend on the token.
struct TokenDetails {
  NameId issuer;                                           ///< who issued the token
  Tarvel::System::DateTime issueInstant;                   ///< when
  NameId subject;                                          ///< the party that it is about
  std::vector<ConfirmationDetails> confirmations;          ///< all that the token has, in document order
  std::size_t usedConfirmation = 0;                        ///< the index of the one that the verification chose
  std::vector<std::set<std::string>> audienceRestrictions; ///< each must be met; empty for no restriction
  bool isOneTimeUse = false;                               ///< the token must be used at once and not be kept
  boost::optional<ProxyDetails> proxyRestriction;          ///< `boost::none` if there is no such restriction
  std::vector<AuthnStatementDetails> authnStatements;      ///< in document order
  std::vector<SamlAttribute> attributes;                   ///< of all attribute statements, in document order
};

/// The details of the token. Reads the token's text again, which takes about as long as parsing it.
/// @param token made by this library
/// @throws Tarvel::InvalidArgumentException for an implementation of `SamlToken` that is not this library's.
/// @throws ParseException when the attribute values that contain elements take more than 32 MiB in canonical form.
/// @throws Tarvel::Xml::XMLParseException when the token was made from an element, and its canonical form is longer than a
///         document may be.
/// @throws Tarvel::OutOfMemoryException or std::bad_alloc when memory runs out.
SSOCLIENT_API TokenDetails GetTokenDetails(const SamlToken &token);

/// The subject's identifier exactly as written. Does not read the text again. The parameter and the exceptions are
/// those of `GetTokenDetails`, except that it throws no `ParseException`.
SSOCLIENT_API NameId GetNameId(const SamlToken &token);

/// The attributes of the subject, including those that other functions interpret. The time that it takes, the parameter
/// and the exceptions are those of `GetTokenDetails`.
SSOCLIENT_API std::vector<SamlAttribute> GetAttributes(const SamlToken &token);

} // namespace SsoClient
