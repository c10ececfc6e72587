// SPDX-License-Identifier: Apache-2.0
/// @file
/// `QName`, a name qualified by its namespace.

#pragma once

#include <tarvel/core/export.h>

#include <string>
#include <tuple>
#include <utility>

namespace Tarvel::Xml {

/// A namespace name and a local name; equal when both are equal byte for byte.
struct QName {
  std::string namespaceUri; ///< empty for a name in no namespace
  std::string localName;

  QName() = default;
  QName(std::string uri, std::string local) : namespaceUri(std::move(uri)), localName(std::move(local)) {}

  friend bool operator==(const QName &a, const QName &b) {
    return a.localName == b.localName && a.namespaceUri == b.namespaceUri;
  }
  friend bool operator!=(const QName &a, const QName &b) { return !(a == b); }
  friend bool operator<(const QName &a, const QName &b) {
    return std::tie(a.namespaceUri, a.localName) < std::tie(b.namespaceUri, b.localName);
  }

  /// "{namespace}local", or "local" alone for a name in no namespace.
  TARVEL_API std::string ToString() const;
};

/// A name as a message argument: its `ToString` text.
TARVEL_API std::string FormatMessageArgument(const QName &value);

} // namespace Tarvel::Xml
