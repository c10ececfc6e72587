// SPDX-License-Identifier: Apache-2.0
/// @file
/// Prefixes that are bound to a namespace at an element of a message that others have written.

#pragma once

#include <tarvel/xml/node.h>

#include <string>
#include <string_view>

namespace SsoClient {

/// A prefix that is bound to `namespaceUri` at `element`, without a change: `preferred` if possible, otherwise the one that is
/// declared nearest. Empty if there is none; the default namespace does not count, because attributes are never in it.
std::string_view FindBoundPrefix(const Tarvel::Xml::ElementNode &element, std::string_view preferred,
                                 std::string_view namespaceUri) noexcept;

/// The prefix that `BindPrefix` declares: `preferred`, or `preferred` and a number if it is bound to something else.
std::string ChooseFreePrefix(const Tarvel::Xml::ElementNode &element, std::string_view preferred);

/// The same as `FindBoundPrefix`, but if there is none, the element gets a declaration of `ChooseFreePrefix`. So no prefix
/// that the content of the element uses changes its meaning.
std::string BindPrefix(Tarvel::Xml::ElementNode &element, std::string_view preferred, std::string_view namespaceUri);

} // namespace SsoClient
