// SPDX-License-Identifier: Apache-2.0
/// @file
/// The lines of text about a token's details.

#include "details_view.h"
#include "time_text.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <string>
#include <string_view>

namespace SsoClient::Tool {
namespace {

/// The attributes that have lines of their own: groups, the solution flag, and the two parts of the full name.
constexpr std::array<std::string_view, 4> SHOWN_ELSEWHERE = {
    SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity",
    SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution",
    "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname",
    "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname"};

bool IsShownElsewhere(const SamlAttribute &attribute) {
  return std::find(SHOWN_ELSEWHERE.begin(), SHOWN_ELSEWHERE.end(), attribute.name) != SHOWN_ELSEWHERE.end();
}

void AddAttribute(const SamlAttribute &attribute, LabelledLines &lines) {
  lines.Add("Attribute:", attribute.name);
  for (const AttributeValue &value : attribute.values) {
    lines.Add("", value.isNil ? "(nil)" : "= " + value.text);
  }
}

void AddSession(const AuthnStatementDetails &statement, const Tarvel::System::DateTime &now, LabelledLines &lines) {
  lines.AddUnlessEmpty("Session:", statement.sessionIndex.value_or(""));
  if (const auto &end = statement.sessionNotOnOrAfter) {
    lines.Add("Session end:", UtcText(*end) + " (" + WhenText(*end, now) + ")");
  }
}

} // namespace

void AddConfirmationLines(const TokenDetails &details, LabelledLines &lines) {
  const bool isOnly = details.confirmations.size() == 1;
  for (std::size_t index = 0; index < details.confirmations.size(); ++index) {
    const ConfirmationDetails &confirmation = details.confirmations[index];
    if (isOnly || index == details.usedConfirmation) {
      lines.AddUnlessEmpty("Recipient:", confirmation.recipient.value_or(""));
      lines.AddUnlessEmpty("In response to:", confirmation.inResponseTo.value_or(""));
      lines.AddUnlessEmpty("Sender address:", confirmation.address.value_or(""));
    } else {
      lines.Add("Not used:", confirmation.method);
    }
  }
}

void AddDetailLines(const TokenDetails &details, const Tarvel::System::DateTime &now, LabelledLines &lines) {
  lines.AddUnlessEmpty("Name here:", details.subject.spProvidedId.value_or(""));
  if (details.isOneTimeUse) {
    lines.Add("One-time use:", "yes");
  }
  if (details.proxyRestriction) {
    for (const std::string &audience : details.proxyRestriction->audiences) {
      lines.Add("Proxy audience:", audience);
    }
  }
  for (const AuthnStatementDetails &statement : details.authnStatements) {
    AddSession(statement, now, lines);
  }
  for (const SamlAttribute &attribute : details.attributes) {
    if (!IsShownElsewhere(attribute)) {
      AddAttribute(attribute, lines);
    }
  }
}

} // namespace SsoClient::Tool
