// SPDX-License-Identifier: Apache-2.0
#include "token/schema_names.h"

#include "model/namespaces.h"

#include <string>

namespace SsoClient::SchemaNames {

using Tarvel::Xml::QName;

const QName XSI_TYPE(std::string(Namespaces::XSI), "type");
const QName KEY_INFO_CONFIRMATION_DATA_TYPE(std::string(Namespaces::SAML), "KeyInfoConfirmationDataType");
const QName DELEGATION_RESTRICTION_TYPE(std::string(Namespaces::DELEGATION), "DelegationRestrictionType");
const QName RENEW_RESTRICTION_TYPE(std::string(Namespaces::RSA_SAML2), "RenewRestrictionType");

} // namespace SsoClient::SchemaNames
