// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PrincipalId`, a principal's name within a domain.

#pragma once

#include <ssoclient/export.h>

#include <cstddef>
#include <functional>
#include <string>

namespace SsoClient {

/// A principal's name and its domain. It can be a key: `std::unordered_set<PrincipalId>`, or
/// `std::set<PrincipalId, PrincipalIdLess>`.
struct SSOCLIENT_API PrincipalId {
  std::string name;   ///< the principal's name within its domain
  std::string domain; ///< the domain (tenant, realm) that the name belongs to

  /// A text for logs, for example "{Name: alice; Domain:CORP}".
  std::string ToString() const;
};

/// Equality ignores letter case in the name and in the domain: it compares the upper-case forms by Unicode's simple mapping.
/// A few distinct letters have the same upper-case form, for example dotless i and i, or long s and s, and are equal here.
SSOCLIENT_API bool operator==(const PrincipalId &left, const PrincipalId &right);
SSOCLIENT_API bool operator!=(const PrincipalId &left, const PrincipalId &right);

/// An order for sets and maps, by name and then by domain. It compares the same upper-case forms as `==`: two
/// principals are equal exactly when neither is less than the other.
struct SSOCLIENT_API PrincipalIdLess {
  bool operator()(const PrincipalId &left, const PrincipalId &right) const;
};

/// A principal as a message argument: its `ToString` text, or "(null)" for a null pointer.
SSOCLIENT_API std::string FormatMessageArgument(const PrincipalId *principal);

} // namespace SsoClient

/// The hash for unordered sets and maps. Equal principals have the same hash, whatever their letter case. Its values are valid
/// in one process only: do not store them.
template <>
struct SSOCLIENT_API std::hash<SsoClient::PrincipalId> {
  std::size_t operator()(const SsoClient::PrincipalId &principal) const;
};
