// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one place where tests replace the clock and the source of UUIDs.

#pragma once

#include <tarvel/core/export.h>

#include <cstdint>
#include <functional>
#include <string>

namespace Tarvel {

/// What the platform reads from outside the process. An empty function means the real source.
struct Environment {
  std::function<std::int64_t()> utcMicroseconds; ///< microseconds since 1970-01-01T00:00:00Z
  std::function<std::string()> uuid;             ///< a UUID's text
};

/// Replaces the real clock and UUID source for the whole process until this object is destroyed. Scopes nest. The
/// functions are called on any thread. For tests: a service must never use it.
class TARVEL_API ScopedEnvironment {
public:
  /// From now on, the functions of `environment` replace the real sources.
  explicit ScopedEnvironment(Environment environment);
  ScopedEnvironment(const ScopedEnvironment &) = delete;
  ScopedEnvironment &operator=(const ScopedEnvironment &) = delete;
  ~ScopedEnvironment();

private:
  const Environment *m_environment;
  const Environment *m_previous;
};

} // namespace Tarvel
