// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the profile SAML2 for names, and for the subject and its confirmations.

#pragma once

#include "token/saml2_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads a `saml:Issuer`. As in the profile STRICT, its `Format` is not checked.
void ParseSaml2IssuerElement(NodeFilterIterator &iterator, NameIDType &issuer, NameId &exact,
                             DeviationSink &sink = ThrowingSink());

/// Reads a `saml:NameID`, of any format. `exact` is the same name with its qualifiers.
void ParseSaml2NameIdElement(NodeFilterIterator &iterator, NameIDType &nameId, NameId &exact,
                             DeviationSink &sink = ThrowingSink());

/// Reads a `saml:Subject`: one name, and at least one confirmation.
void ParseSaml2SubjectElement(NodeFilterIterator &iterator, Saml2Assertion &assertion,
                              DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
