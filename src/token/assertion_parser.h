// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseSamlAssertionElement`, the strict reader of one assertion.

#pragma once

#include "token/assertion_model.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads the assertion that the cursor stands on and moves the cursor to the next node. Only the form that the token
/// service issues is accepted: elements in their fixed order, with their fixed attributes, and none besides.
///
/// This and the other parsing functions share one pattern: the element's name, its attributes, its children in order, nothing
/// after them; then on to the next sibling. The first failure ends the parse and leaves the record partly filled.
/// @throws ParseException for everything else.
void ParseSamlAssertionElement(NodeFilterIterator &iterator, SamlAssertionType &assertion);

} // namespace SsoClient
