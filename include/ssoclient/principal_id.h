// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PrincipalId`, a principal's name within a domain.

#pragma once

#include <ssoclient/export.h>

#include <string>

namespace SsoClient {

/// A principal name qualified by its domain.
struct SSOCLIENT_API PrincipalId {
  std::string name;   ///< the principal's name within its domain
  std::string domain; ///< the domain (tenant, realm) that the name belongs to

  /// One line for logs: "{Name: alice; Domain:CORP}".
  std::string ToString() const;
};

/// Equality ignores letter case, in the name and in the domain: it compares the upper-case forms by Unicode's simple
/// mapping. A few distinct letters share one, as dotless i and i, or long s and s, and are the same here.
SSOCLIENT_API bool operator==(const PrincipalId &left, const PrincipalId &right);
SSOCLIENT_API bool operator!=(const PrincipalId &left, const PrincipalId &right);

/// A principal as a message argument: its `ToString` text, or "(null)" for a null pointer.
SSOCLIENT_API std::string FormatMessageArgument(const PrincipalId *principal);

} // namespace SsoClient
