// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one matcher for exceptions: the exact dynamic class and the whole message.

#pragma once

#include <gtest/gtest.h>

#include <exception>
#include <string>
#include <typeinfo>

namespace Testing {

/// Runs `statement` and judges what it throws: an exception of exactly the class `Expected` with exactly that message.
template <typename Expected, typename Statement>
::testing::AssertionResult ThrowsMessage(const Statement &statement, const std::string &message) {
  try {
    statement();
  } catch (const std::exception &thrown) {
    if (typeid(thrown) != typeid(Expected)) {
      return ::testing::AssertionFailure() << "expected " << typeid(Expected).name() << " \"" << message << "\", got "
                                           << typeid(thrown).name() << " \"" << thrown.what() << "\"";
    }
    if (thrown.what() != message) {
      return ::testing::AssertionFailure() << "expected the message\n  " << message << "\ngot\n  " << thrown.what();
    }
    return ::testing::AssertionSuccess();
  } catch (...) {
    return ::testing::AssertionFailure() << "something was thrown that is no std::exception";
  }
  return ::testing::AssertionFailure() << "expected " << typeid(Expected).name() << " \"" << message
                                       << "\", nothing was thrown";
}

} // namespace Testing

/// Expects that `statement` throws exactly the class `Class`, not one derived from it, with exactly the text `message`.
#define EXPECT_THROWS_MESSAGE(statement, Class, message)                                                               \
  EXPECT_TRUE(::Testing::ThrowsMessage<Class>([&] { statement; }, message))
