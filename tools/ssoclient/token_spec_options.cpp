// SPDX-License-Identifier: Apache-2.0

#include "token_spec_options.h"

#include "exit_code.h"
#include "option.h"

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <system_error>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Token";
constexpr std::int64_t DAY_SEC = 24 * 60 * 60;
constexpr std::int64_t MAX_LIFETIME_SEC = 100 * 366 * DAY_SEC;

/// The seconds of a unit; 0 for an unknown unit.
std::int64_t UnitSeconds(std::string_view unit) {
  if (unit.empty() || unit == "s") {
    return 1;
  }
  return unit == "m" ? 60 : unit == "h" ? 60 * 60 : unit == "d" ? DAY_SEC : 0;
}

struct AdviceText {
  std::string source;
  std::string name;
  std::string value;
};

/// Splits SOURCE:NAME=VALUE and removes the backslashes.
AdviceText SplitAdvice(const std::string &text) {
  std::string plain;
  std::size_t colon = std::string::npos;
  std::size_t equals = std::string::npos;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const bool isEscaped = text[i] == '\\' && i + 1 < text.size();
    if (isEscaped) {
      ++i;
    } else if (text[i] == '=' && equals == std::string::npos) {
      equals = plain.size();
    } else if (text[i] == ':' && equals == std::string::npos) {
      colon = plain.size();
    }
    plain += text[i];
  }
  const bool isWhole = colon != std::string::npos && equals != std::string::npos;
  // A token cannot have an empty value.
  if (!isWhole || colon == 0 || equals == colon + 1 || equals + 1 == plain.size()) {
    throw UsageException("--advice '" + text + "' is not of the form SOURCE:NAME=VALUE");
  }
  return {plain.substr(0, colon), plain.substr(colon + 1, equals - colon - 1), plain.substr(equals + 1)};
}

/// The element of `list` whose `key` is `value`; added when there is none.
template <typename Element>
Element &FindOrAdd(std::vector<Element> &list, std::string Element::*key, const std::string &value) {
  const auto found = std::find_if(list.begin(), list.end(), [&](const Element &e) { return e.*key == value; });
  if (found != list.end()) {
    return *found;
  }
  list.emplace_back();
  list.back().*key = value;
  return list.back();
}

} // namespace

void AddLifetimeOption(CLI::App &app, std::string &lifetime) {
  AddOption(app, "--lifetime", lifetime, "Lifetime to ask for: a number and s, m, h or d")
      .ShowDefault()
      .TypeName("TIME")
      .Group(GROUP);
}

void AddTokenSpecOptions(CLI::App &app, TokenSpecOptions &options) {
  AddLifetimeOption(app, options.lifetime);
  AddOption(app, "--audience", options.audience, "Service that may accept the token; may be repeated")
      .TypeName("URI")
      .Group(GROUP);
  AddOption(app, "--delegate-to", options.delegateTo, "Principal that may act for the subject with the token")
      .TypeName("NAME")
      .Group(GROUP);
  AddFlag(app, "--delegable", options.delegable, "Ask for a token that may be delegated").Group(GROUP);
  AddFlag(app, "--renewable", options.renewable, "Ask for a token that may be renewed").Group(GROUP);
  AddFlag(app, "--bearer", options.bearer, "Even with an identity, ask for a bearer token, which needs no key")
      .Group(GROUP);
  AddOption(app, "--advice", options.advice,
            "Advice to put into the token; may be repeated; put a backslash before a colon that is part of NAME")
      .TypeName("SOURCE:NAME=VALUE")
      .Group(GROUP);
}

std::int64_t ParseLifetime(std::string_view text) {
  std::int64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  const std::size_t digits = static_cast<std::size_t>(end - text.data());
  const std::int64_t unit = UnitSeconds(text.substr(digits));
  // No message repeats the text: it may be a secret in the wrong place.
  if ((error != std::errc() && error != std::errc::result_out_of_range) || digits == 0 || unit == 0) {
    throw UsageException("--lifetime must be a duration such as 8h (units: s, m, h, d)");
  }
  if (error == std::errc() && number <= 0) {
    throw UsageException("--lifetime must be positive");
  }
  if (error != std::errc() || number > MAX_LIFETIME_SEC / unit) {
    throw UsageException("--lifetime must be at most a hundred years");
  }
  return number * unit;
}

std::vector<Advice> ParseAdvice(const std::vector<std::string> &texts) {
  std::vector<Advice> all;
  for (const std::string &text : texts) {
    const AdviceText parts = SplitAdvice(text);
    Advice &advice = FindOrAdd(all, &Advice::source, parts.source);
    FindOrAdd(advice.attributes, &AdviceAttribute::name, parts.name).values.push_back(parts.value);
  }
  return all;
}

TokenSpec ToTokenSpec(const TokenSpecOptions &options) {
  TokenSpec spec;
  spec.tokenLifetimeSec = ParseLifetime(options.lifetime);
  spec.audienceRestriction.insert(options.audience.begin(), options.audience.end());
  spec.advice = ParseAdvice(options.advice);
  spec.delegable = options.delegable;
  if (!options.delegateTo.empty()) {
    spec.delegateTo = options.delegateTo;
  }
  spec.renewable = options.renewable;
  spec.confirmation = options.bearer ? TokenSpec::CONFIRMATION_NONE : TokenSpec::CONFIRMATION_DEFAULT;
  return spec;
}

} // namespace SsoClient::Tool
