// SPDX-License-Identifier: Apache-2.0
/// @file
/// The JSON of a token.

#include "details_view.h"
#include "json_array.h"
#include "time_text.h"
#include "token_view.h"

#include <nlohmann/json.hpp>

#include <string_view>
#include <utility>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;

Json ToJson(const std::string &text) {
  return text;
}

Json ToJson(bool flag) {
  return flag;
}

Json ToJson(const Tarvel::System::DateTime &time) {
  return UtcText(time);
}

Json ToJson(SamlToken::ConfirmationType confirmation) {
  return ConfirmationText(confirmation);
}

Json ToJson(const PrincipalId &principal) {
  return {{"name", principal.name}, {"domain", principal.domain}};
}

Json ToJson(const std::pair<std::string, std::string> &fullName) {
  return {{"first", fullName.first}, {"last", fullName.second}};
}

Json ToJson(const CertificateFacts &certificate) {
  return {{"subject", certificate.subject}, {"sha256", certificate.sha256}};
}

Json ToJson(const Delegate &delegate) {
  Json json = ToJson(delegate.subject);
  json["instant"] = UtcText(delegate.delegationInstant);
  return json;
}

Json ToJson(const Advice &advice) {
  Json attributes = Json::array();
  for (const AdviceAttribute &attribute : advice.attributes) {
    attributes.push_back({{"name", attribute.name}, {"values", attribute.values}});
  }
  return {{"source", advice.source}, {"attributes", std::move(attributes)}};
}

template <typename Value>
Json OrNull(const boost::optional<Value> &value) {
  return value ? ToJson(*value) : Json(nullptr);
}

template <typename Items>
Json ArrayOf(const Items &items) {
  return JsonArrayOf(items, [](const auto &item) { return ToJson(item); });
}

/// These keys and those of `AddDetails` are in one place each, because callers rely on the keys and their order: a change
/// to either needs a new "schema".
Json BasicFactsJson(const TokenFacts &facts) {
  return {{"id", OrNull(facts.id)},
          {"subject", OrNull(facts.subject)},
          {"confirmation", OrNull(facts.confirmation)},
          {"notBefore", OrNull(facts.startDate)},
          {"notOnOrAfter", OrNull(facts.endDate)},
          {"renewable", OrNull(facts.renewable)},
          {"delegable", OrNull(facts.delegable)},
          {"solution", OrNull(facts.solution)},
          {"fullName", OrNull(facts.fullName)},
          {"groups", ArrayOf(facts.groups)},
          {"delegation", ArrayOf(facts.delegationChain)},
          {"audience", ArrayOf(facts.audience)},
          {"advice", ArrayOf(facts.advice)},
          {"certificate", OrNull(facts.certificate)}};
}

Json FactsJson(const TokenFacts &facts) {
  Json json = BasicFactsJson(facts);
  AddDetails(facts.details, json);
  return json;
}

/// `facts` with null for every value.
Json AllNull(Json facts) {
  for (auto &value : facts) {
    value = nullptr;
  }
  return facts;
}

} // namespace

nlohmann::ordered_json TokenJsonObject(const TokenView &view) {
  Json json = {{"schema", 1}, {"verified", view.verified}};
  json.update(view.facts ? FactsJson(*view.facts) : AllNull(FactsJson({})));
  if (view.unmet) {
    json["unmet"] = Json::array();
    for (const UnmetRequest &request : *view.unmet) {
      json["unmet"].push_back(request.key);
    }
  }
  if (view.report) {
    json["report"] = ReportJson(*view.report);
  }
  return json;
}

std::string TokenJson(const TokenView &view) {
  // Everything except ASCII is escaped, so that the text cannot control a terminal. A cut in a report may have split a
  // character.
  return TokenJsonObject(view).dump(2, ' ', true, Json::error_handler_t::replace);
}

} // namespace SsoClient::Tool
