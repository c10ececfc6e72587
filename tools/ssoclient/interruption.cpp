// SPDX-License-Identifier: Apache-2.0

#include "interruption.h"

#include "exit_code.h"
#include "quiet_terminal.h"

#include <ssoclient/client/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/io/private_file.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <ctime>
#include <mutex>
#include <thread>

#include <poll.h>
#include <pthread.h>
#include <sys/stat.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

using Clock = CallOptions::Clock;
using std::chrono::microseconds;

constexpr int ENDING_SIGNALS[] = {SIGINT, SIGTERM, SIGHUP, SIGQUIT};

/// How long a command has to end by itself.
constexpr microseconds GRACE{20'000};
/// How often a thread that waits for a file checks whether the file is complete.
constexpr microseconds TURN{1'000};
/// How often a thread checks that before it stops waiting: the lock can be that of another process.
constexpr int MAX_TURNS = 10'000;

// Why the process ends early: one of these, or the number of a signal.
constexpr int NOTHING = 0;
constexpr int TOO_LATE = -1;
std::atomic<int> g_cause{NOTHING};

std::mutex g_writing; // locked while a file is not complete, and for the rest of the process after the command
std::mutex g_naming;  // protects the paths
std::string g_unfinishedPath;
std::string g_replacedPath; // of a file that the library may replace; empty for none

// Set before there is a second thread.
sigset_t g_ending;   // the signals that end the process
sigset_t g_awaited;  // these, and the signal by which the main thread reports that the command has ended
std::thread g_watch; // not joinable before the command begins
boost::optional<microseconds> g_timeLimit;
boost::optional<Clock::time_point> g_deadline;
Format g_format = Format::TEXT;

/// The signal that reports the end of the command to the watching thread. No other thread or process uses it.
int EndOfCommand() noexcept {
  return SIGRTMIN;
}

const CancelSource &GetCancelSource() {
  static const CancelSource source;
  return source;
}

/// Waits for one of the signals, at most until `time`. Returns its number, or 0 after that time.
int AwaitSignal(const sigset_t &set, const boost::optional<Clock::time_point> &time) noexcept {
  for (;;) {
    int signal = -1;
    if (!time) {
      signal = sigwaitinfo(&set, nullptr);
    } else {
      const auto left = std::chrono::ceil<std::chrono::nanoseconds>(*time - Clock::now()).count();
      constexpr std::int64_t NANOSECONDS = 1'000'000'000;
      const timespec patience{std::max<std::int64_t>(left, 0) / NANOSECONDS,
                              std::max<std::int64_t>(left, 0) % NANOSECONDS};
      signal = sigtimedwait(&set, nullptr, &patience);
    }
    if (signal > 0) {
      return signal;
    }
    if (errno == EAGAIN) {
      return 0;
    }
  }
}

/// Waits for at most `time`, and returns whether a signal that ends the process has arrived.
bool IsInterruptedWithin(microseconds time) noexcept {
  const int signal = AwaitSignal(g_awaited, Clock::now() + time);
  return signal != 0 && signal != EndOfCommand();
}

std::string SecondsText(microseconds time) {
  std::string fraction = std::to_string(time.count() % 1'000'000 + 1'000'000);
  fraction.front() = '.';
  fraction.erase(fraction.find_last_not_of('0') + 1);
  return std::to_string(time.count() / 1'000'000) + (fraction == "." ? "" : fraction) + " s";
}

/// Does not wait for the reader of standard error, or for another thread that waits for that reader.
void ReportLateness() {
  const std::string text =
      FailureText(DeadlineExceededException("the command did not end within " + SecondsText(g_timeLimit.value()) +
                                            ", the limit of --timeout"),
                  g_format);
  pollfd error{STDERR_FILENO, POLLOUT, 0};
  if (poll(&error, 1, 0) > 0) {
    [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, text.data(), text.size());
  }
}

[[noreturn]] void EndEarly(int cause) {
  RestoreTerminal();
  if (cause == TOO_LATE) {
    ReportLateness();
    _exit(static_cast<int>(ExitCode::COMMUNICATION));
  }
  if (cause == SIGINT) {
    _exit(static_cast<int>(ExitCode::INTERRUPTED));
  }
  std::signal(cause, SIG_DFL);
  sigset_t all;
  sigfillset(&all);
  pthread_sigmask(SIG_UNBLOCK, &all, nullptr);
  for (;;) {
    kill(getpid(), cause);
  }
}

/// The path at which the library makes the new content of a file (see `Tarvel::PrivateFileLock::Replace`).
std::string ReplacementOf(const std::string &path) {
  return path + ".new";
}

/// Whether a thread or another process is replacing the file at `path`. A process that was killed leaves a replacement,
/// but no lock.
bool IsBeingReplaced(const std::string &path) {
  struct stat status = {};
  try {
    return !path.empty() && lstat(ReplacementOf(path).c_str(), &status) == 0 && !Tarvel::PrivateFile(path).TryLock();
  } catch (const Tarvel::Exception &) { // it is not a private file
    return false;
  }
}

/// Waits until no file is unfinished. After a second signal, removes the file instead.
/// @param isImpatient whether the second signal has already arrived
void CompleteFile(bool isImpatient) {
  while (!g_writing.try_lock()) {
    if (isImpatient || IsInterruptedWithin(TURN)) {
      g_naming.lock(); // never unlocked: no further file is made
      unlink(g_unfinishedPath.c_str());
      return;
    }
  }
  g_naming.lock();
  for (int turn = 0; turn < MAX_TURNS && IsBeingReplaced(g_replacedPath); ++turn) {
    if (isImpatient || IsInterruptedWithin(TURN)) {
      unlink(ReplacementOf(g_replacedPath).c_str());
      return;
    }
  }
}

/// The main thread has ended the command. Returns why the process must end early nevertheless, or `NOTHING`.
int AfterCommand() noexcept {
  // The system reports the end of the command before signals that arrived earlier.
  int cause = AwaitSignal(g_ending, Clock::now());
  if (cause == 0) {
    cause = g_cause;
  }
  // Another thread may still be writing a file.
  while (cause == NOTHING && !g_writing.try_lock()) {
    cause = AwaitSignal(g_ending, Clock::now() + TURN);
  }
  return cause;
}

void Watch() {
  const int signal = AwaitSignal(g_awaited, g_deadline);
  const bool hasEnded = signal == EndOfCommand();
  const int cause = hasEnded ? AfterCommand() : signal != 0 ? signal : TOO_LATE;
  if (cause == NOTHING) {
    return;
  }
  g_cause = cause;
  bool isImpatient = false;
  if (!hasEnded) {
    if (signal != 0) {
      GetCancelSource().Cancel();
    }
    isImpatient = IsInterruptedWithin(GRACE);
  }
  CompleteFile(isImpatient);
  EndEarly(cause);
}

sigset_t EndingSignals() {
  sigset_t set;
  sigemptyset(&set);
  for (const int signal : ENDING_SIGNALS) {
    struct sigaction current = {};
    // A shell starts background jobs with SIGINT ignored; it must stay ignored.
    if (sigaction(signal, nullptr, &current) == 0 && current.sa_handler != SIG_IGN) {
      sigaddset(&set, signal);
    }
  }
  return set;
}

} // namespace

void WatchCommand(const boost::optional<microseconds> &timeout, Format format) {
  // Ignored so that a file beyond the process's size limit is a write error, after which the file is cleaned up.
  std::signal(SIGXFSZ, SIG_IGN);
  g_ending = EndingSignals();
  g_awaited = g_ending;
  sigaddset(&g_awaited, EndOfCommand());
  g_timeLimit = timeout;
  if (timeout) {
    g_deadline = Clock::now() + *timeout;
  }
  g_format = format;
  GetCancelSource(); // created here, and not when a signal arrives
  sigset_t all;
  sigset_t earlier;
  sigfillset(&all);
  pthread_sigmask(SIG_SETMASK, &all, &earlier);
  g_watch = std::thread(Watch); // it inherits the mask
  pthread_sigmask(SIG_SETMASK, &earlier, nullptr);
  pthread_sigmask(SIG_BLOCK, &g_ending, nullptr);
}

CallOptions GetCallOptions() {
  CallOptions options;
  options.deadline = g_deadline;
  options.cancelToken = GetCancelSource().GetToken();
  return options;
}

boost::optional<microseconds> GetTimeLimit() {
  return g_timeLimit;
}

void FinishCommand() {
  if (!g_watch.joinable()) {
    return;
  }
  pthread_kill(g_watch.native_handle(), EndOfCommand());
  g_watch.join();
  pthread_sigmask(SIG_UNBLOCK, &g_ending, nullptr); // from now on they have their usual effect
}

void ReportAndFinish(const std::exception &failure, Format format) {
  const bool isLate = Classify(failure).className == "DeadlineExceededException";
  if (isLate && g_deadline && *g_deadline <= Clock::now()) {
    g_cause = TOO_LATE;
  }
  if (g_cause == NOTHING) {
    ReportFailure(failure, format);
  }
  FinishCommand();
}

void AwaitReplacementOf(const std::string &path) {
  const std::lock_guard<std::mutex> naming(g_naming);
  g_replacedPath = path;
}

UnfinishedFile::UnfinishedFile(const std::function<std::string()> &create) {
  std::unique_lock<std::mutex> writing(g_writing);
  const std::lock_guard<std::mutex> naming(g_naming);
  g_unfinishedPath = create();
  writing.release();
}

UnfinishedFile::~UnfinishedFile() {
  g_writing.unlock();
}

} // namespace SsoClient::Tool
