// SPDX-License-Identifier: Apache-2.0
/// @file
/// The text of a token, for people.

#include "details_view.h"
#include "labelled_lines.h"
#include "time_text.h"
#include "token_view.h"

#include <string_view>

namespace SsoClient::Tool {
namespace {

constexpr const char *UNKNOWN = "unknown";
constexpr const char *TRUST_IS_MISSING =
    "The signature and the keys were not checked, because no trusted certificate was given.\n";

std::string TimeText(const boost::optional<Tarvel::System::DateTime> &time, const Tarvel::System::DateTime &now) {
  return time ? UtcText(*time) + " (" + WhenText(*time, now) + ")" : UNKNOWN;
}

std::string FlagText(const boost::optional<bool> &flag) {
  return flag ? *flag ? "yes" : "no" : UNKNOWN;
}

void AddTimesAndFlags(const TokenFacts &facts, const Tarvel::System::DateTime &now, LabelledLines &lines) {
  lines.Add("Not before:", TimeText(facts.startDate, now));
  lines.Add("Not on or after:", TimeText(facts.endDate, now));
  lines.Add("Renewable:", FlagText(facts.renewable));
  lines.Add("Delegable:", FlagText(facts.delegable));
  lines.Add("Solution:", FlagText(facts.solution));
}

void AddLists(const TokenFacts &facts, LabelledLines &lines) {
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
}

void AddFacts(const TokenFacts &facts, const Tarvel::System::DateTime &now, LabelledLines &lines) {
  lines.Add("Id:", facts.id.value_or(UNKNOWN));
  lines.Add("Subject:", facts.subject ? facts.subject->name + "@" + facts.subject->domain : UNKNOWN);
  if (facts.fullName) {
    lines.AddUnlessEmpty("First name:", facts.fullName->first);
    lines.AddUnlessEmpty("Last name:", facts.fullName->second);
  }
  lines.Add("Confirmation:", facts.confirmation ? ConfirmationText(*facts.confirmation) : UNKNOWN);
  if (facts.details) {
    AddConfirmationLines(*facts.details, lines);
  }
  AddTimesAndFlags(facts, now, lines);
  AddLists(facts, lines);
  if (facts.certificate) {
    lines.Add("Certificate:", facts.certificate->subject);
    lines.Add("", "SHA-256 " + facts.certificate->sha256);
  }
  if (facts.details) {
    AddDetailLines(*facts.details, now, lines);
  }
}

} // namespace

std::string_view ConfirmationText(SamlToken::ConfirmationType confirmation) noexcept {
  return confirmation == SamlToken::BEARER ? "bearer" : "holder-of-key";
}

std::string TokenText(const TokenView &view, const TextStyle &style) {
  LabelledLines lines;
  const char *const unverified = view.facts ? "no, nothing below was checked" : "no";
  lines.Add("Verified:", view.verified ? "yes" : unverified);
  if (view.facts) {
    AddFacts(*view.facts, view.now, lines);
  }
  std::string text = lines.Get();
  if (view.report) {
    text += "\n" + ReportText(*view.report, style);
    text += view.report->usesTrust ? "" : std::string("\n") + TRUST_IS_MISSING;
  }
  return text;
}

} // namespace SsoClient::Tool
