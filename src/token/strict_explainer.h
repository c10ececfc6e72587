// SPDX-License-Identifier: Apache-2.0
/// @file
/// `StrictExplainer`, which reports the checks of the profile STRICT.

#pragma once

#include "token/profile_explainer.h"
#include "token/saml2_model.h"

#include <boost/optional.hpp>

namespace SsoClient {

/// The record of the profile. It is a base class, so it is constructed before `ProfileExplainer`, which changes it.
struct StrictRecord {
  SamlAssertionType strict;
};

/// The rules of some checks differ between the profiles. If such a check fails, its summary also states whether the
/// profile SAML2 accepts the token in this check.
class StrictExplainer final : private StrictRecord, public ProfileExplainer {
public:
  explicit StrictExplainer(const ExplainContext &context) : ProfileExplainer(context, strict) {}

private:
  void Parse(NodeFilterIterator iterator, DeviationSink &sink) override;
  std::string ReadOtherProfile(const NodeFilterIterator &iterator) override;
  void ExplainProperties() override;
  void ExplainFacts() override;

  void ExplainValidity();
  void ExplainConfirmation();
  void ExplainDelegation();
  TokenFacts ExplainNames();
  void ExplainAudience(const std::set<std::string> &audience);
  void SetDetails();

  /// Sets the summary of a check. If the check has failed, the summary also states whether the profile SAML2 accepts
  /// the token, that is whether `rule` does not throw.
  template <typename Rule>
  void SummarizeBoth(const std::string &summary, const Rule &rule);

  boost::optional<Saml2Assertion> m_other; // what the profile SAML2 reads; empty if it refuses the form
};

} // namespace SsoClient
