// SPDX-License-Identifier: Apache-2.0
/// @file
/// The content of a token in the profile SAML2, and how an identifier becomes a principal.

#pragma once

#include "token/saml2_model.h"
#include "token/token_facts.h"
#include "xml/deviation_sink.h"

#include <ssoclient/principal_id.h>
#include <ssoclient/token_details.h>

#include <set>
#include <string>
#include <vector>

namespace SsoClient {

/// The principal with this identifier.
///
/// A user principal name `name@domain` without qualifiers is split at its last at-sign, as in the profile STRICT,
/// unless its domain begins with "nameid:". Any other identifier becomes a principal whose name is the value. The
/// domain states the format and the qualifiers: "nameid:", the key of the format, and ";name-qualifier=" and
/// ";sp-name-qualifier=", each with its value, if they are there. The keys are "unspecified" (also if there is no
/// format), "email", "x509-subject", "windows", "kerberos", "entity", "persistent", "transient" and "upn", and
/// "format=" with the URI for every other format. In URI and qualifiers, every octet except lower-case letters, digits
/// and "-._~:/" is percent-encoded. So identifiers that differ in format or qualifiers, or in the value by more than
/// letter case, are different principals. `SPProvidedID` is ignored, because it is not part of the identity.
PrincipalId ToPrincipalId(const NameId &nameId);

/// Whether two identifiers name the same party: value, format and qualifiers are equal. No format and the format
/// "unspecified" are the same.
bool IsSameIdentifier(const NameId &left, const NameId &right);

/// The content of `assertion` without its audiences. Its confirmation must have been chosen. Values are moved out of
/// `assertion.common`. The dates are those within which the token can be used.
/// @throws ParseException when a group or the solution attribute is malformed.
TokenFacts TakeSaml2Facts(Saml2Assertion &assertion);

/// The steps of `TakeSaml2Facts`, in their order. What cannot be read is reported to `sink`, and left out if the sink does
/// not throw. They move values out of `assertion.common`, but change neither its dates nor `assertion.details`.
void TakeSaml2Subject(Saml2Assertion &assertion, TokenFacts &facts);
void TakeSaml2Attributes(Saml2Assertion &assertion, TokenFacts &facts, DeviationSink &sink);
void TakeSaml2Conditions(const Saml2Assertion &assertion, TokenFacts &facts);

/// The audiences that are in each of `restrictions`, so each of them meets all restrictions. If there is no such
/// audience, the only entry is a text that lists all restrictions, and that no address equals. Empty if there are no
/// restrictions. There may be very many audiences, so they are moved, and there are fewer look-ups than audiences.
std::set<std::string> TakeCommonAudiences(std::vector<std::set<std::string>> &&restrictions);

/// A text with blanks, so no address equals it: "(urn:a, urn:b) and (urn:c)".
std::string JoinRestrictions(const std::vector<std::set<std::string>> &restrictions);

} // namespace SsoClient
