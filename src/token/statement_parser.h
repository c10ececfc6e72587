// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the statements of an assertion: advice, authentication and attributes.

#pragma once

#include "token/assertion_model.h"
#include "xml/node_filter_iterator.h"

#include <boost/optional.hpp>

namespace SsoClient {

/// Reads a `saml:Advice`. Returns whether one was at the cursor. If not, the cursor and the record stay unchanged.
bool TryParseAdviceElement(NodeFilterIterator &iterator, boost::optional<AdviceType> &advice);

/// Reads an `RSAAdvice`, the advice of one source.
void ParseRsaAdviceElement(NodeFilterIterator &iterator, Advice &advice);

/// Reads a `saml:AuthnStatement`.
void ParseAuthnStatementElement(NodeFilterIterator &iterator, AuthnStatementType &statement);

/// Reads a `saml:AuthnContext`.
void ParseAuthnContextElement(NodeFilterIterator &iterator, AuthnContextType &context);

/// Reads a `saml:AttributeStatement`.
void ParseAttributeStatementElement(NodeFilterIterator &iterator, AttributeStatementType &statement);

/// Reads a `saml:Attribute`.
void ParseAttributeElement(NodeFilterIterator &iterator, AttributeType &attribute);

} // namespace SsoClient
