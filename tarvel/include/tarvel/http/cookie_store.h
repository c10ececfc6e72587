// SPDX-License-Identifier: Apache-2.0
/// @file
/// Cookies, kept in memory.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>

#include <cstddef>
#include <string>
#include <string_view>

namespace Tarvel::Http {

/// Cookies by RFC 6265, for one user agent, at most 50 of at most 4096 bytes each. One deviation: a cookie is sent only
/// to the host that set it, even if its Domain attribute is a domain above that host, because only a list that is kept
/// up to date can distinguish domains from public suffixes. Safe on any thread.
class TARVEL_API CookieStore : public Object {
public:
  /// Stores the cookie in a Set-Cookie header's value, received from `host` for the request path `path`. What RFC 6265
  /// says to ignore is ignored.
  virtual void SetFromHeader(std::string_view setCookie, std::string_view host, std::string_view path,
                             bool isSecure) = 0;

  /// The Cookie header's value for a request; empty when there is no cookie to send.
  virtual std::string GetHeader(std::string_view host, std::string_view path, bool isSecure) const = 0;

  /// The number of cookies in the store.
  virtual std::size_t GetCount() const = 0;

protected:
  ~CookieStore() override;
};

/// Makes an empty store. May be called on any thread.
/// @param name must be empty: named stores do not exist.
/// @param out the store; unchanged when an exception is thrown.
/// @throws InvalidArgumentException when `name` is not empty.
TARVEL_API void CreateCookieStore(const std::string &name, Ref<CookieStore> &out);

/// Returns a new, empty store. May be called on any thread.
inline Ref<CookieStore> CreateCookieStore() {
  Ref<CookieStore> store;
  CreateCookieStore(std::string(), store);
  return store;
}

} // namespace Tarvel::Http
