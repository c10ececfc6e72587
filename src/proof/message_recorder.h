// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessageRecorder`, the sink that writes deviations into a `MessageReport`.

#pragma once

#include "token/element_paths.h"
#include "xml/deviation_sink.h"

#include <ssoclient/proof/message_report.h>
#include <tarvel/xml/node.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace SsoClient {

/// Records the checks of a verification one after the other. The report must outlive the recorder, and the tree must
/// not be changed.
class MessageRecorder final : public DeviationSink {
public:
  /// Adds all checks to `report`, as not done yet.
  explicit MessageRecorder(MessageReport &report);

  /// Begins `check`. It has passed unless a deviation is added to it.
  void Begin(MessageReport::Check check);

  /// Sets the summary of the current check.
  void Summarize(std::string_view summary);

  /// The current check could not be done completely. Unless it has a finding, its outcome is NOT_DONE.
  void SetNotDone(std::string_view missing);

  /// The same for `check`, which becomes the current check.
  void Skip(MessageReport::Check check, std::string_view missing);

  /// The same for `first` and all checks after it.
  void SkipFrom(MessageReport::Check first, std::string_view missing);

  /// Whether the current check has a finding, listed or not.
  bool HasFailed() const noexcept { return m_current->outcome == TokenReport::Outcome::FAILED; }

  /// Adds a finding to the current check. `line` and `column` are used if `deviation` has no element.
  void AddAt(const Deviation &deviation, std::uint32_t line, std::uint32_t column);

  /// The path of an element as reports contain it.
  std::string PathOf(const Tarvel::Xml::ElementNode &element);

  bool IsFull() const noexcept override;
  void Add(Deviation deviation) override { AddAt(deviation, 0, 0); }
  void Count() noexcept override;

private:
  MessageReport &m_report;
  MessageReport::CheckResult *m_current;
  ElementPaths m_paths;
  std::size_t m_listed = 0; // findings of all checks
};

} // namespace SsoClient
