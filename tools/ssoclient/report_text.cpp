// SPDX-License-Identifier: Apache-2.0
/// @file
/// The text of a report, for people.

#include "labelled_lines.h"
#include "output.h"
#include "report_view.h"
#include "table.h"
#include "time_text.h"

#include <algorithm>
#include <string_view>

namespace SsoClient::Tool {
namespace {

using Outcome = TokenReport::Outcome;

constexpr const char *DETAIL = "\n  "; ///< begins an indented line of a cell

Colour ColourOf(Outcome outcome) noexcept {
  if (outcome == Outcome::NOT_DONE) {
    return Colour::YELLOW;
  }
  return outcome == Outcome::PASSED ? Colour::GREEN : Colour::RED;
}

/// A part of a finding in its own line, or nothing if there is no such part.
std::string LineUnlessEmpty(std::string_view label, std::string_view value) {
  return value.empty() ? std::string() : DETAIL + std::string(label) + PrintableValue(value);
}

/// The place in one line, such as "line 3, column 5: /saml2:Assertion, attribute Version".
std::string PlaceText(const TokenReport::Finding &finding) {
  std::string text = PrintableValue(finding.path.empty() ? finding.element : finding.path);
  if (!finding.attribute.empty()) {
    text += ", attribute " + PrintableValue(finding.attribute);
  }
  if (finding.line > 0) {
    const std::string column = finding.column > 0 ? ", column " + std::to_string(finding.column) : "";
    text = "line " + std::to_string(finding.line) + column + (text.empty() ? "" : ": ") + text;
  }
  return text.empty() ? text : DETAIL + text;
}

/// @param isRepeated whether the finding before has the same remedy
Table::Row FindingRow(const TokenReport::Finding &finding, bool isRepeated) {
  std::string found = PrintableValue(finding.message) + PlaceText(finding) +
                      LineUnlessEmpty("wanted: ", finding.wanted) + LineUnlessEmpty("found: ", finding.found);
  if (finding.missedBySec != 0) {
    found += DETAIL + ("missed by " + SpanText(finding.missedBySec));
  }
  return {Cell{}, Cell{}, Cell{std::move(found)}, Cell{isRepeated ? "" : PrintableValue(finding.remedy)}};
}

void AddCheck(const TokenReport::CheckResult &result, Table &table) {
  table.Add({Cell{GetCheckName(result.check)}, Cell{GetOutcomeName(result.outcome), ColourOf(result.outcome)},
             Cell{PrintableValue(result.summary)}, Cell{}});
  const std::string *remedy = nullptr;
  for (const TokenReport::Finding &finding : result.findings) {
    table.Add(FindingRow(finding, remedy && *remedy == finding.remedy));
    remedy = &finding.remedy;
  }
  if (result.unlistedFindings > 0) {
    table.Add({Cell{}, Cell{}, Cell{"and " + std::to_string(result.unlistedFindings) + " more findings"}, Cell{}});
  }
}

/// Whether the check needs trusted certificates or demands, which only `verify` has.
bool NeedsCaller(TokenReport::Check check) noexcept {
  using Check = TokenReport::Check;
  return check == Check::KEYS || check == Check::SIGNATURE || check == Check::AUDIENCE ||
         check == Check::REQUIRED_CONFIRMATION;
}

/// Whether the check is shown. Without trust, it is shown only if it has failed, or if an earlier failure left nothing
/// to check.
bool IsShown(const TokenReport::CheckResult &result, bool usesTrust) noexcept {
  return usesTrust || (result.outcome != Outcome::PASSED && !NeedsCaller(result.check));
}

std::string DigestText(const TokenReport::Reference &reference) {
  if (reference.digestComputed.empty()) {
    return "digest not computed";
  }
  return reference.digestMatches ? "digest as signed"
                                 : "digest " + reference.digestComputed + ", signed: " + reference.digestWanted;
}

void AddReference(const TokenReport::Reference &reference, LabelledLines &lines) {
  lines.Add("Reference:", reference.uri.empty() ? "(the document)" : reference.uri);
  const std::string target = reference.target.empty() ? "its target" : reference.target;
  lines.Add("", !reference.resolves     ? "resolves to no single element"
                : reference.coversToken ? target + ", covers the token"
                                        : target + ", does not cover the token");
  lines.Add("", DigestText(reference));
  lines.AddUnlessEmpty("", reference.digestMethod);
  for (const std::string &transform : reference.transforms) {
    lines.AddUnlessEmpty("", transform);
  }
}

void AddKey(const TokenReport::TrustedKey &key, bool hasAlgorithm, LabelledLines &lines) {
  lines.Add("Trusted key:", key.subject);
  lines.Add("", "SHA-256 " + key.thumbprint);
  lines.Add("", key.madeSignature ? "made the signature"
                : key.isUsable    ? "did not make the signature"
                : hasAlgorithm    ? "cannot be used with the signature's algorithm"
                                  : "was not tried, because the signature's algorithm is not known");
}

void AddNamedCertificate(const TokenReport::NamedCertificate &certificate, bool usesTrust, LabelledLines &lines) {
  lines.Add("In the token:", certificate.subject.empty() ? "a certificate that cannot be read" : certificate.subject);
  if (!certificate.thumbprint.empty()) {
    lines.Add("", "SHA-256 " + certificate.thumbprint);
  }
  if (usesTrust) {
    lines.Add("", certificate.isTrusted ? "is trusted" : "is not trusted, and was not used");
  }
}

/// The claims that the token's own lines do not show: the issuer, the time of issue, and names and methods as written.
void AddClaims(const UnverifiedClaims &claims, LabelledLines &lines) {
  lines.AddUnlessEmpty("Issuer:", claims.issuer.value_or(""));
  lines.AddUnlessEmpty("Issued:", claims.issueInstant ? UtcText(*claims.issueInstant) : "");
  lines.AddUnlessEmpty("Name:", claims.nameId.value_or(""));
  lines.AddUnlessEmpty("Name format:", claims.nameIdFormat.value_or(""));
  lines.AddUnlessEmpty("Method:", claims.confirmationMethod.value_or(""));
}

} // namespace

std::string ReportText(const ReportView &view, const TextStyle &style) {
  const TokenReport &report = view.report;
  LabelledLines lines;
  AddClaims(report.claims, lines);
  lines.AddUnlessEmpty("Signature:", report.signatureAlgorithm);
  lines.AddUnlessEmpty("", report.canonicalization);
  for (const TokenReport::Reference &reference : report.references) {
    AddReference(reference, lines);
  }
  for (const TokenReport::TrustedKey &key : report.trustedKeys) {
    AddKey(key, !report.signatureAlgorithm.empty(), lines);
  }
  for (const TokenReport::NamedCertificate &certificate : report.namedCertificates) {
    AddNamedCertificate(certificate, view.usesTrust, lines);
  }

  Table table({"Check", "Outcome", "What was found", "What to do"});
  const auto isShown = [&](const auto &result) { return IsShown(result, view.usesTrust); };
  const bool hasRows = std::any_of(report.checks.begin(), report.checks.end(), isShown);
  for (const TokenReport::CheckResult &result : report.checks) {
    if (isShown(result)) {
      AddCheck(result, table);
    }
  }
  std::string text = lines.Get();
  if (hasRows) {
    text += (text.empty() ? "" : "\n") + table.Write(style);
  }
  return text;
}

} // namespace SsoClient::Tool
