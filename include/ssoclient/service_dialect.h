// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ServiceDialect`, what a token service of another maker expects in requests, and how its responses are read.

#pragma once

#include <ssoclient/export.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// The name of a SOAP fault.
struct FaultName {
  std::string namespaceUri; ///< of the fault code
  std::string localName;    ///< of the fault code
};

/// What requests contain, and how responses are read, where services differ. Each default is what this client has
/// always done: the default dialect changes no octet of any message. `docs/interoperate.md` lists the symptoms by
/// which you find the switch that a service needs.
struct SSOCLIENT_API ServiceDialect {
  /// When a request has an element that only states a choice.
  enum class Statement : std::int32_t {
    ALWAYS = 0, ///< with its value, true or false
    WHEN_TRUE,  ///< only with the value true
    NEVER       ///< not at all; a `TokenSpec` that asks for it is refused
  };
  /// What `wst:UseKey` contains in a request for a holder-of-key token.
  enum class UseKey : std::int32_t {
    REFERENCE = 0, ///< nothing: its `Sig` refers to the message signature; not written when a token is presented
    CERTIFICATE,   ///< the certificate in a `ds:X509Data`, also when a token is presented
    NEVER          ///< the element is not written
  };
  /// The element for the party to which the token is delegated.
  enum class Delegation : std::int32_t {
    DELEGATE_TO = 0, ///< `wst:DelegateTo` (WS-Trust 1.3)
    ON_BEHALF_OF,    ///< `wst:OnBehalfOf` (WS-Trust 1.3): the token is about that party
    ACT_AS           ///< `wst14:ActAs` (WS-Trust 1.4)
  };

  /// Whether `Content-Type` declares `charset=utf-8`.
  bool declaresCharset = false;
  /// The address in `wsp:AppliesTo`, of the service that will receive the token. If unset, the element is not written.
  boost::optional<std::string> appliesTo;
  /// Whether the header has the elements of WS-Addressing 1.0. They are signed when the message is signed.
  bool addressing = false;
  Statement delegatable = Statement::ALWAYS; ///< `wst:Delegatable`
  /// `wst:Renewing`. Without it, the service decides: it may issue a renewable token that nobody asked for.
  Statement renewing = Statement::ALWAYS;
  UseKey useKey = UseKey::REFERENCE;               ///< `wst:UseKey`
  Delegation delegation = Delegation::DELEGATE_TO; ///< for `TokenSpec::delegateTo`
  /// The type of token in a request, and in the response that ends a negotiation; empty for
  /// "urn:oasis:names:tc:SAML:2.0:assertion".
  std::string tokenType;
  /// Whether a reference to a SAML token has the token type of the WS-Security SAML Token Profile 1.1 in its published
  /// spelling, "oasis-wss-saml-token-profile-1.1", which the Basic Security Profile demands.
  bool standardTokenTypeReference = false;
  /// Faults that also mean that the service refuses the caller's credentials.
  std::vector<FaultName> credentialFaults;
  /// Whether the response of every operation may be inside or outside a collection.
  bool acceptsAnyResponse = false;
};

/// The dialect with this name, which must be one of `GetDialectNames`.
/// @throws Tarvel::InvalidArgumentException for another name. The message lists the names.
SSOCLIENT_API ServiceDialect GetServiceDialect(const std::string &name);

/// The names of the dialects that are known: "default", and one for each service with which this client is tested.
SSOCLIENT_API std::vector<std::string> GetDialectNames();

/// Checks a dialect. `CreateSecurityTokenService` and `CreateGssNegotiationContext` call it.
/// @throws Tarvel::InvalidArgumentException when `appliesTo`, the token type or the namespace of a fault is not an
///         absolute URI, when a fault has no namespace or no valid local name, when the token type is known not to be
///         SAML 2.0, when a credential fault is one that services also report for other reasons, and for a value that
///         is not in its enumeration. The message names the field.
SSOCLIENT_API void CheckServiceDialect(const ServiceDialect &dialect);

} // namespace SsoClient
