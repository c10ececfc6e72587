// SPDX-License-Identifier: Apache-2.0

#include "token/report_recorder.h"

#include "token/report_remedies.h"

#include <tarvel/core/string_util.h>

#include <utility>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using Outcome = TokenReport::Outcome;

constexpr std::size_t CHECKS = static_cast<std::size_t>(Check::REQUIRED_CONFIRMATION) + 1;

// Enough for all texts of a document, each of them in one message. But many messages can contain the same text, such as the
// URI of a namespace, which has no limit of its own.
constexpr std::size_t MAX_MESSAGE_BYTES = 32u * 1024 * 1024;

} // namespace

std::string ReportText(std::string_view text) {
  return Tarvel::StringUtil::Shorten(Tarvel::StringUtil::Printable(text));
}

namespace {

/// The same for a text of a rule, which may be cut already: it then states how many bytes are missing, so it is not cut again.
std::string ReportValue(std::string_view text) {
  constexpr std::size_t LONGEST_NOTE = 40; // "... (N more bytes)"
  const std::string printable = Tarvel::StringUtil::Printable(text);
  return printable.size() <= Tarvel::StringUtil::MAX_VALUE_BYTES + LONGEST_NOTE ? printable : ReportText(text);
}

} // namespace

TokenReport::Finding MakeFinding(const Deviation &deviation, ElementPaths &paths, std::uint32_t line,
                                 std::uint32_t column) {
  TokenReport::Finding finding;
  finding.message = ReportText(deviation.message);
  finding.attribute = ReportText(deviation.attribute);
  finding.line = line;
  finding.column = column;
  if (deviation.element) {
    finding.element = ReportText(deviation.element->GetName());
    finding.path = ReportText(paths.Of(*deviation.element));
    finding.line = deviation.element->GetLine();
    finding.column = deviation.element->GetColumn();
  }
  finding.wanted = ReportValue(deviation.allowed);
  finding.found = ReportValue(deviation.found);
  finding.missedBySec = deviation.missedBySec;
  return finding;
}

ReportRecorder::ReportRecorder(TokenReport &report) : m_report(report) {
  m_report.checks.resize(CHECKS);
  for (std::size_t index = 0; index < CHECKS; ++index) {
    m_report.checks[index].check = static_cast<Check>(index);
  }
  m_current = m_report.checks.data();
}

void ReportRecorder::Begin(Check check) {
  m_current = &m_report.checks[static_cast<std::size_t>(check)];
  m_current->outcome = Outcome::PASSED;
}

void ReportRecorder::Summarize(std::string_view summary) {
  m_current->summary = ReportText(summary);
}

void ReportRecorder::SetNotDone(std::string_view missing) {
  if (!HasFailed()) {
    m_current->outcome = Outcome::NOT_DONE;
  }
  Summarize(missing);
}

void ReportRecorder::Skip(Check check, std::string_view missing) {
  Begin(check);
  SetNotDone(missing);
}

void ReportRecorder::SkipFrom(Check first, std::string_view missing) {
  for (auto index = static_cast<std::size_t>(first); index < CHECKS; ++index) {
    Skip(static_cast<Check>(index), missing);
  }
}

void ReportRecorder::ReplaceFirstRemedy(std::string_view remedy) {
  m_current->findings.front().remedy = ReportText(remedy);
}

// One finding is reserved for each later check, so that each check that fails lists at least one.
bool ReportRecorder::IsFull() const noexcept {
  const std::size_t following = CHECKS - 1 - static_cast<std::size_t>(m_current->check);
  const bool areMessagesTooLong = m_messageBytes > MAX_MESSAGE_BYTES && !m_current->findings.empty();
  return areMessagesTooLong || m_listed >= TokenReport::MAX_FINDINGS - following;
}

void ReportRecorder::AddAt(const Deviation &deviation, std::uint32_t line, std::uint32_t column) {
  if (m_report.refusal.empty()) {
    m_report.refusal = deviation.message;
  }
  m_current->outcome = Outcome::FAILED;
  TokenReport::Finding finding = MakeFinding(deviation, m_paths, line, column);
  finding.remedy = ReportText(RemedyFor(m_report, m_current->check, finding));
  m_current->findings.push_back(std::move(finding));
  ++m_listed;
  m_messageBytes += deviation.message.size();
}

void ReportRecorder::Count() noexcept {
  m_current->outcome = Outcome::FAILED;
  ++m_current->unlistedFindings;
}

} // namespace SsoClient
