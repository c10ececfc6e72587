// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ReportRecorder`, the sink that writes deviations into a `TokenReport`.

#pragma once

#include "token/element_paths.h"
#include "xml/deviation_sink.h"

#include <ssoclient/token_report.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace SsoClient {

/// `text` as reports contain it: printable and shortened.
std::string ReportText(std::string_view text);

/// `deviation` as a finding without a remedy. `line` and `column` are used if `deviation` has no element.
/// @param paths of the tree in which the deviation is
TokenReport::Finding MakeFinding(const Deviation &deviation, ElementPaths &paths, std::uint32_t line,
                                 std::uint32_t column);

/// Records the checks of a verification one after the other. The report must outlive the recorder, and the tree must not be
/// changed.
class ReportRecorder final : public DeviationSink {
public:
  /// Adds all checks to `report`, as not done yet.
  explicit ReportRecorder(TokenReport &report);

  /// Begins `check`. It has passed unless a deviation is added to it.
  void Begin(TokenReport::Check check);

  /// Sets the summary of the current check.
  void Summarize(std::string_view summary);

  /// The current check could not be done completely. Unless it has a finding, its outcome is NOT_DONE. `missing` is the
  /// summary, which states what is missing.
  void SetNotDone(std::string_view missing);

  /// The same for `check`, which becomes the current check.
  void Skip(TokenReport::Check check, std::string_view missing);

  /// The same for `first` and all checks after it.
  void SkipFrom(TokenReport::Check first, std::string_view missing);

  /// Replaces the remedy of the current check's first finding.
  void ReplaceFirstRemedy(std::string_view remedy);

  /// Whether the current check has a finding, listed or not.
  bool HasFailed() const noexcept { return m_current->outcome == TokenReport::Outcome::FAILED; }

  /// The number of findings of the current check, listed or not.
  std::size_t CountFindings() const noexcept { return m_current->findings.size() + m_current->unlistedFindings; }

  /// Adds a finding to the current check. `line` and `column` are used if `deviation` has no element.
  void AddAt(const Deviation &deviation, std::uint32_t line, std::uint32_t column);

  bool IsFull() const noexcept override;
  void Add(Deviation deviation) override { AddAt(deviation, 0, 0); }
  void Count() noexcept override;

private:
  TokenReport &m_report;
  TokenReport::CheckResult *m_current;
  ElementPaths m_paths;
  std::size_t m_listed = 0;       // findings of all checks
  std::size_t m_messageBytes = 0; // of their messages before they were cut
};

} // namespace SsoClient
