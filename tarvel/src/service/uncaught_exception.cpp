// SPDX-License-Identifier: Apache-2.0

#include "service/uncaught_exception.h"

#include "core/demangle.h"
#include "core/fork_gate.h"

#include <tarvel/core/string_util.h>
#include <tarvel/service/app.h>
#include <tarvel/service/logger.h>

#include <exception>
#include <string>
#include <typeinfo>

namespace Tarvel::Service {

namespace {

constexpr int LEVEL_WARNING = 8;

std::string DescribeCurrentException() {
  try {
    throw;
  } catch (const std::exception &exception) {
    return Demangle(typeid(exception).name()) + ": " + StringUtil::Shorten(exception.what());
  } catch (...) {
    return "an object that is not a std::exception";
  }
}

Logger &PlatformLogger() {
  const Computation computing;
  // Never destroyed: the threads that log run until the process ends.
  static Logger *const logger = Logger::CreateLogger(GetApp().GetRootLogger(), "Tarvel", LEVEL_WARNING).Detach();
  return *logger;
}

} // namespace

void LogUncaughtException(std::string_view place) noexcept {
  try {
    LogInternal(PlatformLogger(), LEVEL_WARNING, "An exception left %1: %2", place, DescribeCurrentException());
  } catch (...) {
    // Out of memory while logging: the line is lost, but the thread continues.
  }
}

} // namespace Tarvel::Service
