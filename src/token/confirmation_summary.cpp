// SPDX-License-Identifier: Apache-2.0

#include "token/confirmation_summary.h"

#include "token/token_checks.h"
#include "xml/date_time_text.h"

#include <tarvel/core/string_util.h>

#include <cstddef>

namespace SsoClient {

namespace {

/// Whether a report shows all of `text`. If not, nothing more need be added.
bool IsShown(const std::string &text) {
  return text.size() <= Tarvel::StringUtil::MAX_VALUE_BYTES;
}

std::string NameOf(const Saml2Assertion &assertion, std::size_t index) {
  const auto &type = assertion.confirmations[index].type;
  return std::to_string(index + 1) + " (" +
         (type ? std::string(GetConfirmationName(*type)) : assertion.details.confirmations[index].method) + ")";
}

/// Adds a value that a confirmation states and, if it was not compared with anything, a remark.
void AppendStated(std::string &text, const char *name, const boost::optional<std::string> &value, bool isCompared) {
  if (value) {
    text.append("; ").append(name).append(" \"").append(*value).append("\"");
    text += isCompared ? "" : ", not checked";
  }
}

void AppendDate(std::string &text, const char *name, const boost::optional<Tarvel::System::DateTime> &date) {
  if (date) {
    text.append("; ").append(name).append(" ").append(DateTimeFormatter(*date));
  }
}

std::string UsedConfirmation(const Saml2Assertion &assertion, const VerifyOptions &options) {
  const std::size_t used = assertion.details.usedConfirmation;
  const ConfirmationDetails &details = assertion.details.confirmations[used];
  std::string text =
      "Confirmation " + NameOf(assertion, used) + " of " + std::to_string(assertion.confirmations.size()) + " is used";
  AppendDate(text, "NotBefore", details.notBefore);
  AppendDate(text, "NotOnOrAfter", details.notOnOrAfter);
  AppendStated(text, "Recipient", details.recipient, !options.acceptedRecipients.empty());
  AppendStated(text, "InResponseTo", details.inResponseTo, options.expectedInResponseTo.has_value());
  AppendStated(text, "Address", details.address, options.senderAddress.has_value());
  return text + ".";
}

} // namespace

std::string SummaryOfConfirmations(const Saml2Assertion &assertion, const VerifyOptions &options,
                                   const Tarvel::System::DateTime &now, bool isChosen) {
  const ConfirmationChoice choice(assertion, options, now);
  std::string text = isChosen ? UsedConfirmation(assertion, options) : "No confirmation can be used.";
  for (std::size_t index = 0; index < assertion.confirmations.size() && IsShown(text); ++index) {
    if (!isChosen || index != assertion.details.usedConfirmation) {
      const boost::optional<Deviation> refusal = choice.GetRefusal(index);
      text += " Not " + NameOf(assertion, index) + ": " + (refusal ? refusal->message : "another is preferred") + ".";
    }
  }
  return text;
}

} // namespace SsoClient
