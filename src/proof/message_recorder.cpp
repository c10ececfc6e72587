// SPDX-License-Identifier: Apache-2.0

#include "proof/message_recorder.h"

#include "token/report_recorder.h"

#include <utility>

namespace SsoClient {

namespace {

using Check = MessageReport::Check;
using Outcome = TokenReport::Outcome;

constexpr std::size_t CHECKS = static_cast<std::size_t>(Check::PARTS) + 1;

const char *RemedyForTime(const TokenReport::Finding &finding) {
  return finding.missedBySec != 0
             ? "Synchronise the clocks of this machine and of the sender, or send the message sooner "
               "after it is made."
             : "Ask the sender to write one timestamp with Created and Expires.";
}

/// What the reader can do about a finding.
const char *RemedyFor(Check check, const TokenReport::Finding &finding) {
  switch (check) {
  case Check::WELL_FORMED:
    return "Use the whole message exactly as it was received, as XML in UTF-8.";
  case Check::ENVELOPE:
    return "Ask the sender for a SOAP 1.1 or 1.2 envelope with one body, after at most one header.";
  case Check::SECURITY_HEADER:
    return "Ask the sender for one security header, with the actor or role of this receiver.";
  case Check::TIMESTAMP:
    return RemedyForTime(finding);
  case Check::TOKEN:
    return "See the report of the token.";
  case Check::PROOF:
    return "Ask the sender to sign the message with the token's key, in the accepted profile, after its last change.";
  case Check::PARTS:
    return "Ask the sender to sign the body, the timestamp and each required header block, and to write each of them "
           "once.";
  }
  return "";
}

} // namespace

MessageRecorder::MessageRecorder(MessageReport &report) : m_report(report) {
  m_report.checks.resize(CHECKS);
  for (std::size_t index = 0; index < CHECKS; ++index) {
    m_report.checks[index].check = static_cast<Check>(index);
  }
  m_current = m_report.checks.data();
}

void MessageRecorder::Begin(Check check) {
  m_current = &m_report.checks[static_cast<std::size_t>(check)];
  m_current->outcome = Outcome::PASSED;
}

void MessageRecorder::Summarize(std::string_view summary) {
  m_current->summary = ReportText(summary);
}

void MessageRecorder::SetNotDone(std::string_view missing) {
  if (!HasFailed()) {
    m_current->outcome = Outcome::NOT_DONE;
  }
  Summarize(missing);
}

void MessageRecorder::Skip(Check check, std::string_view missing) {
  Begin(check);
  SetNotDone(missing);
}

void MessageRecorder::SkipFrom(Check first, std::string_view missing) {
  for (auto index = static_cast<std::size_t>(first); index < CHECKS; ++index) {
    Skip(static_cast<Check>(index), missing);
  }
}

std::string MessageRecorder::PathOf(const Tarvel::Xml::ElementNode &element) {
  return ReportText(m_paths.Of(element));
}

// One finding is reserved for each later check, so that each check that fails lists at least one.
bool MessageRecorder::IsFull() const noexcept {
  const std::size_t following = CHECKS - 1 - static_cast<std::size_t>(m_current->check);
  return m_listed >= TokenReport::MAX_FINDINGS - following;
}

void MessageRecorder::AddAt(const Deviation &deviation, std::uint32_t line, std::uint32_t column) {
  if (m_report.refusal.empty()) {
    m_report.refusal = deviation.message;
  }
  m_current->outcome = Outcome::FAILED;
  TokenReport::Finding finding = MakeFinding(deviation, m_paths, line, column);
  finding.remedy = RemedyFor(m_current->check, finding);
  m_current->findings.push_back(std::move(finding));
  ++m_listed;
}

void MessageRecorder::Count() noexcept {
  m_current->outcome = Outcome::FAILED;
  ++m_current->unlistedFindings;
}

} // namespace SsoClient
