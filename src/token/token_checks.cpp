// SPDX-License-Identifier: Apache-2.0

#include "token/token_checks.h"

#include "xml/date_time_text.h"

#include <ssoclient/exceptions.h>

#include <limits>

namespace SsoClient {

namespace {

constexpr std::int64_t MICROSECONDS_PER_SECOND = 1'000'000;
constexpr std::int64_t EARLIEST = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t LATEST = std::numeric_limits<std::int64_t>::max();

// An absurd tolerance must mean "always" or "never", not wrap around into its opposite: the arithmetic saturates.

std::int64_t ToMicroseconds(std::int64_t seconds) {
  std::int64_t microseconds = 0;
  if (__builtin_mul_overflow(seconds, MICROSECONDS_PER_SECOND, &microseconds)) {
    return seconds < 0 ? EARLIEST : LATEST;
  }
  return microseconds;
}

std::int64_t Later(std::int64_t time, std::int64_t microseconds) {
  std::int64_t result = 0;
  if (__builtin_add_overflow(time, microseconds, &result)) {
    return microseconds < 0 ? EARLIEST : LATEST;
  }
  return result;
}

std::int64_t Earlier(std::int64_t time, std::int64_t microseconds) {
  std::int64_t result = 0;
  if (__builtin_sub_overflow(time, microseconds, &result)) {
    return microseconds < 0 ? LATEST : EARLIEST;
  }
  return result;
}

void CheckVersionAndId(const SamlAssertionType &assertion) {
  if (assertion.Version != "2.0") {
    throw ParseException("Invalid token version");
  }
  if (assertion.ID.empty() || assertion.ID.front() != '_') {
    throw ParseException("Invalid token ID");
  }
}

void CheckValidity(const ConditionsType &conditions, std::int64_t clockToleranceSec) {
  const std::int64_t notBefore = conditions.NotBefore.GetUtcTime();
  const std::int64_t notOnOrAfter = conditions.NotOnOrAfter.GetUtcTime();
  if (notBefore >= notOnOrAfter) {
    throw ParseException("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.");
  }
  const std::int64_t tolerance = ToMicroseconds(clockToleranceSec);
  const std::int64_t now = Tarvel::System::GetUtcDateTime().GetUtcTime();
  if (Earlier(notBefore, tolerance) > now) {
    throw ParseException("Token start date is in the future: " + DateTimeFormatter(conditions.NotBefore));
  }
  if (Later(notOnOrAfter, tolerance) <= now) {
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
