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
  std::string localName;    ///< the name without a prefix

  QName() = default;
  /// The name `local` in the namespace `uri`, which may be empty.
  QName(std::string uri, std::string local) : namespaceUri(std::move(uri)), localName(std::move(local)) {}

  /// Whether both have the same namespace and the same local name.
  friend bool operator==(const QName &a, const QName &b) {
    return a.localName == b.localName && a.namespaceUri == b.namespaceUri;
  }
  /// Whether namespace or local name differ.
  friend bool operator!=(const QName &a, const QName &b) { return !(a == b); }
  /// An order for sets and maps: by namespace, then by local name.
  friend bool operator<(const QName &a, const QName &b) {
    return std::tie(a.namespaceUri, a.localName) < std::tie(b.namespaceUri, b.localName);
  }

  /// "{namespace}local", or only "local" for a name in no namespace.
  TARVEL_API std::string ToString() const;
};

/// A name as a message argument: its `ToString` text.
TARVEL_API std::string FormatMessageArgument(const QName &value);

} // namespace Tarvel::Xml
