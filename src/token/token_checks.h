// SPDX-License-Identifier: Apache-2.0
/// @file
/// The rules for a token that a schema cannot express: `CheckTokenProperties`, and what `VerifyOptions` require.
///
/// Each rule reports to a sink. The sink of a verification throws at the first deviation. If the sink does not throw,
/// the rule continues.

#pragma once

#include "token/assertion_model.h"
#include "xml/deviation_sink.h"
#include "xml/refuse.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/verify_options.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>

#include <cstdint>
#include <set>
#include <string>
#include <string_view>

namespace SsoClient {

/// Checks version, identifier, validity and delegation of `assertion`.
/// @param clockToleranceSec seconds by which the time of validity is extended at both ends; a negative number shortens it
/// @throws ParseException on the first rule that fails.
void CheckTokenProperties(const SamlAssertionType &assertion, std::int64_t clockToleranceSec);

/// The rules of `CheckTokenProperties`, in their order.
void CheckVersion(const SamlAssertionType &assertion, DeviationSink &sink);
void CheckId(const SamlAssertionType &assertion, DeviationSink &sink);
/// Returns this machine's time, with which the validity was compared.
Tarvel::System::DateTime CheckValidity(const ConditionsType &conditions, std::int64_t clockToleranceSec,
                                       DeviationSink &sink);
/// The same for conditions whose `NotBefore` is written at the place `start`.
Tarvel::System::DateTime CheckValidity(const ConditionsType &conditions, const Place &start,
                                       std::int64_t clockToleranceSec, DeviationSink &sink);
void CheckSubjectValidity(const SamlAssertionType &assertion, DeviationSink &sink);
void CheckDelegation(const SamlAssertionType &assertion, DeviationSink &sink);

/// Refuse the delegate of a confirmation: there is no delegation restriction, or its last delegate is another one.
void RefuseUnexpectedDelegate(const NameIDType &delegate, DeviationSink &sink);
void RefuseOtherDelegate(const NameIDType &delegate, std::string_view lastDelegate, DeviationSink &sink);

/// A date at which something begins or ends.
struct TimeLimit {
  const Tarvel::System::DateTime &date;
  Place place;         ///< where it is written
  const char *message; ///< the text of the refusal, up to the date
};

/// Checks that `start` is not after `now` by more than the tolerance.
void CheckStart(const TimeLimit &start, const Tarvel::System::DateTime &now, std::int64_t clockToleranceSec,
                DeviationSink &sink);

/// Checks that `now` is before `end` plus the tolerance.
void CheckEnd(const TimeLimit &end, const Tarvel::System::DateTime &now, std::int64_t clockToleranceSec,
              DeviationSink &sink);

/// Checks that `options` accept one of the token's audiences. `audience` is empty if the token is not restricted.
/// @param conditions the place that is reported; may be null
void CheckAudience(const std::set<std::string> &audience, const VerifyOptions &options,
                   const Tarvel::Xml::ElementNode *conditions, DeviationSink &sink);

/// Checks that the confirmation is the required one, if one is required.
/// @param element the place that is reported; may be null
void CheckRequiredConfirmation(SamlToken::ConfirmationType confirmation, const VerifyOptions &options,
                               const Tarvel::Xml::ElementNode *element, DeviationSink &sink);

/// "bearer" or "holder-of-key".
const char *GetConfirmationName(SamlToken::ConfirmationType confirmation) noexcept;

/// `texts` in their order, separated by ", ".
std::string JoinTexts(const std::set<std::string> &texts);

} // namespace SsoClient
