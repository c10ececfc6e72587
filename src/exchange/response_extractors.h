// SPDX-License-Identifier: Apache-2.0
/// @file
/// Extracts the result of each operation from the SOAP body of its response.
///
/// Elements are found by local name: the namespace is ignored, and the first element of a name is used. All functions throw
/// `SsoException` when an element that they need is missing.

#pragma once

#include "exchange/spnego_response.h"

#include <tarvel/xml/node.h>

#include <string>

namespace SsoClient {

/// The assertion of an issue response, which is in a collection. Also throws what `CanonicalElementText` throws.
std::string ExtractIssuedToken(const Tarvel::Xml::ElementNode &body);

/// The assertion of a renew response, which is not in a collection. Also throws what `CanonicalElementText` throws.
std::string ExtractRenewedToken(const Tarvel::Xml::ElementNode &body);

/// Whether a validate response says that the token is valid.
bool ExtractValidationStatus(const Tarvel::Xml::ElementNode &body);

/// One leg of a negotiation. The response to the final leg is in a collection and has the token; the earlier responses
/// are not in a collection. Also throws what `CanonicalElementText` throws.
SPNegoResponse ExtractSPNegoLeg(const Tarvel::Xml::ElementNode &body);

} // namespace SsoClient
