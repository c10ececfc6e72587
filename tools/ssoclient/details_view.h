// SPDX-License-Identifier: Apache-2.0
/// @file
/// The written forms of what a token states beyond its basic facts.

#pragma once

#include "labelled_lines.h"

#include <ssoclient/token_details.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>
#include <nlohmann/json_fwd.hpp>

namespace SsoClient::Tool {

/// Adds the keys of `details` to the object `json`, each with null if there are no details.
void AddDetails(const boost::optional<TokenDetails> &details, nlohmann::ordered_json &json);

/// Adds lines about the confirmation that is used, and about those that are not used.
void AddConfirmationLines(const TokenDetails &details, LabelledLines &lines);

/// Adds lines about what only few tokens have: sessions, restrictions of use, and attributes without a line elsewhere.
void AddDetailLines(const TokenDetails &details, const Tarvel::System::DateTime &now, LabelledLines &lines);

} // namespace SsoClient::Tool
