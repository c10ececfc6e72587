// SPDX-License-Identifier: Apache-2.0
/// @file
/// Named loggers with levels, and the call that writes one formatted line.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/core/ref.h>

#include <atomic>
#include <functional>
#include <string>
#include <string_view>

namespace Tarvel::Service {

/// One line for the sink. The texts are valid during the call only.
struct LogRecord {
  std::string_view logger; ///< the logger's name
  int level;               ///< the line's level: the higher, the finer
  std::string_view message;
};

/// What the host does with a line. Called on the thread that logs, possibly on several at once; an exception that leaves
/// it is swallowed.
using LogSink = std::function<void(const LogRecord &)>;

/// The root of all loggers: it holds the host's sink. One exists, in the `App`.
class TARVEL_API LogRoot : public Object {
public:
  /// Installs the sink, in place of any earlier one; an empty function removes it. Lines that are being written on other
  /// threads may still reach the earlier sink.
  virtual void SetSink(LogSink sink) = 0;

  /// Hands `record` to the sink, if there is one. Never throws.
  virtual void Write(const LogRecord &record) noexcept = 0;

  /// Whether a sink is installed.
  virtual bool HasSink() const noexcept = 0;

protected:
  ~LogRoot() override;
};

/// A named source of log lines. Safe on any thread.
class TARVEL_API Logger : public Object {
public:
  /// A logger of that name on `root` that lets lines of up to `level` through.
  static Ref<Logger> CreateLogger(const Ref<LogRoot> &root, std::string name, int level);

  virtual const std::string &GetName() const noexcept = 0;

  /// The finest level that is let through; one atomic load. A line of level n is written when this is at least n.
  int GetLevel() const noexcept { return m_level.load(std::memory_order_relaxed); }
  void SetLevel(int level) noexcept { m_level.store(level, std::memory_order_relaxed); }

  /// Writes one line, whatever its level; callers test `GetLevel` first. Never throws.
  virtual void Write(int level, std::string_view message) noexcept = 0;

protected:
  explicit Logger(int level) noexcept : m_level(level) {}
  ~Logger() override;

private:
  std::atomic<int> m_level;
};

/// Writes `message`, with the arguments in %1 to %9, as one line of `logger` when its level lets it through.
template <typename... Args>
void LogInternal(Logger &logger, int level, std::string_view message, const Args &...args) {
  if (logger.GetLevel() < level) {
    return;
  }
  logger.Write(level, MessageFormatter::ASPrint(message, args...));
}

} // namespace Tarvel::Service
