// SPDX-License-Identifier: Apache-2.0

#include "token/token_checks.h"

#include "xml/date_time_text.h"

#include <algorithm>
#include <string_view>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;
using Tarvel::System::MICROSECONDS_PER_SECOND;
using Tarvel::Xml::ElementNode;

/// By how many microseconds `missed` exceeds `tolerance`, which is not larger. The difference may need all 64 bits.
std::uint64_t Excess(std::int64_t missed, std::int64_t tolerance) {
  return static_cast<std::uint64_t>(missed) - static_cast<std::uint64_t>(tolerance);
}

std::int64_t ToSeconds(std::uint64_t microseconds) {
  return static_cast<std::int64_t>(microseconds / MICROSECONDS_PER_SECOND);
}

std::string ToleranceText(std::int64_t clockToleranceSec) {
  return ", with a tolerance of " + std::to_string(clockToleranceSec) + " s";
}

} // namespace

void CheckStart(const TimeLimit &start, const DateTime &now, std::int64_t clockToleranceSec, DeviationSink &sink) {
  // Compares differences of dates. It does not shift dates, because a shifted date cannot leave the years 1 to 9999.
  const std::int64_t tolerance = Tarvel::System::SecondsToMicroseconds(clockToleranceSec);
  const std::int64_t missed = start.date.MicrosecondsSince(now);
  if (missed > tolerance) {
    ReportDeviation(sink, [&] {
      const std::string text = DateTimeFormatter(start.date);
      return Deviation{start.message + text,
                       start.place.element,
                       std::string(start.place.attribute),
                       "at or before " + DateTimeFormatter(now) + ToleranceText(clockToleranceSec),
                       text,
                       ToSeconds(Excess(missed, tolerance) - 1) + 1};
    });
  }
}

void CheckEnd(const TimeLimit &end, const DateTime &now, std::int64_t clockToleranceSec, DeviationSink &sink) {
  const std::int64_t tolerance = Tarvel::System::SecondsToMicroseconds(clockToleranceSec);
  const std::int64_t missed = now.MicrosecondsSince(end.date);
  if (missed >= tolerance) {
    ReportDeviation(sink, [&] {
      const std::string text = DateTimeFormatter(end.date);
      return Deviation{end.message + text,
                       end.place.element,
                       std::string(end.place.attribute),
                       "after " + DateTimeFormatter(now) + ToleranceText(clockToleranceSec),
                       text,
                       ToSeconds(Excess(missed, tolerance)) + 1};
    });
  }
}

void CheckTokenProperties(const SamlAssertionType &assertion, std::int64_t clockToleranceSec) {
  DeviationSink &sink = ThrowingSink();
  CheckVersion(assertion, sink);
  CheckId(assertion, sink);
  CheckValidity(assertion.Conditions, clockToleranceSec, sink);
  CheckSubjectValidity(assertion, sink);
  CheckDelegation(assertion, sink);
}

void CheckVersion(const SamlAssertionType &assertion, DeviationSink &sink) {
  if (assertion.Version != "2.0") {
    Refuse(sink, {assertion.element, "Version"}, "2.0", assertion.Version, "Invalid token version");
  }
}

void CheckId(const SamlAssertionType &assertion, DeviationSink &sink) {
  if (assertion.ID.empty() || assertion.ID.front() != '_') {
    Refuse(sink, {assertion.element, "ID"}, "a text that begins with \"_\"", assertion.ID, "Invalid token ID");
  }
}

DateTime CheckValidity(const ConditionsType &conditions, std::int64_t clockToleranceSec, DeviationSink &sink) {
  return CheckValidity(conditions, {conditions.element, "NotBefore"}, clockToleranceSec, sink);
}

DateTime CheckValidity(const ConditionsType &conditions, const Place &start, std::int64_t clockToleranceSec,
                       DeviationSink &sink) {
  if (!(conditions.NotBefore < conditions.NotOnOrAfter)) {
    Refuse(sink, start, "before " + DateTimeFormatter(conditions.NotOnOrAfter), DateTimeFormatter(conditions.NotBefore),
           "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.");
  }
  const DateTime now = Tarvel::System::GetUtcDateTime();
  CheckStart({conditions.NotBefore, start, "Token start date is in the future: "}, now, clockToleranceSec, sink);
  CheckEnd({conditions.NotOnOrAfter, {conditions.element, "NotOnOrAfter"}, "The token has expired at: "}, now,
           clockToleranceSec, sink);
  return now;
}

void CheckSubjectValidity(const SamlAssertionType &assertion, DeviationSink &sink) {
  const SubjectConfirmationType &confirmation = assertion.Subject.SubjectConfirmation;
  const SubjectConfirmationDataType &data = confirmation.SubjectConfirmationData;
  if (confirmation.Method == SamlToken::BEARER && data.NotOnOrAfter < assertion.Conditions.NotOnOrAfter) {
    Refuse(sink, {data.element, "NotOnOrAfter"}, DateTimeFormatter(assertion.Conditions.NotOnOrAfter) + " or later",
           DateTimeFormatter(data.NotOnOrAfter), "Invalid token subject validity");
  }
}

void CheckDelegation(const SamlAssertionType &assertion, DeviationSink &sink) {
  const SubjectConfirmationType &confirmation = assertion.Subject.SubjectConfirmation;
  const boost::optional<DelegationRestrictionType> &restriction = assertion.Conditions.DelegationRestriction;
  const NameIDType *const last =
      restriction && !restriction->delegates.empty() ? &restriction->delegates.back().NameID : nullptr;
  const std::string_view lastName = last ? std::string_view(last->value) : std::string_view();
  if (confirmation.NameID && !restriction) {
    RefuseUnexpectedDelegate(*confirmation.NameID, sink);
  } else if (!confirmation.NameID && restriction) {
    Refuse(sink, confirmation.element, lastName, std::string(),
           "Token has delegation restriction, but no delegate id is present in the SubjectConfirmation");
  } else if (confirmation.NameID && (!last || *confirmation.NameID != *last)) {
    RefuseOtherDelegate(*confirmation.NameID, lastName, sink);
  }
}

void RefuseUnexpectedDelegate(const NameIDType &delegate, DeviationSink &sink) {
  Refuse(sink, delegate.element, "no delegate id", delegate.value,
         "Token SubjectConfirmation contains delegate id, but no delegation restriction is present");
}

void RefuseOtherDelegate(const NameIDType &delegate, std::string_view lastDelegate, DeviationSink &sink) {
  Refuse(sink, delegate.element, lastDelegate, delegate.value,
         "The SubjectConfirmation delegate id does not match the id of the last delegate");
}

void CheckAudience(const std::set<std::string> &audience, const VerifyOptions &options, const ElementNode *conditions,
                   DeviationSink &sink) {
  const std::set<std::string> &accepted = options.acceptedAudiences;
  if (accepted.empty() || (audience.empty() && options.acceptUnrestrictedAudience)) {
    return;
  }
  if (audience.empty()) {
    Refuse(sink, conditions, JoinTexts(accepted), std::string(), "The token is not restricted to an audience");
    return;
  }
  const bool isAccepted = std::any_of(audience.begin(), audience.end(),
                                      [&accepted](const std::string &one) { return accepted.count(one) != 0; });
  if (!isAccepted) {
    const std::string found = JoinTexts(audience);
    Refuse(sink, conditions, JoinTexts(accepted), found, "The token is restricted to other audiences: %1", found);
  }
}

void CheckRequiredConfirmation(SamlToken::ConfirmationType confirmation, const VerifyOptions &options,
                               const ElementNode *element, DeviationSink &sink) {
  if (options.requiredConfirmation && confirmation != *options.requiredConfirmation) {
    const char *const found = GetConfirmationName(confirmation);
    const char *const wanted = GetConfirmationName(*options.requiredConfirmation);
    Refuse(sink, {element, "Method"}, wanted, found, "The token's confirmation is %1, but %2 is required", found,
           wanted);
  }
}

const char *GetConfirmationName(SamlToken::ConfirmationType confirmation) noexcept {
  return confirmation == SamlToken::HOLDER_OF_KEY ? "holder-of-key" : "bearer";
}

std::string JoinTexts(const std::set<std::string> &texts) {
  std::string joined;
  for (const std::string &text : texts) {
    if (!joined.empty()) {
      joined += ", ";
    }
    joined += text;
  }
  return joined;
}

} // namespace SsoClient
