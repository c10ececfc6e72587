// SPDX-License-Identifier: Apache-2.0

#include "token/strict_explainer.h"

#include "token/assertion_parser.h"
#include "token/other_profile.h"
#include "token/report_remedies.h"
#include "token/saml2_checks.h"
#include "token/saml2_details.h"
#include "token/saml2_facts.h"
#include "token/saml2_parser.h"
#include "token/token_checks.h"
#include "xml/date_time_text.h"

#include <utility>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using Tarvel::System::DateTime;

constexpr const char *NO_METHOD = "The Method of the SubjectConfirmation is missing or not known.";

} // namespace

void StrictExplainer::Parse(NodeFilterIterator iterator, DeviationSink &sink) {
  ParseSamlAssertionElement(iterator, strict, sink);
}

std::string StrictExplainer::ReadOtherProfile(const NodeFilterIterator &iterator) {
  const std::string refusal = RefusalOf([&] {
    NodeFilterIterator cursor = iterator;
    m_other.emplace();
    ParseSaml2AssertionElement(cursor, *m_other);
  });
  if (!refusal.empty()) {
    m_other = boost::none;
  }
  if (m_read.isFormAccepted) {
    return {}; // the profile SAML2 reads all that the profile STRICT reads
  }
  if (m_other) {
    m_recorder.ReplaceFirstRemedy(RemedyForOtherForm());
  }
  return OtherProfileSentence("SAML2", "read", refusal, true);
}

template <typename Rule>
void StrictExplainer::SummarizeBoth(const std::string &summary, const Rule &rule) {
  if (m_recorder.HasFailed() && m_other) {
    m_recorder.Summarize(summary + " " + OtherProfileSentence("SAML2", "accept", RefusalOf(rule), true));
  } else {
    m_recorder.Summarize(summary);
  }
}

void StrictExplainer::ExplainProperties() {
  ExplainValidity();
  ExplainConfirmation();
  ExplainDelegation();
}

void StrictExplainer::ExplainValidity() {
  const ConditionsType &conditions = strict.Conditions;
  if (!m_read.HasDate(conditions.NotBefore)) {
    m_recorder.Skip(Check::VALIDITY, Missing::START);
  } else if (!m_read.HasDate(conditions.NotOnOrAfter)) {
    m_recorder.Skip(Check::VALIDITY, Missing::END);
  } else {
    m_recorder.Begin(Check::VALIDITY);
    m_report.checkedAt = CheckValidity(conditions, m_options.clockToleranceSec, m_recorder);
    m_recorder.Summarize(SummaryOfValidity());
  }
}

void StrictExplainer::ExplainConfirmation() {
  const SubjectConfirmationType &confirmation = strict.Subject.SubjectConfirmation;
  const DateTime &end = confirmation.SubjectConfirmationData.NotOnOrAfter;
  const bool isBearer = confirmation.Method == SamlToken::BEARER;
  if (!m_read.HasMethod()) {
    m_recorder.Skip(Check::CONFIRMATION, NO_METHOD);
  } else if (isBearer && !m_read.HasDate(end)) {
    m_recorder.Skip(Check::CONFIRMATION, "The NotOnOrAfter of the SubjectConfirmationData cannot be read.");
  } else if (isBearer && !m_read.HasDate(strict.Conditions.NotOnOrAfter)) {
    m_recorder.Skip(Check::CONFIRMATION, Missing::END);
  } else {
    m_recorder.Begin(Check::CONFIRMATION);
    CheckSubjectValidity(strict, m_recorder);
    SummarizeBoth(isBearer ? "The confirmation ends at " + DateTimeFormatter(end) + ", the token at " +
                                 DateTimeFormatter(strict.Conditions.NotOnOrAfter) + "."
                           : std::string("A holder-of-key confirmation lasts as long as the token."),
                  [this] {
                    ChooseConfirmation(*m_other, m_options, m_report.checkedAt, ThrowingSink());
                    CheckSessions(*m_other, m_options.clockToleranceSec, m_report.checkedAt, ThrowingSink());
                  });
  }
}

void StrictExplainer::ExplainDelegation() {
  if (!m_read.isFormAccepted && !strict.Subject.SubjectConfirmation.element) {
    m_recorder.Skip(Check::DELEGATION, Missing::CONFIRMATION);
  } else if (HasDelegates()) {
    m_recorder.Begin(Check::DELEGATION);
    CheckDelegation(strict, m_recorder);
    SummarizeBoth(SummaryOfDelegation(), [this] {
      ChooseConfirmation(*m_other, m_options, m_report.checkedAt, ThrowingSink());
      CheckSaml2Delegation(*m_other, ThrowingSink());
    });
  }
}

void StrictExplainer::ExplainFacts() {
  SetDetails();
  TokenFacts facts = ExplainNames();
  ExplainAudience(facts.audience);
  if (m_read.HasMethod()) {
    ExplainRequiredConfirmation();
  } else {
    m_recorder.Skip(Check::REQUIRED_CONFIRMATION, NO_METHOD);
  }
  SetClaimsOfFacts(std::move(facts));
}

void StrictExplainer::SetDetails() {
  if (m_other) {
    m_other->details.usedConfirmation = ConfirmationChoice(*m_other, m_options, m_report.checkedAt)
                                            .Find()
                                            .value_or(m_other->details.confirmations.size());
    m_report.claims.details = TakeDetailsOfClaims(*m_other);
  }
}

TokenFacts StrictExplainer::ExplainNames() {
  TokenFacts facts;
  const bool hasSubject = m_read.HasName(strict.Subject.NameID);
  m_recorder.Begin(Check::NAMES);
  if (hasSubject) {
    TakeSubject(strict, facts, m_recorder);
  }
  TakeAttributes(strict, facts, m_recorder);
  m_read.RemoveUnreadDelegates();
  TakeConditions(strict.Conditions, facts, m_recorder);
  if (hasSubject) {
    SummarizeBoth("The subject is \"" + m_report.claims.nameId.value_or(std::string()) +
                      "\"; groups: " + std::to_string(facts.groups.size()) +
                      "; delegates: " + std::to_string(facts.delegationChain.size()) + ".",
                  [this] {
                    TokenFacts unused;
                    TakeSaml2Attributes(*m_other, unused, ThrowingSink());
                  });
  } else {
    m_recorder.SetNotDone("The NameID of the Subject cannot be read.");
  }
  return facts;
}

void StrictExplainer::ExplainAudience(const std::set<std::string> &audience) {
  if (!m_read.HasConditions()) {
    m_recorder.Skip(Check::AUDIENCE, Missing::CONDITIONS);
    return;
  }
  m_recorder.Begin(Check::AUDIENCE);
  CheckAudience(audience, m_options, strict.Conditions.element, m_recorder);
  m_recorder.Summarize(SummaryOfAudience(JoinTexts(audience)));
}

} // namespace SsoClient
