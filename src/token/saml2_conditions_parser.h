// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseSaml2ConditionsElement`, the reader of the profile SAML2 for the conditions under which a token is valid.

#pragma once

#include "token/saml2_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads a `saml:Conditions`: restrictions in any order. Without a `NotBefore`, the token is valid from its
/// `IssueInstant`, which must have been read. A condition that is not known is refused, because it cannot be checked
/// (SAML 2.0 core, section 2.5.1.1).
void ParseSaml2ConditionsElement(NodeFilterIterator &iterator, Saml2Assertion &assertion,
                                 DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
