// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/principal_id.h>

#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>

namespace SsoClient {

using Tarvel::StringUtil;

std::string PrincipalId::ToString() const {
  // No blank after "Domain:"; who reads the logs by machine relies on it.
  return Tarvel::MessageFormatter::ASPrint("{Name: %1; Domain:%2}", name, domain);
}

bool operator==(const PrincipalId &left, const PrincipalId &right) {
  if (&left == &right) {
    return true;
  }
  return StringUtil::ToUpper(left.name) == StringUtil::ToUpper(right.name) &&
         StringUtil::ToUpper(left.domain) == StringUtil::ToUpper(right.domain);
}

bool operator!=(const PrincipalId &left, const PrincipalId &right) {
  return !(left == right);
}

std::string FormatMessageArgument(const PrincipalId *principal) {
  return principal ? principal->ToString() : "(null)";
}

} // namespace SsoClient
