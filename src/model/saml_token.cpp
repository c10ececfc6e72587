// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/saml_token.h>

namespace SsoClient {

std::pair<std::string, std::string> SamlToken::GetFullName() const {
  std::pair<std::string, std::string> fullName;
  GetFullName(fullName);
  return fullName;
}

std::vector<PrincipalId> SamlToken::GetGroups() const {
  std::vector<PrincipalId> groups;
  GetGroups(groups);
  return groups;
}

std::vector<Delegate> SamlToken::GetDelegationChain() const {
  std::vector<Delegate> delegationChain;
  GetDelegationChain(delegationChain);
  return delegationChain;
}

std::set<std::string> SamlToken::GetAudience() const {
  std::set<std::string> audience;
  GetAudience(audience);
  return audience;
}

std::vector<Advice> SamlToken::GetAdvice() const {
  std::vector<Advice> advice;
  GetAdvice(advice);
  return advice;
}

} // namespace SsoClient
