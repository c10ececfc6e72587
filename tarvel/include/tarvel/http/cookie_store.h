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

/// Cookies by RFC 6265, for one user agent, at most 50 of 4096 bytes each. One deviation: a cookie goes back to the host
/// that set it and to no other, also when its Domain attribute names a domain above that host, because telling domains
/// from public suffixes takes a list that somebody has to keep up to date. Safe on any thread.
class TARVEL_API CookieStore : public Object {
public:
  /// Takes a Set-Cookie header's value as received from that host and request path. What RFC 6265 says to ignore is
  /// ignored.
  virtual void SetFromHeader(std::string_view setCookie, std::string_view host, std::string_view path,
                             bool isSecure) = 0;

  /// The Cookie header's value for a request, empty when there is none to send.
  virtual std::string GetHeader(std::string_view host, std::string_view path, bool isSecure) const = 0;

  virtual std::size_t GetCount() const = 0;

protected:
  ~CookieStore() override;
};

/// @param name the name under which the store would be shared; empty for one that is private to its holder. Only private
///        stores exist. @throws InvalidArgumentException for a name.
TARVEL_API void CreateCookieStore(const std::string &name, Ref<CookieStore> &out);

} // namespace Tarvel::Http
