// SPDX-License-Identifier: Apache-2.0
/// @file
/// What was asked of the service for a token, and is not in the token that it issued.

#pragma once

#include "token/token_facts.h"

#include <ssoclient/token_spec.h>
#include <tarvel/system/date_time.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient::Tool {

struct UnmetRequest {
  std::string_view key; ///< "delegation", "renewable", "delegable", "advice", "audience" or "lifetime"
  std::string wanted;   ///< what was asked for and what the token has instead, for a person
};

/// What `spec` asks for beyond what `facts` have, in the order of the keys above. The properties are those that the
/// manual lists for "unmet".
/// @param askedAt when the request was sent, by this machine's clock
/// @param toleranceSec how far the clocks of this machine and of the service may be apart; counts as at least 0 and at most
///        `DEFAULT_CLOCK_TOLERANCE_SEC`
std::vector<UnmetRequest> FindUnmet(const TokenSpec &spec, const Tarvel::System::DateTime &askedAt,
                                    const TokenFacts &facts, std::int64_t toleranceSec);

} // namespace SsoClient::Tool
