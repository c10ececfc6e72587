// SPDX-License-Identifier: Apache-2.0

#include <tarvel/http/cookie_store.h>

#include "core/fork_gate.h"
#include "http/header_syntax.h"
#include "http/set_cookie.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/system/date_time.h>

#include <algorithm>
#include <arpa/inet.h>
#include <cstdint>
#include <mutex>
#include <optional>
#include <utility>
#include <vector>

namespace Tarvel::Http {

namespace {

constexpr std::size_t MAX_COOKIES = 50;        // RFC 6265, section 6.1: at least this many for a domain
constexpr std::size_t MAX_COOKIE_BYTES = 4096; // at least this many for a cookie; here for name and value together
constexpr std::int64_t MICROSECONDS = 1000000; // in a second

/// A cookie is sent only to the host that set it. A Domain attribute could extend this to a whole domain, but only a
/// list that is kept up to date can show whether a domain is a public suffix such as "co.uk". A user agent sends to one
/// host only and needs no cookies of other hosts.
struct Cookie {
  std::string name;
  std::string value;
  std::string host;
  std::string path;
  std::optional<std::int64_t> expires; // microseconds since 1970, UTC; nullopt: never
  bool isSecure = false;
};

bool IsAddress(std::string_view host) {
  const std::string text(host);
  in6_addr address;
  return inet_pton(AF_INET, text.c_str(), &address) == 1 || inet_pton(AF_INET6, text.c_str(), &address) == 1;
}

/// RFC 6265, section 5.1.3.
bool MatchesDomain(std::string_view host, std::string_view domain) {
  if (EqualsIgnoringCase(host, domain)) {
    return true;
  }
  return host.size() > domain.size() && host[host.size() - domain.size() - 1] == '.' &&
         EqualsIgnoringCase(host.substr(host.size() - domain.size()), domain) && !IsAddress(host);
}

std::string_view WithoutQuery(std::string_view path) {
  return path.substr(0, path.find('?'));
}

/// RFC 6265, section 5.1.4.
std::string DefaultPath(std::string_view requestPath) {
  const std::string_view path = WithoutQuery(requestPath);
  const std::size_t lastSlash = path.rfind('/');
  if (path.empty() || path.front() != '/' || lastSlash == 0) {
    return "/";
  }
  return std::string(path.substr(0, lastSlash));
}

/// RFC 6265, section 5.1.4.
bool MatchesPath(std::string_view requestPath, std::string_view cookiePath) {
  const std::string_view path = WithoutQuery(requestPath);
  if (path.substr(0, cookiePath.size()) != cookiePath) {
    return false;
  }
  return path.size() == cookiePath.size() || cookiePath.back() == '/' || path[cookiePath.size()] == '/';
}

std::optional<std::int64_t> ComputeExpiry(const SetCookie &cookie, std::int64_t now) {
  return cookie.maxAge ? now + *cookie.maxAge * MICROSECONDS : cookie.expires;
}

bool IsExpired(const Cookie &cookie, std::int64_t now) {
  return cookie.expires && *cookie.expires <= now;
}

class CookieStoreImpl final : public CookieStore {
public:
  void SetFromHeader(std::string_view setCookie, std::string_view host, std::string_view path, bool) override;
  std::string GetHeader(std::string_view host, std::string_view path, bool isSecure) const override;
  std::size_t GetCount() const override;

private:
  ~CookieStoreImpl() override = default;

  mutable ForkSafeMutex m_mutex;
  std::vector<Cookie> m_cookies; // in the order of their creation
};

// Whether the connection is secure does not matter here (RFC 6265, section 5.3); it matters when cookies are sent back.
void CookieStoreImpl::SetFromHeader(std::string_view setCookie, std::string_view host, std::string_view path, bool) {
  const std::optional<SetCookie> parsed = ParseSetCookie(setCookie);
  if (!parsed || parsed->name.size() + parsed->value.size() > MAX_COOKIE_BYTES ||
      (!parsed->domain.empty() && !MatchesDomain(host, parsed->domain))) {
    return;
  }
  const std::int64_t now = System::GetUtcDateTime().GetUtcTime();
  Cookie cookie{parsed->name,
                parsed->value,
                std::string(host),
                parsed->path.empty() ? DefaultPath(path) : parsed->path,
                ComputeExpiry(*parsed, now),
                parsed->isSecure};

  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  const auto same = std::find_if(m_cookies.begin(), m_cookies.end(), [&cookie](const Cookie &other) {
    return other.name == cookie.name && other.path == cookie.path && EqualsIgnoringCase(other.host, cookie.host);
  });
  if (same != m_cookies.end()) {
    *same = std::move(cookie); // the new cookie keeps the place of the old one
  } else {
    m_cookies.push_back(std::move(cookie));
  }
  m_cookies.erase(
      std::remove_if(m_cookies.begin(), m_cookies.end(), [now](const Cookie &other) { return IsExpired(other, now); }),
      m_cookies.end());
  if (m_cookies.size() > MAX_COOKIES) {
    m_cookies.erase(m_cookies.begin());
  }
}

std::string CookieStoreImpl::GetHeader(std::string_view host, std::string_view path, bool isSecure) const {
  const std::int64_t now = System::GetUtcDateTime().GetUtcTime();
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  std::vector<const Cookie *> toSend;
  for (const Cookie &cookie : m_cookies) {
    if (!IsExpired(cookie, now) && (isSecure || !cookie.isSecure) && EqualsIgnoringCase(cookie.host, host) &&
        MatchesPath(path, cookie.path)) {
      toSend.push_back(&cookie);
    }
  }
  // Longer paths first; of equally long ones, older cookies before newer ones (RFC 6265, section 5.4).
  std::stable_sort(toSend.begin(), toSend.end(),
                   [](const Cookie *left, const Cookie *right) { return left->path.size() > right->path.size(); });
  std::string header;
  for (const Cookie *cookie : toSend) {
    header.append(header.empty() ? "" : "; ").append(cookie->name).append("=").append(cookie->value);
  }
  return header;
}

std::size_t CookieStoreImpl::GetCount() const {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  return m_cookies.size();
}

} // namespace

CookieStore::~CookieStore() = default;

void CreateCookieStore(const std::string &name, Ref<CookieStore> &out) {
  if (!name.empty()) {
    throw InvalidArgumentException("there are no named cookie stores, but \"" + StringUtil::Shorten(name) +
                                   "\" was asked for.");
  }
  out = MakeRef<CookieStoreImpl>();
}

} // namespace Tarvel::Http
