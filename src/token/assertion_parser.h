// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseSamlAssertionElement`, the strict reader of one assertion.

#pragma once

#include "token/assertion_model.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// Reads the assertion at the cursor and moves the cursor to the next node. Only the form that the token service issues is
/// accepted: its elements in their order with their attributes, and no others.
///
/// All parsing functions have the same steps: check the name of the element, its attributes, its children in order, and that
/// nothing follows them; then move to the next sibling. The first failure ends the parse and leaves the record partly filled.
/// @throws ParseException for any other form.
void ParseSamlAssertionElement(NodeFilterIterator &iterator, SamlAssertionType &assertion);

} // namespace SsoClient
