// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_facts.h"

#include "token/saml2_checks.h"
#include "token/saml2_details.h"
#include "token/token_checks.h"

#include <tarvel/core/string_util.h>

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

constexpr std::string_view FORMAT_UNSPECIFIED = "urn:oasis:names:tc:SAML:1.1:nameid-format:unspecified";
constexpr std::string_view NAME_ID = "nameid:";

struct KnownFormat {
  std::string_view uri;
  std::string_view key;
};

constexpr KnownFormat KNOWN_FORMATS[] = {
    {FORMAT_UNSPECIFIED, "unspecified"},
    {"urn:oasis:names:tc:SAML:1.1:nameid-format:emailAddress", "email"},
    {"urn:oasis:names:tc:SAML:1.1:nameid-format:X509SubjectName", "x509-subject"},
    {"urn:oasis:names:tc:SAML:1.1:nameid-format:WindowsDomainQualifiedName", "windows"},
    {"urn:oasis:names:tc:SAML:2.0:nameid-format:kerberos", "kerberos"},
    {"urn:oasis:names:tc:SAML:2.0:nameid-format:entity", "entity"},
    {"urn:oasis:names:tc:SAML:2.0:nameid-format:persistent", "persistent"},
    {"urn:oasis:names:tc:SAML:2.0:nameid-format:transient", "transient"},
    {FORMAT_UPN, "upn"},
};

std::string_view FormatOf(const NameId &nameId) {
  return nameId.format ? std::string_view(*nameId.format) : FORMAT_UNSPECIFIED;
}

/// Upper-case letters are encoded, too, because `PrincipalId` ignores letter case.
bool IsWrittenAsItIs(char octet) {
  constexpr std::string_view MARKS = "-._~:/";
  return (octet >= 'a' && octet <= 'z') || (octet >= '0' && octet <= '9') ||
         MARKS.find(octet) != std::string_view::npos;
}

void AppendEncoded(std::string &text, std::string_view value) {
  constexpr std::string_view DIGITS = "0123456789ABCDEF";
  const auto plain = static_cast<std::size_t>(std::count_if(value.begin(), value.end(), IsWrittenAsItIs));
  text.reserve(text.size() + 3 * value.size() - 2 * plain); // exactly, because a qualifier may be very long
  for (const char octet : value) {
    if (IsWrittenAsItIs(octet)) {
      text += octet;
    } else {
      const auto number = static_cast<unsigned char>(octet);
      text += {'%', DIGITS[number / DIGITS.size()], DIGITS[number % DIGITS.size()]};
    }
  }
}

void AppendFormat(std::string &domain, std::string_view format) {
  const auto *const known = std::find_if(std::begin(KNOWN_FORMATS), std::end(KNOWN_FORMATS),
                                         [format](const KnownFormat &one) { return one.uri == format; });
  if (known != std::end(KNOWN_FORMATS)) {
    domain += known->key;
  } else {
    domain += "format=";
    AppendEncoded(domain, format);
  }
}

void AppendQualifier(std::string &domain, std::string_view name, const boost::optional<std::string> &qualifier) {
  if (qualifier) {
    domain += name;
    AppendEncoded(domain, *qualifier);
  }
}

/// Whether `domain` could be mistaken for one that states a format. Principals are compared without letter case, and
/// some letters beyond ASCII become ASCII letters in upper case.
bool StatesFormat(const std::string &domain) {
  const std::string upperCase = Tarvel::StringUtil::ToUpper(domain);
  return upperCase.compare(0, NAME_ID.size(), Tarvel::StringUtil::ToUpper(std::string(NAME_ID))) == 0;
}

} // namespace

PrincipalId ToPrincipalId(const NameId &nameId) {
  PrincipalId principal;
  const std::string_view format = FormatOf(nameId);
  if (format == FORMAT_UPN && !nameId.nameQualifier && !nameId.spNameQualifier &&
      SplitUserPrincipalName(nameId.value, principal) && !StatesFormat(principal.domain)) {
    return principal;
  }
  std::string domain(NAME_ID);
  AppendFormat(domain, format);
  AppendQualifier(domain, ";name-qualifier=", nameId.nameQualifier);
  AppendQualifier(domain, ";sp-name-qualifier=", nameId.spNameQualifier);
  return {nameId.value, std::move(domain)};
}

bool IsSameIdentifier(const NameId &left, const NameId &right) {
  return left.value == right.value && FormatOf(left) == FormatOf(right) && left.nameQualifier == right.nameQualifier &&
         left.spNameQualifier == right.spNameQualifier;
}

TokenFacts TakeSaml2Facts(Saml2Assertion &assertion) {
  TokenFacts facts;
  TakeSaml2Subject(assertion, facts);
  TakeSaml2Attributes(assertion, facts, ThrowingSink());
  TakeSaml2Conditions(assertion, facts);
  return facts;
}

void TakeSaml2Subject(Saml2Assertion &assertion, TokenFacts &facts) {
  SubjectConfirmationType &confirmation = assertion.common.Subject.SubjectConfirmation;
  facts.id = std::move(assertion.common.ID);
  facts.subject = ToPrincipalId(assertion.details.subject);
  facts.confirmationMethod = confirmation.Method;
  if (confirmation.Method == SamlToken::HOLDER_OF_KEY) {
    facts.confirmationCertificate = std::move(confirmation.SubjectConfirmationData.certificate);
  }
}

void TakeSaml2Attributes(Saml2Assertion &assertion, TokenFacts &facts, DeviationSink &sink) {
  TakeAttributes(assertion.common, facts, sink, TokenProfile::SAML2);
}

void TakeSaml2Conditions(const Saml2Assertion &assertion, TokenFacts &facts) {
  const ConditionsType &conditions = assertion.common.Conditions;
  const TokenPeriod period = GetTokenPeriod(assertion);
  facts.startDate = period.start;
  facts.endDate = period.end;
  TakePermissions(conditions, facts);
  if (conditions.DelegationRestriction) {
    facts.delegationChain.reserve(conditions.DelegationRestriction->delegates.size());
    for (const DelegateType &delegate : conditions.DelegationRestriction->delegates) {
      if (delegate.NameID.element) {
        facts.delegationChain.push_back(
            {ToPrincipalId(ReadNameId(*delegate.NameID.element)), delegate.DelegationInstant});
      }
    }
  }
}

std::string JoinRestrictions(const std::vector<std::set<std::string>> &restrictions) {
  std::string joined;
  for (const std::set<std::string> &audiences : restrictions) {
    if (!joined.empty()) {
      joined += " and ";
    }
    joined += '(';
    joined += JoinTexts(audiences);
    joined += ')';
  }
  return joined;
}

std::set<std::string> TakeCommonAudiences(std::vector<std::set<std::string>> &&restrictions) {
  std::set<std::string> common;
  if (restrictions.empty()) {
    return common;
  }
  // Each audience of the smallest set is looked up in the other sets, so there are fewer look-ups than audiences.
  const auto smallest =
      std::min_element(restrictions.begin(), restrictions.end(),
                       [](const auto &left, const auto &right) { return left.size() < right.size(); });
  for (auto one = smallest->begin(); one != smallest->end();) {
    const auto candidate = one++;
    if (std::all_of(restrictions.begin(), restrictions.end(), [&](const auto &audiences) {
          return &audiences == &*smallest || audiences.count(*candidate) != 0;
        })) {
      common.insert(common.end(), smallest->extract(candidate));
    }
  }
  if (common.empty()) {
    common.insert(JoinRestrictions(restrictions));
  }
  return common;
}

} // namespace SsoClient
