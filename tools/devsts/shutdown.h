// SPDX-License-Identifier: Apache-2.0
/// @file
/// Waiting until the service must end.

#pragma once

namespace DevSts {

/// Catches SIGTERM and SIGINT, for the rest of the process. Create it before any thread starts, so that all threads
/// inherit the signal mask.
class EndSignals {
public:
  EndSignals();
  EndSignals(const EndSignals &) = delete;
  EndSignals &operator=(const EndSignals &) = delete;
  ~EndSignals();

  /// Returns when one of the signals arrives or, if `untilEof` is set, at the end of standard input.
  void Wait(bool untilEof) const;

private:
  int m_descriptor;
};

} // namespace DevSts
