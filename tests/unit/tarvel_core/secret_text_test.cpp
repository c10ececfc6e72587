// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/secret_text.h>

#include <gtest/gtest.h>

#include <ostream>
#include <string>
#include <type_traits>
#include <utility>

namespace Tarvel {
namespace {

static_assert(!std::is_convertible_v<std::string, SecretText>, "a plain text never becomes a secret by itself");
static_assert(!std::is_convertible_v<const char *, SecretText>, "a plain text never becomes a secret by itself");
static_assert(!std::is_convertible_v<SecretText, std::string>, "a secret never becomes a plain text by itself");
static_assert(!std::is_assignable_v<SecretText &, std::string>, "a plain text is never assigned to a secret");

TEST(SecretText, IsEmptyAtFirst) {
  EXPECT_EQ(SecretText().Get(), "");
}

TEST(SecretText, MovesTheTextAndEmptiesItsSource) {
  for (const std::string text : {"short", "a text that is too long to be kept inside of a string object"}) {
    std::string source = text;

    const SecretText secret(std::move(source));

    EXPECT_EQ(secret.Get(), text);
    EXPECT_EQ(source, ""); // NOLINT(bugprone-use-after-move): promised
  }
}

TEST(SecretText, CopiesAndMoves) {
  SecretText first("first");
  const SecretText copy = first;
  SecretText second = std::move(first);

  EXPECT_EQ(copy.Get(), "first");
  EXPECT_EQ(second.Get(), "first");
  EXPECT_EQ(first.Get(), ""); // NOLINT(bugprone-use-after-move): promised

  first = second;
  EXPECT_EQ(first.Get(), "first");
  second = SecretText("second");
  EXPECT_EQ(second.Get(), "second");
}

TEST(SecretText, AppendsToItsText) {
  SecretText secret("a");
  std::string expected = "a";
  for (int i = 0; i < 1000; ++i) {
    secret.Append("bc");
    expected += "bc";
  }
  EXPECT_EQ(secret.Get(), expected);
}

} // namespace
} // namespace Tarvel
