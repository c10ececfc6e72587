// SPDX-License-Identifier: Apache-2.0
/// @file
/// The elements of the WS-Security header: timestamp, tokens, and references to tokens.

#pragma once

#include "compose/xml_builder.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/service_dialect.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>

#include <string>

namespace SsoClient {

/// `wsse:Security` with a timestamp that begins now and ends `minutes` later. Tokens are added after the timestamp.
XMLCompositePtr WsSecurityHeaderBuilder(int minutes);

/// `wsu:Timestamp` from now to `minutes` later. The clock is read once.
XMLCompositePtr WssuTimestampBuilder(int minutes);

/// `wsu:Timestamp` with these two instants.
XMLCompositePtr WssuTimestampBuilder(const Tarvel::System::DateTime &created, const Tarvel::System::DateTime &expires);

/// `wsse:UsernameToken` without or with a password. The password is in clear text: the connection must keep it secret.
XMLCompositePtr WsseUsernameTokenBuilder(const std::string &user);
XMLCompositePtr WsseUsernameTokenBuilder(const std::string &user, const std::string &password);

/// `wsse:BinarySecurityToken` with that identifier and the certificate. The prefix "wsse" must be declared by the header.
XMLBuilderPtr WsseX509v3BinarySecTokenBuilder(const std::string &id, const Tarvel::Crypto::Certificate *certificate);

/// `wsse:SecurityTokenReference` to the binary security token with that identifier.
XMLBuilderPtr WsseX509v3BSTReferenceBuilder(const std::string &id);

/// `wsse:SecurityTokenReference` to the SAML assertion with that identifier.
XMLBuilderPtr WsseSamlKeyIdReferenceBuilder(const std::string &assertionId, const ServiceDialect &dialect = {});

/// `ds:KeyInfo` with the certificate in a `ds:X509Data`.
XMLBuilderPtr DsCertificateKeyInfoBuilder(const Tarvel::Crypto::Certificate &certificate);

/// The assertion element of the token as it was issued, so that its signature stays valid. It can be built into one tree only.
/// @throws what `ParseXML` throws when the token's text does not parse.
XMLBuilderPtr InsertSamlTokenBuilder(const SamlToken &token);

} // namespace SsoClient
