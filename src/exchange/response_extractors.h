// SPDX-License-Identifier: Apache-2.0
/// @file
/// Extracts the result of each operation from the SOAP body of its response.
///
/// Elements are found by local name: the namespace is ignored, and the first element of a name is used. All functions throw
/// `SsoException` when an element that they need is missing. The response of each operation is expected
/// in one place, in a collection or directly in the body. With `ServiceDialect::acceptsAnyResponse`, the other place is
/// searched next.

#pragma once

#include "exchange/spnego_response.h"

#include <ssoclient/service_dialect.h>
#include <tarvel/xml/node.h>

#include <string>

namespace SsoClient {

/// The assertion of an issue response, which is in a collection. Also throws what `CanonicalElementText` throws.
std::string ExtractIssuedToken(const Tarvel::Xml::ElementNode &body, const ServiceDialect &dialect = {});

/// The assertion of a renew response, which is not in a collection. Also throws what `CanonicalElementText` throws.
std::string ExtractRenewedToken(const Tarvel::Xml::ElementNode &body, const ServiceDialect &dialect = {});

/// Whether a validate response says that the token is valid.
bool ExtractValidationStatus(const Tarvel::Xml::ElementNode &body, const ServiceDialect &dialect = {});

/// One leg of a negotiation. The response to the final leg is in a collection and has the token; the earlier responses
/// are not in a collection. With `ServiceDialect::acceptsAnyResponse`, each response with a token is the final one. The
/// token type of the final response must be the requested one. Also throws what `CanonicalElementText` throws.
SPNegoResponse ExtractSPNegoLeg(const Tarvel::Xml::ElementNode &body, const ServiceDialect &dialect = {});

} // namespace SsoClient
