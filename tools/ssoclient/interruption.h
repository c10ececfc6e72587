// SPDX-License-Identifier: Apache-2.0
/// @file
/// How a signal or the limit of --timeout ends a command early, and what is cleaned up then.

#pragma once

#include "output.h"

#include <ssoclient/client/call_options.h>

#include <boost/optional.hpp>

#include <chrono>
#include <exception>
#include <functional>
#include <string>

namespace SsoClient::Tool {

/// Starts the thread that waits for signals and for the end of `timeout`. Call it once, on the main thread, before any
/// other thread exists. The command must end with `FinishCommand` or `ReportAndFinish`.
///
/// SIGINT ends the process with `ExitCode::INTERRUPTED`; SIGTERM, SIGHUP and SIGQUIT end it as they always do. A signal
/// that is ignored stays ignored. First, calls with the options of `GetCallOptions` are cancelled, the command has a
/// moment to end by itself, and a file that is being written is completed. A second signal ends the process at once,
/// and removes the unfinished file. In each case a quiet terminal echoes again.
/// @param timeout the process then ends with `ExitCode::COMMUNICATION` and a message; `boost::none` for no limit
/// @param format of that message
/// @throws std::system_error when no thread can be started
void WatchCommand(const boost::optional<std::chrono::microseconds> &timeout, Format format);

/// Options for calls that must end when the command must end.
CallOptions GetCallOptions();

/// How long the whole command may take; `boost::none` if there is no limit.
boost::optional<std::chrono::microseconds> GetTimeLimit();

/// Reports that the command has ended by itself. Does not return if a signal arrived before, or the time is over.
void FinishCommand();

/// Reports the `failure` that has ended the command, and then does the same as `FinishCommand`. If a signal has ended
/// the command, nothing is reported; if the time was over, only that is reported.
void ReportAndFinish(const std::exception &failure, Format format);

/// From now on, a signal or the end of the time takes effect only when the library is not replacing the private file at
/// `path`: it may still write a token after a cancelled call. A second signal removes the unfinished file. Call it at
/// most once.
void AwaitReplacementOf(const std::string &path);

/// While it lives, a file exists that is not complete or does not have its final name. Signals take effect afterwards.
class UnfinishedFile {
public:
  /// Waits while another thread has an unfinished file.
  /// @param create makes the file, and returns its path; a second signal removes the file
  explicit UnfinishedFile(const std::function<std::string()> &create);
  UnfinishedFile(const UnfinishedFile &) = delete;
  UnfinishedFile &operator=(const UnfinishedFile &) = delete;
  /// The file has been completed or removed.
  ~UnfinishedFile();
};

} // namespace SsoClient::Tool
