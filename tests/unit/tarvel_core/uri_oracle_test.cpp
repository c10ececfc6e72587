// SPDX-License-Identifier: Apache-2.0

#include "uri_oracle.h"

#include "core/uri_reference.h"

#include <gtest/gtest.h>

#include <array>
#include <iterator>
#include <random>
#include <string>
#include <string_view>

namespace Tarvel {
namespace {

class UriReferenceOracle : public testing::Test {
protected:
  void Compare(const std::string &text) {
    const UriComparison comparison = CompareWithLibxml2(text);
    EXPECT_EQ(comparison.disagreement, "");
    m_accepted += comparison.isUriReference ? 1 : 0;
    for (std::size_t kind = 0; kind < m_seen.size(); ++kind) {
      m_seen[kind] = m_seen[kind] || comparison.differences[kind];
    }
  }

  std::size_t GetAccepted() const { return m_accepted; }
  const std::array<bool, URI_DIFFERENCES> &GetSeen() const { return m_seen; }

private:
  std::size_t m_accepted = 0;
  std::array<bool, URI_DIFFERENCES> m_seen{};
};

TEST_F(UriReferenceOracle, AgreesOnEachCharacterAtEachPlace) {
  for (const std::string text :
       {"", "a", "ab:c", "a/b", "//h", "s://u:p@h.x:80/a/b?c#d", "s://[::1]:1/", "//[v1.a]", "1.2.3.4", "//1.2.3.4",
        "s:a@b:c;d=e", "s:?q?#f/", "%41%5A", "s://%41@%42:1/%43?%44#%45", "urn:a:b", "/a//b:c/", "//@:", "s:#[1]"}) {
    Compare(text);
    for (int code = 1; code < 256; ++code) {
      const char c = static_cast<char>(code);
      for (std::size_t place = 0; place <= text.size(); ++place) {
        std::string changed = text;
        Compare(changed.insert(place, 1, c));
        if (place < text.size()) {
          changed = text;
          changed[place] = c;
          Compare(changed);
        }
      }
    }
  }
  EXPECT_GT(GetAccepted(), 15'000U);
}

TEST_F(UriReferenceOracle, AgreesOnTextsMadeOfPieces) {
  const std::string_view pieces[] = {"s",
                                     "1",
                                     ":",
                                     ":",
                                     "/",
                                     "//",
                                     "//",
                                     "?",
                                     "#",
                                     "@",
                                     "[",
                                     "]",
                                     "[::1]",
                                     "[v1.x]",
                                     "%41",
                                     "%",
                                     "%4",
                                     "80",
                                     ".",
                                     "-",
                                     "_",
                                     "~",
                                     "!",
                                     "&",
                                     "'",
                                     ";",
                                     "=",
                                     "+",
                                     "\xC3\xA4",
                                     " ",
                                     "<",
                                     "|",
                                     "::",
                                     "..",
                                     "2147483647",
                                     "256",
                                     "000000000001",
                                     "1.2.3.4",
                                     "2147483648",
                                     "http:",
                                     "a.b",
                                     "\\",
                                     "^"};
  std::mt19937 random(20); // the same texts every time
  for (int count = 0; count < 400'000; ++count) {
    std::string text;
    for (std::size_t length = random() % 10; length > 0; --length) {
      text += pieces[random() % std::size(pieces)];
    }
    Compare(text);
  }
  EXPECT_GT(GetAccepted(), 30'000U);
  for (std::size_t kind = 0; kind < GetSeen().size(); ++kind) {
    EXPECT_TRUE(GetSeen()[kind]) << "no text had difference " << kind;
  }
}

struct KnownDifference {
  const char *text;
  UriDifference kind;
  bool isUriReference;
};

TEST(IsUriReference, FollowsTheStandardWhereLibxml2DoesNot) {
  for (const KnownDifference &known :
       {KnownDifference{"s://h:", EMPTY_PORT, true}, KnownDifference{"s://h:2147483648", LARGE_PORT, true},
        KnownDifference{"s://[]", ADDRESS, false}, KnownDifference{"s://[a/b]", ADDRESS, false},
        KnownDifference{"#xpointer(a[1])", BRACKET_IN_FRAGMENT, false}}) {
    const UriComparison comparison = CompareWithLibxml2(known.text);
    EXPECT_EQ(comparison.isUriReference, known.isUriReference) << known.text;
    EXPECT_TRUE(comparison.differences[known.kind]) << known.text;
    EXPECT_EQ(comparison.disagreement, "");
  }
}

} // namespace
} // namespace Tarvel
