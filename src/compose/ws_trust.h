// SPDX-License-Identifier: Apache-2.0
/// @file
/// The bodies of WS-Trust requests, and the elements that they are made of.

#pragma once

#include "compose/xml_builder.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/// The elements that all issue requests have in common. Further children may be added.
XMLCompositePtr CommonAcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec);

/// An issue request. For a holder-of-key token its last element is `wst:UseKey`, which refers to the message signature.
XMLCompositePtr AcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec);

/// An issue request that presents a token. It never has a `wst:UseKey`, on purpose.
XMLCompositePtr ExchangeSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec);

/// A request to renew `token` for `lifetimeSec` seconds from now. It can be built into one tree only.
/// @throws what `ParseXML` throws when the token's text does not parse.
XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken &token, std::int64_t lifetimeSec);

/// A request to validate `token`. It can be built into one tree only.
/// @throws what `ParseXML` throws when the token's text does not parse.
XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken &token);

/// `wst:Lifetime` from now to `seconds` later, at most to the last moment that a date-time can represent.
XMLBuilderPtr WssuLifetimeBuilder(std::int64_t seconds);

/// `wst:Renewing`. Renewal after expiry is never requested.
XMLBuilderPtr WstRenewingBuilder(bool allow);

/// `wst:DelegateTo` with the principal as a username token without password.
XMLBuilderPtr WstDelegateToBuilder(const std::string &name);

/// `wst:Participants`, one `wst:Participant` for each audience entry.
XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string> &audience);
XMLBuilderPtr WstParticipantBuilder(const std::string &address);

/// `wsa:EndpointReference` to that address.
XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string &address);

/// `wst:BinaryExchange` with one leg of an SPNEGO negotiation.
XMLBuilderPtr WstSPNegoBinExchangeBuilder(const std::vector<std::uint8_t> &leg);

} // namespace SsoClient
