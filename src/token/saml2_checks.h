// SPDX-License-Identifier: Apache-2.0
/// @file
/// The rules of the profile SAML2 that differ from those of the profile STRICT: which confirmation is used, how long
/// the token is valid, and for which audiences.
///
/// Like the rules in `token_checks.h`, each of them reports to a sink, and continues if the sink does not throw.

#pragma once

#include "token/saml2_model.h"
#include "xml/deviation_sink.h"

#include <ssoclient/verify_options.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/// Checks version, identifier, validity, confirmation, sessions and delegation of `assertion`, and chooses its confirmation.
/// @throws ParseException on the first rule that fails.
void CheckSaml2Properties(Saml2Assertion &assertion, const VerifyOptions &options);

// The rules of `CheckSaml2Properties`, in their order, after `CheckVersion` and `CheckId`.

/// Checks the dates of the conditions. Returns this machine's time, with which all dates are compared.
Tarvel::System::DateTime CheckSaml2Validity(const Saml2Assertion &assertion, std::int64_t clockToleranceSec,
                                            DeviationSink &sink);

/// Chooses the confirmation that is used: the first bearer confirmation in document order that can be used with
/// `options` at the time `now` or, if there is none, the first such holder-of-key confirmation. If `options` require a
/// kind and the assertion has it, only that kind is considered. Sets `details.usedConfirmation` and the confirmation in
/// `common.Subject`. If no confirmation can be used, nothing is set, and each reason against one of them is reported:
/// against the first of a known kind that is considered or, if there is none, against the first.
/// @return whether a confirmation was chosen
bool ChooseConfirmation(Saml2Assertion &assertion, const VerifyOptions &options, const Tarvel::System::DateTime &now,
                        DeviationSink &sink);

/// Checks that no session has ended, and that none ends before the token starts. If a confirmation has been chosen, the
/// token does not start before that confirmation can be used.
void CheckSessions(const Saml2Assertion &assertion, std::int64_t clockToleranceSec, const Tarvel::System::DateTime &now,
                   DeviationSink &sink);

/// Checks that the delegate of the chosen confirmation, if there is one, is the last delegate of the delegation
/// restriction or, if there is no restriction, the subject itself.
void CheckSaml2Delegation(const Saml2Assertion &assertion, DeviationSink &sink);

/// Decides which confirmations of an assertion can be used. The assertion and the options must outlive it.
class ConfirmationChoice {
public:
  ConfirmationChoice(const Saml2Assertion &assertion, const VerifyOptions &options,
                     const Tarvel::System::DateTime &now) noexcept;

  /// The confirmation that is used; empty if none can be used.
  boost::optional<std::size_t> Find() const;

  /// The confirmation whose reasons are reported if none can be used. There must be a confirmation.
  std::size_t FindRefused() const noexcept;

  /// Reports each reason for which the confirmation at `index` cannot be used.
  void Check(std::size_t index, DeviationSink &sink) const;

  /// The first reason that `Check` reports for this confirmation; empty if it can be used.
  boost::optional<Deviation> GetRefusal(std::size_t index) const;

private:
  bool IsConsidered(std::size_t index) const noexcept;
  boost::optional<std::size_t> FindOfType(SamlToken::ConfirmationType type) const;
  void CheckDates(std::size_t index, DeviationSink &sink) const;
  void CheckRecipient(std::size_t index, DeviationSink &sink) const;
  void CheckRequest(std::size_t index, DeviationSink &sink) const;
  void CheckSender(std::size_t index, DeviationSink &sink) const;

  const Saml2Assertion &m_assertion;
  const VerifyOptions &m_options;
  const Tarvel::System::DateTime m_now;
  boost::optional<SamlToken::ConfirmationType> m_onlyType; // empty: all are considered
};

/// The time in which a token can be used.
struct TokenPeriod {
  Tarvel::System::DateTime start; ///< the first moment
  Tarvel::System::DateTime end;   ///< the first moment after the last one
};

/// The time in which the conditions hold, the chosen confirmation can be used, and no session has ended.
TokenPeriod GetTokenPeriod(const Saml2Assertion &assertion);

/// Checks that `options` accept an audience of each restriction.
/// @param conditions the place that is reported; may be null
void CheckAudienceRestrictions(const std::vector<std::set<std::string>> &restrictions, const VerifyOptions &options,
                               const Tarvel::Xml::ElementNode *conditions, DeviationSink &sink);

} // namespace SsoClient
