// SPDX-License-Identifier: Apache-2.0
/// @file
/// The bodies of WS-Trust requests, and the elements that they are made of.

#pragma once

#include "compose/xml_builder.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/service_dialect.h>
#include <ssoclient/token_spec.h>
#include <tarvel/crypto/certificate.h>

#include <cstdint>
#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/// The type of token that requests ask for.
std::string RequestedTokenType(const ServiceDialect &dialect);

/// The elements that all issue requests have in common. Further children may be added.
XMLCompositePtr CommonAcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec,
                                                  const ServiceDialect &dialect = {});

/// An issue request. For a holder-of-key token its last element is `wst:UseKey`, which refers to the message signature
/// unless the dialect demands the certificate or no such element.
/// @param certificate for a `wst:UseKey` with the certificate
/// @throws Tarvel::InvalidArgumentException when the certificate is needed and null.
XMLCompositePtr AcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec,
                                            const ServiceDialect &dialect = {},
                                            const Tarvel::Crypto::Certificate *certificate = nullptr);

/// An issue request that presents a token. It has a `wst:UseKey` only if the dialect demands one with the certificate.
/// @param certificate for this `wst:UseKey`
/// @throws Tarvel::InvalidArgumentException when the certificate is needed and null.
XMLCompositePtr ExchangeSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec,
                                             const ServiceDialect &dialect = {},
                                             const Tarvel::Crypto::Certificate *certificate = nullptr);

/// A request to renew `token` for `lifetimeSec` seconds from now. It can be built into one tree only.
/// @throws what `ParseXML` throws when the token's text does not parse.
XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken &token, std::int64_t lifetimeSec,
                                        const ServiceDialect &dialect = {});

/// A request to validate `token`. It can be built into one tree only.
/// @throws what `ParseXML` throws when the token's text does not parse.
XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken &token);

/// `wst:Lifetime` from now to `seconds` later, at most to the last moment that a date-time can represent.
XMLBuilderPtr WssuLifetimeBuilder(std::int64_t seconds);

/// `wst:Renewing`. Renewal after expiry is never requested.
XMLBuilderPtr WstRenewingBuilder(bool allow);

/// `wst:DelegateTo`, or the dialect's element instead, with the principal as a username token without password.
XMLBuilderPtr WstDelegateToBuilder(const std::string &name, const ServiceDialect &dialect = {});

/// `wst:UseKey` with the certificate.
XMLBuilderPtr WstUseKeyBuilder(const Tarvel::Crypto::Certificate &certificate);

/// `wsp:AppliesTo` with the address of the service that will receive the token.
XMLBuilderPtr WspAppliesToBuilder(const std::string &address);

/// `wst:Participants`, one `wst:Participant` for each audience entry.
XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string> &audience);
XMLBuilderPtr WstParticipantBuilder(const std::string &address);

/// `wsa:EndpointReference` to that address.
XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string &address);

/// `wst:BinaryExchange` with one leg of an SPNEGO negotiation.
XMLBuilderPtr WstSPNegoBinExchangeBuilder(const std::vector<std::uint8_t> &leg);

} // namespace SsoClient
