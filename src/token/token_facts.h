// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenFacts`, the content of a token, and the readers of its names, groups, delegates and attributes.

#pragma once

#include "token/assertion_model.h"
#include "xml/deviation_sink.h"

#include <ssoclient/advice.h>
#include <ssoclient/delegate.h>
#include <ssoclient/principal_id.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/verify_options.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>

#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace SsoClient {

/// The `Format` of a user principal name, `name@domain`.
constexpr std::string_view FORMAT_UPN = "http://schemas.xmlsoap.org/claims/UPN";

/// The content of an assertion, verified or not.
struct TokenFacts {
  std::string id;
  Tarvel::System::DateTime startDate;
  Tarvel::System::DateTime endDate;
  PrincipalId subject;
  bool renewable = false;
  bool delegable = false;
  bool solution = false;
  std::pair<std::string, std::string> fullName; ///< first name and last name
  std::vector<PrincipalId> groups;
  std::vector<Delegate> delegationChain;
  std::set<std::string> audience;
  std::vector<Advice> advice;
  SamlToken::ConfirmationType confirmationMethod = SamlToken::BEARER;
  Tarvel::Ref<const Tarvel::Crypto::Certificate> confirmationCertificate; ///< null for bearer
};

/// The content of `assertion`, which is moved from. Neither its dates nor its signature are checked here.
/// @throws ParseException when a name, a group or the solution attribute is malformed.
TokenFacts TakeTokenFacts(SamlAssertionType &&assertion);

/// The steps of `TakeTokenFacts`, in their order. What cannot be read is reported to `sink`, and left out if the sink
/// does not throw. They move values out of their first argument.
void TakeSubject(SamlAssertionType &assertion, TokenFacts &facts, DeviationSink &sink);
void TakeAttributes(SamlAssertionType &assertion, TokenFacts &facts, DeviationSink &sink,
                    TokenProfile profile = TokenProfile::STRICT);
void TakeConditions(ConditionsType &conditions, TokenFacts &facts, DeviationSink &sink);

/// The part of `TakeConditions` that both profiles have: whether the token may be renewed, and whether it may be delegated.
void TakePermissions(const ConditionsType &conditions, TokenFacts &facts);

/// The four kinds of attributes that are read; others are ignored. Each function checks the `Name` of `attribute`.
bool SamlAttributeIsGroupIdentity(const AttributeType &attribute);
bool SamlAttributeIsSolution(const AttributeType &attribute);
bool SamlAttributeIsGivenName(const AttributeType &attribute);
bool SamlAttributeIsSurName(const AttributeType &attribute);

/// The group in the form `domain\name`. The first backslash is the separator.
/// @throws ParseException when domain or name is missing.
PrincipalId ParseGroupIdentity(std::string value);

/// The principal in the form `name@domain`. The last at-sign is the separator.
/// @throws ParseException when the format is not that of a user principal name, or when name or domain is missing.
PrincipalId ParseSamlNameId(const NameIDType &nameId);

/// Splits `text` at its last at-sign. Returns whether there is text on both sides; otherwise `principal` is not changed.
bool SplitUserPrincipalName(const std::string &text, PrincipalId &principal);

/// Whether the attribute's only value is "true", in any letter case.
/// @throws ParseException when it has no value or several.
bool ParseIsSolutionAttribute(const AttributeType &attribute);

/// The attribute's first value; empty when it has none.
std::string ParsePrincipalNameAttribute(const AttributeType &attribute);

/// The delegate and the time of the delegation.
/// @throws ParseException in the same cases as `ParseSamlNameId`.
Delegate ParseToDelegate(const DelegateType &delegate);

/// The same functions for a sink that need not throw. They return whether the value could be read. If not, they report
/// why and do not change the name or the flag.
/// @param place the element that contains the group; may be null
bool ParseGroupIdentity(std::string &&value, PrincipalId &group, const Tarvel::Xml::ElementNode *place,
                        DeviationSink &sink);
bool ParseSamlNameId(const NameIDType &nameId, PrincipalId &principal, DeviationSink &sink);
bool ParseIsSolutionAttribute(const AttributeType &attribute, bool &isSolution, DeviationSink &sink);
bool ParseToDelegate(const DelegateType &delegate, Delegate &parsed, DeviationSink &sink);

} // namespace SsoClient
