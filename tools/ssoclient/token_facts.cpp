// SPDX-License-Identifier: Apache-2.0

#include "token_facts.h"

namespace SsoClient::Tool {

TokenFacts FactsOf(const SamlToken &token) {
  TokenFacts facts;
  facts.id = token.GetId();
  facts.subject = token.GetSubject();
  facts.confirmation = token.GetConfirmationMethod();
  facts.startDate = token.GetStartDate();
  facts.endDate = token.GetEndDate();
  facts.renewable = token.IsRenewable();
  facts.delegable = token.IsDelegable();
  facts.solution = token.IsSolution();
  facts.fullName = token.GetFullName();
  facts.groups = token.GetGroups();
  facts.delegationChain = token.GetDelegationChain();
  facts.audience = token.GetAudience();
  facts.advice = token.GetAdvice();
  if (const Tarvel::Crypto::Certificate *const certificate = token.GetConfirmationCertificate()) {
    facts.certificate = CertificateFacts{certificate->GetSubject(), certificate->GetSha256Thumbprint()};
  }
  facts.details = GetTokenDetails(token);
  return facts;
}

TokenFacts FactsOf(const UnverifiedClaims &claims) {
  TokenFacts facts;
  facts.id = claims.id;
  facts.subject = claims.subject;
  facts.confirmation = claims.confirmation;
  facts.startDate = claims.startDate;
  facts.endDate = claims.endDate;
  facts.renewable = claims.renewable;
  facts.delegable = claims.delegable;
  facts.solution = claims.solution;
  facts.fullName = claims.fullName;
  facts.groups = claims.groups;
  facts.delegationChain = claims.delegationChain;
  facts.audience = claims.audience;
  facts.advice = claims.advice;
  if (!claims.certificateThumbprint.empty()) {
    facts.certificate = CertificateFacts{claims.certificateSubject, claims.certificateThumbprint};
  }
  facts.details = claims.details;
  return facts;
}

} // namespace SsoClient::Tool
