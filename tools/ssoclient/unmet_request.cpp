// SPDX-License-Identifier: Apache-2.0

#include "unmet_request.h"

#include <ssoclient/verify_options.h>

#include <algorithm>
#include <set>

namespace SsoClient::Tool {
namespace {

using Tarvel::System::MICROSECONDS_PER_SECOND;

// A service may round both dates of a token to whole seconds, and each rounding may shorten the time of validity.
constexpr std::int64_t ROUNDING_SEC = 2;

template <typename Texts>
std::string Join(const Texts &texts) {
  std::string joined;
  for (const std::string &text : texts) {
    joined += (joined.empty() ? "" : ", ") + text;
  }
  return joined;
}

/// Whether the principal's name is the whole identifier, which the profile SAML2 does not split. Its domain then states
/// only the format and the qualifiers.
bool HasWholeName(const PrincipalId &principal) {
  return principal.domain.find("nameid:") == 0;
}

std::string Show(const PrincipalId &principal) {
  return HasWholeName(principal) ? principal.name : principal.name + "@" + principal.domain;
}

/// Whether `name` refers to `principal`. A name without a domain matches that name in any domain.
bool RefersTo(const std::string &name, const PrincipalId &principal) {
  const std::size_t at = name.rfind('@');
  if (at == std::string::npos || HasWholeName(principal)) {
    return PrincipalId{name, principal.domain} == principal;
  }
  return PrincipalId{name.substr(0, at), name.substr(at + 1)} == principal;
}

void CheckDelegation(const TokenSpec &spec, const TokenFacts &facts, std::vector<UnmetRequest> &unmet) {
  std::string actual = "not delegated";
  if (!facts.delegationChain.empty()) {
    const PrincipalId &last = facts.delegationChain.back().subject;
    if (RefersTo(*spec.delegateTo, last)) {
      return;
    }
    actual = "delegated to " + Show(last);
  }
  unmet.push_back({"delegation", "delegation to " + *spec.delegateTo + "; the token is " + actual});
}

void CheckSubject(const TokenSpec &spec, const TokenFacts &facts, std::vector<UnmetRequest> &unmet) {
  if (facts.subject && RefersTo(*spec.delegateTo, *facts.subject)) {
    return;
  }
  unmet.push_back({"delegation", "a token about " + *spec.delegateTo + "; the token is about " +
                                     (facts.subject ? Show(*facts.subject) : "nobody")});
}

void CheckOtherParty(const TokenSpec &spec, const ServiceDialect &dialect, const TokenFacts &facts,
                     std::vector<UnmetRequest> &unmet) {
  if (!spec.delegateTo) {
    return;
  }
  switch (dialect.delegation) {
  case ServiceDialect::Delegation::DELEGATE_TO:
    return CheckDelegation(spec, facts, unmet);
  case ServiceDialect::Delegation::ON_BEHALF_OF:
    return CheckSubject(spec, facts, unmet);
  case ServiceDialect::Delegation::ACT_AS:
    return;
  }
}

bool HasAdvice(const std::vector<Advice> &all, const std::string &source, const std::string &name,
               const std::string &value) {
  return std::any_of(all.begin(), all.end(), [&](const Advice &advice) {
    return advice.source == source &&
           std::any_of(advice.attributes.begin(), advice.attributes.end(), [&](const AdviceAttribute &attribute) {
             return attribute.name == name &&
                    std::find(attribute.values.begin(), attribute.values.end(), value) != attribute.values.end();
           });
  });
}

void CheckAdvice(const TokenSpec &spec, const TokenFacts &facts, std::vector<UnmetRequest> &unmet) {
  std::vector<std::string> missing;
  for (const Advice &advice : spec.advice) {
    for (const AdviceAttribute &attribute : advice.attributes) {
      for (const std::string &value : attribute.values) {
        if (!HasAdvice(facts.advice, advice.source, attribute.name, value)) {
          missing.push_back(advice.source + ":" + attribute.name + "=" + value);
        }
      }
    }
  }
  if (!missing.empty()) {
    unmet.push_back({"advice", "the advice " + Join(missing)});
  }
}

/// Whether the token is restricted to the requested audiences. A service may restrict a token to the address in
/// `wsp:AppliesTo`, too, in the same restriction or in one of its own.
bool HasAudience(const std::set<std::string> &requested, const ServiceDialect &dialect, const TokenFacts &facts) {
  std::set<std::string> withAddress = requested;
  std::set<std::string> address;
  if (dialect.appliesTo) {
    withAddress.insert(*dialect.appliesTo);
    address.insert(*dialect.appliesTo);
  }
  if (!facts.details || facts.details->audienceRestrictions.size() < 2) {
    return facts.audience == requested || facts.audience == withAddress;
  }
  const std::vector<std::set<std::string>> &all = facts.details->audienceRestrictions;
  return std::find(all.begin(), all.end(), requested) != all.end() &&
         std::all_of(all.begin(), all.end(), [&](const std::set<std::string> &one) {
           return one == requested || (dialect.appliesTo && one == address);
         });
}

void CheckAudience(const TokenSpec &spec, const ServiceDialect &dialect, const TokenFacts &facts,
                   std::vector<UnmetRequest> &unmet) {
  if (!spec.audienceRestriction.empty() && !HasAudience(spec.audienceRestriction, dialect, facts)) {
    unmet.push_back({"audience", "restriction to the audience " + Join(spec.audienceRestriction) + "; the token is " +
                                     (facts.audience.empty() ? "not restricted" : "for " + Join(facts.audience))});
  }
}

/// Whether the token is valid for the requested lifetime. A service may count from its own clock or from the
/// request's dates. So it is enough that the token ends late enough by this machine's clock, or that its own dates are
/// far enough apart and the difference of the clocks explains the rest.
bool LastsLongEnough(std::int64_t lifetimeSec, const Tarvel::System::DateTime &askedAt, const TokenFacts &facts,
                     std::int64_t toleranceSec) {
  if (!facts.startDate || !facts.endDate) {
    return false;
  }
  const std::int64_t least = (lifetimeSec - ROUNDING_SEC) * MICROSECONDS_PER_SECOND;
  const std::int64_t left = facts.endDate->MicrosecondsSince(askedAt);
  const std::int64_t span = facts.endDate->MicrosecondsSince(*facts.startDate);
  const std::int64_t tolerance =
      std::clamp<std::int64_t>(toleranceSec, 0, DEFAULT_CLOCK_TOLERANCE_SEC) * MICROSECONDS_PER_SECOND;
  return left > least || (span > least && left + tolerance > least);
}

} // namespace

std::vector<UnmetRequest> FindUnmet(const TokenSpec &spec, const ServiceDialect &dialect,
                                    const Tarvel::System::DateTime &askedAt, const TokenFacts &facts,
                                    std::int64_t toleranceSec) {
  std::vector<UnmetRequest> unmet;
  CheckOtherParty(spec, dialect, facts, unmet);
  if (spec.renewable && !facts.renewable.value_or(false)) {
    unmet.push_back({"renewable", "a renewable token"});
  }
  if (spec.delegable && !facts.delegable.value_or(false)) {
    unmet.push_back({"delegable", "a delegable token"});
  }
  CheckAdvice(spec, facts, unmet);
  CheckAudience(spec, dialect, facts, unmet);
  if (!LastsLongEnough(spec.tokenLifetimeSec, askedAt, facts, toleranceSec)) {
    unmet.push_back({"lifetime", "a lifetime of " + std::to_string(spec.tokenLifetimeSec) +
                                     " seconds; the token ends at " +
                                     (facts.endDate ? facts.endDate->ToString() : "no known time")});
  }
  return unmet;
}

} // namespace SsoClient::Tool
