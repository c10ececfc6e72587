// SPDX-License-Identifier: Apache-2.0

#include "token/read_assertion.h"

#include "token/trusted_keys.h"

#include <string>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;

/// The value of each date before the parser sets it. A text contains exactly this microsecond only on purpose.
DateTime Unread() {
  return Tarvel::System::DateTimeFromUtc(-1, false);
}

boost::optional<std::string> TextOrNone(const std::string &text) {
  return text.empty() ? boost::optional<std::string>() : boost::optional<std::string>(text);
}

} // namespace

ReadAssertion::ReadAssertion(SamlAssertionType &record) : assertion(record) {
  assertion.IssueInstant = Unread();
  assertion.Conditions.NotBefore = Unread();
  assertion.Conditions.NotOnOrAfter = Unread();
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter = Unread();
}

bool ReadAssertion::HasDate(const DateTime &date) const noexcept {
  return isFormAccepted || date != Unread();
}

void ReadAssertion::RemoveUnreadDelegates() {
  if (assertion.Conditions.DelegationRestriction && !isFormAccepted) {
    std::erase_if(assertion.Conditions.DelegationRestriction->delegates, [this](const DelegateType &delegate) {
      return !HasName(delegate.NameID) || delegate.DelegationInstant == DateTime();
    });
  }
}

void SetClaims(const ReadAssertion &read, UnverifiedClaims &claims) {
  const SamlAssertionType &assertion = read.assertion;
  const SubjectConfirmationType &confirmation = assertion.Subject.SubjectConfirmation;
  const auto dateOrNone = [&read](const DateTime &date) {
    return read.HasDate(date) ? boost::optional<DateTime>(date) : boost::none;
  };
  claims.isAssertion = true;
  claims.id = TextOrNone(assertion.ID);
  claims.issuer = TextOrNone(assertion.Issuer.value);
  claims.issueInstant = dateOrNone(assertion.IssueInstant);
  claims.nameId = TextOrNone(assertion.Subject.NameID.value);
  claims.nameIdFormat = TextOrNone(assertion.Subject.NameID.Format);
  if (read.HasMethod()) {
    claims.confirmation = confirmation.Method;
  }
  if (confirmation.writtenMethod) {
    claims.confirmationMethod = std::string(*confirmation.writtenMethod);
  }
  claims.startDate = dateOrNone(assertion.Conditions.NotBefore);
  claims.endDate = dateOrNone(assertion.Conditions.NotOnOrAfter);
  if (const auto &certificate = confirmation.SubjectConfirmationData.certificate) {
    claims.certificateSubject = SubjectOf(*certificate);
    claims.certificateThumbprint = certificate->GetSha256Thumbprint();
  }
}

} // namespace SsoClient
