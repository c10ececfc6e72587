// SPDX-License-Identifier: Apache-2.0
/// @file
/// The token that a command line asks for.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

constexpr const char *DEFAULT_LIFETIME = "8h";

struct TokenSpecOptions {
  std::string lifetime = DEFAULT_LIFETIME;
  std::vector<std::string> audience;
  std::string delegateTo; ///< empty: no delegation
  bool delegable = false;
  bool renewable = false;
  bool bearer = false;
  std::vector<std::string> advice;
};

void AddLifetimeOption(CLI::App &app, std::string &lifetime);
void AddTokenSpecOptions(CLI::App &app, TokenSpecOptions &options);

/// The seconds of a text such as "8h": a number, followed by s, m, h or d; without a unit, seconds.
/// @throws UsageException for any other text, an empty one included, for zero or less, and for more than a hundred
///         years.
std::int64_t ParseLifetime(std::string_view text);

/// The advice in texts of the form SOURCE:NAME=VALUE. NAME begins after the last colon before the first "="; a
/// backslash makes the character after it an ordinary one. Values of one name, and names of one source, are
/// collected in their order.
/// @throws UsageException for a text of another form.
std::vector<Advice> ParseAdvice(const std::vector<std::string> &texts);

/// @throws UsageException for a lifetime or an advice that `ParseLifetime` or `ParseAdvice` refuses.
TokenSpec ToTokenSpec(const TokenSpecOptions &options);

} // namespace SsoClient::Tool
