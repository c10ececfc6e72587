// SPDX-License-Identifier: Apache-2.0

#include "support/exception_class.h"

#include <ssoclient/exceptions.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <typeinfo>

namespace Testing {

using namespace SsoClient;

std::string ClassOf(const std::exception &failure) {
  const std::type_info &type = typeid(failure);
  if (type == typeid(ParseException)) {
    return "ParseException";
  }
  if (type == typeid(InvalidSignatureException)) {
    return "InvalidSignatureException";
  }
  if (type == typeid(Tarvel::Xml::XMLParseException)) {
    return "XMLParseException";
  }
  if (type == typeid(Tarvel::Xml::Security::XmlSecurityException)) { // documented for elements without canonical form
    return "XmlSecurityException";
  }
  return "undocumented";
}

} // namespace Testing
