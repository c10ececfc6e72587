// SPDX-License-Identifier: Apache-2.0
/// @file
/// `FixedEnvironment`, a stopped clock and UUIDs that count from one.

#pragma once

#include <tarvel/core/environment.h>

#include <cstdint>
#include <memory>
#include <string>

namespace Testing {

/// 2026-01-02T03:04:05.006Z in microseconds since 1970.
constexpr std::int64_t FIXED_NOW = 1767323045006000;

/// While it exists, the time is always 2026-01-02T03:04:05.006Z, and the n-th UUID (n up to 9) ends in n and has zeros
/// everywhere else where the UUID's form allows.
class FixedEnvironment {
public:
  FixedEnvironment() : m_scope(Make()) {}

private:
  static Tarvel::Environment Make() {
    const auto count = std::make_shared<int>(0);
    return {[] { return FIXED_NOW; },
            [count] { return "00000000-0000-4000-8000-00000000000" + std::to_string(++*count); }};
  }

  Tarvel::ScopedEnvironment m_scope;
};

} // namespace Testing
