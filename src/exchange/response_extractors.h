// SPDX-License-Identifier: Apache-2.0
/// @file
/// What each operation takes out of the SOAP body of its response.
///
/// Elements are found by local name; their namespace does not count, and the first of a name wins. Whatever is missing
/// ends in an `SsoException`.

#pragma once

#include "exchange/spnego_response.h"

#include <tarvel/xml/node.h>

#include <string>

namespace SsoClient {

/// The inclusive canonical form of `element` as it stands in its document: the text stands on its own, with all
/// namespace declarations that it needs, and its signature stays good.
/// @throws Tarvel::Xml::Security::XmlSecurityException when it has none, as with a prefix that is not bound.
std::string CanonicalElementText(const Tarvel::Xml::ElementNode &element);

/// The assertion of an issue response, which comes in a collection. @throws as `CanonicalElementText` besides.
std::string ExtractIssuedToken(const Tarvel::Xml::ElementNode &body);

/// The assertion of a renew response, which comes without a collection. @throws as `CanonicalElementText` besides.
std::string ExtractRenewedToken(const Tarvel::Xml::ElementNode &body);

/// Whether a validate response says that the token is valid.
bool ExtractValidationStatus(const Tarvel::Xml::ElementNode &body);

/// One leg of a negotiation: an intermediate one has no collection around it, the final one has, and brings the token.
/// @throws as `CanonicalElementText` besides.
SPNegoResponse ExtractSPNegoLeg(const Tarvel::Xml::ElementNode &body);

} // namespace SsoClient
