// SPDX-License-Identifier: Apache-2.0

#include "client/published_token.h"

#include "support/sanitized.h"
#include "unit/token_source/dated_token.h"

#include <gtest/gtest.h>

#include <atomic>
#include <limits>
#include <string>
#include <thread>
#include <vector>

namespace Testing {

using SsoClient::PublishedToken;

namespace {

constexpr std::int64_t ALWAYS = std::numeric_limits<std::int64_t>::max();

std::shared_ptr<const DatedToken> MakeToken(const std::string &id) {
  return std::make_shared<const DatedToken>(id, 0, 1);
}

} // namespace

TEST(PublishedToken, IsNullAtFirstAndAfterItIsCleared) {
  PublishedToken published;
  EXPECT_EQ(published.Read(0), nullptr);
  published.Publish(MakeToken("a"), 0, ALWAYS);
  EXPECT_NE(published.Read(0), nullptr);
  published.Clear();
  EXPECT_EQ(published.Read(0), nullptr);
}

TEST(PublishedToken, IsReadInItsTimeOnly) {
  PublishedToken published;
  published.Publish(MakeToken("a"), 10, 20);
  EXPECT_EQ(published.Read(9), nullptr);
  EXPECT_EQ(published.Read(10)->GetId(), "a");
  EXPECT_EQ(published.Read(19)->GetId(), "a");
  EXPECT_EQ(published.Read(20), nullptr);
  published.SetUntil(30);
  EXPECT_EQ(published.Read(20)->GetId(), "a");
  published.SetUntil(5);
  EXPECT_EQ(published.Read(10), nullptr);
}

TEST(PublishedToken, ReleasesATokenWhenItIsReplacedClearedOrDestroyed) {
  const int before = DatedToken::Alive();
  {
    PublishedToken published;
    published.Publish(MakeToken("a"), 0, ALWAYS);
    const std::shared_ptr<const SsoClient::SamlToken> copy = published.Read(0);
    published.Publish(MakeToken("b"), 0, ALWAYS);
    EXPECT_EQ(DatedToken::Alive(), before + 2) << "a copy keeps its token";
    EXPECT_EQ(copy->GetId(), "a");
    published.Publish(MakeToken("c"), 0, ALWAYS);
    EXPECT_EQ(DatedToken::Alive(), before + 2);
    published.Clear();
    EXPECT_EQ(DatedToken::Alive(), before + 1);
    published.Publish(MakeToken("d"), 0, ALWAYS);
  }
  EXPECT_EQ(DatedToken::Alive(), before);
}

TEST(PublishedToken, ReturnsWholeTokensToSixteenReadersWhileAWriterReplacesThem) {
  constexpr int REPLACEMENTS = IS_SANITIZED ? 10'000 : 50'000;
  const int before = DatedToken::Alive();
  {
    PublishedToken published;
    published.Publish(MakeToken("0"), 0, ALWAYS);
    std::atomic<bool> isEnded{false};
    std::atomic<int> wrong{0};
    std::vector<std::thread> readers;
    for (int reader = 0; reader < 16; ++reader) {
      readers.emplace_back([&] {
        int last = 0;
        while (!isEnded.load(std::memory_order_relaxed)) {
          const std::shared_ptr<const SsoClient::SamlToken> token = published.Read(0);
          const int number = token ? std::stoi(token->GetId()) : last;
          wrong += number < last ? 1 : 0; // an older token after a newer one
          last = number;
        }
      });
    }
    for (int number = 1; number <= REPLACEMENTS; ++number) {
      if (number % 7 == 0) {
        published.Clear();
      }
      published.Publish(MakeToken(std::to_string(number)), 0, ALWAYS);
    }
    isEnded = true;
    for (std::thread &reader : readers) {
      reader.join();
    }
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(published.Read(0)->GetId(), std::to_string(REPLACEMENTS));
    EXPECT_EQ(DatedToken::Alive(), before + 1) << "of all replaced tokens none is left";
  }
  EXPECT_EQ(DatedToken::Alive(), before);
}

} // namespace Testing
