// SPDX-License-Identifier: Apache-2.0

#include "crypto/openssl_errors.h"

#include "support/throws_message.h"

#include <tarvel/crypto/certificate.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <openssl/err.h>

#include <cerrno>

namespace Tarvel::Crypto {

namespace {

using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;

void RaiseError(int reason, const char *words) {
  ERR_raise_data(ERR_LIB_USER, reason, "%s", words);
}

class OpenSslErrorScopeTest : public ::testing::Test {
protected:
  OpenSslErrorScopeTest() { ERR_clear_error(); }
  ~OpenSslErrorScopeTest() override { ERR_clear_error(); }
};

TEST_F(OpenSslErrorScopeTest, RemovesItsErrors) {
  {
    const OpenSslErrorScope errors;
    RaiseError(1, "ours");
  }
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST_F(OpenSslErrorScopeTest, KeepsTheErrorsOfTheHost) {
  RaiseError(1, "first of the host");
  RaiseError(2, "second of the host");
  {
    const OpenSslErrorScope outer;
    RaiseError(3, "ours");
    const OpenSslErrorScope inner;
    RaiseError(4, "ours too");
    EXPECT_THAT(inner.TakeText(), HasSubstr("ours too"));
  }
  EXPECT_EQ(ERR_GET_REASON(ERR_get_error()), 1);
  EXPECT_EQ(ERR_GET_REASON(ERR_get_error()), 2);
  EXPECT_EQ(ERR_get_error(), 0U);
}

TEST_F(OpenSslErrorScopeTest, KeepsAMarkOfTheHost) {
  RaiseError(1, "before the mark");
  ERR_set_mark();
  RaiseError(2, "after the mark");
  {
    const OpenSslErrorScope errors;
    RaiseError(3, "ours");
  }
  ERR_pop_to_mark();
  EXPECT_EQ(ERR_GET_REASON(ERR_peek_last_error()), 1);
}

TEST_F(OpenSslErrorScopeTest, DescribesEveryErrorOldestFirst) {
  const OpenSslErrorScope errors;
  RaiseError(1, "first");
  RaiseError(2, "second");
  const std::string text = errors.Describe("It failed");
  EXPECT_THAT(text,
              AllOf(::testing::StartsWith("It failed: error:"), HasSubstr("(first); error:"), EndsWith("(second)")));
}

TEST_F(OpenSslErrorScopeTest, NeverDescribesAnErrorOfTheHost) {
  RaiseError(1, "of the host");
  const OpenSslErrorScope errors;
  RaiseError(2, "ours");
  EXPECT_THAT(errors.TakeText(), AllOf(HasSubstr("ours"), Not(HasSubstr("of the host"))));
}

TEST_F(OpenSslErrorScopeTest, AddsNoTextWithoutAnError) {
  const OpenSslErrorScope errors;
  EXPECT_EQ(errors.Describe("It failed"), "It failed");
}

TEST_F(OpenSslErrorScopeTest, AddsNoTextWhenOnlyTheHostHasAnError) {
  RaiseError(1, "of the host");
  const OpenSslErrorScope errors;
  EXPECT_EQ(errors.Describe("It failed"), "It failed");
}

TEST_F(OpenSslErrorScopeTest, RecognisesALackOfMemoryByAnyQueuedError) {
  const OpenSslErrorScope errors;
  ERR_raise(ERR_LIB_ASN1, ERR_R_MALLOC_FAILURE);
  RaiseError(1, "and so it does not decode");
  EXPECT_THROWS_MESSAGE(errors.Throw("It failed"), OutOfMemoryException, "There is not enough memory");
}

TEST_F(OpenSslErrorScopeTest, RecognisesALackOfMemoryByErrnoWhenOpenSslReportsAnotherError) {
  errno = ENOMEM; // of the host
  const OpenSslErrorScope errors;
  RaiseError(1, "it does not decode");
  EXPECT_FALSE(errors.RanOutOfMemory());
  errno = ENOMEM;
  EXPECT_THROWS_MESSAGE(errors.Describe("It failed"), OutOfMemoryException, "There is not enough memory");
}

TEST_F(OpenSslErrorScopeTest, RecognisesALackOfMemoryInAnInnerScope) {
  const OpenSslErrorScope errors;
  {
    const OpenSslErrorScope inner;
    errno = ENOMEM;
  }
  {
    const OpenSslErrorScope inner;
    EXPECT_FALSE(inner.RanOutOfMemory());
  }
  EXPECT_TRUE(errors.RanOutOfMemory());
}

TEST_F(OpenSslErrorScopeTest, KeepsErrnoOfTheHost) {
  errno = EAGAIN;
  {
    const OpenSslErrorScope errors;
    errno = EBADF;
  }
  EXPECT_EQ(errno, EAGAIN);
}

TEST_F(OpenSslErrorScopeTest, KeepsItsTextAfterACheckForMemory) {
  const OpenSslErrorScope errors;
  RaiseError(1, "ours");
  EXPECT_FALSE(errors.RanOutOfMemory());
  EXPECT_EQ(ERR_GET_REASON(errors.PeekNewest()), 1);
  EXPECT_THAT(errors.Describe("It failed"), HasSubstr("ours"));
}

} // namespace

} // namespace Tarvel::Crypto
