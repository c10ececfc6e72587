// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MemoryCache`, a Kerberos credential cache in this process's memory.

#pragma once

#include <krb5/krb5.h>

#include <memory>
#include <string>
#include <type_traits>

namespace SsoClient::Gssapi {

struct KerberosContextDeleter {
  void operator()(krb5_context context) const noexcept { krb5_free_context(context); }
};

/// Destroys the cache itself, not only the handle.
struct KerberosCacheDeleter {
  krb5_context context = nullptr;
  void operator()(krb5_ccache cache) const noexcept { krb5_cc_destroy(context, cache); }
};

/// A cache with a unique name. It exists as long as this object.
class MemoryCache {
public:
  /// @throws GssCredentialException when the Kerberos library cannot be used, for example because of a malformed
  ///         configuration.
  MemoryCache();

  /// For example "MEMORY:xyz".
  const std::string &GetName() const noexcept { return m_name; }

private:
  std::unique_ptr<std::remove_pointer_t<krb5_context>, KerberosContextDeleter> m_context;
  std::unique_ptr<std::remove_pointer_t<krb5_ccache>, KerberosCacheDeleter> m_cache; // destroyed before the context
  std::string m_name;
};

} // namespace SsoClient::Gssapi
