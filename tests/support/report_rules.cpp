// SPDX-License-Identifier: Apache-2.0

#include "support/report_rules.h"

#include "support/printable_text.h"
#include "support/report_texts.h"
#include "support/report_times.h"

#include <tarvel/core/string_util.h>

#include <algorithm>
#include <cstdint>
#include <set>
#include <string_view>
#include <vector>

namespace Testing {

using namespace SsoClient;
using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

namespace {

constexpr std::size_t CHECKS = 14;
constexpr std::size_t MAX_REFERENCES = 10;
constexpr std::size_t MAX_NAMED_CERTIFICATES = 16;
constexpr const char *METHOD_BEARER = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr const char *METHOD_HOLDER_OF_KEY = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";
constexpr std::size_t LONGEST_TEXT = 1024 + 40; // the 40 are for the note that states how much was cut

/// Collects what is wrong. Each rule is a function that is named after its promise.
class Contradictions {
public:
  void Expect(bool holds, const std::string &otherwise) {
    if (!holds) {
      m_text += otherwise + '\n';
    }
  }

  std::string Take() { return std::move(m_text); }

private:
  std::string m_text;
};

bool Passed(const TokenReport &report, Check check) {
  return report.Get(check).outcome == Outcome::PASSED;
}

bool Failed(const TokenReport &report, Check check) {
  return report.Get(check).outcome == Outcome::FAILED;
}

void ExpectAllChecksInOrder(const TokenReport &report, Contradictions &wrong) {
  wrong.Expect(report.checks.size() == CHECKS, "there are " + std::to_string(report.checks.size()) + " checks");
  const TokenReport::CheckResult *firstFailed = nullptr;
  for (std::size_t i = 0; i < report.checks.size(); ++i) {
    const TokenReport::CheckResult &result = report.checks[i];
    const std::string name = GetCheckName(result.check);
    wrong.Expect(static_cast<std::size_t>(result.check) == i, name + " is at position " + std::to_string(i));
    wrong.Expect(&report.Get(static_cast<Check>(i)) == &result, "Get does not return " + name);
    firstFailed = !firstFailed && result.outcome == Outcome::FAILED ? &result : firstFailed;
    wrong.Expect(result.outcome != Outcome::NOT_DONE || firstFailed, name + " is not done although none has failed");
    wrong.Expect(!result.summary.empty(), name + " has no summary");
  }
  wrong.Expect(report.FirstFailed() == firstFailed, "FirstFailed is not the first failed check");
}

void ExpectFindingsOfFailedChecksOnly(const TokenReport &report, Contradictions &wrong) {
  std::size_t listed = 0;
  for (const TokenReport::CheckResult &result : report.checks) {
    const std::string name = GetCheckName(result.check);
    const bool hasFindings = !result.findings.empty() || result.unlistedFindings > 0;
    wrong.Expect(hasFindings == (result.outcome == Outcome::FAILED),
                 name + (hasFindings ? " has findings" : " has no findings") + ", but " +
                     GetOutcomeName(result.outcome));
    listed += result.findings.size();
    // A report reserves one finding for each later check.
    wrong.Expect(result.unlistedFindings == 0 || listed + CHECKS >= TokenReport::MAX_FINDINGS,
                 name + " leaves out findings of a report with " + std::to_string(listed));
    for (const TokenReport::Finding &finding : result.findings) {
      wrong.Expect(!finding.message.empty(), name + " has a finding without a message");
      wrong.Expect(finding.missedBySec >= 0, name + " misses a time by less than nothing");
    }
  }
  wrong.Expect(listed <= TokenReport::MAX_FINDINGS, "there are " + std::to_string(listed) + " findings");
}

void ExpectTheOutcomeOfVerify(const TokenReport &report, const Verification &verification, Contradictions &wrong) {
  const bool accepts = verification.token != nullptr;
  wrong.Expect(verification.exceptionClass != "undocumented", "undocumented exception: " + verification.refusal);
  wrong.Expect(report.accepted == accepts,
               accepts ? "a refusal of what Verify accepts" : "accepts what Verify refuses");
  wrong.Expect(report.refusal == verification.refusal,
               "the refusal is: " + report.refusal.substr(0, 1000) +
                   "\n  but Verify says: " + verification.refusal.substr(0, 1000));
  const bool allPassed = std::all_of(report.checks.begin(), report.checks.end(),
                                     [](const auto &result) { return result.outcome == Outcome::PASSED; });
  wrong.Expect(report.accepted == allPassed, "accepted and the outcomes of the checks contradict each other");
  const TokenReport::CheckResult *const failed = report.FirstFailed();
  wrong.Expect(accepts || (failed && !failed->findings.empty()), "it is refused, but there is no finding");
  if (!accepts && failed && !failed->findings.empty()) {
    using Tarvel::StringUtil;
    wrong.Expect(failed->findings.front().message == StringUtil::Shorten(StringUtil::Printable(verification.refusal)),
                 "the first finding is: " + failed->findings.front().message +
                     "\n  but Verify says: " + verification.refusal.substr(0, 1000));
  }
}

/// Whether a verification whose first failed check is `check` can throw that exception.
bool CanThrow(Check check, const std::string &exceptionClass) {
  switch (check) {
  case Check::WELL_FORMED:
    return exceptionClass == "XMLParseException" || exceptionClass == "XmlSecurityException";
  case Check::ALGORITHMS:
  case Check::KEYS:
  case Check::REFERENCES:
  case Check::SIGNATURE:
  case Check::DIGESTS:
    return exceptionClass == "InvalidSignatureException";
  case Check::FORM:
    return exceptionClass == "ParseException" || exceptionClass == "XmlSecurityException";
  default:
    return exceptionClass == "ParseException";
  }
}

void ExpectTheCheckThatCanThrow(const TokenReport &report, const Verification &verification, Contradictions &wrong) {
  const TokenReport::CheckResult *const failed = report.FirstFailed();
  if (failed) {
    wrong.Expect(CanThrow(failed->check, verification.exceptionClass),
                 std::string(GetCheckName(failed->check)) + " fails, but Verify throws " + verification.exceptionClass);
  }
  if (verification.exceptionClass == "XMLParseException" && failed && !failed->findings.empty()) {
    const TokenReport::Finding &finding = failed->findings.front();
    wrong.Expect(finding.line == verification.line && finding.column == verification.column,
                 "the syntax error has another line or column");
    wrong.Expect(!report.claims.isAssertion, "there are claims of a text that cannot be parsed");
    wrong.Expect(std::count_if(report.checks.begin(), report.checks.end(),
                               [](const auto &result) { return result.outcome == Outcome::NOT_DONE; }) == CHECKS - 1,
                 "checks of a text that cannot be parsed are done");
  }
}

void ExpectShortPrintableTexts(const TokenReport &report, Contradictions &wrong) {
  for (const ReportText &text : PrintableTextsOf(report)) {
    wrong.Expect(IsPrintable(text.text), text.place + " is not printable: " + text.text.substr(0, 200));
    wrong.Expect(text.text.size() <= LONGEST_TEXT, text.place + " has " + std::to_string(text.text.size()) + " bytes");
  }
}

void ExpectWrittenReport(const TokenReport &report, Contradictions &wrong) {
  const std::string written = WriteTokenReport(report);
  wrong.Expect(!written.empty() && written.back() == '\n', "the written report does not end in a line end");
  std::size_t place = 0;
  for (const TokenReport::CheckResult &result : report.checks) {
    place = written.find(GetCheckName(result.check), place);
    wrong.Expect(place != std::string::npos, std::string("the written report lacks ") + GetCheckName(result.check));
    place = std::min(place, written.size());
  }
  std::string_view rest = written;
  for (std::size_t end = rest.find('\n'); end != std::string_view::npos; end = rest.find('\n')) {
    wrong.Expect(IsPrintable(rest.substr(0, end)),
                 "a written line is not printable: " + std::string(rest.substr(0, end)));
    rest.remove_prefix(end + 1);
  }
}

void ExpectConsistentReferences(const TokenReport &report, Contradictions &wrong) {
  wrong.Expect(report.references.size() <= MAX_REFERENCES, "there are too many references");
  for (const TokenReport::Reference &reference : report.references) {
    const bool isEqual = !reference.digestWanted.empty() && reference.digestWanted == reference.digestComputed;
    wrong.Expect(reference.digestMatches == isEqual,
                 "a digest " + reference.digestWanted + " for " + reference.digestComputed + " matches wrongly or not");
    wrong.Expect(reference.resolves || (!reference.coversToken && reference.target.empty()),
                 "a reference that does not resolve has a target");
    wrong.Expect(!Passed(report, Check::REFERENCES) || reference.resolves,
                 "REFERENCES passed, but one does not resolve");
    wrong.Expect(!Passed(report, Check::DIGESTS) || reference.digestMatches, "DIGESTS passed, but one does not match");
  }
  if (Passed(report, Check::DIGESTS)) {
    wrong.Expect(!report.references.empty(), "DIGESTS passed without references");
  }
  if (report.accepted) {
    wrong.Expect(std::any_of(report.references.begin(), report.references.end(),
                             [](const auto &reference) { return reference.coversToken; }),
                 "accepted, but no reference covers the token");
    wrong.Expect(!report.signatureAlgorithm.empty() && !report.canonicalization.empty(), "accepted without algorithms");
  }
}

std::set<std::string> ThumbprintsOf(const Tarvel::Crypto::CertificateList &certificates) {
  std::set<std::string> thumbprints;
  for (const auto &certificate : certificates) {
    if (certificate) {
      thumbprints.insert(certificate->GetSha256Thumbprint());
    }
  }
  return thumbprints;
}

void ExpectConsistentKeys(const TokenReport &report, const JudgedVerifier &verifier, Contradictions &wrong) {
  const std::set<std::string> trusted = ThumbprintsOf(verifier.trusted);
  const std::size_t listed = report.trustedKeys.size();
  wrong.Expect(listed == 0 || listed == trusted.size(), "some trusted keys are missing");
  wrong.Expect(!report.accepted || listed > 0, "accepted, but no trusted keys are listed");
  bool isMade = false;
  bool isUsable = false;
  for (const TokenReport::TrustedKey &key : report.trustedKeys) {
    wrong.Expect(key.certificate != nullptr, "a trusted key has no certificate");
    wrong.Expect(trusted.count(key.thumbprint) == 1, "a key is listed that is not trusted: " + key.thumbprint);
    wrong.Expect(!key.madeSignature || key.isUsable, "a key that cannot be used made the signature");
    isMade = isMade || key.madeSignature;
    isUsable = isUsable || key.isUsable;
  }
  // If KeyInfo selects a trusted key, a verification tries no other key.
  const bool isSelected = std::any_of(report.trustedKeys.begin(), report.trustedKeys.end(),
                                      [](const auto &key) { return key.isNamed && !key.madeSignature; });
  wrong.Expect(!Passed(report, Check::SIGNATURE) || isMade, "SIGNATURE passed, but no key made it");
  wrong.Expect(Passed(report, Check::SIGNATURE) || !isMade || isSelected, "a key made it, but SIGNATURE is not passed");
  wrong.Expect(!Passed(report, Check::KEYS) || isUsable, "KEYS passed, but no key can be used");
  wrong.Expect(report.namedCertificates.size() <= MAX_NAMED_CERTIFICATES, "there are too many named certificates");
  for (const TokenReport::NamedCertificate &named : report.namedCertificates) {
    wrong.Expect(named.isTrusted == (trusted.count(named.thumbprint) == 1), "a named certificate is trusted wrongly");
  }
}

/// Describes the claims that a token has, too. A claim that is unknown gets the value that a token has in its place.
std::string ClaimsLikeAToken(UnverifiedClaims claims) {
  claims.isAssertion = true;
  claims.issuer.reset();
  claims.issueInstant.reset();
  claims.nameId.reset();
  claims.nameIdFormat.reset();
  claims.confirmationMethod.reset();
  claims.certificateSubject.clear();
  claims.fullName = claims.fullName.value_or(std::pair<std::string, std::string>());
  claims.renewable = claims.renewable.value_or(false);
  claims.delegable = claims.delegable.value_or(false);
  claims.solution = claims.solution.value_or(false);
  return DescribeClaims(claims);
}

/// The details of a token, without signatures in attribute values, which a report does not repeat.
TokenDetails DetailsOf(const SamlToken &token) {
  TokenDetails details = GetTokenDetails(token);
  for (SamlAttribute &attribute : details.attributes) {
    for (AttributeValue &value : attribute.values) {
      value.text = value.text.find("SignatureValue") != std::string::npos ? std::string() : value.text;
    }
  }
  return details;
}

UnverifiedClaims ClaimsOf(const SamlToken &token) {
  UnverifiedClaims claims;
  claims.details = DetailsOf(token);
  claims.id = token.GetId();
  claims.subject = token.GetSubject();
  claims.startDate = token.GetStartDate();
  claims.endDate = token.GetEndDate();
  claims.confirmation = token.GetConfirmationMethod();
  claims.renewable = token.IsRenewable();
  claims.delegable = token.IsDelegable();
  claims.solution = token.IsSolution();
  claims.fullName.emplace();
  token.GetFullName(*claims.fullName);
  token.GetGroups(claims.groups);
  token.GetDelegationChain(claims.delegationChain);
  token.GetAudience(claims.audience);
  token.GetAdvice(claims.advice);
  if (token.GetConfirmationCertificate()) {
    claims.certificateThumbprint = token.GetConfirmationCertificate()->GetSha256Thumbprint();
  }
  return claims;
}

void ExpectTheClaimsOfTheToken(const TokenReport &report, const Verification &verification, Contradictions &wrong) {
  if (verification.token) {
    wrong.Expect(report.claims.isAssertion, "accepted, but not an assertion");
    const std::string ofToken = ClaimsLikeAToken(ClaimsOf(*verification.token));
    const std::string ofReport = ClaimsLikeAToken(report.claims);
    wrong.Expect(ofToken == ofReport, "the token says:\n" + ofToken + "but the claims are:\n" + ofReport);
  }
  wrong.Expect(report.claims.isAssertion || DescribeClaims(report.claims) == DescribeClaims(UnverifiedClaims()),
               "there are claims, but no assertion");
}

/// Whether a confirmation was chosen. In the profile STRICT, there is only one, and it is always used.
bool HasUsedConfirmation(const UnverifiedClaims &claims, const VerifyOptions &options) {
  return options.profile == TokenProfile::STRICT ||
         (claims.details && claims.details->usedConfirmation < claims.details->confirmations.size());
}

/// The audiences of each restriction. The profile STRICT allows only one restriction.
std::vector<std::set<std::string>> RestrictionsOf(const UnverifiedClaims &claims) {
  if (claims.details) {
    return claims.details->audienceRestrictions;
  }
  return claims.audience.empty() ? std::vector<std::set<std::string>>()
                                 : std::vector<std::set<std::string>>{claims.audience};
}

bool IsAudienceAccepted(const std::vector<std::set<std::string>> &restrictions, const VerifyOptions &options) {
  if (options.acceptedAudiences.empty() || (restrictions.empty() && options.acceptUnrestrictedAudience)) {
    return true;
  }
  return !restrictions.empty() &&
         std::all_of(restrictions.begin(), restrictions.end(), [&](const std::set<std::string> &audiences) {
           return std::any_of(audiences.begin(), audiences.end(),
                              [&](const auto &one) { return options.acceptedAudiences.count(one) != 0; });
         });
}

/// The confirmation of an accepted token is one that the options allow.
void ExpectAConfirmationThatFits(const TokenReport &report, const VerifyOptions &options, Contradictions &wrong) {
  if (!report.accepted || !report.claims.details) {
    return;
  }
  const TokenDetails &details = *report.claims.details;
  wrong.Expect(details.usedConfirmation < details.confirmations.size(), "accepted without a confirmation");
  if (details.usedConfirmation >= details.confirmations.size()) {
    return;
  }
  const ConfirmationDetails &used = details.confirmations[details.usedConfirmation];
  const bool isBearer = report.claims.confirmation == SamlToken::BEARER;
  wrong.Expect(used.method == (isBearer ? METHOD_BEARER : METHOD_HOLDER_OF_KEY),
               "another method is used: " + used.method);
  wrong.Expect(isBearer == used.publicKey.empty(), "the key does not belong to the method");
  wrong.Expect(options.acceptedRecipients.empty() ||
                   (used.recipient ? options.acceptedRecipients.count(*used.recipient) != 0 : !isBearer),
               "the recipient is not one of those accepted");
  wrong.Expect(!options.expectedInResponseTo ||
                   (used.inResponseTo ? *used.inResponseTo == *options.expectedInResponseTo : !isBearer),
               "the token answers another request");
  wrong.Expect(!options.senderAddress || !used.address || *used.address == *options.senderAddress,
               "the token has another sender");
}

void ExpectTheOptionsToDecide(const TokenReport &report, const VerifyOptions &options, Contradictions &wrong) {
  if (!Passed(report, Check::FORM)) {
    return;
  }
  const bool isAccepted = IsAudienceAccepted(RestrictionsOf(report.claims), options);
  wrong.Expect(Passed(report, Check::AUDIENCE) == isAccepted, "AUDIENCE is not what the options say");
  wrong.Expect(Failed(report, Check::AUDIENCE) != isAccepted, "AUDIENCE is not done");
  const bool isConfirmed =
      HasUsedConfirmation(report.claims, options) &&
      (!options.requiredConfirmation || options.requiredConfirmation == report.claims.confirmation);
  wrong.Expect(Passed(report, Check::REQUIRED_CONFIRMATION) == isConfirmed,
               "the confirmation is not what they require");
  ExpectAConfirmationThatFits(report, options, wrong);
}

} // namespace

std::string FindContradictions(const TokenReport &report, const Verification &verification,
                               const JudgedVerifier &verifier) {
  Contradictions wrong;
  ExpectAllChecksInOrder(report, wrong);
  ExpectTheOutcomeOfVerify(report, verification, wrong);
  if (report.checks.size() != CHECKS) {
    return wrong.Take();
  }
  ExpectFindingsOfFailedChecksOnly(report, wrong);
  ExpectTheCheckThatCanThrow(report, verification, wrong);
  ExpectShortPrintableTexts(report, wrong);
  ExpectWrittenReport(report, wrong);
  ExpectConsistentReferences(report, wrong);
  ExpectConsistentKeys(report, verifier, wrong);
  ExpectTheClaimsOfTheToken(report, verification, wrong);
  ExpectTheOptionsToDecide(report, verifier.options, wrong);
  return wrong.Take() + FindWrongTimes(report, verifier.options);
}

} // namespace Testing
