// SPDX-License-Identifier: Apache-2.0

#include <tarvel/service/logger.h>

#include <utility>

namespace Tarvel {
namespace Service {

namespace {

class LoggerImpl final : public Logger {
public:
  LoggerImpl(Ref<LogRoot> root, std::string name, int level)
      : Logger(level), m_root(std::move(root)), m_name(std::move(name)) {}

  const std::string &GetName() const noexcept override { return m_name; }

  void Write(int level, std::string_view message) noexcept override {
    if (m_root) {
      m_root->Write({m_name, level, message});
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

} // namespace Service
} // namespace Tarvel
