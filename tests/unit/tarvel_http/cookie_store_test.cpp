// SPDX-License-Identifier: Apache-2.0

#include "http/cookie_date.h"
#include "support/throws_message.h"

#include <tarvel/core/environment.h>
#include <tarvel/core/exception.h>
#include <tarvel/http/cookie_store.h>

#include <gtest/gtest.h>

#include <atomic>
#include <cstdint>
#include <optional>
#include <ostream>
#include <string>

namespace Tarvel::Http {
namespace {

constexpr std::int64_t SECOND = 1000000;
constexpr std::int64_t START = 1767323045 * SECOND; // 2026-01-02T03:04:05Z

/// A store with a clock that only the test changes.
class CookieStoreTest : public testing::Test {
protected:
  void Set(std::string_view header, std::string_view host = "sts.example", std::string_view path = "/STS/trust",
           bool isSecure = true) {
    m_store->SetFromHeader(header, host, path, isSecure);
  }
  std::string Get(std::string_view host = "sts.example", std::string_view path = "/STS/trust", bool isSecure = true) {
    return m_store->GetHeader(host, path, isSecure);
  }

  std::atomic<std::int64_t> m_now{START};
  const ScopedEnvironment m_clock{{[this] { return m_now.load(); }, nullptr}};
  const Ref<CookieStore> m_store = CreateCookieStore();
};

TEST_F(CookieStoreTest, SendsBackTheCookiesThatWereSet) {
  EXPECT_EQ(Get(), "");
  Set("session=abc");
  EXPECT_EQ(Get(), "session=abc");
  Set("node=7; Path=/STS; HttpOnly; SameSite=Lax; Unknown=x");
  EXPECT_EQ(Get(), "session=abc; node=7");
  EXPECT_EQ(m_store->GetCount(), 2u);
}

struct PairCase {
  std::string header;
  std::string expected;
};

void PrintTo(const PairCase &pair, std::ostream *out) {
  *out << pair.header;
}

class CookieStorePairs : public CookieStoreTest, public testing::WithParamInterface<PairCase> {};

TEST_P(CookieStorePairs, AreParsedByTheStandard) {
  Set(GetParam().header);
  EXPECT_EQ(Get(), GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(
    Headers, CookieStorePairs,
    testing::Values(PairCase{"a=b", "a=b"}, PairCase{"  a \t=\t b  ", "a=b"}, PairCase{"a=", "a="},
                    PairCase{"a=b=c", "a=b=c"}, PairCase{"a=\"b c\"", "a=\"b c\""}, PairCase{"a=b;", "a=b"},
                    PairCase{"a=b;;;", "a=b"}, PairCase{"a=b; ; =x; Path", "a=b"}, PairCase{"a", ""}, PairCase{"", ""},
                    PairCase{";", ""}, PairCase{"=b", ""}, PairCase{"  =b", ""}, PairCase{"a; b=c", ""},
                    PairCase{"a=b\rc", ""}, PairCase{"a=b\r\nX-Evil: 1", ""}, PairCase{"a\n=b", ""},
                    PairCase{std::string("a=b\0c", 5), ""}, PairCase{"a=b\x7F", ""}, PairCase{"a=b\tc", ""},
                    PairCase{"a=b; Path=/STS", "a=b"}, PairCase{"a=b; path=/other", ""},
                    PairCase{"a=b; Path=/other; Path=/STS", "a=b"}, PairCase{"a=b; Path=/other; Path=", "a=b"},
                    PairCase{"a=b; Path=relative", "a=b"}, PairCase{"a=b; Domain=sts.example", "a=b"},
                    PairCase{"a=b; Domain=STS.Example", "a=b"}, PairCase{"a=b; Domain=.sts.example", "a=b"},
                    PairCase{"a=b; Domain=example", "a=b"}, PairCase{"a=b; Domain=", "a=b"},
                    PairCase{"a=b; Domain=other.example", ""}, PairCase{"a=b; Domain=ts.example", ""},
                    PairCase{"a=b; Domain=x.sts.example", ""}, PairCase{"a=b; Domain=.", "a=b"},
                    PairCase{"a=b; Domain=other.example; Domain=sts.example", "a=b"}));

TEST_F(CookieStoreTest, NeverSendsACookieToAnotherHost) {
  Set("a=b");
  Set("wide=1; Domain=example");
  for (const char *host :
       {"example", "other.example", "x.sts.example", "sts.example.evil", "sts.exampl", "127.0.0.1", ""}) {
    EXPECT_EQ(Get(host), "") << host;
  }
  EXPECT_EQ(Get("STS.EXAMPLE"), "a=b; wide=1");
}

TEST_F(CookieStoreTest, MatchesAnAddressOnlyAsAWhole) {
  Set("a=b; Domain=0.0.1", "127.0.0.1");
  EXPECT_EQ(m_store->GetCount(), 0u);
  Set("a=b; Domain=127.0.0.1", "127.0.0.1");
  EXPECT_EQ(Get("127.0.0.1"), "a=b");
}

struct PathCase {
  std::string cookiePath; ///< empty: the default path, from the request that set the cookie
  std::string setFrom;
  std::string requestPath;
  bool isSent;
};

void PrintTo(const PathCase &path, std::ostream *out) {
  *out << path.cookiePath << " set from " << path.setFrom << ", requested " << path.requestPath;
}

class CookieStorePaths : public CookieStoreTest, public testing::WithParamInterface<PathCase> {};

TEST_P(CookieStorePaths, DecideWhereACookieIsSent) {
  const PathCase &path = GetParam();
  Set(path.cookiePath.empty() ? "a=b" : "a=b; Path=" + path.cookiePath, "h", path.setFrom);
  EXPECT_EQ(Get("h", path.requestPath), path.isSent ? "a=b" : "");
}

INSTANTIATE_TEST_SUITE_P(Paths, CookieStorePaths,
                         testing::Values(PathCase{"/", "/x", "/", true}, PathCase{"/", "/x", "/any/thing", true},
                                         PathCase{"/a", "/x", "/a", true}, PathCase{"/a", "/x", "/a/b", true},
                                         PathCase{"/a", "/x", "/ab", false}, PathCase{"/a", "/x", "/", false},
                                         PathCase{"/a", "/x", "/A", false}, PathCase{"/a/", "/x", "/a/b", true},
                                         PathCase{"/a/", "/x", "/a", false}, PathCase{"/a", "/x", "/a?q=/b", true},
                                         PathCase{"", "/a/b", "/a/c", true}, PathCase{"", "/a/b", "/a", true},
                                         PathCase{"", "/a/b", "/c", false}, PathCase{"", "/a", "/anything", true},
                                         PathCase{"", "/", "/anything", true}, PathCase{"", "/a/b?c/d/e", "/a/z", true},
                                         PathCase{"", "relative", "/anything", true},
                                         PathCase{"", "/a/b/", "/a/b/c", true}));

TEST_F(CookieStoreTest, SendsASecureCookieOnlyOverASecureConnection) {
  Set("a=b; Secure");
  Set("c=d");
  EXPECT_EQ(Get("sts.example", "/STS/trust", false), "c=d");
  EXPECT_EQ(Get("sts.example", "/STS/trust", true), "a=b; c=d");
}

TEST_F(CookieStoreTest, SendsTheLongerPathFirstAndThenTheOlderCookie) {
  Set("first=1; Path=/");
  Set("second=2; Path=/STS");
  Set("third=3; Path=/STS/trust");
  Set("fourth=4; Path=/STS");
  EXPECT_EQ(Get(), "third=3; second=2; fourth=4; first=1");
}

TEST_F(CookieStoreTest, ReplacesACookieOfTheSameNamePathAndHostInItsPlace) {
  Set("a=1; Path=/");
  Set("b=2; Path=/");
  Set("a=3; Path=/");
  Set("a=4; Path=/STS");
  Set("A=5; Path=/");
  EXPECT_EQ(Get(), "a=4; a=3; b=2; A=5");
}

TEST_F(CookieStoreTest, RemovesACookieThatHasExpired) {
  Set("a=b; Max-Age=10");
  m_now = START + 10 * SECOND - 1;
  EXPECT_EQ(Get(), "a=b");
  m_now = START + 10 * SECOND;
  EXPECT_EQ(Get(), "");
  Set("c=d");
  EXPECT_EQ(m_store->GetCount(), 1u);
}

TEST_F(CookieStoreTest, HonoursExpires) {
  Set("a=b; Expires=Fri, 02 Jan 2026 03:04:06 GMT");
  EXPECT_EQ(Get(), "a=b");
  m_now = START + SECOND;
  EXPECT_EQ(Get(), "");
}

struct ExpiryCase {
  std::string attributes;
  bool isKept;
};

void PrintTo(const ExpiryCase &expiry, std::ostream *out) {
  *out << expiry.attributes;
}

class CookieStoreExpiry : public CookieStoreTest, public testing::WithParamInterface<ExpiryCase> {};

TEST_P(CookieStoreExpiry, IsParsedByTheStandard) {
  Set("a=b; " + GetParam().attributes);
  EXPECT_EQ(Get(), GetParam().isKept ? "a=b" : "");
  EXPECT_EQ(m_store->GetCount(), GetParam().isKept ? 1u : 0u);
}

INSTANTIATE_TEST_SUITE_P(
    Attributes, CookieStoreExpiry,
    testing::Values(ExpiryCase{"Max-Age=0", false}, ExpiryCase{"Max-Age=-1", false}, ExpiryCase{"max-age=1", true},
                    ExpiryCase{"Max-Age=99999999999999999999999999", true},
                    ExpiryCase{"Max-Age=-99999999999999999999999999", false}, ExpiryCase{"Max-Age=soon", true},
                    ExpiryCase{"Max-Age=", true}, ExpiryCase{"Max-Age=1.5", true}, ExpiryCase{"Max-Age=+5", true},
                    ExpiryCase{"Max-Age=0; Max-Age=5", true}, ExpiryCase{"Max-Age=5; Max-Age=0", false},
                    ExpiryCase{"Expires=Thu, 01 Jan 1970 00:00:00 GMT", false},
                    ExpiryCase{"Expires=Thu, 01 Jan 2099 00:00:00 GMT", true},
                    ExpiryCase{"Expires=Thu, 01 Jan 1970 00:00:00 GMT; Max-Age=5", true},
                    ExpiryCase{"Max-Age=0; Expires=Thu, 01 Jan 2099 00:00:00 GMT", false},
                    ExpiryCase{"Expires=never", true}, ExpiryCase{"Expires=", true}));

TEST_F(CookieStoreTest, RemovesACookieThatIsReplacedByAnExpiredOne) {
  Set("a=b");
  Set("a=; Max-Age=0");
  EXPECT_EQ(Get(), "");
  EXPECT_EQ(m_store->GetCount(), 0u);
}

TEST_F(CookieStoreTest, KeepsTheNewestFifty) {
  for (int i = 0; i < 200; ++i) {
    Set("name" + std::to_string(i) + "=v");
  }
  EXPECT_EQ(m_store->GetCount(), 50u);
  EXPECT_EQ(Get().substr(0, 9), "name150=v");
}

TEST_F(CookieStoreTest, IgnoresACookieOfMoreThan4096Bytes) {
  Set("a=" + std::string(4096, 'x'));
  EXPECT_EQ(m_store->GetCount(), 0u);
  Set("a=" + std::string(4095, 'x'));
  EXPECT_EQ(m_store->GetCount(), 1u);
}

TEST(CreateCookieStore, MakesStoresThatShareNothing) {
  const Ref<CookieStore> one = CreateCookieStore();
  const Ref<CookieStore> other = CreateCookieStore();
  Ref<CookieStore> third;
  CreateCookieStore("", third);
  one->SetFromHeader("a=b", "h", "/", true);
  EXPECT_EQ(one->GetCount(), 1u);
  EXPECT_EQ(other->GetCount(), 0u);
  EXPECT_EQ(third->GetCount(), 0u);
}

TEST(CreateCookieStore, RefusesAName) {
  Ref<CookieStore> store;
  EXPECT_THROWS_MESSAGE(CreateCookieStore("shared", store), InvalidArgumentException,
                        "Invalid argument : there are no named cookie stores, but \"shared\" was asked for.");
}

struct DateCase {
  std::string text;
  std::optional<std::int64_t> seconds;
};

void PrintTo(const DateCase &date, std::ostream *out) {
  *out << date.text;
}

class ParseCookieDateTest : public testing::TestWithParam<DateCase> {};

TEST_P(ParseCookieDateTest, ParsesByTheStandard) {
  const std::optional<std::int64_t> date = ParseCookieDate(GetParam().text);
  ASSERT_EQ(date.has_value(), GetParam().seconds.has_value());
  if (date) {
    EXPECT_EQ(*date, *GetParam().seconds * SECOND);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Dates, ParseCookieDateTest,
    testing::Values(DateCase{"Sun, 06 Nov 1994 08:49:37 GMT", 784111777},
                    DateCase{"Sunday, 06-Nov-94 08:49:37 GMT", 784111777},
                    DateCase{"Sun Nov  6 08:49:37 1994", 784111777}, DateCase{"08:49:37 6 november 94", 784111777},
                    DateCase{"1994 Nov 6 8:49:37", 784111777}, DateCase{"6 Nov 94 8:49:37", 784111777},
                    DateCase{"6 Nov 69 00:00:00", 3150921600}, DateCase{"6 Nov 70 00:00:00", 26697600},
                    DateCase{"6 Nov 1600 00:00:00", std::nullopt}, DateCase{"1 Jan 1601 00:00:00", -11644473600},
                    DateCase{"29 Feb 2024 00:00:00", 1709164800}, DateCase{"29 Feb 2023 00:00:00", std::nullopt},
                    DateCase{"32 Jan 2024 00:00:00", std::nullopt}, DateCase{"0 Jan 2024 00:00:00", std::nullopt},
                    DateCase{"1 Jan 2024 24:00:00", std::nullopt}, DateCase{"1 Jan 2024 23:60:00", std::nullopt},
                    DateCase{"1 Jan 2024 23:59:60", std::nullopt}, DateCase{"1 Jan 2024", std::nullopt},
                    DateCase{"1 Foo 2024 00:00:00", std::nullopt}, DateCase{"Jan 2024 00:00:00", std::nullopt},
                    DateCase{"1 Jan 00:00:00", std::nullopt}, DateCase{"1 Jan 12345 00:00:00", std::nullopt},
                    DateCase{"1 Jan 2024 00:00", std::nullopt}, DateCase{"1 Jan 2024 00:00:00:00", 1704067200},
                    DateCase{"", std::nullopt}, DateCase{" ,;-", std::nullopt}));

} // namespace
} // namespace Tarvel::Http
