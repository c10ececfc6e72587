// SPDX-License-Identifier: Apache-2.0
/// @file
/// The written forms of a token.

#include "token_report.h"

#include "token/assertion_parser.h"
#include "xml/xml_text.h"

#include <nlohmann/json.hpp>

#include <memory>
#include <string_view>
#include <utility>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;

std::string UtcText(const Tarvel::System::DateTime &time) {
  return Tarvel::System::DateTimeFromUtc(time.GetUtcTime(), false).ToString();
}

std::string_view ConfirmationText(SamlToken::ConfirmationType confirmation) {
  return confirmation == SamlToken::BEARER ? "bearer" : "holder-of-key";
}

Json PrincipalJson(const PrincipalId &principal) {
  return {{"name", principal.name}, {"domain", principal.domain}};
}

Json AdviceJson(const Advice &advice) {
  Json attributes = Json::array();
  for (const AdviceAttribute &attribute : advice.attributes) {
    attributes.push_back({{"name", attribute.name}, {"values", attribute.values}});
  }
  return {{"source", advice.source}, {"attributes", std::move(attributes)}};
}

// Long because it lists all keys in one place: callers rely on the keys and their order, and a change to either needs a
// new "schema".
std::string RenderJson(const TokenReport &report) {
  const TokenFacts &facts = report.facts;
  Json json = {{"schema", 1},
               {"verified", report.verified},
               {"id", facts.id},
               {"subject", PrincipalJson(facts.subject)},
               {"confirmation", ConfirmationText(facts.confirmationMethod)},
               {"notBefore", UtcText(facts.startDate)},
               {"notOnOrAfter", UtcText(facts.endDate)},
               {"renewable", facts.renewable},
               {"delegable", facts.delegable},
               {"solution", facts.solution},
               {"fullName", {{"first", facts.fullName.first}, {"last", facts.fullName.second}}},
               {"groups", Json::array()},
               {"delegation", Json::array()},
               {"audience", facts.audience},
               {"advice", Json::array()},
               {"certificate", nullptr}};
  for (const PrincipalId &group : facts.groups) {
    json["groups"].push_back(PrincipalJson(group));
  }
  for (const Delegate &delegate : facts.delegationChain) {
    Json entry = PrincipalJson(delegate.subject);
    entry["instant"] = UtcText(delegate.delegationInstant);
    json["delegation"].push_back(std::move(entry));
  }
  for (const Advice &advice : facts.advice) {
    json["advice"].push_back(AdviceJson(advice));
  }
  if (facts.confirmationCertificate) {
    json["certificate"] = {{"subject", facts.confirmationCertificate->GetSubject()},
                           {"sha256", facts.confirmationCertificate->GetSha256Thumbprint()}};
  }
  if (report.unmet) {
    json["unmet"] = Json::array();
    for (const UnmetRequest &request : *report.unmet) {
      json["unmet"].push_back(request.key);
    }
  }
  // Everything except ASCII is escaped, so that the text cannot control a terminal.
  return json.dump(2, ' ', true);
}

/// Collects lines of a label and a value, with the values in one column.
class Lines {
public:
  void Add(std::string_view label, std::string_view value) {
    m_text += label;
    m_text.append(label.size() < COLUMN ? COLUMN - label.size() : 1, ' ');
    m_text += PrintableValue(value);
    m_text += '\n';
  }
  void AddFlag(std::string_view label, bool value) { Add(label, value ? "yes" : "no"); }
  void AddUnlessEmpty(std::string_view label, std::string_view value) {
    if (!value.empty()) {
      Add(label, value);
    }
  }

  const std::string &Get() const { return m_text; }

private:
  static constexpr std::size_t COLUMN = 17;
  std::string m_text;
};

std::string RenderText(const TokenReport &report) {
  const TokenFacts &facts = report.facts;
  Lines lines;
  lines.Add("Verified:", report.verified ? "yes" : "no, nothing below was checked");
  lines.Add("Id:", facts.id);
  lines.Add("Subject:", facts.subject.name + "@" + facts.subject.domain);
  lines.AddUnlessEmpty("First name:", facts.fullName.first);
  lines.AddUnlessEmpty("Last name:", facts.fullName.second);
  lines.Add("Confirmation:", ConfirmationText(facts.confirmationMethod));
  lines.Add("Not before:", UtcText(facts.startDate));
  lines.Add("Not on or after:", UtcText(facts.endDate));
  lines.AddFlag("Renewable:", facts.renewable);
  lines.AddFlag("Delegable:", facts.delegable);
  lines.AddFlag("Solution:", facts.solution);
  for (const PrincipalId &group : facts.groups) {
    lines.Add("Group:", group.domain + "\\" + group.name);
  }
  for (const Delegate &delegate : facts.delegationChain) {
    lines.Add("Delegate:",
              delegate.subject.name + "@" + delegate.subject.domain + " at " + UtcText(delegate.delegationInstant));
  }
  for (const std::string &audience : facts.audience) {
    lines.Add("Audience:", audience);
  }
  for (const Advice &advice : facts.advice) {
    lines.Add("Advice:", advice.source);
    for (const AdviceAttribute &attribute : advice.attributes) {
      lines.Add("", attribute.name);
      for (const std::string &value : attribute.values) {
        lines.Add("", "= " + value);
      }
    }
  }
  if (facts.confirmationCertificate) {
    lines.Add("Certificate:", facts.confirmationCertificate->GetSubject());
    lines.Add("", "SHA-256 " + facts.confirmationCertificate->GetSha256Thumbprint());
  }
  return lines.Get();
}

} // namespace

TokenReport ReportOf(const SamlToken &token) {
  TokenReport report;
  report.verified = true;
  report.xml = token.ToXml();
  TokenFacts &facts = report.facts;
  facts.id = token.GetId();
  facts.startDate = token.GetStartDate();
  facts.endDate = token.GetEndDate();
  facts.subject = token.GetSubject();
  facts.renewable = token.IsRenewable();
  facts.delegable = token.IsDelegable();
  facts.solution = token.IsSolution();
  token.GetFullName(facts.fullName);
  token.GetGroups(facts.groups);
  token.GetDelegationChain(facts.delegationChain);
  token.GetAudience(facts.audience);
  token.GetAdvice(facts.advice);
  facts.confirmationMethod = token.GetConfirmationMethod();
  facts.confirmationCertificate = Tarvel::Ref<const Tarvel::Crypto::Certificate>(token.GetConfirmationCertificate());
  return report;
}

TokenReport InspectToken(std::string xml) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML(xml, document);
  NodeFilterIterator iterator(document->GetDocumentElement(), std::make_shared<SkipWsAndCommentsFilter>());
  SamlAssertionType assertion;
  ParseSamlAssertionElement(iterator, assertion);

  TokenReport report;
  report.facts = TakeTokenFacts(std::move(assertion));
  report.xml = std::move(xml);
  return report;
}

std::string Render(const TokenReport &report, Format format) {
  std::string text = report.xml;
  if (format == Format::TEXT) {
    text = RenderText(report);
  }
  if (format == Format::JSON) {
    text = RenderJson(report);
  }
  if (text.empty() || text.back() != '\n') {
    text += '\n';
  }
  return text;
}

} // namespace SsoClient::Tool
