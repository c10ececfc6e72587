// SPDX-License-Identifier: Apache-2.0
/// @file
/// The parts of `TokenDetails` that need no check of their own: names and attributes, read from elements.

#pragma once

#include "token/assertion_model.h"

#include <ssoclient/token_details.h>
#include <tarvel/xml/node.h>

#include <vector>

namespace SsoClient {

/// The identifier in `element`, which a parser has accepted.
NameId ReadNameId(const Tarvel::Xml::ElementNode &element);

/// The attributes of `statement`, which a parser has accepted, with the values that are XML.
std::vector<SamlAttribute> ReadAttributes(const AttributeStatementType &statement);

} // namespace SsoClient
