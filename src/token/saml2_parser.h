// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseSaml2AssertionElement`, the reader of the profile SAML2.

#pragma once

#include "token/saml2_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads the assertion at the cursor and moves the cursor to the next node. Accepts what SAML 2.0 core lets an issuer
/// of authentication and attribute assertions write, and everything that `ParseSamlAssertionElement` accepts. What is
/// not accepted is reported to `sink`. If the sink does not throw, the parse continues like that of
/// `ParseSamlAssertionElement`, except that a statement or an advice that is not in its place is skipped.
///
/// After a parse without deviations there is at least one confirmation, and `Conditions` has both dates.
void ParseSaml2AssertionElement(NodeFilterIterator &iterator, Saml2Assertion &assertion,
                                DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
