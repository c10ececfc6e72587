// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the statements of an assertion: advice, authentication and attributes.
///
/// The functions for elements of lists return whether they found their element. If not, they have skipped another node.

#pragma once

#include "token/assertion_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

#include <boost/optional.hpp>

#include <cstddef>
#include <string>
#include <vector>

namespace SsoClient {

/// Reads a `saml:Advice`. Returns whether one was at the cursor. If not, the cursor and the record stay unchanged.
bool TryParseAdviceElement(NodeFilterIterator &iterator, boost::optional<AdviceType> &advice,
                           DeviationSink &sink = ThrowingSink());

/// Reads an `RSAAdvice`, the advice of one source.
bool ParseRsaAdviceElement(NodeFilterIterator &iterator, Advice &advice, DeviationSink &sink = ThrowingSink());

/// Reads a `saml:AuthnStatement`.
void ParseAuthnStatementElement(NodeFilterIterator &iterator, AuthnStatementType &statement,
                                DeviationSink &sink = ThrowingSink());

/// Reads a `saml:AuthnContext`.
void ParseAuthnContextElement(NodeFilterIterator &iterator, AuthnContextType &context,
                              DeviationSink &sink = ThrowingSink());

/// An upper limit of the number of SAML attributes in `statement`: it counts each element with at least one XML
/// attribute. Callers reserve memory for all of them at once, because a sequence that grows step by step needs up to
/// three times the memory.
std::size_t CountPossibleAttributes(const Tarvel::Xml::ElementNode &statement);

/// Reads a `saml:AttributeStatement` and adds its attributes to those that `statement` has.
void ParseAttributeStatementElement(NodeFilterIterator &iterator, AttributeStatementType &statement,
                                    DeviationSink &sink = ThrowingSink());

/// Reads a `saml:Attribute`.
bool ParseAttributeElement(NodeFilterIterator &iterator, AttributeType &attribute,
                           DeviationSink &sink = ThrowingSink());

/// A function that reads a `saml:AttributeValue`. It returns whether `value` was set.
using AttributeValueParser = bool (*)(NodeFilterIterator &iterator, std::string &value, DeviationSink &sink);

/// Reads the names of `element`, a `saml:Attribute` whose XML attributes the caller has checked.
void ReadAttributeNames(const Tarvel::Xml::ElementNode &element, AttributeType &attribute);

/// Reads the values from the cursor on.
void ReadAttributeValues(NodeFilterIterator iterator, std::vector<std::string> &values, AttributeValueParser parseValue,
                         DeviationSink &sink);

} // namespace SsoClient
