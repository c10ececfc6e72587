// SPDX-License-Identifier: Apache-2.0
/// @file
/// The JSON of a token's details.

#include "details_view.h"
#include "json_array.h"
#include "time_text.h"

#include <tarvel/core/string_util.h>

#include <nlohmann/json.hpp>

#include <cstddef>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;

Json ToJson(const std::string &text) {
  return text;
}

Json ToJson(std::uint64_t number) {
  return number;
}

Json ToJson(const Tarvel::System::DateTime &time) {
  return UtcText(time);
}

// Declared here, because the template finds only functions that are declared before it.
Json ToJson(const NameId &nameId);
Json ToJson(const ProxyDetails &proxy);

template <typename Value>
Json OrNull(const boost::optional<Value> &value) {
  return value ? ToJson(*value) : Json(nullptr);
}

Json ToJson(const NameId &nameId) {
  return {{"value", nameId.value},
          {"format", OrNull(nameId.format)},
          {"nameQualifier", OrNull(nameId.nameQualifier)},
          {"spNameQualifier", OrNull(nameId.spNameQualifier)},
          {"spProvidedId", OrNull(nameId.spProvidedId)}};
}

Json ToJson(const Tarvel::Ref<const Tarvel::Crypto::Certificate> &certificate) {
  return certificate ? Json{{"subject", certificate->GetSubject()}, {"sha256", certificate->GetSha256Thumbprint()}}
                     : Json(nullptr);
}

Json ConfirmationJson(const ConfirmationDetails &confirmation, bool isUsed) {
  const std::vector<std::uint8_t> &key = confirmation.publicKey;
  return {{"method", confirmation.method},
          {"used", isUsed},
          {"nameId", OrNull(confirmation.nameId)},
          {"notBefore", OrNull(confirmation.notBefore)},
          {"notOnOrAfter", OrNull(confirmation.notOnOrAfter)},
          {"recipient", OrNull(confirmation.recipient)},
          {"inResponseTo", OrNull(confirmation.inResponseTo)},
          {"address", OrNull(confirmation.address)},
          {"certificate", ToJson(confirmation.certificate)},
          {"publicKey", key.empty() ? Json(nullptr) : Json(Tarvel::StringUtil::Base64Encode(key.data(), key.size()))}};
}

Json ConfirmationsJson(const TokenDetails &details) {
  Json array = Json::array();
  for (std::size_t index = 0; index < details.confirmations.size(); ++index) {
    array.push_back(ConfirmationJson(details.confirmations[index], index == details.usedConfirmation));
  }
  return array;
}

Json ToJson(const ProxyDetails &proxy) {
  return {{"count", OrNull(proxy.count)}, {"audiences", proxy.audiences}};
}

Json StatementJson(const AuthnStatementDetails &statement) {
  return {{"authnInstant", ToJson(statement.authnInstant)},
          {"sessionIndex", OrNull(statement.sessionIndex)},
          {"sessionNotOnOrAfter", OrNull(statement.sessionNotOnOrAfter)},
          {"localityAddress", OrNull(statement.localityAddress)},
          {"localityDnsName", OrNull(statement.localityDnsName)},
          {"contextClass", OrNull(statement.contextClass)},
          {"contextDeclaration", OrNull(statement.contextDeclaration)},
          {"authenticatingAuthorities", statement.authenticatingAuthorities}};
}

Json ValueJson(const AttributeValue &value) {
  return {{"text", value.text}, {"xml", value.isXml}, {"nil", value.isNil}};
}

Json AttributeJson(const SamlAttribute &attribute) {
  return {{"name", attribute.name},
          {"nameFormat", OrNull(attribute.nameFormat)},
          {"friendlyName", OrNull(attribute.friendlyName)},
          {"values", JsonArrayOf(attribute.values, ValueJson)}};
}

/// All keys are in this one place, because callers rely on the keys and their order.
Json DetailsJson(const TokenDetails &details) {
  return {{"nameId", ToJson(details.subject)},
          {"issuer", ToJson(details.issuer)},
          {"issueInstant", ToJson(details.issueInstant)},
          {"confirmations", ConfirmationsJson(details)},
          {"audienceRestrictions", details.audienceRestrictions},
          {"oneTimeUse", details.isOneTimeUse},
          {"proxyRestriction", OrNull(details.proxyRestriction)},
          {"authnStatements", JsonArrayOf(details.authnStatements, StatementJson)},
          {"attributes", JsonArrayOf(details.attributes, AttributeJson)}};
}

} // namespace

void AddDetails(const boost::optional<TokenDetails> &details, Json &json) {
  Json keys = DetailsJson(details.value_or(TokenDetails()));
  if (!details) {
    for (auto &value : keys) {
      value = nullptr;
    }
  }
  json.update(keys);
}

} // namespace SsoClient::Tool
