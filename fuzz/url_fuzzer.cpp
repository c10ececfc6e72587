// SPDX-License-Identifier: Apache-2.0
/// @file
/// URLs: an accepted URL, written again from its parts, gives the same parts; the host is what follows the scheme; no
/// part can end the line in which it is sent. libxml2 agrees on whether a text is a URI reference, and on its parts.

#include "core/uri_reference.h"
#include "unit/tarvel_core/uri_oracle.h"

#include <tarvel/http/url.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

namespace {

using Tarvel::Http::MalformedURLException;
using Tarvel::Http::ParseHttpURL;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

struct Parts {
  bool isSecure = false;
  std::string host;
  int port = 0;
  std::string path;
};

bool Parse(std::string_view url, Parts &parts) {
  try {
    ParseHttpURL(url, parts.isSecure, parts.host, parts.port, parts.path);
    return true;
  } catch (const MalformedURLException &refusal) {
    Require(*refusal.what() != '\0');
    return false;
  }
}

void RequireSafe(const Parts &parts) {
  const auto isVisible = [](char c) { return c > ' ' && c < 0x7F; };
  Require(!parts.host.empty() && std::all_of(parts.host.begin(), parts.host.end(), isVisible));
  Require(parts.host.find_first_of("/?#@[]%") == std::string::npos);
  Require(parts.port >= 1 && parts.port <= 65535);
  Require(!parts.path.empty() && parts.path.front() == '/');
  Require(std::all_of(parts.path.begin(), parts.path.end(), isVisible));
  Require(parts.path.find('#') == std::string::npos);
}

std::string Write(const Parts &parts) {
  const bool isV6 = parts.host.find(':') != std::string::npos;
  const std::string host = isV6 ? "[" + parts.host + "]" : parts.host;
  return (parts.isSecure ? "https://" : "http://") + host + ":" + std::to_string(parts.port) + parts.path;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const std::string_view url(reinterpret_cast<const char *>(data), size);
  if (url.find('\0') == std::string_view::npos) {
    Require(Tarvel::CompareWithLibxml2(std::string(url)).disagreement.empty());
  } else {
    Require(!Tarvel::IsUriReference(url));
  }
  Parts parts;
  if (!Parse(url, parts)) {
    return 0;
  }
  RequireSafe(parts);
  const std::size_t schemeLength = parts.isSecure ? 5 : 4;
  Require(url.substr(schemeLength, 3 + parts.host.size()) == "://" + parts.host ||
          url.substr(schemeLength, 5 + parts.host.size()) == "://[" + parts.host + "]");
  Parts again;
  Require(Parse(Write(parts), again));
  Require(again.isSecure == parts.isSecure && again.host == parts.host);
  Require(again.port == parts.port && again.path == parts.path);
  return 0;
}
