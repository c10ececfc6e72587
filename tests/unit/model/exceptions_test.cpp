// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/exceptions.h>

#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <type_traits>
#include <typeinfo>

namespace {

using namespace SsoClient;

static_assert(std::is_base_of_v<Tarvel::Exception, SsoException>);
static_assert(std::is_base_of_v<SsoException, InvalidTokenException>);
static_assert(std::is_base_of_v<InvalidTokenException, InvalidSignatureException>);
static_assert(std::is_base_of_v<InvalidTokenException, ParseException>);
static_assert(std::is_base_of_v<SsoException, CommunicationException>);
static_assert(std::is_base_of_v<SsoException, InvalidCredentialsException>);
static_assert(!std::is_base_of_v<InvalidTokenException, CommunicationException>);
static_assert(!std::is_base_of_v<InvalidTokenException, InvalidCredentialsException>);
static_assert(!std::is_base_of_v<SsoException, Tarvel::InvalidArgumentException>);
static_assert(!std::is_base_of_v<SsoException, Tarvel::InvalidStateException>);

TEST(Exceptions, OneBaseCatchesBothTokenFailures) {
  EXPECT_THROW(throw InvalidSignatureException("signature"), InvalidTokenException);
  EXPECT_THROW(throw ParseException("parse"), InvalidTokenException);
}

TEST(Exceptions, BaseCatchesEveryClassOfTheLibrary) {
  EXPECT_THROW(throw InvalidTokenException("token"), SsoException);
  EXPECT_THROW(throw InvalidSignatureException("signature"), SsoException);
  EXPECT_THROW(throw ParseException("parse"), SsoException);
  EXPECT_THROW(throw CommunicationException("communication"), SsoException);
  EXPECT_THROW(throw InvalidCredentialsException("credentials"), SsoException);
}

TEST(Exceptions, BaseDoesNotCatchThePlatformsArgumentAndStateExceptions) {
  const auto caughtAsSsoException = [](const auto &exception) {
    try {
      throw exception;
    } catch (const SsoException &) {
      return true;
    } catch (const Tarvel::Exception &) {
      return false;
    }
  };
  EXPECT_FALSE(caughtAsSsoException(Tarvel::InvalidArgumentException("argument")));
  EXPECT_FALSE(caughtAsSsoException(Tarvel::InvalidStateException("state")));
}

TEST(Exceptions, CloneOfAParseExceptionThroughItsBaseIsAParseException) {
  const ParseException original("what went wrong");
  const SsoException &held = original;
  const std::unique_ptr<Tarvel::Exception> clone(held.Clone());
  const Tarvel::Exception &cloned = *clone;
  EXPECT_TRUE(typeid(cloned) == typeid(ParseException));
  EXPECT_NE(clone.get(), &original);
  EXPECT_THROWS_MESSAGE(clone->Throw(), ParseException, "what went wrong");
}

template <typename Exception>
class EachException : public ::testing::Test {};

using AllExceptions = ::testing::Types<SsoException, InvalidTokenException, InvalidSignatureException, ParseException,
                                       CommunicationException, InvalidCredentialsException>;
TYPED_TEST_SUITE(EachException, AllExceptions);

TYPED_TEST(EachException, IsClonedAndThrownAsItsOwnClass) {
  std::unique_ptr<Tarvel::Exception> clone;
  {
    const TypeParam original("the message");
    const Tarvel::Exception &held = original;
    clone.reset(held.Clone());
    EXPECT_THROWS_MESSAGE(held.Throw(), TypeParam, "the message");
  }
  const Tarvel::Exception &cloned = *clone;
  EXPECT_TRUE(typeid(cloned) == typeid(TypeParam));
  EXPECT_STREQ(clone->what(), "the message");
}

TYPED_TEST(EachException, KeepsMessageAndCallStack) {
  const TypeParam exception("the message");
  EXPECT_STREQ("the message", exception.what());
  EXPECT_NE("", exception.GetBacktrace());
  EXPECT_EQ(::testing::internal::GetTypeName<TypeParam>() + ": the message\n" + exception.GetBacktrace(),
            exception.Dump());
  EXPECT_NE("", exception.Where());
  EXPECT_NE(std::string::npos, exception.GetBacktrace().find(exception.Where()));
  const TypeParam copy(exception);
  EXPECT_EQ(exception.GetBacktrace(), copy.GetBacktrace());
  EXPECT_EQ(exception.Where(), copy.Where());
}

} // namespace
