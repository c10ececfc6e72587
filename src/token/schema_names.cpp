// SPDX-License-Identifier: Apache-2.0
#include "token/schema_names.h"

#include "model/namespaces.h"

#include <string>

namespace SsoClient::SchemaNames {

using Tarvel::Xml::QName;

const QName &XsiType() {
  static const QName &name = *new QName(std::string(Namespaces::XSI), "type");
  return name;
}

const QName &KeyInfoConfirmationDataType() {
  static const QName &name = *new QName(std::string(Namespaces::SAML), "KeyInfoConfirmationDataType");
  return name;
}

const QName &DelegationRestrictionType() {
  static const QName &name = *new QName(std::string(Namespaces::DELEGATION), "DelegationRestrictionType");
  return name;
}

const QName &RenewRestrictionType() {
  static const QName &name = *new QName(std::string(Namespaces::RSA_SAML2), "RenewRestrictionType");
  return name;
}

} // namespace SsoClient::SchemaNames
