// SPDX-License-Identifier: Apache-2.0

#include "token/assertion_explainer.h"

#include "model/namespaces.h"
#include "token/assertion_parser.h"
#include "token/read_assertion.h"
#include "token/report_remedies.h"
#include "token/signature_explainer.h"
#include "token/token_checks.h"
#include "token/token_facts.h"
#include "xml/date_time_text.h"
#include "xml/qualified_name.h"

#include <memory>
#include <set>
#include <string>
#include <utility>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using Tarvel::System::DateTime;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;

constexpr const char *NO_ASSERTION = "There is no assertion.";
constexpr const char *NO_METHOD = "The Method of the SubjectConfirmation is missing or not known.";
constexpr const char *NO_END = "The NotOnOrAfter of the Conditions cannot be read.";

/// Reads the assertion and runs the checks on what could be read.
class Explainer {
public:
  Explainer(const VerifyOptions &options, TokenReport &report, ReportRecorder &recorder)
      : m_options(options), m_report(report), m_recorder(recorder) {}

  /// Returns whether there is an assertion, of any version.
  bool ExplainForm(const ElementNode &root);

  void ExplainProperties() {
    ExplainIdentifiers();
    ExplainValidity();
    ExplainConfirmation();
    ExplainDelegation();
  }

  void ExplainTokenSignature(const KeyInfoResolver &resolver) {
    const SamlAssertionType &assertion = m_read.assertion;
    ExplainSignature(assertion.Signature.get(), *assertion.element, resolver, m_report, m_recorder);
  }

  /// The checks after those of the signature. They move values out of the assertion.
  void ExplainFacts() {
    SetClaims(m_read, m_report.claims);
    TokenFacts facts = ExplainNames();
    ExplainAudience(facts.audience);
    ExplainRequiredConfirmation();
    SetClaimsOfFacts(std::move(facts));
  }

private:
  void SummarizeForm(const ElementNode &root);
  void ExplainIdentifiers();
  void ExplainValidity();
  void ExplainConfirmation();
  void ExplainDelegation();
  TokenFacts ExplainNames();
  void ExplainAudience(const std::set<std::string> &audience);
  void ExplainRequiredConfirmation();
  void SetClaimsOfFacts(TokenFacts facts);

  const VerifyOptions &m_options;
  TokenReport &m_report;
  ReportRecorder &m_recorder;
  ReadAssertion m_read;
};

bool Explainer::ExplainForm(const ElementNode &root) {
  m_recorder.Begin(Check::FORM);
  const SkipWsAndCommentsFilter filter;
  NodeFilterIterator iterator(&root, std::shared_ptr<const NodeFilter>(std::shared_ptr<void>(), &filter));
  ParseSamlAssertionElement(iterator, m_read.assertion, m_recorder);
  m_read.isFormAccepted = !m_recorder.HasFailed();
  SummarizeForm(root);
  return m_read.assertion.element != nullptr;
}

void Explainer::SummarizeForm(const ElementNode &root) {
  if (m_read.isFormAccepted) {
    m_recorder.Summarize("The assertion has the accepted form, and its signature covers it.");
    return;
  }
  const ElementNode *const element = m_read.assertion.element;
  const bool isSaml2 = ElementQNameIs(element, "Assertion", Namespaces::SAML);
  if (!isSaml2 || element != &root) {
    m_recorder.ReplaceFirstRemedy(RemedyForSurroundings(isSaml2));
  }
  const std::string count = std::to_string(m_recorder.CountFindings()) + ".";
  if (!element) {
    m_recorder.Summarize(NO_ASSERTION);
  } else if (!isSaml2) {
    m_recorder.Summarize(
        "There is no SAML 2.0 assertion, so the first element of that name was examined; deviations from "
        "the accepted form: " +
        count);
  } else if (element != &root) {
    m_recorder.Summarize("The document element is not an assertion, so the first assertion in it was examined; "
                         "deviations from the accepted form: " +
                         count);
  } else {
    m_recorder.Summarize("Deviations from the accepted form: " + count);
  }
}

void Explainer::ExplainIdentifiers() {
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

void Explainer::ExplainValidity() {
  const ConditionsType &conditions = m_read.assertion.Conditions;
  if (!m_read.HasDate(conditions.NotBefore)) {
    m_recorder.Skip(Check::VALIDITY, "The NotBefore of the Conditions cannot be read.");
  } else if (!m_read.HasDate(conditions.NotOnOrAfter)) {
    m_recorder.Skip(Check::VALIDITY, NO_END);
  } else {
    m_recorder.Begin(Check::VALIDITY);
    m_report.checkedAt = CheckValidity(conditions, m_options.clockToleranceSec, m_recorder);
    m_recorder.Summarize("Valid from " + DateTimeFormatter(conditions.NotBefore) + " to " +
                         DateTimeFormatter(conditions.NotOnOrAfter) + "; now " + DateTimeFormatter(m_report.checkedAt) +
                         " (tolerance " + std::to_string(m_options.clockToleranceSec) + " s).");
  }
}

void Explainer::ExplainConfirmation() {
  const SamlAssertionType &assertion = m_read.assertion;
  const SubjectConfirmationType &confirmation = assertion.Subject.SubjectConfirmation;
  const DateTime &end = confirmation.SubjectConfirmationData.NotOnOrAfter;
  const bool isBearer = confirmation.Method == SamlToken::BEARER;
  if (!m_read.HasMethod()) {
    m_recorder.Skip(Check::CONFIRMATION, NO_METHOD);
  } else if (isBearer && !m_read.HasDate(end)) {
    m_recorder.Skip(Check::CONFIRMATION, "The NotOnOrAfter of the SubjectConfirmationData cannot be read.");
  } else if (isBearer && !m_read.HasDate(assertion.Conditions.NotOnOrAfter)) {
    m_recorder.Skip(Check::CONFIRMATION, NO_END);
  } else {
    m_recorder.Begin(Check::CONFIRMATION);
    CheckSubjectValidity(assertion, m_recorder);
    m_recorder.Summarize(isBearer ? "The confirmation ends at " + DateTimeFormatter(end) + ", the token at " +
                                        DateTimeFormatter(assertion.Conditions.NotOnOrAfter) + "."
                                  : std::string("A holder-of-key confirmation lasts as long as the token."));
  }
}

void Explainer::ExplainDelegation() {
  const SubjectConfirmationType &confirmation = m_read.assertion.Subject.SubjectConfirmation;
  const auto &restriction = m_read.assertion.Conditions.DelegationRestriction;
  const bool hasDelegates = restriction && !restriction->delegates.empty();
  if (!m_read.isFormAccepted && !confirmation.element) {
    m_recorder.Skip(Check::DELEGATION, "There is no SubjectConfirmation.");
  } else if (!m_read.HasConditions()) {
    m_recorder.Skip(Check::DELEGATION, "There are no Conditions.");
  } else if (confirmation.NameID && !m_read.HasName(*confirmation.NameID)) {
    m_recorder.Skip(Check::DELEGATION, "The delegate of the SubjectConfirmation cannot be read.");
  } else if (restriction && !(hasDelegates && m_read.HasName(restriction->delegates.back().NameID))) {
    m_recorder.Skip(Check::DELEGATION, "The last delegate of the delegation restriction cannot be read.");
  } else {
    m_recorder.Begin(Check::DELEGATION);
    CheckDelegation(m_read.assertion, m_recorder);
    m_recorder.Summarize(
        (confirmation.NameID ? "The delegate of the confirmation is \"" + confirmation.NameID->value + "\""
                             : std::string("The confirmation has no delegate")) +
        (hasDelegates
             ? "; the last delegate of the restriction is \"" + restriction->delegates.back().NameID.value + "\"."
             : std::string("; there is no delegation restriction.")));
  }
}

TokenFacts Explainer::ExplainNames() {
  TokenFacts facts;
  const bool hasSubject = m_read.HasName(m_read.assertion.Subject.NameID);
  m_recorder.Begin(Check::NAMES);
  if (hasSubject) {
    TakeSubject(m_read.assertion, facts, m_recorder);
  }
  TakeAttributes(m_read.assertion, facts, m_recorder);
  m_read.RemoveUnreadDelegates();
  TakeConditions(m_read.assertion.Conditions, facts, m_recorder);
  if (hasSubject) {
    m_recorder.Summarize("The subject is \"" + m_report.claims.nameId.value_or(std::string()) +
                         "\"; groups: " + std::to_string(facts.groups.size()) +
                         "; delegates: " + std::to_string(facts.delegationChain.size()) + ".");
  } else {
    m_recorder.SetNotDone("The NameID of the Subject cannot be read.");
  }
  return facts;
}

void Explainer::ExplainAudience(const std::set<std::string> &audience) {
  if (!m_read.HasConditions()) {
    m_recorder.Skip(Check::AUDIENCE, "There are no Conditions.");
    return;
  }
  m_recorder.Begin(Check::AUDIENCE);
  CheckAudience(audience, m_options, m_read.assertion.Conditions.element, m_recorder);
  m_recorder.Summarize((audience.empty() ? std::string("The token is not restricted to an audience")
                                         : "The token is for " + JoinTexts(audience)) +
                       (m_options.acceptedAudiences.empty()
                            ? std::string("; every audience is accepted.")
                            : "; accepted: " + JoinTexts(m_options.acceptedAudiences) + "."));
}

void Explainer::ExplainRequiredConfirmation() {
  const SubjectConfirmationType &confirmation = m_read.assertion.Subject.SubjectConfirmation;
  if (!m_read.HasMethod()) {
    m_recorder.Skip(Check::REQUIRED_CONFIRMATION, NO_METHOD);
    return;
  }
  m_recorder.Begin(Check::REQUIRED_CONFIRMATION);
  CheckRequiredConfirmation(confirmation.Method, m_options, confirmation.element, m_recorder);
  m_recorder.Summarize(std::string("The confirmation is ") + GetConfirmationName(confirmation.Method) +
                       (m_options.requiredConfirmation
                            ? std::string("; required: ") + GetConfirmationName(*m_options.requiredConfirmation) + "."
                            : std::string("; none is required.")));
}

void Explainer::SetClaimsOfFacts(TokenFacts facts) {
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

} // namespace

void ExplainAssertion(const ElementNode &root, const KeyInfoResolver &resolver, const VerifyOptions &options,
                      TokenReport &report, ReportRecorder &recorder) {
  Explainer explainer(options, report, recorder);
  if (!explainer.ExplainForm(root)) {
    recorder.SkipFrom(Check::IDENTIFIERS, NO_ASSERTION);
    return;
  }
  explainer.ExplainProperties();
  explainer.ExplainTokenSignature(resolver);
  explainer.ExplainFacts();
}

} // namespace SsoClient
