// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a token says about its subject: readers of names, groups, delegates and attributes.

#pragma once

#include "token/assertion_model.h"

#include <ssoclient/delegate.h>
#include <ssoclient/principal_id.h>

#include <string>

namespace SsoClient {

/// Which of the attributes that mean something to the token this is, by its `Name`.
bool SamlAttributeIsGroupIdentity(const AttributeType &attribute);
bool SamlAttributeIsSolution(const AttributeType &attribute);
bool SamlAttributeIsGivenName(const AttributeType &attribute);
bool SamlAttributeIsSurName(const AttributeType &attribute);

/// The group written as `domain\name`; the first backslash parts them.
/// @throws ParseException when one of them is missing.
PrincipalId ParseGroupIdentity(const std::string &value);

/// The principal written as `name@domain`; the last at-sign parts them.
/// @throws ParseException when the format is not the user principal name, or one of them is missing.
PrincipalId ParseSamlNameId(const NameIDType &nameId);

/// Whether the attribute's one value is "true", in any letter case.
/// @throws ParseException when it has no value or several.
bool ParseIsSolutionAttribute(const AttributeType &attribute);

/// The attribute's first value; empty when it has none.
std::string ParsePrincipalNameAttribute(const AttributeType &attribute);

/// @throws ParseException as `ParseSamlNameId`.
Delegate ParseToDelegate(const DelegateType &delegate);

} // namespace SsoClient
