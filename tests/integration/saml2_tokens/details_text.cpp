// SPDX-License-Identifier: Apache-2.0

#include "details_text.h"

#include "xml/date_time_text.h"

#include <tarvel/core/string_util.h>

#include <sstream>
#include <stdexcept>
#include <string_view>

namespace Testing {

using namespace SsoClient;
using Tarvel::System::DateTime;

namespace {

void AddText(std::ostream &out, std::string_view label, const boost::optional<std::string> &text) {
  if (text) {
    out << ' ' << label << " {" << *text << '}';
  }
}

void AddTime(std::ostream &out, std::string_view label, const boost::optional<DateTime> &time) {
  if (time) {
    out << ' ' << label << ' ' << DateTimeFormatter(*time);
  }
}

void AddConfirmation(std::ostream &out, const ConfirmationDetails &confirmation) {
  out << "confirmation {" << confirmation.method << '}';
  AddTime(out, "not-before", confirmation.notBefore);
  AddTime(out, "not-on-or-after", confirmation.notOnOrAfter);
  AddText(out, "recipient", confirmation.recipient);
  AddText(out, "in-response-to", confirmation.inResponseTo);
  AddText(out, "address", confirmation.address);
  if (confirmation.certificate) {
    AddText(out, "certificate", confirmation.certificate->GetSha256Thumbprint());
  }
  if (!confirmation.publicKey.empty()) {
    AddText(out, "key", Tarvel::StringUtil::Base64Encode(confirmation.publicKey));
  }
  out << '\n';
  if (confirmation.nameId) {
    out << "confirmed-by" << DescribeName(*confirmation.nameId);
  }
}

void AddAudiences(std::ostream &out, const std::set<std::string> &audiences) {
  for (const std::string &audience : audiences) {
    out << " {" << audience << '}';
  }
  out << '\n';
}

void AddConditions(std::ostream &out, const TokenDetails &details) {
  for (const std::set<std::string> &restriction : details.audienceRestrictions) {
    out << "audiences";
    AddAudiences(out, restriction);
  }
  if (details.isOneTimeUse) {
    out << "one-time-use\n";
  }
  if (details.proxyRestriction) {
    out << "proxy";
    if (details.proxyRestriction->count) {
      out << " count " << *details.proxyRestriction->count;
    }
    AddAudiences(out, details.proxyRestriction->audiences);
  }
}

void AddAuthnStatement(std::ostream &out, const AuthnStatementDetails &statement) {
  out << "authn " << DateTimeFormatter(statement.authnInstant);
  AddText(out, "session-index", statement.sessionIndex);
  AddTime(out, "session-end", statement.sessionNotOnOrAfter);
  AddText(out, "address", statement.localityAddress);
  AddText(out, "dns-name", statement.localityDnsName);
  AddText(out, "class", statement.contextClass);
  AddText(out, "declaration", statement.contextDeclaration);
  for (const std::string &authority : statement.authenticatingAuthorities) {
    AddText(out, "authority", authority);
  }
  out << '\n';
}

std::string DescribeAttributes(const std::vector<SamlAttribute> &attributes) {
  std::ostringstream out;
  for (const SamlAttribute &attribute : attributes) {
    out << "attribute";
    AddText(out, "name", attribute.name);
    AddText(out, "format", attribute.nameFormat);
    AddText(out, "friendly-name", attribute.friendlyName);
    out << '\n';
    for (const AttributeValue &value : attribute.values) {
      out << (value.isNil ? "nil" : value.isXml ? "xml" : "text") << " {" << value.text << "}\n";
    }
  }
  return out.str();
}

} // namespace

std::string DescribeName(const NameId &name) {
  std::ostringstream out;
  AddText(out, "value", name.value);
  AddText(out, "format", name.format);
  AddText(out, "name-qualifier", name.nameQualifier);
  AddText(out, "sp-name-qualifier", name.spNameQualifier);
  AddText(out, "sp-provided-id", name.spProvidedId);
  out << '\n';
  return out.str();
}

std::string DescribeDetails(const SamlToken &token) {
  const TokenDetails details = GetTokenDetails(token);
  std::ostringstream out;
  out << "issuer" << DescribeName(details.issuer) << "issued " << DateTimeFormatter(details.issueInstant) << "\nsubject"
      << DescribeName(details.subject);
  if (GetNameId(token) != details.subject) {
    throw std::logic_error("GetNameId differs from GetTokenDetails");
  }
  for (const ConfirmationDetails &confirmation : details.confirmations) {
    AddConfirmation(out, confirmation);
  }
  AddConditions(out, details);
  for (const AuthnStatementDetails &statement : details.authnStatements) {
    AddAuthnStatement(out, statement);
  }
  const std::string attributes = DescribeAttributes(details.attributes);
  if (DescribeAttributes(GetAttributes(token)) != attributes) {
    throw std::logic_error("GetAttributes differs from GetTokenDetails");
  }
  return out.str() + attributes;
}

} // namespace Testing
