// SPDX-License-Identifier: Apache-2.0
/// @file
/// The application object: what the host process provides for the platform.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/service/logger.h>

namespace Tarvel::Service {

/// The single application object of the process.
class TARVEL_API App {
public:
  App(const App &) = delete;
  App &operator=(const App &) = delete;

  /// The root of all loggers. It has no sink at first: the library prints nothing.
  virtual Ref<LogRoot> GetRootLogger() = 0;

protected:
  App() = default;
  ~App() = default;
};

/// The application object, made on first use; it lives until the process ends. Safe on any thread.
TARVEL_API App &GetApp();

} // namespace Tarvel::Service
