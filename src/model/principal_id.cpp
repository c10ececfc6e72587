// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/principal_id.h>

#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>

namespace SsoClient {

namespace {

/// The form of a name or a domain in which letter case makes no difference.
std::string FoldCase(const std::string &text) {
  return Tarvel::StringUtil::ToUpper(text);
}

} // namespace

std::string PrincipalId::ToString() const {
  // There is no blank after "Domain:" because programs that read the logs rely on that.
  return Tarvel::MessageFormatter::ASPrint("{Name: %1; Domain:%2}", name, domain);
}

bool operator==(const PrincipalId &left, const PrincipalId &right) {
  if (&left == &right) {
    return true;
  }
  return FoldCase(left.name) == FoldCase(right.name) && FoldCase(left.domain) == FoldCase(right.domain);
}

bool operator!=(const PrincipalId &left, const PrincipalId &right) {
  return !(left == right);
}

bool PrincipalIdLess::operator()(const PrincipalId &left, const PrincipalId &right) const {
  const int order = FoldCase(left.name).compare(FoldCase(right.name));
  return order != 0 ? order < 0 : FoldCase(left.domain) < FoldCase(right.domain);
}

std::string FormatMessageArgument(const PrincipalId *principal) {
  return principal ? principal->ToString() : "(null)";
}

} // namespace SsoClient

std::size_t std::hash<SsoClient::PrincipalId>::operator()(const SsoClient::PrincipalId &principal) const {
  // The product with an odd number makes the two parts differ in weight: swapping name and domain changes the hash.
  constexpr std::size_t ODD = 31;
  const std::hash<std::string> hashOf;
  return hashOf(SsoClient::FoldCase(principal.name)) * ODD + hashOf(SsoClient::FoldCase(principal.domain));
}
