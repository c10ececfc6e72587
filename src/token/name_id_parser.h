// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the elements that name somebody.

#pragma once

#include "token/assertion_model.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads attributes and text of an element of the type NameIDType, whatever its name. The cursor must stand on an element.
void ParseNameIDType(NodeFilterIterator &iterator, NameIDType &nameId);

/// Reads a `saml:Issuer`.
void ParseSamlIssuerElement(NodeFilterIterator &iterator, NameIDType &issuer);

/// Reads a `saml:NameID`.
void ParseSubjectNameIdElement(NodeFilterIterator &iterator, NameIDType &nameId);

} // namespace SsoClient
