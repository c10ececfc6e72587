// SPDX-License-Identifier: Apache-2.0

#include "doctor_check.h"

#include "table.h"

#include <tarvel/core/string_util.h>

#include <algorithm>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;

constexpr std::size_t MAX_SHOWN_BYTES = 200;
constexpr std::size_t NAME_COLUMNS = 14;
constexpr std::size_t OUTCOME_COLUMNS = 10;
constexpr std::size_t INDENT = NAME_COLUMNS + OUTCOME_COLUMNS; // less than the least width

struct OutcomeText {
  const char *text;
  Colour colour;
};

OutcomeText TextOf(CheckOutcome outcome) {
  switch (outcome) {
  case CheckOutcome::FINE:
    return {"fine", Colour::GREEN};
  case CheckOutcome::WARNING:
    return {"warning", Colour::YELLOW};
  case CheckOutcome::FAILED:
    return {"failed", Colour::RED};
  case CheckOutcome::NOT_DONE:
    break;
  }
  return {"not done", Colour::NONE};
}

/// `text` in a column of that width. The colour does not count.
std::string Column(const std::string &text, std::size_t width, Colour colour, bool usesColour) {
  return Coloured(text, colour, usesColour) + std::string(width - std::min(width, text.size()), ' ');
}

/// Adds the text, wrapped, after `columns`, which become blanks for its later lines and the next text.
void AddText(std::string &lines, std::string &columns, const std::string &text, const TextStyle &style) {
  for (const std::string &line : Wrap(text, style.width - INDENT)) {
    lines += columns + line + "\n";
    columns = std::string(INDENT, ' ');
  }
}

void AddCheck(std::string &lines, const DoctorCheck &check, const TextStyle &style) {
  const auto [outcome, colour] = TextOf(check.outcome);
  std::string columns = Column(check.name, NAME_COLUMNS, Colour::BOLD, style.hasColours) +
                        Column(outcome, OUTCOME_COLUMNS, colour, style.hasColours);
  for (const std::vector<std::string> *const texts : {&check.found, &check.details}) {
    for (const std::string &text : *texts) {
      AddText(lines, columns, text, style);
    }
  }
  columns = std::string(NAME_COLUMNS, ' ') + Column("to do", OUTCOME_COLUMNS, Colour::BOLD, style.hasColours);
  for (const std::string &advice : check.todo) {
    AddText(lines, columns, advice, style);
  }
}

} // namespace

void DoctorCheck::Skip(const std::string &reason) {
  outcome = CheckOutcome::NOT_DONE;
  found = {reason};
}

void DoctorCheck::Warn(const std::string &advice) {
  if (outcome == CheckOutcome::FINE) {
    outcome = CheckOutcome::WARNING;
  }
  todo.push_back(advice);
}

void DoctorCheck::Fail(ExitCode code, const std::string &advice) {
  if (outcome != CheckOutcome::FAILED) {
    outcome = CheckOutcome::FAILED;
    exitCode = code;
  }
  todo.push_back(advice);
}

std::string Shown(std::string_view text) {
  return Tarvel::StringUtil::Printable(Tarvel::StringUtil::Shorten(text, MAX_SHOWN_BYTES));
}

std::string Sentence(std::string_view text) {
  std::string sentence = Shown(text);
  if (!sentence.empty() && sentence.front() >= 'a' && sentence.front() <= 'z') {
    sentence.front() = static_cast<char>(sentence.front() - 'a' + 'A');
  }
  return sentence + ".";
}

std::string Count(std::int64_t number, const std::string &unit) {
  return std::to_string(number) + " " + unit + (number == 1 ? "" : "s");
}

std::int64_t Milliseconds(std::int64_t microseconds) {
  constexpr std::int64_t MICROSECONDS_PER_MILLISECOND = 1000;
  return microseconds / MICROSECONDS_PER_MILLISECOND;
}

std::string DurationText(std::int64_t microseconds) {
  return "(" + std::to_string(Milliseconds(microseconds)) + " ms)";
}

std::string JoinTexts(const std::vector<std::string> &texts, std::string_view separator) {
  std::string joined;
  for (const std::string &text : texts) {
    joined.append(joined.empty() ? std::string_view() : separator).append(text);
  }
  return joined;
}

ExitCode ExitCodeOf(const std::vector<DoctorCheck> &checks) {
  const auto failed = std::find_if(checks.begin(), checks.end(),
                                   [](const DoctorCheck &check) { return check.outcome == CheckOutcome::FAILED; });
  return failed == checks.end() ? ExitCode::DONE : failed->exitCode;
}

std::string RenderChecks(const std::vector<DoctorCheck> &checks, const TextStyle &style) {
  std::string lines;
  for (const DoctorCheck &check : checks) {
    AddCheck(lines, check, style);
  }
  return lines;
}

std::string RenderChecksJson(const std::vector<DoctorCheck> &checks) {
  Json json = {{"schema", 1}, {"checks", Json::array()}};
  for (const DoctorCheck &check : checks) {
    Json entry = {{"name", check.name},
                  {"outcome", TextOf(check.outcome).text},
                  {"found", JoinTexts(check.found, " ")},
                  {"todo", nullptr}};
    if (!check.todo.empty()) {
      entry["todo"] = JoinTexts(check.todo, " ");
    }
    entry.update(check.facts);
    json["checks"].push_back(std::move(entry));
  }
  // A server's texts are not always UTF-8, but the result must still be JSON.
  return json.dump(2, ' ', true, Json::error_handler_t::replace) + "\n";
}

} // namespace SsoClient::Tool
