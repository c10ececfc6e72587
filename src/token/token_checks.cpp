// SPDX-License-Identifier: Apache-2.0

#include "token/token_checks.h"

#include "xml/date_time_text.h"

#include <ssoclient/exceptions.h>

namespace SsoClient {

namespace {

void CheckVersionAndId(const SamlAssertionType &assertion) {
  if (assertion.Version != "2.0") {
    throw ParseException("Invalid token version");
  }
  if (assertion.ID.empty() || assertion.ID.front() != '_') {
    throw ParseException("Invalid token ID");
  }
}

void CheckValidity(const ConditionsType &conditions, std::int64_t clockToleranceSec) {
  if (!(conditions.NotBefore < conditions.NotOnOrAfter)) {
    throw ParseException("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.");
  }
  // Compares differences of dates. It does not shift dates, because a shifted date cannot leave the years 1 to 9999.
  const std::int64_t tolerance = Tarvel::System::SecondsToMicroseconds(clockToleranceSec);
  const Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();
  if (conditions.NotBefore.MicrosecondsSince(now) > tolerance) {
    throw ParseException("Token start date is in the future: " + DateTimeFormatter(conditions.NotBefore));
  }
  if (now.MicrosecondsSince(conditions.NotOnOrAfter) >= tolerance) {
    throw ParseException("The token has expired at: " + DateTimeFormatter(conditions.NotOnOrAfter));
  }
}

void CheckSubjectValidity(const SamlAssertionType &assertion) {
  const SubjectConfirmationType &confirmation = assertion.Subject.SubjectConfirmation;
  if (confirmation.Method == SamlToken::BEARER &&
      confirmation.SubjectConfirmationData.NotOnOrAfter < assertion.Conditions.NotOnOrAfter) {
    throw ParseException("Invalid token subject validity");
  }
}

void CheckDelegation(const boost::optional<NameIDType> &delegateId,
                     const boost::optional<DelegationRestrictionType> &restriction) {
  if (delegateId && !restriction) {
    throw ParseException("Token SubjectConfirmation contains delegate id, but no delegation restriction is present");
  }
  if (!delegateId && restriction) {
    throw ParseException("Token has delegation restriction, but no delegate id is present in the SubjectConfirmation");
  }
  if (delegateId && (restriction->delegates.empty() || *delegateId != restriction->delegates.back().NameID)) {
    throw ParseException("The SubjectConfirmation delegate id does not match the id of the last delegate");
  }
}

} // namespace

void CheckTokenProperties(const SamlAssertionType &assertion, std::int64_t clockToleranceSec) {
  CheckVersionAndId(assertion);
  CheckValidity(assertion.Conditions, clockToleranceSec);
  CheckSubjectValidity(assertion);
  CheckDelegation(assertion.Subject.SubjectConfirmation.NameID, assertion.Conditions.DelegationRestriction);
}

} // namespace SsoClient
