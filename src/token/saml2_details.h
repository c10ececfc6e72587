// SPDX-License-Identifier: Apache-2.0
/// @file
/// The parts of `TokenDetails` that need no check of their own: names and attributes, read from elements.

#pragma once

#include "token/saml2_model.h"

#include <ssoclient/token_details.h>
#include <tarvel/xml/node.h>

#include <cstddef>
#include <vector>

namespace SsoClient {

/// The maximum number of bytes of all attribute values that contain elements.
constexpr std::size_t MAX_XML_VALUE_BYTES = 32u * 1024 * 1024;

/// The identifier in `element`, which a parser has accepted.
NameId ReadNameId(const Tarvel::Xml::ElementNode &element);

/// The attributes of `statement`, which a parser has accepted. Values that contain elements are read in canonical form.
/// @throws ParseException when the canonical forms together are longer than `MAX_XML_VALUE_BYTES`.
/// @throws Tarvel::Xml::Security::XmlSecurityException when a value has no canonical form. In an assertion with a valid
///         signature, each value has one.
std::vector<SamlAttribute> ReadAttributes(const AttributeStatementType &statement);

/// Reads the attributes of `assertion`, and moves all its details out of it.
/// @throws what `ReadAttributes` throws.
TokenDetails TakeDetails(Saml2Assertion &assertion);

/// The same for an assertion that is not verified. If the attributes cannot be read, they are left out. The text of a
/// value that has elements with a signature is empty.
TokenDetails TakeDetailsOfClaims(Saml2Assertion &assertion);

} // namespace SsoClient
