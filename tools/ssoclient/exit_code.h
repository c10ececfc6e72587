// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exit codes of the tool, and the exit code of each failure.

#pragma once

#include <exception>
#include <stdexcept>
#include <string>
#include <string_view>

namespace SsoClient::Tool {

enum class ExitCode : int {
  DONE = 0,
  UNEXPECTED = 1,
  USAGE = 2,
  CREDENTIALS_REFUSED = 3,
  COMMUNICATION = 4,
  TOKEN_INVALID = 5,
  SIGNATURE_INVALID = 6,
  FILE_OR_KEY = 7,
  SERVICE_FAULT = 8,
  INTERRUPTED = 130,
};

/// The exit codes and what each means, as the help shows them.
std::string ExitCodeHelp();

/// A command line that the tool cannot act on.
class UsageException : public std::runtime_error {
public:
  using std::runtime_error::runtime_error;
};

/// How the tool reports a failure.
struct Failure {
  ExitCode code;
  std::string_view className; ///< the unqualified name of the exception's class
  std::string_view label;     ///< begins the line that reports the failure in text
};

/// Looks `failure` up in the one table of failures.
Failure Classify(const std::exception &failure) noexcept;

/// A failure together with a hint: what the caller may do about it. It is reported as that failure.
class HintedException : public std::runtime_error {
public:
  HintedException(const std::exception &failure, const std::string &hint)
      : std::runtime_error(failure.what()), m_failure(Classify(failure)), m_hint(hint) {}

  const Failure &GetFailure() const noexcept { return m_failure; }
  const std::string &GetHint() const noexcept { return m_hint; }

private:
  Failure m_failure;
  std::string m_hint;
};

/// A failure that is reported with another label.
class RelabelledException : public std::runtime_error {
public:
  /// @param label outlives the exception
  RelabelledException(const std::exception &failure, std::string_view label)
      : std::runtime_error(failure.what()), m_failure(Classify(failure)) {
    m_failure.label = label;
  }

  const Failure &GetFailure() const noexcept { return m_failure; }

private:
  Failure m_failure;
};

} // namespace SsoClient::Tool
