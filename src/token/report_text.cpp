// SPDX-License-Identifier: Apache-2.0

#include "token/report_text.h"

namespace SsoClient {

namespace {

void AppendColumn(std::string &text, const std::string &word, std::size_t width) {
  text += word;
  text.append(width > word.size() ? width - word.size() : 0, ' ');
  text += "  ";
}

void AppendPart(std::string &text, const char *name, const std::string &value) {
  if (!value.empty()) {
    text.append("\n      ").append(name).append(": ").append(value);
  }
}

std::string PlaceOf(const TokenReport::Finding &finding) {
  std::string place = finding.path;
  if (!finding.attribute.empty()) {
    place.append("/@").append(finding.attribute);
  }
  if (finding.line != 0) {
    place += place.empty() ? "" : ", ";
    place += "line " + std::to_string(finding.line) + ", column " + std::to_string(finding.column);
  }
  return place;
}

} // namespace

void AppendCheckLine(std::string &text, const char *check, TokenReport::Outcome outcome, const std::string &summary) {
  constexpr std::size_t CHECK_WIDTH = 21; // of "required-confirmation"
  constexpr std::size_t OUTCOME_WIDTH = 8;
  AppendColumn(text, check, CHECK_WIDTH);
  AppendColumn(text, GetOutcomeName(outcome), OUTCOME_WIDTH);
  text.append(summary).append("\n");
}

void AppendFinding(std::string &text, const TokenReport::Finding &finding) {
  text.append("    ").append(finding.message);
  AppendPart(text, "at", PlaceOf(finding));
  AppendPart(text, "wanted", finding.wanted);
  AppendPart(text, "found", finding.found);
  AppendPart(text, "missed by", finding.missedBySec ? std::to_string(finding.missedBySec) + " s" : std::string());
  AppendPart(text, "what to do", finding.remedy);
  text += "\n";
}

} // namespace SsoClient
