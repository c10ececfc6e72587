// SPDX-License-Identifier: Apache-2.0

#include "token/profile_explainer.h"

#include "model/namespaces.h"
#include "token/report_remedies.h"
#include "token/signature_explainer.h"
#include "token/token_checks.h"
#include "xml/date_time_text.h"
#include "xml/qualified_name.h"

#include <memory>
#include <utility>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using Tarvel::Xml::ElementNode;

} // namespace

void ProfileExplainer::Explain(const ElementNode &root) {
  ExplainForm(root);
  if (!m_read.assertion.element) {
    m_recorder.SkipFrom(Check::IDENTIFIERS, Missing::ASSERTION);
    return;
  }
  ExplainIdentifiers();
  ExplainProperties();
  ExplainSignature(m_read.assertion.Signature.get(), *m_read.assertion.element, m_resolver, m_report, m_recorder);
  SetClaims(m_read, m_report.claims);
  ExplainFacts();
}

void ProfileExplainer::ExplainForm(const ElementNode &root) {
  const SkipWsAndCommentsFilter filter;
  const std::shared_ptr<const NodeFilter> borrowed(std::shared_ptr<void>(), &filter);
  m_recorder.Begin(Check::FORM);
  Parse(NodeFilterIterator(&root, borrowed), m_recorder);
  m_read.isFormAccepted = !m_recorder.HasFailed();
  std::string otherProfile;
  if (const ElementNode *const element = m_read.assertion.element) {
    otherProfile = ReadOtherProfile(NodeFilterIterator(element, borrowed));
  }
  const std::string summary = SummaryOfForm(root);
  // Both profiles refuse a document around an assertion.
  const bool isShown = m_read.assertion.element == &root && !otherProfile.empty();
  m_recorder.Summarize(isShown ? summary + " " + otherProfile : summary);
}

std::string ProfileExplainer::SummaryOfForm(const ElementNode &root) {
  if (m_read.isFormAccepted) {
    return "The assertion has the accepted form, and its signature covers it.";
  }
  const ElementNode *const element = m_read.assertion.element;
  const bool isSaml2 = ElementQNameIs(element, "Assertion", Namespaces::SAML);
  if (!isSaml2 || element != &root) {
    m_recorder.ReplaceFirstRemedy(RemedyForSurroundings(isSaml2));
  }
  const std::string count = std::to_string(m_recorder.CountFindings()) + ".";
  if (!element) {
    return Missing::ASSERTION;
  }
  if (!isSaml2) {
    return "There is no SAML 2.0 assertion, so the first element of that name was examined; deviations from "
           "the accepted form: " +
           count;
  }
  if (element != &root) {
    return "The document element is not an assertion, so the first assertion in it was examined; "
           "deviations from the accepted form: " +
           count;
  }
  return "Deviations from the accepted form: " + count;
}

void ProfileExplainer::ExplainIdentifiers() {
  const SamlAssertionType &assertion = m_read.assertion;
  const bool hasVersion = m_read.isFormAccepted || !assertion.Version.empty();
  const bool hasId = m_read.isFormAccepted || !assertion.ID.empty();
  m_recorder.Begin(Check::IDENTIFIERS);
  if (hasVersion) {
    CheckVersion(assertion, m_recorder);
  }
  if (hasId) {
    CheckId(assertion, m_recorder);
  }
  if (hasVersion && hasId) {
    m_recorder.Summarize("The version is \"" + assertion.Version + "\", the ID is \"" + assertion.ID + "\".");
  } else {
    m_recorder.SetNotDone(hasId ? "The Version is missing." : "The ID is missing.");
  }
}

std::string ProfileExplainer::SummaryOfValidity() const {
  const ConditionsType &conditions = m_read.assertion.Conditions;
  return "Valid from " + DateTimeFormatter(conditions.NotBefore) + " to " + DateTimeFormatter(conditions.NotOnOrAfter) +
         "; now " + DateTimeFormatter(m_report.checkedAt) + " (tolerance " +
         std::to_string(m_options.clockToleranceSec) + " s).";
}

bool ProfileExplainer::HasDelegates() {
  const SubjectConfirmationType &confirmation = m_read.assertion.Subject.SubjectConfirmation;
  const auto &restriction = m_read.assertion.Conditions.DelegationRestriction;
  const bool hasLast =
      restriction && !restriction->delegates.empty() && m_read.HasName(restriction->delegates.back().NameID);
  if (!m_read.HasConditions()) {
    m_recorder.Skip(Check::DELEGATION, Missing::CONDITIONS);
  } else if (confirmation.NameID && !m_read.HasName(*confirmation.NameID)) {
    m_recorder.Skip(Check::DELEGATION, "The delegate of the SubjectConfirmation cannot be read.");
  } else if (restriction && !hasLast) {
    m_recorder.Skip(Check::DELEGATION, "The last delegate of the delegation restriction cannot be read.");
  } else {
    return true;
  }
  return false;
}

std::string ProfileExplainer::SummaryOfDelegation() const {
  const SubjectConfirmationType &confirmation = m_read.assertion.Subject.SubjectConfirmation;
  const auto &restriction = m_read.assertion.Conditions.DelegationRestriction;
  const bool hasDelegates = restriction && !restriction->delegates.empty();
  return (confirmation.NameID ? "The delegate of the confirmation is \"" + confirmation.NameID->value + "\""
                              : std::string("The confirmation has no delegate")) +
         (hasDelegates
              ? "; the last delegate of the restriction is \"" + restriction->delegates.back().NameID.value + "\"."
              : std::string("; there is no delegation restriction."));
}

std::string ProfileExplainer::SummaryOfAudience(const std::string &tokenAudience) const {
  return (tokenAudience.empty() ? std::string("The token is not restricted to an audience")
                                : "The token is for " + tokenAudience) +
         (m_options.acceptedAudiences.empty() ? std::string("; every audience is accepted.")
                                              : "; accepted: " + JoinTexts(m_options.acceptedAudiences) + ".");
}

void ProfileExplainer::ExplainRequiredConfirmation() {
  const SubjectConfirmationType &confirmation = m_read.assertion.Subject.SubjectConfirmation;
  m_recorder.Begin(Check::REQUIRED_CONFIRMATION);
  CheckRequiredConfirmation(confirmation.Method, m_options, confirmation.element, m_recorder);
  m_recorder.Summarize(std::string("The confirmation is ") + GetConfirmationName(confirmation.Method) +
                       (m_options.requiredConfirmation
                            ? std::string("; required: ") + GetConfirmationName(*m_options.requiredConfirmation) + "."
                            : std::string("; none is required.")));
}

void ProfileExplainer::SetClaimsOfFacts(TokenFacts facts) {
  UnverifiedClaims &claims = m_report.claims;
  if (!facts.subject.name.empty()) {
    claims.subject = std::move(facts.subject);
  }
  if (m_read.HasConditions()) {
    claims.renewable = facts.renewable;
    claims.delegable = facts.delegable;
  }
  if (m_read.isFormAccepted || m_read.assertion.AttributeStatement) {
    claims.solution = facts.solution;
    claims.fullName = std::move(facts.fullName);
  }
  claims.groups = std::move(facts.groups);
  claims.delegationChain = std::move(facts.delegationChain);
  claims.audience = std::move(facts.audience);
  claims.advice = std::move(facts.advice);
}

} // namespace SsoClient
