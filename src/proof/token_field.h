// SPDX-License-Identifier: Apache-2.0
/// @file
/// The header field that contains the token.

#pragma once

#include "proof/http_components.h"

#include <ssoclient/proof/http_request.h>
#include <ssoclient/saml_token.h>

#include <string>

namespace SsoClient {

/// @throws Tarvel::InvalidArgumentException when no request can have such a field.
void RequireTokenHeader(const TokenHeader &form);

/// The value of the token's field.
std::string WriteTokenField(const SamlToken &token, const TokenHeader &form);

/// The token's XML.
/// @throws InvalidMessageException when there is no such field, more than one, or its value has another form.
std::string ReadTokenField(const HttpComponents &components, const TokenHeader &form);

} // namespace SsoClient
