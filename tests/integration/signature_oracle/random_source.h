// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RandomSource`, random choices that are the same on every machine.

#pragma once

#include <cstddef>
#include <cstdint>
#include <random>
#include <string_view>

namespace Testing {

class RandomSource {
public:
  explicit RandomSource(std::uint64_t seed) : m_engine(seed) {}

  /// A number below `bound`, which must not be 0. Unlike a number of the standard distributions, it is the same with
  /// every standard library.
  std::size_t Below(std::size_t bound) { return static_cast<std::size_t>(m_engine() % bound); }

  /// True once in `times`.
  bool OnceIn(std::size_t times) { return Below(times) == 0; }

  template <std::size_t COUNT>
  std::string_view OneOf(const std::string_view (&choices)[COUNT]) {
    return choices[Below(COUNT)];
  }

private:
  std::mt19937_64 m_engine;
};

} // namespace Testing
