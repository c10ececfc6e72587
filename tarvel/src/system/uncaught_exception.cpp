// SPDX-License-Identifier: Apache-2.0

#include "system/uncaught_exception.h"

#include "core/demangle.h"
#include "system/fork_gate.h"

#include <tarvel/core/string_util.h>
#include <tarvel/service/app.h>
#include <tarvel/service/logger.h>

#include <exception>
#include <string>
#include <typeinfo>

namespace Tarvel::System {

namespace {

constexpr int LEVEL_WARNING = 8;

std::string DescribeCurrentException() {
  try {
    throw;
  } catch (const std::exception &exception) {
    return Demangle(typeid(exception).name()) + ": " + StringUtil::Shorten(exception.what());
  } catch (...) {
    return "an object that is no exception";
  }
}

Service::Logger &PlatformLogger() {
  const Computation computing;
  // Never destroyed, as the threads that log never end before the process does.
  static Service::Logger *const logger =
      Service::Logger::CreateLogger(Service::GetApp().GetRootLogger(), "Tarvel", LEVEL_WARNING).Detach();
  return *logger;
}

} // namespace

void LogUncaughtException(std::string_view place) noexcept {
  try {
    LogInternal(PlatformLogger(), LEVEL_WARNING, "An exception left %1: %2", place, DescribeCurrentException());
  } catch (...) {
    // Out of memory while logging: the line is lost, the thread is not.
  }
}

} // namespace Tarvel::System
