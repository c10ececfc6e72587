// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a request asked for and the issued token does not have.

#pragma once

#include "token_facts.h"

#include <ssoclient/service_dialect.h>
#include <ssoclient/token_spec.h>
#include <tarvel/system/date_time.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient::Tool {

struct UnmetRequest {
  std::string_view key; ///< "delegation", "renewable", "delegable", "advice", "audience" or "lifetime"
  std::string wanted;   ///< what was asked for and what the token has instead, as text
};

/// What `spec` asks for and `facts` do not have, in the order of the keys above. An empty fact counts as missing.
/// @param dialect of the request. `wst:OnBehalfOf` asks for a token about the other party, without a delegation.
///        `wst14:ActAs` is not checked: the standard does not say where a token names that party. The token may also be
///        restricted to the address in `wsp:AppliesTo`.
/// @param askedAt when the request was sent, by this machine's clock
/// @param toleranceSec how far apart the clocks of this machine and of the service may be; limited to the range from 0
///        to `DEFAULT_CLOCK_TOLERANCE_SEC`
std::vector<UnmetRequest> FindUnmet(const TokenSpec &spec, const ServiceDialect &dialect,
                                    const Tarvel::System::DateTime &askedAt, const TokenFacts &facts,
                                    std::int64_t toleranceSec);

} // namespace SsoClient::Tool
