// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Saml2Explainer`, which reports the checks of the profile SAML2.

#pragma once

#include "token/profile_explainer.h"
#include "token/saml2_checks.h"
#include "token/saml2_model.h"

#include <cstddef>
#include <string>

namespace SsoClient {

/// The record of the profile. It is a base class, so it is constructed before `ProfileExplainer`, which changes it.
struct Saml2Record {
  Saml2Assertion saml2;
};

class Saml2Explainer final : private Saml2Record, public ProfileExplainer {
public:
  explicit Saml2Explainer(const ExplainContext &context) : ProfileExplainer(context, saml2.common) {}

private:
  void Parse(NodeFilterIterator iterator, DeviationSink &sink) override;
  std::string ReadOtherProfile(const NodeFilterIterator &iterator) override;
  void ExplainProperties() override;
  void ExplainFacts() override;

  bool HasDates(TokenReport::Check check);
  void ExplainValidity();
  void ExplainConfirmation();
  void ExplainDelegation();
  TokenFacts ExplainNames();
  void ExplainAudience();
  void SetClaimsOfPeriod(const TokenFacts &facts);

  bool m_isConfirmationChosen = false;
};

} // namespace SsoClient
