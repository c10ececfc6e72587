// SPDX-License-Identifier: Apache-2.0
/// @file
/// The messages under tests/data/messages/attacks and their outcomes.

#pragma once

#include <string>
#include <vector>

namespace Messages {

/// One line of expected.tsv.
struct MessageFile {
  std::string name;
  std::string options;        ///< of the receiver
  std::string exceptionClass; ///< or "accepted"
  std::string text;           ///< of the exception, or the proof
  std::string xml;

  bool IsAccepted() const { return exceptionClass == "accepted"; }
};

/// All of them, in the order of the table.
const std::vector<MessageFile> &AllMessageFiles();

} // namespace Messages
