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
  std::string_view logger;  ///< the logger's name
  int level;                ///< the line's level: the higher, the more detailed
  std::string_view message; ///< the text of the line
};

/// The host's function for one line. Called on the thread that logs, possibly on several at once; an exception that it
/// throws is ignored.
using LogSink = std::function<void(const LogRecord &)>;

/// The root of all loggers, which has the host's sink. There is one, in the `App`.
class TARVEL_API LogRoot : public Object {
public:
  /// Installs the sink, which replaces any earlier one; an empty function removes it. Lines that other threads are
  /// writing at that moment may still reach the earlier sink.
  virtual void SetSink(LogSink sink) = 0;

  /// Passes `record` to the sink, if there is one. Never throws.
  virtual void Write(const LogRecord &record) noexcept = 0;

  /// Whether a sink is installed.
  virtual bool HasSink() const noexcept = 0;

protected:
  ~LogRoot() override;
};

/// A named source of log lines. Safe on any thread.
class TARVEL_API Logger : public Object {
public:
  /// A logger of that name on `root` that writes lines of up to `level`.
  static Ref<Logger> CreateLogger(const Ref<LogRoot> &root, std::string name, int level);

  /// The name that the logger was made with.
  virtual const std::string &GetName() const noexcept = 0;

  /// The highest level that is written; one atomic load. A line of level n is written when this is at least n.
  int GetLevel() const noexcept { return m_level.load(std::memory_order_relaxed); }
  /// Sets the highest level that is written; other threads see the change soon.
  void SetLevel(int level) noexcept { m_level.store(level, std::memory_order_relaxed); }

  /// Writes one line, whatever its level; callers test `GetLevel` first. A line of more than 7,168 bytes is cut, which its end
  /// reports. Never throws.
  virtual void Write(int level, std::string_view message) noexcept = 0;

protected:
  explicit Logger(int level) noexcept : m_level(level) {}
  ~Logger() override;

private:
  std::atomic<int> m_level;
};

/// Writes `message` as one line of `logger` if the logger's level is at least `level`. The arguments replace %1 to %9.
template <typename... Args>
void LogInternal(Logger &logger, int level, std::string_view message, const Args &...args) {
  if (logger.GetLevel() < level) {
    return;
  }
  logger.Write(level, MessageFormatter::ASPrint(message, args...));
}

} // namespace Tarvel::Service
