// SPDX-License-Identifier: Apache-2.0
/// @file
/// The JSON of a checked message.

#include "json_array.h"
#include "message_view.h"
#include "time_text.h"

#include <nlohmann/json.hpp>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;

Json OrNull(const boost::optional<Tarvel::System::DateTime> &time) {
  return time ? Json(UtcText(*time)) : Json(nullptr);
}

Json CheckJson(const MessageReport::CheckResult &result) {
  return {{"name", GetCheckName(result.check)},
          {"outcome", GetOutcomeName(result.outcome)},
          {"summary", result.summary},
          {"findings", JsonArrayOf(result.findings, FindingJson)}};
}

Json ReportJson(const MessageReport &report) {
  return {{"accepted", report.accepted},
          {"refusal", report.refusal.empty() ? Json(nullptr) : Json(report.refusal)},
          {"checks", JsonArrayOf(report.checks, CheckJson)},
          {"covered", report.covered},
          {"token", report.token ? ReportJson(ReportView{*report.token}) : Json(nullptr)}};
}

/// Callers rely on the keys and their order: a change to either needs a new "schema".
Json MessageFactsJson(const AcceptedMessage *message) {
  return {{"proof", message ? Json(GetProofName(message->proof)) : Json(nullptr)},
          {"covered", message ? Json(message->covered) : Json::array()},
          {"created", message ? OrNull(message->created) : Json(nullptr)},
          {"expires", message ? OrNull(message->expires) : Json(nullptr)},
          {"replay", message ? Json(ReplayText(message->replay)) : Json(nullptr)},
          {"token", message ? TokenJsonObject(message->token) : Json(nullptr)}};
}

} // namespace

std::string MessageJson(const MessageView &view) {
  Json json = {{"schema", 1}, {"verified", view.accepted.has_value()}};
  json.update(MessageFactsJson(view.accepted.get_ptr()));
  if (view.report) {
    json["report"] = ReportJson(*view.report);
  }
  // Everything except ASCII is escaped, so that the text cannot control a terminal. A cut in a report may have split a
  // character.
  return json.dump(2, ' ', true, Json::error_handler_t::replace);
}

} // namespace SsoClient::Tool
