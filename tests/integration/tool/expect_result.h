// SPDX-License-Identifier: Apache-2.0
/// @file
/// Asserts the exit code and the whole output of a run of the tool.

#pragma once

#include "process.h"

#include <gtest/gtest.h>

#include <string>

namespace ToolTest {

inline void ExpectResult(const Result &result, int exitCode, const std::string &out, const std::string &err) {
  EXPECT_EQ(exitCode, result.exitCode);
  EXPECT_EQ(out, result.out);
  EXPECT_EQ(err, result.err);
}

} // namespace ToolTest
