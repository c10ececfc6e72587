// SPDX-License-Identifier: Apache-2.0

#include "support/facts_of.h"

#include <set>
#include <sstream>
#include <utility>
#include <vector>

namespace Testing {

using namespace SsoClient;

namespace {

void AppendPrincipal(std::ostream &out, const char *label, const PrincipalId &principal) {
  out << label << " {" << principal.name << "} {" << principal.domain << "}\n";
}

void AppendAdvice(std::ostream &out, const SamlToken &token) {
  std::vector<Advice> advice;
  token.GetAdvice(advice);
  for (const Advice &one : advice) {
    out << "advice {" << one.source << "}\n";
    for (const AdviceAttribute &attribute : one.attributes) {
      out << "attribute {" << attribute.name << "}";
      for (const std::string &value : attribute.values) {
        out << " {" << value << "}";
      }
      out << '\n';
    }
  }
}

} // namespace

std::string FactsOf(const SamlToken &token) {
  std::ostringstream out;
  out << "id {" << token.GetId() << "}\n";
  AppendPrincipal(out, "subject", token.GetSubject());
  out << "from " << token.GetStartDate().GetUtcTime() << " to " << token.GetEndDate().GetUtcTime() << '\n';
  out << "flags " << token.IsRenewable() << token.IsDelegable() << token.IsSolution() << token.GetConfirmationMethod()
      << '\n';
  std::pair<std::string, std::string> fullName;
  token.GetFullName(fullName);
  out << "name {" << fullName.first << "} {" << fullName.second << "}\n";
  std::vector<PrincipalId> groups;
  token.GetGroups(groups);
  for (const PrincipalId &group : groups) {
    AppendPrincipal(out, "group", group);
  }
  std::vector<Delegate> chain;
  token.GetDelegationChain(chain);
  for (const Delegate &delegate : chain) {
    AppendPrincipal(out, "delegate", delegate.subject);
    out << "at " << delegate.delegationInstant.GetUtcTime() << '\n';
  }
  std::set<std::string> audience;
  token.GetAudience(audience);
  for (const std::string &text : audience) {
    out << "audience {" << text << "}\n";
  }
  AppendAdvice(out, token);
  if (token.GetConfirmationCertificate()) {
    out << "certificate " << token.GetConfirmationCertificate()->GetSha256Thumbprint() << '\n';
  }
  return out.str();
}

} // namespace Testing
