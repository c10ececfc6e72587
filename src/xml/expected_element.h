// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading lists of child elements in the order of the accepted form, and finding the next element after a deviation.
///
/// Each call examines each node of the list at most three times. A parser takes each name of a sequence once, so it
/// reads every document in linear time.

#pragma once

#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

#include <string_view>

namespace SsoClient {

/// Takes the element of that name, which must be at the cursor: the cursor moves to the node after it, and the result is a
/// cursor on the element.
///
/// If another node is at the cursor and the sink does not throw, the element is searched for: first after the cursor,
/// then before it, because a search for another element may have skipped it. Each node that is skipped is a deviation
/// of its own. An element of the right local name in another namespace is taken, too, if there is no better one after
/// the cursor. If there is no element to take, the result is past the end, and the cursor does not move.
NodeFilterIterator TakeElement(NodeFilterIterator &iterator, std::string_view localName, std::string_view namespaceUri,
                               DeviationSink &sink);

/// The same for a list in which all elements have the same name. If another node is at the cursor and the sink does not
/// throw, only that node is skipped, so the cursor always moves unless it is past the end.
NodeFilterIterator TakeListElement(NodeFilterIterator &iterator, std::string_view localName,
                                   std::string_view namespaceUri, DeviationSink &sink);

} // namespace SsoClient
