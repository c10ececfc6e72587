// SPDX-License-Identifier: Apache-2.0
/// @file
/// The qualified names of attributes and types that the parsers compare against.

#pragma once

#include "model/namespaces.h"
#include "xml/qualified_name.h"

namespace SsoClient::SchemaNames {

constexpr QNameView XSI_TYPE(Namespaces::XSI, "type");
constexpr QNameView KEY_INFO_CONFIRMATION_DATA_TYPE(Namespaces::SAML, "KeyInfoConfirmationDataType");
constexpr QNameView DELEGATION_RESTRICTION_TYPE(Namespaces::DELEGATION, "DelegationRestrictionType");
constexpr QNameView RENEW_RESTRICTION_TYPE(Namespaces::RSA_SAML2, "RenewRestrictionType");

} // namespace SsoClient::SchemaNames
