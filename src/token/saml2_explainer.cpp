// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_explainer.h"

#include "token/assertion_parser.h"
#include "token/confirmation_summary.h"
#include "token/other_profile.h"
#include "token/saml2_details.h"
#include "token/saml2_facts.h"
#include "token/saml2_parser.h"
#include "token/token_checks.h"
#include "xml/date_time_text.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using Tarvel::System::DateTime;

constexpr const char *NOT_CHOSEN = "No confirmation can be used.";

/// The earliest end of a session; empty if no statement has one.
boost::optional<DateTime> SessionEnd(const TokenDetails &details) {
  boost::optional<DateTime> end;
  for (const AuthnStatementDetails &statement : details.authnStatements) {
    if (statement.sessionNotOnOrAfter) {
      end = end ? std::min(*end, *statement.sessionNotOnOrAfter) : *statement.sessionNotOnOrAfter;
    }
  }
  return end;
}

/// Whether the data of `confirmation` has a date that could not be read.
bool HasUnreadDate(const Saml2Confirmation &confirmation, const ConfirmationDetails &details) {
  const auto isUnread = [&](const char *name, const boost::optional<DateTime> &date) {
    return !date && confirmation.data && confirmation.data->FindAttribute(std::string_view(), name);
  };
  return isUnread("NotBefore", details.notBefore) || isUnread("NotOnOrAfter", details.notOnOrAfter);
}

bool HasUnreadDate(const Saml2Assertion &assertion) {
  for (std::size_t index = 0; index < assertion.confirmations.size(); ++index) {
    if (HasUnreadDate(assertion.confirmations[index], assertion.details.confirmations[index])) {
      return true;
    }
  }
  return false;
}

} // namespace

void Saml2Explainer::Parse(NodeFilterIterator iterator, DeviationSink &sink) {
  ParseSaml2AssertionElement(iterator, saml2, sink);
}

std::string Saml2Explainer::ReadOtherProfile(const NodeFilterIterator &iterator) {
  const std::string refusal = RefusalOf([&] {
    NodeFilterIterator cursor = iterator;
    SamlAssertionType unused;
    ParseSamlAssertionElement(cursor, unused);
  });
  return OtherProfileSentence("STRICT", "read", refusal, !m_read.isFormAccepted);
}

void Saml2Explainer::ExplainProperties() {
  ExplainValidity();
  ExplainConfirmation();
  ExplainDelegation();
}

bool Saml2Explainer::HasDates(Check check) {
  const ConditionsType &conditions = saml2.common.Conditions;
  if (!m_read.HasDate(conditions.NotBefore)) {
    m_recorder.Skip(check, "Neither the NotBefore of the Conditions nor the IssueInstant can be read.");
  } else if (!m_read.HasDate(conditions.NotOnOrAfter)) {
    m_recorder.Skip(check, Missing::END);
  } else {
    return true;
  }
  return false;
}

void Saml2Explainer::ExplainValidity() {
  if (!HasDates(Check::VALIDITY)) {
    return;
  }
  m_recorder.Begin(Check::VALIDITY);
  m_report.checkedAt = CheckSaml2Validity(saml2, m_options.clockToleranceSec, m_recorder);
  const boost::optional<DateTime> session = SessionEnd(saml2.details);
  m_recorder.Summarize(SummaryOfValidity() +
                       (session ? " The session ends at " + DateTimeFormatter(*session) + "." : std::string()));
}

void Saml2Explainer::ExplainConfirmation() {
  if (!m_read.isFormAccepted && saml2.confirmations.empty()) {
    m_recorder.Skip(Check::CONFIRMATION, Missing::CONFIRMATION);
  } else if (HasUnreadDate(saml2)) {
    m_recorder.Skip(Check::CONFIRMATION, "A date of a SubjectConfirmationData cannot be read.");
  } else if (HasDates(Check::CONFIRMATION)) {
    m_recorder.Begin(Check::CONFIRMATION);
    m_isConfirmationChosen = ChooseConfirmation(saml2, m_options, m_report.checkedAt, m_recorder);
    CheckSessions(saml2, m_options.clockToleranceSec, m_report.checkedAt, m_recorder);
    m_recorder.Summarize(SummaryOfConfirmations(saml2, m_options, m_report.checkedAt, m_isConfirmationChosen));
  }
}

void Saml2Explainer::ExplainDelegation() {
  if (!m_isConfirmationChosen) {
    m_recorder.Skip(Check::DELEGATION, NOT_CHOSEN);
  } else if (HasDelegates()) {
    m_recorder.Begin(Check::DELEGATION);
    CheckSaml2Delegation(saml2, m_recorder);
    m_recorder.Summarize(SummaryOfDelegation());
  }
}

void Saml2Explainer::ExplainFacts() {
  TokenFacts facts = ExplainNames();
  ExplainAudience();
  if (m_isConfirmationChosen) {
    ExplainRequiredConfirmation();
  } else {
    m_recorder.Skip(Check::REQUIRED_CONFIRMATION, NOT_CHOSEN);
  }
  SetClaimsOfPeriod(facts);
  facts.audience = TakeCommonAudiences(std::vector<std::set<std::string>>(saml2.details.audienceRestrictions));
  SetClaimsOfFacts(std::move(facts));
  if (m_read.isFormAccepted) {
    if (!m_isConfirmationChosen) {
      saml2.details.usedConfirmation = saml2.details.confirmations.size();
    }
    m_report.claims.details = TakeDetailsOfClaims(saml2);
  }
}

TokenFacts Saml2Explainer::ExplainNames() {
  TokenFacts facts;
  const bool hasSubject = m_read.HasName(saml2.common.Subject.NameID);
  m_recorder.Begin(Check::NAMES);
  if (hasSubject) {
    TakeSaml2Subject(saml2, facts);
  }
  TakeSaml2Attributes(saml2, facts, m_recorder);
  m_read.RemoveUnreadDelegates();
  TakeSaml2Conditions(saml2, facts);
  if (hasSubject) {
    m_recorder.Summarize("The subject is \"" + saml2.details.subject.value + "\"; the principal is \"" +
                         facts.subject.name + "\" in \"" + facts.subject.domain +
                         "\"; groups: " + std::to_string(facts.groups.size()) +
                         "; delegates: " + std::to_string(facts.delegationChain.size()) + ".");
  } else {
    m_recorder.SetNotDone("The NameID of the Subject cannot be read.");
  }
  return facts;
}

void Saml2Explainer::ExplainAudience() {
  if (!m_read.HasConditions()) {
    m_recorder.Skip(Check::AUDIENCE, Missing::CONDITIONS);
    return;
  }
  const std::vector<std::set<std::string>> &restrictions = saml2.details.audienceRestrictions;
  m_recorder.Begin(Check::AUDIENCE);
  CheckAudienceRestrictions(restrictions, m_options, saml2.common.Conditions.element, m_recorder);
  m_recorder.Summarize(
      SummaryOfAudience(restrictions.size() == 1 ? JoinTexts(restrictions.front()) : JoinRestrictions(restrictions)));
}

/// The dates of a confirmation and of sessions can make the time of validity shorter than that of the conditions.
void Saml2Explainer::SetClaimsOfPeriod(const TokenFacts &facts) {
  UnverifiedClaims &claims = m_report.claims;
  if (m_isConfirmationChosen) {
    claims.startDate = facts.startDate;
    claims.endDate = facts.endDate;
  } else {
    claims.confirmation = boost::none;
    if (!saml2.details.confirmations.empty()) {
      claims.confirmationMethod = saml2.details.confirmations.front().method;
    }
  }
}

} // namespace SsoClient
