// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/descriptions.h>

#include <tarvel/core/message_formatter.h>
#include <tarvel/system/date_time.h>

#include <boost/algorithm/string/join.hpp>

namespace SsoClient {

using Tarvel::DatePrintFormatter;
using Tarvel::MessageFormatter;

// Programs read the texts below, so their oddities must stay: missing blanks and brackets, and the label "source"
// before the name of an attribute.

std::string WriteDelegate(const Delegate *delegate) {
  return delegate->subject.ToString() + " at " + delegate->delegationInstant.ToString();
}

std::string WriteAdviceAttribute(const AdviceAttribute *attribute) {
  return MessageFormatter::ASPrint("[source=%1, attributes=[%2]]", attribute->name,
                                   boost::algorithm::join(attribute->values, ", "));
}

std::string WriteAdvice(const Advice *advice) {
  return MessageFormatter::ASPrint("Advice [source=%1, attributes=[%2]]", advice->source,
                                   AsString(advice->attributes, WriteAdviceAttribute));
}

std::string WriteTokenSpec(const TokenSpec &spec) {
  return MessageFormatter::ASPrint(
      "TokenSpec [tokenLifetimeSec=%1, delegable=%2, delegateTo=%3, renewable=%4, "
      "confirmationType=%5,audienceRestriction=%6, advice=[%7]",
      spec.tokenLifetimeSec, spec.delegable, spec.delegateTo ? *spec.delegateTo : "<unset>", spec.renewable,
      spec.confirmation, boost::algorithm::join(spec.audienceRestriction, ", "), AsString(spec.advice, WriteAdvice));
}

std::string CreateRedactedDescription(const SamlToken &token) {
  return MessageFormatter::ASPrint(
      "SamlToken [subject=%1, groups=[%2], delegationChain=[%3], startTime=%4, expirationTime=%5, renewable=%6, "
      "delegable=%7, isSolution=%8,confirmationType=%9]",
      &token.GetSubject(), AsString(token.GetGroups(), &PrincipalId::ToString),
      AsString(token.GetDelegationChain(), WriteDelegate), DatePrintFormatter::Format(token.GetStartDate()),
      DatePrintFormatter::Format(token.GetEndDate()), token.IsRenewable(), token.IsDelegable(), token.IsSolution(),
      token.GetConfirmationMethod());
}

} // namespace SsoClient
