// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HttpComponents`, the values of a request that a signature can cover (RFC 9421, section 2).

#pragma once

#include <ssoclient/proof/http_request.h>

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace SsoClient {

/// Names and values of a request in the form in which they are signed. It refers to the request, which must outlive it
/// and must not be changed.
class HttpComponents {
public:
  /// Checks the form of the method, the target and the header. Takes linear time, except for sorting the names of the
  /// fields.
  /// @throws InvalidMessageException when one of them is malformed, or the header is longer than
  ///         `MAX_HTTP_HEADER_OCTETS`.
  explicit HttpComponents(const HttpRequest &request);

  /// The value of a derived component such as "@method" (RFC 9421, section 2.2); nullopt for a name that no request
  /// has, or that needs a parameter.
  std::optional<std::string> FindDerived(std::string_view name) const;

  /// The values of all header fields of this name, which is in lower case, in the form of RFC 9421, section 2.1:
  /// without blanks around each of them, and with ", " between two of them. nullopt if there is no such field.
  std::optional<std::string> FindField(std::string_view name) const;

  /// How many header fields have this name, which is in lower case.
  std::size_t CountFields(std::string_view name) const noexcept;

private:
  using Field = std::pair<std::string, std::string_view>; // the name in lower case, and the value as it was received
  using Fields = std::vector<Field>;

  void ReadFields(const HttpRequest &request);
  void ReadTarget(const std::string &target);
  std::pair<Fields::const_iterator, Fields::const_iterator> EqualRange(std::string_view name) const noexcept;

  std::string_view m_method;
  std::string_view m_targetUri;
  std::string m_authority;
  std::string m_pathAndQuery; // begins with "/"
  bool m_isSecure = false;
  Fields m_fields; // by name; fields of one name in the order of the message
};

/// `name`, which is ASCII, in lower case.
std::string FieldNameInLowerCase(std::string_view name);

/// Whether `text` may be a method or the name of a field: a token (RFC 9110, section 5.6.2).
bool IsHttpToken(std::string_view text) noexcept;

/// Whether `c` must not be in the value of a field: every control character except the tab.
bool IsForbiddenInField(char c) noexcept;

} // namespace SsoClient
