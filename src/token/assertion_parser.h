// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseSamlAssertionElement`, the strict reader of one assertion.

#pragma once

#include "token/assertion_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

namespace SsoClient {

/// The first SAML 2.0 assertion in the tree of `top` or, if there is none, the first "Assertion" in any namespace. Null
/// if there is no such element.
const Tarvel::Xml::ElementNode *FindAssertion(const Tarvel::Xml::Node *top);

/// Reads the assertion at the cursor and moves the cursor to the next node. Only the form that the token service issues is
/// accepted: its elements in their order with their attributes, and no others.
///
/// All parsing functions have the same steps: take the element of the expected name, after which the cursor is at the next
/// sibling; check its attributes, its children in order, and that nothing follows them. Each deviation is reported to
/// `sink`. The sink of a verification throws a `ParseException` at the first deviation, which ends the parse and leaves
/// the record partly filled.
///
/// If the sink does not throw, the parse continues, and reads what it can recognise. It reports each deviation once, in
/// the order of the parse, and takes linear time:
/// - If an expected element is not at the cursor, it is searched for among the siblings (`TakeElement`). If it is not
///   found, its record stays as it is.
/// - Unexpected attributes, elements and texts are reported and skipped. Only audiences of further restrictions, and
///   attributes of further statements, are added to those of the first one.
/// - If the element at the cursor is not an assertion, the first `saml:Assertion` below it is read. If there is none,
///   the first "Assertion" in any namespace is read, which may be the element at the cursor. `assertion.element` is the
///   element that was read. If there is none, it is null, and the record is empty.
void ParseSamlAssertionElement(NodeFilterIterator &iterator, SamlAssertionType &assertion,
                               DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
