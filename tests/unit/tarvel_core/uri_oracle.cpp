// SPDX-License-Identifier: Apache-2.0

#include "uri_oracle.h"

#include "core/uri_reference.h"

#include <libxml/uri.h>

#include <algorithm>
#include <limits>
#include <memory>
#include <optional>
#include <string_view>

namespace Tarvel {

namespace {

struct UriDeleter {
  void operator()(xmlURI *uri) const { xmlFreeURI(uri); }
};
using UriHandle = std::unique_ptr<xmlURI, UriDeleter>;

constexpr std::size_t NPOS = std::string::npos;
constexpr int RAW = 1; // nothing is unescaped

bool IsUriOfLibxml2(const std::string &text) {
  return UriHandle(xmlParseURI(text.c_str())) != nullptr;
}

/// Returns `text`, which our parser accepts, with a port that libxml2 accepts, too.
std::string CorrectPort(std::string text, UriComparison &comparison) {
  const std::optional<std::string_view> port = SplitUriReference(text)->port;
  if (!port) {
    return text;
  }
  const std::string_view digits = port->substr(std::min(port->find_first_not_of('0'), port->size()));
  const std::string largest = std::to_string(std::numeric_limits<int>::max());
  comparison.differences[EMPTY_PORT] = port->empty();
  comparison.differences[LARGE_PORT] =
      digits.size() > largest.size() || (digits.size() == largest.size() && digits > largest);
  return text.replace(static_cast<std::size_t>(port->data() - text.data()), port->size(), "1");
}

/// Returns `text`, which libxml2 accepts, with replacements for what the standard does not allow.
std::string CorrectBrackets(std::string text, UriComparison &comparison) {
  const std::size_t slashes = text.find("//");
  const std::size_t open = text.find('[');
  if (slashes < open && open != NPOS && text.find_first_of("/?#", slashes + 2) > open) {
    const std::size_t close = text.find(']', open);
    if (close != NPOS && !IsIpLiteral(text.substr(open, close + 1 - open))) {
      comparison.differences[ADDRESS] = true;
      text.replace(open, close + 1 - open, "[::1]");
    }
  }
  for (std::size_t next = text.find('#'); (next = text.find_first_of("[]", next)) != NPOS;) {
    comparison.differences[BRACKET_IN_FRAGMENT] = true;
    text[next] = 'x';
  }
  return text;
}

std::string_view ToView(const char *text) {
  return text ? text : "";
}

/// libxml2 distinguishes an empty part from a missing one only if it is the query or the fragment.
bool HasEqualParts(const std::string &text) {
  const UriHandle theirs(xmlParseURIRaw(text.c_str(), RAW));
  const std::optional<UriReference> ours = SplitUriReference(text);
  if (!theirs || !ours) {
    return false;
  }
  const bool hasReadPort = ours->port && !ours->host->empty(); // libxml2 has no port without a host
  return ours->scheme.value_or("") == ToView(theirs->scheme) &&
         ours->userInformation.value_or("") == ToView(theirs->user) &&
         ours->host.value_or("") == ToView(theirs->server) && ours->path == ToView(theirs->path) &&
         (!hasReadPort || std::stoi(std::string(*ours->port)) == theirs->port) &&
         ours->query.has_value() == (theirs->query_raw != nullptr) &&
         ours->query.value_or("") == ToView(theirs->query_raw) &&
         ours->fragment.has_value() == (theirs->fragment != nullptr) &&
         ours->fragment.value_or("") == ToView(theirs->fragment);
}

} // namespace

UriComparison CompareWithLibxml2(const std::string &text) {
  UriComparison comparison;
  comparison.isUriReference = IsUriReference(text);
  const bool isTheirs = IsUriOfLibxml2(text);
  if (comparison.isUriReference && isTheirs) {
    comparison.disagreement = HasEqualParts(text) ? "" : "other parts than libxml2's: " + text;
  } else if (comparison.isUriReference && !IsUriOfLibxml2(CorrectPort(text, comparison))) {
    comparison.disagreement = "accepted, unlike by libxml2: " + text;
  } else if (isTheirs && !IsUriReference(CorrectBrackets(text, comparison))) {
    comparison.disagreement = "refused, unlike by libxml2: " + text;
  }
  return comparison;
}

} // namespace Tarvel
