// SPDX-License-Identifier: Apache-2.0
/// @file
/// What kind of token a command line asks for.

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
  std::string delegateTo; ///< empty: nobody
  bool delegable = false;
  bool renewable = false;
  bool bearer = false;
  std::vector<std::string> advice;
};

void AddLifetimeOption(CLI::App &app, std::string &lifetime);
void AddTokenSpecOptions(CLI::App &app, TokenSpecOptions &options);

/// The seconds that a text such as "8h" says: a number, and s, m, h or d, or nothing for seconds.
/// @throws UsageException for any other text, for none, and for more than a hundred years.
std::int64_t ParseLifetime(std::string_view text);

/// The advice that texts of the form SOURCE:NAME=VALUE say. NAME begins after the last colon before the first "="; a
/// backslash takes from the character behind it any such meaning. Values of one name, and names of one source, that stand
/// in several texts are put together, in their order.
/// @throws UsageException for a text that is not of the form.
std::vector<Advice> ParseAdvice(const std::vector<std::string> &texts);

/// @throws UsageException as above.
TokenSpec ToTokenSpec(const TokenSpecOptions &options);

} // namespace SsoClient::Tool
