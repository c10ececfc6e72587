// SPDX-License-Identifier: Apache-2.0
/// @file
/// The JSON of a report.

#include "json_array.h"
#include "report_view.h"
#include "time_text.h"

#include <boost/optional.hpp>
#include <nlohmann/json.hpp>

#include <cstdint>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;

Json OrNull(const std::string &text) {
  return text.empty() ? Json(nullptr) : Json(text);
}

Json OrNull(const boost::optional<std::string> &text) {
  return text ? Json(*text) : Json(nullptr);
}

Json OrNull(std::int64_t number) {
  return number == 0 ? Json(nullptr) : Json(number);
}

Json CheckJson(const TokenReport::CheckResult &result) {
  return {{"name", GetCheckName(result.check)},
          {"outcome", GetOutcomeName(result.outcome)},
          {"summary", result.summary},
          {"findings", JsonArrayOf(result.findings, FindingJson)},
          {"unlistedFindings", result.unlistedFindings}};
}

Json ReferenceJson(const TokenReport::Reference &reference) {
  return {{"uri", reference.uri},
          {"resolves", reference.resolves},
          {"coversToken", reference.coversToken},
          {"target", OrNull(reference.target)},
          {"transforms", reference.transforms},
          {"digestMethod", OrNull(reference.digestMethod)},
          {"digestWanted", OrNull(reference.digestWanted)},
          {"digestComputed", OrNull(reference.digestComputed)},
          {"digestMatches", reference.digestMatches}};
}

Json KeyJson(const TokenReport::TrustedKey &key) {
  return {{"subject", key.subject},
          {"sha256", key.thumbprint},
          {"named", key.isNamed},
          {"usable", key.isUsable},
          {"madeSignature", key.madeSignature}};
}

/// Without trusted certificates, "trusted" is null, because the answer is not known.
Json NamedCertificateJson(const TokenReport::NamedCertificate &certificate, bool usesTrust) {
  return {{"subject", OrNull(certificate.subject)},
          {"sha256", OrNull(certificate.thumbprint)},
          {"trusted", usesTrust ? Json(certificate.isTrusted) : Json(nullptr)}};
}

/// The claims that have no key outside the report.
Json ClaimsJson(const UnverifiedClaims &claims) {
  return {{"issuer", OrNull(claims.issuer)},
          {"issueInstant", claims.issueInstant ? Json(UtcText(*claims.issueInstant)) : Json(nullptr)},
          {"nameId", OrNull(claims.nameId)},
          {"nameIdFormat", OrNull(claims.nameIdFormat)},
          {"confirmationMethod", OrNull(claims.confirmationMethod)}};
}

} // namespace

nlohmann::ordered_json FindingJson(const TokenReport::Finding &finding) {
  return {{"message", finding.message},
          {"element", OrNull(finding.element)},
          {"attribute", OrNull(finding.attribute)},
          {"path", OrNull(finding.path)},
          {"line", OrNull(finding.line)},
          {"column", OrNull(finding.column)},
          {"wanted", OrNull(finding.wanted)},
          {"found", OrNull(finding.found)},
          {"missedBySec", OrNull(finding.missedBySec)},
          {"remedy", OrNull(finding.remedy)}};
}

nlohmann::ordered_json ReportJson(const ReportView &view) {
  const TokenReport &report = view.report;
  return {{"accepted", view.usesTrust ? Json(report.accepted) : Json(nullptr)},
          {"refusal", OrNull(report.refusal)},
          {"checkedAt", UtcText(report.checkedAt)},
          {"checks", JsonArrayOf(report.checks, CheckJson)},
          {"algorithm", OrNull(report.signatureAlgorithm)},
          {"canonicalization", OrNull(report.canonicalization)},
          {"references", JsonArrayOf(report.references, ReferenceJson)},
          {"keys", JsonArrayOf(report.trustedKeys, KeyJson)},
          {"namedCertificates",
           JsonArrayOf(report.namedCertificates,
                       [&](const auto &certificate) { return NamedCertificateJson(certificate, view.usesTrust); })},
          {"claims", ClaimsJson(report.claims)}};
}

} // namespace SsoClient::Tool
