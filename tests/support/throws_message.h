// SPDX-License-Identifier: Apache-2.0
/// @file
/// The only matcher for exceptions: it checks the exact dynamic class and the whole message.

#pragma once

#include <gtest/gtest.h>

#include <string>
#include <typeinfo>

namespace Testing {

/// Compares the exception that is being handled.
::testing::AssertionResult JudgeThrown(const std::type_info &expected, const std::string &message);

::testing::AssertionResult FailureOfNothingThrown(const std::type_info &expected, const std::string &message);

/// Runs `statement` and checks that it throws an exception of exactly the class `Expected` with exactly that message.
/// Each use is a separate instantiation, so the code that needs no template is in functions.
template <typename Expected, typename Statement>
::testing::AssertionResult ThrowsMessage(const Statement &statement, const std::string &message) {
  try {
    statement();
  } catch (...) {
    return JudgeThrown(typeid(Expected), message);
  }
  return FailureOfNothingThrown(typeid(Expected), message);
}

} // namespace Testing

/// Expects that `statement` throws exactly the class `Class`, not one derived from it, with exactly the text `message`.
#define EXPECT_THROWS_MESSAGE(statement, Class, message)                                                               \
  EXPECT_TRUE(::Testing::ThrowsMessage<Class>([&] { statement; }, message))
