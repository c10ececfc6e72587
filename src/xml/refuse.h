// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Refuse`, with which every rule of the accepted form reports a deviation.

#pragma once

#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>
#include <tarvel/xml/node.h>

#include <string>
#include <string_view>

namespace SsoClient {

/// Where a rule refuses something.
struct Place {
  /// An element, or one of its attributes.
  Place(const Tarvel::Xml::ElementNode &where, std::string_view attributeName = {}) noexcept
      : element(&where), attribute(attributeName) {}

  /// The same for an element that may be null.
  Place(const Tarvel::Xml::ElementNode *where, std::string_view attributeName = {}) noexcept
      : element(where), attribute(attributeName) {}

  /// The element at the cursor or, if there is no element, the parent of the nodes over which the cursor moves.
  Place(const NodeFilterIterator &iterator) noexcept
      : element(IteratorToElement(iterator) ? IteratorToElement(iterator) : Tarvel::Xml::AsElement(iterator.parent)) {}

  const Tarvel::Xml::ElementNode *element; ///< null if there is no element at all
  std::string_view attribute;              ///< the attribute's name as written; empty if the place is the element
};

/// Reports a deviation to `sink`: the message is `format` with `args` in its placeholders, `allowed` is what the form
/// allows at `place`, and `found`, which is shortened, is what is there. Returns only if the sink does not throw.
///
/// `allowed`, `found` and `args` may be of any type that `Tarvel::MessageFormatter` accepts. They become texts only if the
/// sink is not full, so a rule should pass values, and not compose texts from them.
template <typename Allowed, typename Found, typename... Args>
void Refuse(DeviationSink &sink, const Place &place, const Allowed &allowed, const Found &found,
            std::string_view format, const Args &...args) {
  ReportDeviation(sink, [&] {
    using Tarvel::MessageArguments::ToText;
    return Deviation{Tarvel::MessageFormatter::ASPrint(format, args...), place.element, std::string(place.attribute),
                     ToText(allowed), Tarvel::StringUtil::Shorten(ToText(found))};
  });
}

} // namespace SsoClient
