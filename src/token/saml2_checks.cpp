// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_checks.h"

#include "model/namespaces.h"
#include "token/saml2_details.h"
#include "token/saml2_facts.h"
#include "token/subject_parser.h"
#include "token/token_checks.h"
#include "xml/date_time_text.h"
#include "xml/qualified_name.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;
using Tarvel::Xml::ElementNode;

/// Counts deviations. Their texts are not made.
class CountingSink final : public DeviationSink {
public:
  bool IsFull() const noexcept override { return true; }
  void Add(Deviation) override { Count(); }
  void Count() noexcept override { ++count; }

  std::size_t count = 0;
};

/// Keeps the first deviation only.
class FirstDeviationSink final : public DeviationSink {
public:
  bool IsFull() const noexcept override { return first.has_value(); }
  void Add(Deviation deviation) override { first = std::move(deviation); }
  void Count() noexcept override {}

  boost::optional<Deviation> first;
};

/// The data of a confirmation, or the confirmation itself if it has no data.
const ElementNode *PlaceOf(const Saml2Confirmation &confirmation) {
  return confirmation.data ? confirmation.data : confirmation.element;
}

/// The confirmation that has been chosen; null if there is none.
const ConfirmationDetails *ChosenConfirmation(const Saml2Assertion &assertion) {
  return assertion.common.Subject.SubjectConfirmation.isMethodKnown
             ? &assertion.details.confirmations[assertion.details.usedConfirmation]
             : nullptr;
}

/// The part of `period` in which a confirmation can be used.
TokenPeriod Within(TokenPeriod period, const ConfirmationDetails &confirmation) {
  if (confirmation.notBefore) {
    period.start = std::max(period.start, *confirmation.notBefore);
  }
  if (confirmation.notOnOrAfter) {
    period.end = std::min(period.end, *confirmation.notOnOrAfter);
  }
  return period;
}

TokenPeriod PeriodOfConditions(const Saml2Assertion &assertion) {
  return {assertion.common.Conditions.NotBefore, assertion.common.Conditions.NotOnOrAfter};
}

/// The `AuthnStatement` elements of an assertion, one after the other. Null after the last.
class AuthnStatementElements {
public:
  explicit AuthnStatementElements(const ElementNode *assertion) noexcept
      : m_node(assertion ? assertion->GetFirstChild() : nullptr) {}

  const ElementNode *Next() noexcept {
    while (m_node) {
      const ElementNode *const element = Tarvel::Xml::AsElement(m_node);
      m_node = m_node->GetNextSibling();
      if (ElementQNameIs(element, "AuthnStatement", Namespaces::SAML)) {
        return element;
      }
    }
    return nullptr;
  }

private:
  const Tarvel::Xml::Node *m_node;
};

/// Sets the confirmation at `index` as the confirmation of the subject.
void UseConfirmation(Saml2Assertion &assertion, std::size_t index) {
  const Saml2Confirmation &confirmation = assertion.confirmations[index];
  const ConfirmationDetails &details = assertion.details.confirmations[index];
  SubjectConfirmationType used;
  used.Method = *confirmation.type;
  used.isMethodKnown = true;
  used.element = confirmation.element;
  if (confirmation.element) {
    used.writtenMethod = GetTextAttribute(*confirmation.element, "Method");
  }
  if (details.nameId) {
    used.NameID =
        NameIDType{details.nameId->format.value_or(std::string()), details.nameId->value, confirmation.nameId};
  }
  used.SubjectConfirmationData.element = confirmation.data;
  used.SubjectConfirmationData.NotOnOrAfter = details.notOnOrAfter.value_or(DateTime());
  used.SubjectConfirmationData.certificate = details.certificate;
  assertion.common.Subject.SubjectConfirmation = std::move(used);
  assertion.details.usedConfirmation = index;
}

} // namespace

void CheckSaml2Properties(Saml2Assertion &assertion, const VerifyOptions &options) {
  DeviationSink &sink = ThrowingSink();
  CheckVersion(assertion.common, sink);
  CheckId(assertion.common, sink);
  const DateTime now = CheckSaml2Validity(assertion, options.clockToleranceSec, sink);
  ChooseConfirmation(assertion, options, now, sink);
  CheckSessions(assertion, options.clockToleranceSec, now, sink);
  CheckSaml2Delegation(assertion, sink);
}

DateTime CheckSaml2Validity(const Saml2Assertion &assertion, std::int64_t clockToleranceSec, DeviationSink &sink) {
  const ConditionsType &conditions = assertion.common.Conditions;
  const bool hasStart = conditions.element && conditions.element->FindAttribute(std::string_view(), "NotBefore");
  const Place start =
      hasStart ? Place(conditions.element, "NotBefore") : Place(assertion.common.element, "IssueInstant");
  return CheckValidity(conditions, start, clockToleranceSec, sink);
}

bool ChooseConfirmation(Saml2Assertion &assertion, const VerifyOptions &options, const DateTime &now,
                        DeviationSink &sink) {
  if (assertion.confirmations.empty()) {
    Refuse(sink, assertion.common.element, "a SubjectConfirmation", std::string_view(),
           "The token has no subject confirmation");
    return false;
  }
  const ConfirmationChoice choice(assertion, options, now);
  const boost::optional<std::size_t> found = choice.Find();
  if (found) {
    UseConfirmation(assertion, *found);
  } else {
    choice.Check(choice.FindRefused(), sink);
  }
  return found.has_value();
}

void CheckSessions(const Saml2Assertion &assertion, std::int64_t clockToleranceSec, const DateTime &now,
                   DeviationSink &sink) {
  const ConfirmationDetails *const chosen = ChosenConfirmation(assertion);
  const TokenPeriod conditions = PeriodOfConditions(assertion);
  const DateTime start = chosen ? Within(conditions, *chosen).start : conditions.start;
  AuthnStatementElements elements(assertion.common.element);
  for (const AuthnStatementDetails &statement : assertion.details.authnStatements) {
    const Place place(elements.Next(), "SessionNotOnOrAfter");
    if (!statement.sessionNotOnOrAfter) {
      continue;
    }
    CheckEnd({*statement.sessionNotOnOrAfter, place, "The session has ended at: "}, now, clockToleranceSec, sink);
    if (!(start < *statement.sessionNotOnOrAfter)) {
      Refuse(sink, place, "after " + DateTimeFormatter(start), DateTimeFormatter(*statement.sessionNotOnOrAfter),
             "Unsatisfiable token validity conditions: the session ends before the token starts.");
    }
  }
}

void CheckSaml2Delegation(const Saml2Assertion &assertion, DeviationSink &sink) {
  const ConfirmationDetails *const chosen = ChosenConfirmation(assertion);
  if (!chosen || !chosen->nameId) {
    return;
  }
  const NameIDType &delegate = *assertion.common.Subject.SubjectConfirmation.NameID;
  const boost::optional<DelegationRestrictionType> &restriction = assertion.common.Conditions.DelegationRestriction;
  if (!restriction) {
    if (!IsSameIdentifier(*chosen->nameId, assertion.details.subject)) {
      RefuseUnexpectedDelegate(delegate, sink);
    }
    return;
  }
  const NameIDType *const last = restriction->delegates.empty() ? nullptr : &restriction->delegates.back().NameID;
  if (!last || !last->element || !IsSameIdentifier(*chosen->nameId, ReadNameId(*last->element))) {
    RefuseOtherDelegate(delegate, last ? std::string_view(last->value) : std::string_view(), sink);
  }
}

ConfirmationChoice::ConfirmationChoice(const Saml2Assertion &assertion, const VerifyOptions &options,
                                       const DateTime &now) noexcept
    : m_assertion(assertion), m_options(options), m_now(now) {
  const auto &all = assertion.confirmations;
  if (options.requiredConfirmation && std::any_of(all.begin(), all.end(), [&options](const Saml2Confirmation &one) {
        return one.type == options.requiredConfirmation;
      })) {
    m_onlyType = options.requiredConfirmation;
  }
}

boost::optional<std::size_t> ConfirmationChoice::Find() const {
  const boost::optional<std::size_t> bearer = FindOfType(SamlToken::BEARER);
  return bearer ? bearer : FindOfType(SamlToken::HOLDER_OF_KEY);
}

std::size_t ConfirmationChoice::FindRefused() const noexcept {
  for (std::size_t i = 0; i < m_assertion.confirmations.size(); ++i) {
    if (m_assertion.confirmations[i].type && IsConsidered(i)) {
      return i;
    }
  }
  return 0;
}

bool ConfirmationChoice::IsConsidered(std::size_t index) const noexcept {
  return !m_onlyType || m_assertion.confirmations[index].type == m_onlyType;
}

boost::optional<std::size_t> ConfirmationChoice::FindOfType(SamlToken::ConfirmationType type) const {
  for (std::size_t i = 0; i < m_assertion.confirmations.size(); ++i) {
    if (m_assertion.confirmations[i].type == type) {
      CountingSink reasons;
      Check(i, reasons);
      if (reasons.count == 0) {
        return i;
      }
    }
  }
  return boost::none;
}

void ConfirmationChoice::Check(std::size_t index, DeviationSink &sink) const {
  const Saml2Confirmation &confirmation = m_assertion.confirmations[index];
  const ConfirmationDetails &details = m_assertion.details.confirmations[index];
  if (!confirmation.type) {
    RefuseMethod(confirmation.element, details.method, sink);
    return;
  }
  if (!IsConsidered(index)) {
    CheckRequiredConfirmation(*confirmation.type, m_options, confirmation.element, sink);
    return;
  }
  CheckDates(index, sink);
  CheckRecipient(index, sink);
  CheckRequest(index, sink);
  CheckSender(index, sink);
  if (confirmation.type == SamlToken::HOLDER_OF_KEY && details.publicKey.empty()) {
    Refuse(sink, PlaceOf(confirmation), "a certificate or an RSA or EC public key", std::string_view(),
           "The holder-of-key confirmation has no usable key");
  }
  if (confirmation.bearerKey) {
    Refuse(sink, confirmation.bearerKey, "no key", std::string_view(), "The bearer confirmation has a key");
  }
}

boost::optional<Deviation> ConfirmationChoice::GetRefusal(std::size_t index) const {
  FirstDeviationSink sink;
  Check(index, sink);
  return std::move(sink.first);
}

void ConfirmationChoice::CheckDates(std::size_t index, DeviationSink &sink) const {
  const Saml2Confirmation &confirmation = m_assertion.confirmations[index];
  const ConfirmationDetails &details = m_assertion.details.confirmations[index];
  if (details.notBefore) {
    CheckStart(
        {*details.notBefore, {confirmation.data, "NotBefore"}, "The subject confirmation cannot be used before: "},
        m_now, m_options.clockToleranceSec, sink);
  }
  if (details.notOnOrAfter) {
    CheckEnd({*details.notOnOrAfter, {confirmation.data, "NotOnOrAfter"}, "The subject confirmation has expired at: "},
             m_now, m_options.clockToleranceSec, sink);
  }
  const TokenPeriod period = Within(PeriodOfConditions(m_assertion), details);
  if ((details.notBefore || details.notOnOrAfter) && !(period.start < period.end)) {
    Refuse(
        sink, PlaceOf(confirmation), "dates within those of the token",
        DateTimeFormatter(period.start) + " to " + DateTimeFormatter(period.end),
        "Unsatisfiable token validity conditions: the subject confirmation cannot be used while the token is valid.");
  }
}

void ConfirmationChoice::CheckRecipient(std::size_t index, DeviationSink &sink) const {
  const Saml2Confirmation &confirmation = m_assertion.confirmations[index];
  const boost::optional<std::string> &recipient = m_assertion.details.confirmations[index].recipient;
  const std::set<std::string> &accepted = m_options.acceptedRecipients;
  if (accepted.empty()) {
    return;
  }
  if (recipient && accepted.count(*recipient) == 0) {
    Refuse(sink, {PlaceOf(confirmation), "Recipient"}, JoinTexts(accepted), *recipient,
           "The subject confirmation is for another recipient: %1", *recipient);
  } else if (!recipient && confirmation.type == SamlToken::BEARER) {
    Refuse(sink, {PlaceOf(confirmation), "Recipient"}, JoinTexts(accepted), std::string_view(),
           "The subject confirmation does not name a recipient");
  }
}

void ConfirmationChoice::CheckRequest(std::size_t index, DeviationSink &sink) const {
  const Saml2Confirmation &confirmation = m_assertion.confirmations[index];
  const boost::optional<std::string> &answered = m_assertion.details.confirmations[index].inResponseTo;
  if (!m_options.expectedInResponseTo) {
    return;
  }
  const std::string &expected = *m_options.expectedInResponseTo;
  if (answered && *answered != expected) {
    Refuse(sink, {PlaceOf(confirmation), "InResponseTo"}, expected, *answered,
           "The subject confirmation answers another request: %1", *answered);
  } else if (!answered && confirmation.type == SamlToken::BEARER) {
    Refuse(sink, {PlaceOf(confirmation), "InResponseTo"}, expected, std::string_view(),
           "The subject confirmation does not state the request that it answers");
  }
}

void ConfirmationChoice::CheckSender(std::size_t index, DeviationSink &sink) const {
  const boost::optional<std::string> &address = m_assertion.details.confirmations[index].address;
  if (m_options.senderAddress && address && *address != *m_options.senderAddress) {
    Refuse(sink, {PlaceOf(m_assertion.confirmations[index]), "Address"}, *m_options.senderAddress, *address,
           "The subject confirmation is for a sender with another address: %1", *address);
  }
}

TokenPeriod GetTokenPeriod(const Saml2Assertion &assertion) {
  TokenPeriod period = PeriodOfConditions(assertion);
  if (const ConfirmationDetails *const chosen = ChosenConfirmation(assertion)) {
    period = Within(period, *chosen);
  }
  for (const AuthnStatementDetails &statement : assertion.details.authnStatements) {
    if (statement.sessionNotOnOrAfter) {
      period.end = std::min(period.end, *statement.sessionNotOnOrAfter);
    }
  }
  return period;
}

void CheckAudienceRestrictions(const std::vector<std::set<std::string>> &restrictions, const VerifyOptions &options,
                               const ElementNode *conditions, DeviationSink &sink) {
  if (restrictions.empty()) {
    CheckAudience({}, options, conditions, sink);
  }
  for (const std::set<std::string> &audiences : restrictions) {
    CheckAudience(audiences, options, conditions, sink);
  }
}

} // namespace SsoClient
