// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/exception.h>

#include <tarvel/core/checked_cast.h>

#include <gtest/gtest.h>

#include <exception>
#include <memory>
#include <thread>
#include <type_traits>
#include <typeinfo>
#include <utility>

namespace Tarvel {
namespace {

template <typename T>
std::string MessageOf(const T &action) {
  try {
    action();
  } catch (const std::exception &error) {
    return error.what();
  }
  return "nothing was raised";
}

template <typename T>
class ExceptionClass : public testing::Test {};

using ExceptionClasses =
    testing::Types<Exception, InvalidArgumentException, InvalidStateException, TypeMismatchException,
                   Base64FormatException, DateTimeFormatException, IOException>;
TYPED_TEST_SUITE(ExceptionClass, ExceptionClasses);

TYPED_TEST(ExceptionClass, IsAStandardException) {
  EXPECT_TRUE((std::is_base_of_v<std::exception, TypeParam>));
}

TYPED_TEST(ExceptionClass, IsCopiedWithoutThrowing) {
  EXPECT_TRUE(std::is_nothrow_copy_constructible_v<TypeParam>);
  EXPECT_TRUE(std::is_nothrow_copy_assignable_v<TypeParam>);
}

TYPED_TEST(ExceptionClass, CloneOfABaseReferenceKeepsTheDynamicClassAndTheMessage) {
  const TypeParam original("detail");
  const Exception &held = original;
  const std::unique_ptr<Exception> clone(held.Clone());
  const Exception &copy = *clone;
  EXPECT_NE(&copy, &held);
  EXPECT_TRUE(typeid(copy) == typeid(TypeParam));
  EXPECT_STREQ(copy.what(), original.what());
  EXPECT_EQ(copy.GetBacktrace(), original.GetBacktrace());
}

TYPED_TEST(ExceptionClass, CopyOfABaseReferenceOwnsAnObjectOfTheDynamicClass) {
  static_assert(std::is_same_v<decltype(std::declval<const TypeParam &>().Copy()), std::unique_ptr<Exception>>);
  std::unique_ptr<Exception> copy;
  std::string message;
  {
    const TypeParam original("detail");
    const Exception &held = original;
    message = original.what();
    copy = held.Copy();
    EXPECT_NE(copy.get(), &held);
    EXPECT_EQ(copy->GetBacktrace(), original.GetBacktrace());
  }
  const Exception &kept = *copy;
  EXPECT_TRUE(typeid(kept) == typeid(TypeParam));
  EXPECT_EQ(kept.what(), message);
}

TYPED_TEST(ExceptionClass, ThrowOfABaseReferenceThrowsTheDynamicClass) {
  const TypeParam original("detail");
  const Exception &held = original;
  try {
    held.Throw();
  } catch (const Exception &raised) {
    EXPECT_NE(&raised, &held);
    EXPECT_TRUE(typeid(raised) == typeid(TypeParam));
    EXPECT_STREQ(raised.what(), original.what());
  }
}

TEST(Exception, KeepsTheMessageAsGiven) {
  EXPECT_STREQ(Exception("a %1 message").what(), "a %1 message");
  EXPECT_STREQ(Exception("").what(), "");
}

TEST(Exception, KeepsAnAssignedMessageLongerThanItsSource) {
  Exception target("first");
  {
    const Exception source("second");
    target = source;
  }
  EXPECT_STREQ(target.what(), "second");
}

TEST(Exception, MovedFromExceptionStillHasItsMessage) {
  Exception source("kept");
  const Exception target(std::move(source));
  EXPECT_STREQ(source.what(), "kept");
  EXPECT_STREQ(target.what(), "kept");
}

TEST(InvalidArgumentException, PutsItsPrefixBeforeTheDetailOnce) {
  const InvalidArgumentException error("lifetime");
  EXPECT_STREQ(error.what(), "Invalid argument : lifetime");
  const std::unique_ptr<Exception> clone(error.Clone());
  EXPECT_STREQ(clone->what(), "Invalid argument : lifetime");
}

TEST(Exception, BacktraceHasOneFramePerLine) {
  const std::string backtrace = Exception("x").GetBacktrace();
  ASSERT_FALSE(backtrace.empty());
  EXPECT_EQ(backtrace.back(), '\n');
  EXPECT_EQ(backtrace.find("\n\n"), std::string::npos);
}

TEST(Exception, DumpContainsClassMessageAndCallStack) {
  const IOException error("no such thing");
  EXPECT_EQ(error.Dump(), "Tarvel::IOException: no such thing\n" + error.GetBacktrace());
}

TEST(Exception, WhereIsAFrameOfTheCallStack) {
  const InvalidStateException error("x");
  ASSERT_FALSE(error.Where().empty());
  EXPECT_NE(error.GetBacktrace().find(error.Where() + '\n'), std::string::npos);
}

TEST(Exception, WhereIsNotAConstructorOfTheException) {
  EXPECT_EQ(InvalidArgumentException("x").Where().find("InvalidArgumentException::"), std::string::npos);
}

TEST(Exception, CloneIsUsableOnAnotherThreadAfterTheOriginalIsGone) {
  std::unique_ptr<Exception> clone;
  {
    const InvalidStateException original("handed over");
    clone.reset(original.Clone());
  }
  std::string message;
  std::thread([&] { message = MessageOf([&] { clone->Throw(); }); }).join();
  EXPECT_EQ(message, "handed over");
}

class Fruit : public Object {};
class Apple final : public Fruit {};
class Pear final : public Fruit {};

TEST(OutOfMemoryException, HasOneMessageAndNoCallStack) {
  const OutOfMemoryException failure;
  const Exception &base = failure;
  EXPECT_STREQ(base.what(), "There is not enough memory");
  EXPECT_EQ(base.GetBacktrace(), "");
  EXPECT_EQ(base.Where(), "");
  EXPECT_EQ(base.Dump(), "Tarvel::OutOfMemoryException: There is not enough memory\n");
  const std::unique_ptr<const Exception> copy(base.Clone());
  EXPECT_STREQ(copy->what(), "There is not enough memory");
  EXPECT_THROW(copy->Throw(), OutOfMemoryException);
}

TEST(CheckedCast, ReturnsTheSameObjectAsItsClass) {
  const Ref<Object> object = MakeRef<Apple>();
  EXPECT_EQ(CheckedCast<Apple>(object).get(), object.get());
  EXPECT_EQ(CheckedCast<Fruit>(object).get(), object.get());
}

TEST(CheckedCast, KeepsNull) {
  EXPECT_FALSE(CheckedCast<Apple>(Ref<Object>()));
}

TEST(CheckedCast, ReportsExpectedAndActualClass) {
  const Ref<Object> object = MakeRef<Pear>();
  EXPECT_THROW(CheckedCast<Apple>(object), TypeMismatchException);
  EXPECT_EQ(MessageOf([&] { CheckedCast<Apple>(object); }),
            "Type mismatch : expected Tarvel::(anonymous namespace)::Apple, but the object is "
            "Tarvel::(anonymous namespace)::Pear");
}

} // namespace
} // namespace Tarvel
