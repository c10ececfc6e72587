// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the profile SAML2 for advice and statements.

#pragma once

#include "token/saml2_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads each `RSAAdvice` in a `saml:Advice`, if one is at the cursor. Other elements in it are ignored, which SAML 2.0
/// core, section 2.6.1 allows.
void TryParseSaml2AdviceElement(NodeFilterIterator &iterator, boost::optional<AdviceType> &advice,
                                DeviationSink &sink = ThrowingSink());

/// Reads the statements from the cursor on: authentication and attributes, in any order and number.
void ParseSaml2Statements(NodeFilterIterator &iterator, Saml2Assertion &assertion,
                          DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
