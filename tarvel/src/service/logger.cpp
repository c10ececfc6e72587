// SPDX-License-Identifier: Apache-2.0

#include <tarvel/service/logger.h>

#include <tarvel/core/string_util.h>

#include <new>
#include <utility>

namespace Tarvel::Service {

namespace {

class LoggerImpl final : public Logger {
public:
  LoggerImpl(Ref<LogRoot> root, std::string name, int level)
      : Logger(level), m_root(std::move(root)), m_name(std::move(name)) {}

  const std::string &GetName() const noexcept override { return m_name; }

  void Write(int level, std::string_view message) noexcept override {
    if (!m_root) {
      return;
    }
    if (message.size() <= StringUtil::MAX_LINE_BYTES) {
      m_root->Write({m_name, level, message});
      return;
    }
    try {
      m_root->Write({m_name, level, StringUtil::Shorten(message, StringUtil::MAX_LINE_BYTES)});
    } catch (const std::bad_alloc &) {
      // The line is lost, but the operation that it reports continues.
    }
  }

private:
  const Ref<LogRoot> m_root;
  const std::string m_name;
};

} // namespace

LogRoot::~LogRoot() = default;

Logger::~Logger() = default;

Ref<Logger> Logger::CreateLogger(const Ref<LogRoot> &root, std::string name, int level) {
  return MakeRef<LoggerImpl>(root, std::move(name), level);
}

} // namespace Tarvel::Service
