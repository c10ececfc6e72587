// SPDX-License-Identifier: Apache-2.0
/// @file
/// What ends a command before it is done, a signal or the limit of --timeout, and what is cleaned up then.

#pragma once

#include "output.h"

#include <ssoclient/client/call_options.h>

#include <boost/optional.hpp>

#include <chrono>
#include <exception>
#include <functional>
#include <string>

namespace SsoClient::Tool {

/// Starts the thread that waits for signals and for the end of the time. Call it once, on the main thread, before any
/// other thread exists. The command must end with `FinishCommand` or `ReportAndFinish`.
///
/// SIGINT ends the process with `ExitCode::INTERRUPTED`; SIGTERM, SIGHUP and SIGQUIT end it as they always do. A signal
/// that is ignored stays ignored. First, the call of `GetCallOptions` is cancelled, the command has a moment to end by
/// itself, and a file that is being written is completed. A second signal ends the process at once, and removes such a
/// file. In each case a quiet terminal echoes again.
/// @param timeout after which the process ends with `ExitCode::COMMUNICATION` and a message
/// @param format of that message
/// @throws std::system_error when no thread can be started
void WatchCommand(const boost::optional<std::chrono::microseconds> &timeout, Format format);

/// Options of a call that ends when the command must end.
CallOptions GetCallOptions();

/// How long the command may take in all; `boost::none` if there is no limit.
boost::optional<std::chrono::microseconds> GetTimeLimit();

/// The command has ended by itself. Does not return if a signal came first, or the time is over.
void FinishCommand();

/// Reports `failure`, with which the command has ended, and does what `FinishCommand` does. A command that was
/// interrupted reports nothing, and one that was too late reports only that.
void ReportAndFinish(const std::exception &failure, Format format);

/// A file that exists and is not yet complete, or not yet under its final name. Signals take effect afterwards.
class UnfinishedFile {
public:
  /// Waits while another thread writes a file.
  /// @param create makes the file, and returns its path, which a second signal removes
  explicit UnfinishedFile(const std::function<std::string()> &create);
  UnfinishedFile(const UnfinishedFile &) = delete;
  UnfinishedFile &operator=(const UnfinishedFile &) = delete;
  /// The file has been completed or removed.
  ~UnfinishedFile();
};

} // namespace SsoClient::Tool
