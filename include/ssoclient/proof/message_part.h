// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessagePart`, the name of a header block that is signed or must be signed.

#pragma once

#include <string>

namespace SsoClient {

/// The name of a header block: a child element of the SOAP header.
struct MessagePart {
  std::string namespaceUri; ///< may be empty
  std::string localName;    ///< never empty

  /// Whether both are the same name.
  friend bool operator==(const MessagePart &left, const MessagePart &right) {
    return left.namespaceUri == right.namespaceUri && left.localName == right.localName;
  }
  /// The opposite.
  friend bool operator!=(const MessagePart &left, const MessagePart &right) { return !(left == right); }
};

} // namespace SsoClient
