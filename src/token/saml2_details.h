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

/// The attributes of `statement`, which a parser has accepted, with the values that are XML.
/// @throws ParseException when these values are longer than `MAX_XML_VALUE_BYTES`.
/// @throws Tarvel::Xml::Security::XmlSecurityException when such a value has no canonical form. An assertion with a valid
///         signature has one.
std::vector<SamlAttribute> ReadAttributes(const AttributeStatementType &statement);

/// The details of an assertion with its attributes. They are moved.
/// @throws like `ReadAttributes`.
TokenDetails TakeDetails(Saml2Assertion &assertion);

/// The same for an assertion that is not verified. If the attributes cannot be read, they are left out.
TokenDetails TakeDetailsOfClaims(Saml2Assertion &assertion);

} // namespace SsoClient
