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

/// What every issue request asks for; further children may be added behind.
XMLCompositePtr CommonAcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec);

/// An issue request. For a holder-of-key token it ends in `wst:UseKey`, which names the message signature.
XMLCompositePtr AcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec);

/// An issue request made with a token. It has no `wst:UseKey`, on purpose, whatever the confirmation.
XMLCompositePtr ExchangeSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec &spec);

/// A request to renew `token` for `lifetimeSec` seconds from now. Builds into one tree only.
/// @throws what `ParseXML` throws when the token's text does not parse.
XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken &token, std::int64_t lifetimeSec);

/// A request to judge `token`. Builds into one tree only.
/// @throws what `ParseXML` throws when the token's text does not parse.
XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken &token);

/// `wst:Lifetime` from now to `seconds` later, and no later than the last moment that a date-time can tell.
XMLBuilderPtr WssuLifetimeBuilder(std::int64_t seconds);

/// `wst:Renewing`; renewal after expiry is never asked for.
XMLBuilderPtr WstRenewingBuilder(bool allow);

/// `wst:DelegateTo`, the principal as a username token without password.
XMLBuilderPtr WstDelegateToBuilder(const std::string &name);

/// `wst:Participants`, one `wst:Participant` for each audience entry.
XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string> &audience);
XMLBuilderPtr WstParticipantBuilder(const std::string &address);

/// `wsa:EndpointReference` to that address.
XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string &address);

/// `wst:BinaryExchange` with one leg of an SPNEGO negotiation.
XMLBuilderPtr WstSPNegoBinExchangeBuilder(const std::vector<std::uint8_t> &leg);

} // namespace SsoClient
