// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ProfileExplainer`, which reports those checks of an assertion that both profiles have.

#pragma once

#include "token/read_assertion.h"
#include "token/report_recorder.h"
#include "token/token_facts.h"
#include "xml/node_filter_iterator.h"

#include <ssoclient/token_report.h>
#include <ssoclient/verify_options.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/key_info_resolver.h>

#include <set>
#include <string>

namespace SsoClient {

/// What a report states if something that a check needs is missing.
namespace Missing {
constexpr const char *ASSERTION = "There is no assertion.";
constexpr const char *CONDITIONS = "There are no Conditions.";
constexpr const char *CONFIRMATION = "There is no SubjectConfirmation.";
constexpr const char *START = "The NotBefore of the Conditions cannot be read.";
constexpr const char *END = "The NotOnOrAfter of the Conditions cannot be read.";
} // namespace Missing

/// What the checks need, and where they are reported. Everything must outlive the explainer.
struct ExplainContext {
  const Tarvel::Xml::Security::KeyInfoResolver &resolver;
  const VerifyOptions &options;
  TokenReport &report;
  ReportRecorder &recorder;
};

/// Reads the assertion and runs the checks on what could be read. A profile adds the checks that it does not share.
class ProfileExplainer {
public:
  ProfileExplainer(const ProfileExplainer &) = delete;
  ProfileExplainer &operator=(const ProfileExplainer &) = delete;

  /// Runs all checks after WELL_FORMED on `root`, or on the first assertion in it.
  void Explain(const Tarvel::Xml::ElementNode &root);

protected:
  /// `record` is the part of the profile's record that both profiles have.
  ProfileExplainer(const ExplainContext &context, SamlAssertionType &record)
      : m_options(context.options), m_report(context.report), m_recorder(context.recorder), m_read(record),
        m_resolver(context.resolver) {}
  ~ProfileExplainer() = default;

  /// Reads the assertion at the cursor, or the first one below it.
  virtual void Parse(NodeFilterIterator iterator, DeviationSink &sink) = 0;
  /// Reads the assertion at the cursor in the other profile, and stops at the first deviation. Returns a sentence that
  /// states whether that profile reads it; empty if that follows from the outcome in this profile.
  virtual std::string ReadOtherProfile(const NodeFilterIterator &iterator) = 0;
  /// The checks VALIDITY, CONFIRMATION and DELEGATION.
  virtual void ExplainProperties() = 0;
  /// The checks NAMES, AUDIENCE and REQUIRED_CONFIRMATION, and the claims. May move values out of the record.
  virtual void ExplainFacts() = 0;

  /// The summary of VALIDITY, which has been checked.
  std::string SummaryOfValidity() const;
  /// The summary of DELEGATION, which has been checked.
  std::string SummaryOfDelegation() const;
  /// Whether the delegates can be compared. If not, the check DELEGATION is skipped.
  bool HasDelegates();
  /// @param tokenAudience how the summary names the audiences; empty if there is no restriction
  std::string SummaryOfAudience(const std::string &tokenAudience) const;
  void ExplainRequiredConfirmation();
  void SetClaimsOfFacts(TokenFacts facts);

  const VerifyOptions &m_options;
  TokenReport &m_report;
  ReportRecorder &m_recorder;
  ReadAssertion m_read;

private:
  void ExplainForm(const Tarvel::Xml::ElementNode &root);
  std::string SummaryOfForm(const Tarvel::Xml::ElementNode &root);
  void ExplainIdentifiers();

  const Tarvel::Xml::Security::KeyInfoResolver &m_resolver;
};

} // namespace SsoClient
