// SPDX-License-Identifier: Apache-2.0
// Each piece of memory that a `SecretText` gives back, and its own object, is searched for the secret. This program
// replaces the deallocation functions of C++ for that. A text of up to 15 bytes is inside its object, a longer one in
// memory of its own: each operation is tried with both.

#include <tarvel/core/secret_text.h>

#include <gtest/gtest.h>

#include <malloc.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <string_view>
#include <utility>

namespace {

/// Any so many bytes of the secret in a row count as the secret.
constexpr std::size_t PIECE_LENGTH = 4;

const char *g_secret = nullptr; // not owned; null while no test looks
int g_found = 0;

void LookForSecret(const void *memory) noexcept {
  if (!g_secret || !memory) {
    return;
  }
  const std::size_t bytes = malloc_usable_size(const_cast<void *>(memory));
  for (const char *piece = g_secret; std::strlen(piece) >= PIECE_LENGTH; ++piece) {
    if (memmem(memory, bytes, piece, PIECE_LENGTH)) {
      ++g_found;
      return;
    }
  }
}

void Free(void *memory) noexcept {
  LookForSecret(memory);
  std::free(memory);
}

} // namespace

void *operator new(std::size_t bytes) {
  // Zeroed, so that only what the code under test wrote is found.
  void *const memory = std::calloc(1, bytes ? bytes : 1);
  if (!memory) {
    throw std::bad_alloc();
  }
  return memory;
}
void operator delete(void *memory) noexcept {
  Free(memory);
}
void operator delete(void *memory, std::size_t) noexcept {
  Free(memory);
}

namespace Tarvel {
namespace {

const char SHORT_SECRET[] = "tr0ub4dor&3-xyz"; // the longest text that is inside its object
const char LONG_SECRET[] = "correct-horse-battery-staple-and-more-than-fits-into-the-object-itself";
const char SHORT_TEXT[] = "0123456789";
const char LONG_TEXT[] = "0123456789012345678901234567890123456789012345678901234567890123456789";

class SecretTextWiping : public testing::TestWithParam<const char *> {
protected:
  ~SecretTextWiping() override { g_secret = nullptr; }

  /// How many pieces of memory `action` frees with the secret in them.
  template <typename Action>
  static int CountFreed(const Action &action) {
    g_found = 0;
    g_secret = GetParam();
    action();
    g_secret = nullptr;
    return g_found;
  }

  static std::unique_ptr<SecretText> Make(const char *text = GetParam()) { return std::make_unique<SecretText>(text); }
};

INSTANTIATE_TEST_SUITE_P(Length, SecretTextWiping, testing::Values(SHORT_SECRET, LONG_SECRET), [](const auto &length) {
  return length.param == SHORT_SECRET ? std::string("Short") : std::string("Long");
});

TEST_P(SecretTextWiping, IsNeededForAnOrdinaryText) {
  EXPECT_GT(CountFreed([] { delete new std::string(GetParam()); }), 0);
}

TEST_P(SecretTextWiping, HappensOnDestruction) {
  EXPECT_EQ(CountFreed([] { Make(); }), 0);
  EXPECT_EQ(CountFreed([] { delete new SecretText(std::string_view(GetParam())); }), 0);
}

TEST_P(SecretTextWiping, CoversTheTextThatIsTakenOver) {
  auto source = std::make_unique<std::string>(GetParam());
  EXPECT_EQ(CountFreed([&source] {
              const auto secret = std::make_unique<SecretText>(std::move(*source));
              EXPECT_EQ(secret->Get(), GetParam());
              source.reset();
            }),
            0);
}

TEST_P(SecretTextWiping, CoversACopyAndItsSource) {
  EXPECT_EQ(CountFreed([] {
              const auto source = Make();
              const auto copy = std::make_unique<SecretText>(*source);
              EXPECT_EQ(copy->Get(), GetParam());
            }),
            0);
}

TEST_P(SecretTextWiping, CoversTheSourceOfAMove) {
  EXPECT_EQ(CountFreed([] {
              const auto source = Make();
              const auto moved = std::make_unique<SecretText>(std::move(*source));
              EXPECT_EQ(moved->Get(), GetParam());
              EXPECT_EQ(source->Get(), "");
            }),
            0);
}

TEST_P(SecretTextWiping, CoversTheTextThatAnAssignmentReplaces) {
  for (const char *text : {"", SHORT_TEXT, LONG_TEXT}) {
    EXPECT_EQ(CountFreed([text] {
                const auto copiedTo = Make();
                const auto movedTo = Make();
                const SecretText replacement(text);
                *copiedTo = replacement;
                *movedTo = SecretText(text);
                EXPECT_EQ(copiedTo->Get(), text);
                EXPECT_EQ(movedTo->Get(), text);
              }),
              0)
        << text;
  }
}

TEST_P(SecretTextWiping, CoversTheTextThatIsAssigned) {
  for (const char *earlier : {"", SHORT_TEXT, LONG_TEXT}) {
    EXPECT_EQ(CountFreed([earlier] {
                const auto source = Make();
                const auto copiedTo = Make(earlier);
                const auto movedTo = Make(earlier);
                *copiedTo = *source;
                *movedTo = std::move(*source);
                EXPECT_EQ(copiedTo->Get(), GetParam());
                EXPECT_EQ(movedTo->Get(), GetParam());
                EXPECT_EQ(source->Get(), "");
              }),
              0)
        << earlier;
  }
}

// The destructor of a moved-from text finds it empty, and overwrites only that.
TEST_P(SecretTextWiping, LeavesNothingInAMovedFromText) {
  const auto contains = [](const SecretText &text) {
    const std::string_view object(reinterpret_cast<const char *>(&text), sizeof text);
    return object.find(std::string_view(GetParam()).substr(8, PIECE_LENGTH)) != std::string_view::npos;
  };
  const auto constructedFrom = Make();
  const auto assignedFrom = Make();
  const auto takenFrom = Make();
  const auto target = Make(LONG_TEXT);
  const SecretText constructed = std::move(*constructedFrom);
  *target = std::move(*assignedFrom);
  const SecretText taken(takenFrom->Take());
  EXPECT_FALSE(contains(*constructedFrom));
  EXPECT_FALSE(contains(*assignedFrom));
  EXPECT_FALSE(contains(*takenFrom));
}

TEST_P(SecretTextWiping, KeepsATextThatIsAssignedToItself) {
  const auto secret = Make();
  SecretText &same = *secret;
  *secret = same;
  EXPECT_EQ(secret->Get(), GetParam());
  *secret = std::move(same);
  EXPECT_EQ(secret->Get(), GetParam());
}

TEST_P(SecretTextWiping, CoversMemoryThatTheTextOutgrows) {
  constexpr int TIMES = 20;
  EXPECT_EQ(CountFreed([] {
              const auto secret = Make();
              for (int i = 0; i < TIMES; ++i) {
                secret->Append(LONG_TEXT);
              }
              EXPECT_EQ(secret->Get().size(), std::strlen(GetParam()) + TIMES * std::strlen(LONG_TEXT));
            }),
            0);
}

TEST_P(SecretTextWiping, LeavesATextThatWasTakenToItsOwner) {
  auto secret = Make();
  std::string taken = secret->Take();
  EXPECT_EQ(taken, GetParam());
  EXPECT_EQ(secret->Get(), "");
  EXPECT_EQ(CountFreed([&secret] { secret.reset(); }), 0);
}

} // namespace
} // namespace Tarvel
