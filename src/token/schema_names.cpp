// SPDX-License-Identifier: Apache-2.0
#include "token/schema_names.h"

#include "model/namespaces.h"

#include <string>

namespace SsoClient::SchemaNames {

using Tarvel::Xml::QName;

// Never destroyed: a token may be read on a thread of the pool while the process ends.
const QName &XSI_TYPE = *new QName(std::string(Namespaces::XSI), "type");
const QName &KEY_INFO_CONFIRMATION_DATA_TYPE = *new QName(std::string(Namespaces::SAML), "KeyInfoConfirmationDataType");
const QName &DELEGATION_RESTRICTION_TYPE = *new QName(std::string(Namespaces::DELEGATION), "DelegationRestrictionType");
const QName &RENEW_RESTRICTION_TYPE = *new QName(std::string(Namespaces::RSA_SAML2), "RenewRestrictionType");

} // namespace SsoClient::SchemaNames
