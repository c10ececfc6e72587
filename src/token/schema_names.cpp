// SPDX-License-Identifier: Apache-2.0
#include "token/schema_names.h"

#include "model/namespaces.h"

#include <mutex>
#include <string>
#include <string_view>

namespace SsoClient::SchemaNames {

using Tarvel::Xml::QName;

namespace {

/// A name that is made at its first use and never destroyed. A child that another thread forks meanwhile makes it anew:
/// `pthread_once`, on which `std::call_once` rests, sees to that, while the guard of a static object would stay taken there.
class SharedName {
public:
  const QName &Get(std::string_view nameSpace, const char *localName) {
    std::call_once(m_once, [&] { m_name = new QName(std::string(nameSpace), localName); });
    return *m_name;
  }

private:
  std::once_flag m_once;
  const QName *m_name = nullptr;
};

constinit SharedName xsiType;
constinit SharedName keyInfoConfirmationDataType;
constinit SharedName delegationRestrictionType;
constinit SharedName renewRestrictionType;

} // namespace

const QName &XsiType() {
  return xsiType.Get(Namespaces::XSI, "type");
}

const QName &KeyInfoConfirmationDataType() {
  return keyInfoConfirmationDataType.Get(Namespaces::SAML, "KeyInfoConfirmationDataType");
}

const QName &DelegationRestrictionType() {
  return delegationRestrictionType.Get(Namespaces::DELEGATION, "DelegationRestrictionType");
}

const QName &RenewRestrictionType() {
  return renewRestrictionType.Get(Namespaces::RSA_SAML2, "RenewRestrictionType");
}

} // namespace SsoClient::SchemaNames
