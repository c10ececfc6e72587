// SPDX-License-Identifier: Apache-2.0
/// @file
/// `StrictExplainer`, which reports the checks of the profile STRICT.

#pragma once

#include "token/profile_explainer.h"
#include "token/saml2_model.h"

#include <boost/optional.hpp>

namespace SsoClient {

/// The record of the profile. It is a base, so that it exists before the explainer that marks it.
struct StrictRecord {
  SamlAssertionType strict;
};

/// If a check whose rules the profiles do not share has failed, also reports whether the profile SAML2 accepts the token
/// there.
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

  /// Summarizes a check. If it has failed, `rule` is what the profile SAML2 checks there.
  template <typename Rule>
  void SummarizeBoth(const std::string &summary, const Rule &rule);

  boost::optional<Saml2Assertion> m_other; // what the profile SAML2 reads; empty if it refuses the form
};

} // namespace SsoClient
