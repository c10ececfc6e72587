// SPDX-License-Identifier: Apache-2.0

#include "client/token_cache_text.h"

#include <algorithm>

namespace SsoClient {

namespace {

constexpr std::string_view FORMAT_NAME = "ssoclient token cache ";
constexpr std::string_view VERSION_LINE = "ssoclient token cache 1\n";
constexpr std::string_view TOKEN_LINE = "token: ";
constexpr std::string_view END_LINE = "end: ";
constexpr std::string_view OCTETS_LINE = "octets: ";
constexpr std::string_view LAST_LINE = "\nend of token cache\n";

void AppendLine(std::string &text, std::string_view name, std::string_view value) {
  text.append(name).append(": ").append(CacheValue(value)).append("\n");
}

void AppendLine(std::string &text, std::string_view name, bool value) {
  AppendLine(text, name, std::string_view(value ? "true" : "false"));
}

void AppendSpec(std::string &text, const TokenSpec &spec) {
  AppendLine(text, "lifetime", std::to_string(spec.tokenLifetimeSec));
  for (const std::string &audience : spec.audienceRestriction) {
    AppendLine(text, "audience", audience);
  }
  for (const Advice &advice : spec.advice) {
    AppendLine(text, "advice", advice.source);
    for (const AdviceAttribute &attribute : advice.attributes) {
      AppendLine(text, "attribute", attribute.name);
      for (const std::string &value : attribute.values) {
        AppendLine(text, "value", value);
      }
    }
  }
  AppendLine(text, "delegable", spec.delegable);
  if (spec.delegateTo) {
    AppendLine(text, "delegate to", *spec.delegateTo);
  }
  AppendLine(text, "renewable", spec.renewable);
  AppendLine(text, "confirmation", std::to_string(spec.confirmation));
}

/// The lines before those of the token.
std::string BindingText(const CacheBinding &binding) {
  std::string text(VERSION_LINE);
  AppendLine(text, "service", binding.serviceUrl);
  AppendLine(text, "owner", binding.owner);
  AppendLine(text, "options", binding.options);
  AppendSpec(text, binding.spec);
  return text;
}

/// Removes `expected` from the beginning of `rest`; false if `rest` begins differently.
bool Take(std::string_view &rest, std::string_view expected) {
  if (rest.substr(0, expected.size()) != expected) {
    return false;
  }
  rest.remove_prefix(expected.size());
  return true;
}

/// Removes a line from `rest` and sets `value` to what follows its name; false if `rest` begins with another line.
bool TakeLine(std::string_view &rest, std::string_view name, std::string_view &value) {
  const std::size_t end = rest.find('\n');
  if (end == std::string_view::npos || !Take(rest, name)) {
    return false;
  }
  value = rest.substr(0, end - name.size());
  rest.remove_prefix(value.size() + 1);
  return true;
}

} // namespace

std::string CacheValue(std::string_view value) {
  static constexpr char DIGITS[] = "0123456789abcdef";
  constexpr unsigned char DELETE = 0x7f;
  std::string written;
  for (const char c : value) {
    const auto octet = static_cast<unsigned char>(c);
    if (octet >= ' ' && octet != DELETE && c != '\\') {
      written += c;
      continue;
    }
    written.append("\\x").append(1, DIGITS[octet / 16]).append(1, DIGITS[octet % 16]);
  }
  return written;
}

bool IsCacheText(std::string_view text) noexcept {
  const std::size_t compared = std::min(text.size(), FORMAT_NAME.size());
  return text.substr(0, compared) == FORMAT_NAME.substr(0, compared);
}

std::string WriteCacheText(const CacheBinding &binding, const SamlToken &token) {
  const std::string &xml = token.ToXml();
  std::string text = BindingText(binding);
  AppendLine(text, "token", token.GetId());
  AppendLine(text, "end", token.GetEndDate().ToString());
  AppendLine(text, "octets", std::to_string(xml.size()));
  return text.append(xml).append(LAST_LINE);
}

boost::optional<CachedToken> FindCachedToken(std::string_view text, const CacheBinding &binding) {
  CachedToken token;
  std::string_view end;
  std::string_view octets;
  if (!Take(text, BindingText(binding)) || !TakeLine(text, TOKEN_LINE, token.id) || !TakeLine(text, END_LINE, end) ||
      !TakeLine(text, OCTETS_LINE, octets)) {
    return boost::none;
  }
  const std::size_t length = text.size() - std::min(text.size(), LAST_LINE.size());
  token.xml = text.substr(0, length);
  if (octets != std::to_string(length) || text.substr(length) != LAST_LINE) {
    return boost::none;
  }
  return token;
}

} // namespace SsoClient
