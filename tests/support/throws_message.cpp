// SPDX-License-Identifier: Apache-2.0

#include "support/throws_message.h"

#include "support/kept_exception.h"

#include <exception>

namespace Testing {

::testing::AssertionResult JudgeThrown(const std::type_info &expected, const std::string &message) {
  KeepForThreadSanitizer(std::current_exception());
  try {
    throw;
  } catch (const std::exception &thrown) {
    if (typeid(thrown) != expected) {
      return ::testing::AssertionFailure() << "expected " << expected.name() << " \"" << message << "\", got "
                                           << typeid(thrown).name() << " \"" << thrown.what() << "\"";
    }
    if (thrown.what() != message) {
      return ::testing::AssertionFailure() << "expected the message\n  " << message << "\ngot\n  " << thrown.what();
    }
    return ::testing::AssertionSuccess();
  } catch (...) {
    return ::testing::AssertionFailure() << "something was thrown that is not a std::exception";
  }
}

::testing::AssertionResult FailureOfNothingThrown(const std::type_info &expected, const std::string &message) {
  return ::testing::AssertionFailure() << "expected " << expected.name() << " \"" << message
                                       << "\", nothing was thrown";
}

} // namespace Testing
