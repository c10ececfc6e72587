// SPDX-License-Identifier: Apache-2.0

#include "core/uri_reference.h"

#include <gtest/gtest.h>

#include <optional>
#include <ostream>
#include <regex>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel {
namespace {

constexpr std::optional<std::string_view> NONE = std::nullopt;

TEST(SplitUriReference, ReturnsEachPartUnchanged) {
  const std::optional<UriReference> parts = SplitUriReference("hTTp+1://a:%41@h%2F.x:080/b//%63:@?d/?%20e#f?/%25");
  ASSERT_TRUE(parts);
  EXPECT_EQ(parts->scheme, "hTTp+1");
  EXPECT_EQ(parts->userInformation, "a:%41");
  EXPECT_EQ(parts->host, "h%2F.x");
  EXPECT_EQ(parts->port, "080");
  EXPECT_EQ(parts->path, "/b//%63:@");
  EXPECT_EQ(parts->query, "d/?%20e");
  EXPECT_EQ(parts->fragment, "f?/%25");
}

TEST(SplitUriReference, DistinguishesMissingPartsFromEmptyOnes) {
  const std::optional<UriReference> without = SplitUriReference("");
  ASSERT_TRUE(without);
  EXPECT_EQ(without->scheme, NONE);
  EXPECT_EQ(without->userInformation, NONE);
  EXPECT_EQ(without->host, NONE);
  EXPECT_EQ(without->port, NONE);
  EXPECT_EQ(without->path, "");
  EXPECT_EQ(without->query, NONE);
  EXPECT_EQ(without->fragment, NONE);
  const std::optional<UriReference> with = SplitUriReference("//@:?#");
  ASSERT_TRUE(with);
  EXPECT_EQ(with->scheme, NONE);
  EXPECT_EQ(with->userInformation, "");
  EXPECT_EQ(with->host, "");
  EXPECT_EQ(with->port, "");
  EXPECT_EQ(with->path, "");
  EXPECT_EQ(with->query, "");
  EXPECT_EQ(with->fragment, "");
}

TEST(SplitUriReference, KeepsTheBracketsOfAnAddressAndDoesNotCheckTheirContent) {
  const std::optional<UriReference> parts = SplitUriReference("x://[no address]:1/");
  ASSERT_TRUE(parts);
  EXPECT_EQ(parts->host, "[no address]");
  EXPECT_EQ(parts->port, "1");
  EXPECT_FALSE(IsUriReference("x://[no address]:1/"));
}

TEST(SplitUriReference, ReturnsViewsOfTheText) {
  const std::string text = "s://h/p";
  const std::optional<UriReference> parts = SplitUriReference(text);
  ASSERT_TRUE(parts);
  EXPECT_EQ(parts->scheme->data(), text.data());
  EXPECT_EQ(parts->path.data() + parts->path.size(), text.data() + text.size());
}

TEST(IsUriReference, AcceptsTheExamplesOfTheStandard) {
  for (const char *const text :
       {"ftp://ftp.is.co.za/rfc/rfc1808.txt", "http://www.ietf.org/rfc/rfc2396.txt",
        "ldap://[2001:db8::7]/c=GB?objectClass?one", "mailto:John.Doe@example.com",
        "news:comp.infosystems.www.servers.unix", "tel:+1-816-555-1212", "telnet://192.0.2.16:80/",
        "urn:oasis:names:specification:docbook:dtd:xml:4.1.2", "foo://example.com:8042/over/there?name=ferret#nose",
        "g:h", "./g:h", "g;x=1/./y", "//g", "?y", "#s", "../../../g", "g?y/../x#s/./x", "file:///etc/hosts", "./"}) {
    EXPECT_TRUE(IsUriReference(text)) << text;
  }
}

TEST(IsUriReference, AcceptsNamespaceNames) {
  for (const char *const text :
       {"urn:oasis:names:tc:SAML:2.0:assertion", "http://www.w3.org/2000/09/xmldsig#",
        "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd", "relative", "/", "#x"}) {
    EXPECT_TRUE(IsUriReference(text)) << text;
  }
}

TEST(IsUriReference, RefusesCharactersThatNoPartMayContain) {
  using namespace std::string_view_literals;
  for (const char *const before : {"", "x:", "x://", "x://h/", "x:?", "x:#"}) {
    for (int code = 0; code < 256; ++code) {
      const char c = static_cast<char>(code);
      const bool isRefused = code <= ' ' || code >= 0x7F || "\"<>\\^`{|}"sv.find(c) != std::string_view::npos;
      if (isRefused) {
        EXPECT_FALSE(IsUriReference(before + std::string(1, c) + "41")) << before << " and character " << code;
      }
    }
  }
}

TEST(IsUriReference, RefusesAnEscapeWithoutTwoHexadecimalDigits) {
  for (const char *const before : {"", "x:", "x://", "x://@", "x://h/", "x:?", "x:#"}) {
    for (const char *const escape : {"%", "%4", "%4g", "%g4", "%%41", "%4%41", "%/41"}) {
      EXPECT_FALSE(IsUriReference(std::string(before) + escape)) << before << escape;
    }
    for (const char *const escape : {"%41", "%aF", "%00", "%bC%De", "a%41b"}) {
      EXPECT_TRUE(IsUriReference(std::string(before) + escape)) << before << escape;
    }
  }
}

TEST(IsUriReference, RefusesAColonInTheFirstPartOfARelativePath) {
  for (const char *const text : {":", ":a", "1a:b", "+a:b", "a_b:c", "a%41:b", "a@b:c", "a!:b", "1:?a", "1:#a"}) {
    EXPECT_FALSE(IsUriReference(text)) << text;
  }
  for (const char *const text : {"./:", "/:", "a/b:c", "?:", "#:", "a:b:c", "a::", "//h/a:b", "//h:/:"}) {
    EXPECT_TRUE(IsUriReference(text)) << text;
  }
}

TEST(IsUriReference, RefusesBracketsOutsideOfAnAddress) {
  for (const char *const text : {"[", "]", "x:[::1]", "x:/[::1]", "x:?[]", "x:#[1]", "//h[::1]", "//[::1]h", "//a[@h",
                                 "//[::1", "//::1]", "//[[::1]]", "//[::1][::1]", "//[::1]@h", "//@[::1]@h"}) {
    EXPECT_FALSE(IsUriReference(text)) << text;
  }
  for (const char *const text : {"//[::1]", "//[::1]:1", "//[::1]:", "//a@[::1]", "//[::1]/", "//[::1]?", "//[::1]#"}) {
    EXPECT_TRUE(IsUriReference(text)) << text;
  }
}

TEST(IsUriReference, RefusesAPortThatIsNotDigits) {
  for (const char *const text : {"//h:1a", "//h:a", "//h:-1", "//h:+1", "//h:%31", "//h:1:1", "//h::1", "//:a",
                                 "//u:p@h:x", "//[::1]:x", "//[::1]1"}) {
    EXPECT_FALSE(IsUriReference(text)) << text;
  }
  EXPECT_TRUE(IsUriReference("//h:" + std::string(1000, '9')));
}

TEST(IsUriReference, RefusesASecondAtSignBeforeAPath) {
  EXPECT_FALSE(IsUriReference("//a@b@c"));
  EXPECT_TRUE(IsUriReference("//a@b/@c@d?@#@"));
}

TEST(IsUriReference, RefusesASecondNumberSign) {
  EXPECT_FALSE(IsUriReference("##"));
  EXPECT_FALSE(IsUriReference("a#b?c#"));
}

/// The grammar of RFC 3986, section 3.2.2, rule by rule.
std::regex MakeAddressPattern() {
  const std::string group = "[0-9A-Fa-f]{1,4}";
  const std::string octet = "([0-9]|[1-9][0-9]|1[0-9]{2}|2[0-4][0-9]|25[0-5])";
  const std::string address4 = "(" + octet + R"(\.)" + octet + R"(\.)" + octet + R"(\.)" + octet + ")";
  const std::string last = "(" + group + ":" + group + "|" + address4 + ")";
  const auto upTo = [&group](int count) { return "((" + group + ":){0," + std::to_string(count) + "}" + group + ")?"; };
  const auto exactly = [&group](int count) { return "(" + group + ":){" + std::to_string(count) + "}"; };
  const std::string address6 = exactly(6) + last + "|::" + exactly(5) + last + "|(" + group + ")?::" + exactly(4) +
                               last + "|" + upTo(1) + "::" + exactly(3) + last + "|" + upTo(2) + "::" + exactly(2) +
                               last + "|" + upTo(3) + "::" + exactly(1) + last + "|" + upTo(4) + "::" + last + "|" +
                               upTo(5) + "::" + group + "|" + upTo(6) + "::";
  const std::string later = "[vV][0-9A-Fa-f]+\\.[-A-Za-z0-9._~!$&'()*+,;=:]+";
  return std::regex(R"(\[()" + address6 + "|" + later + R"()\])");
}

TEST(IsIpLiteral, FollowsTheGrammarOfTheStandard) {
  const std::regex pattern = MakeAddressPattern();
  const std::vector<std::string> pieces = {"0",         "Ffff",     "12345", ":",  "::",           "1.2.3.4",
                                           "256.1.1.1", "01.2.3.4", "g",     "1:", "1:2:3:4:5:6:7"};
  std::vector<std::string> texts = {""};
  for (std::size_t begin = 0, round = 0; round < 4; ++round) {
    const std::size_t end = texts.size();
    for (; begin < end; ++begin) {
      for (const std::string &piece : pieces) {
        texts.push_back(texts[begin] + piece);
      }
    }
  }
  std::size_t accepted = 0;
  for (const std::string &text : texts) {
    const std::string host = "[" + text + "]";
    const bool isExpected = std::regex_match(host, pattern);
    EXPECT_EQ(IsIpLiteral(host), isExpected) << host;
    accepted += isExpected ? 1 : 0;
  }
  EXPECT_GT(accepted, 100U);
}

TEST(IsIpLiteral, AcceptsAddressesOfLaterVersionsAndRefusesZones) {
  for (const char *const host : {"[v1.x]", "[VaF.:!]", "[v0.~]"}) {
    EXPECT_TRUE(IsIpLiteral(host)) << host;
  }
  for (const char *const host : {"[v.x]", "[v1.]", "[v1x]", "[vg.x]", "[v]", "[1.x]", "[v1.%41]", "[v1.[]", "[v1.@]",
                                 "[fe80::1%25eth0]", "[fe80::1%eth0]", "[::1", "::1]", "::1", "[", "]", "[]", ""}) {
    EXPECT_FALSE(IsIpLiteral(host)) << host;
  }
}

TEST(IsIpLiteral, RefusesATextThatOnlyBeginsWithAnAddress) {
  EXPECT_FALSE(IsIpLiteral(std::string_view("[::1\0]", 6)));
  EXPECT_TRUE(IsIpLiteral("[0000:0000:0000:0000:0000:ffff:255.255.255.255]"));
  EXPECT_FALSE(IsIpLiteral("[0000:0000:0000:0000:0000:ffff:255.255.255.255" + std::string(1000, '5') + "]"));
}

TEST(IsUriReference, RefusesATextThatEndsWithinAnEscape) {
  const std::string_view text = "//%41/%41?%41#%41";
  for (std::size_t length = 0; length <= text.size(); ++length) {
    const std::string_view prefix = text.substr(0, length);
    const std::size_t percent = prefix.rfind('%');
    const bool isCut = percent != std::string_view::npos && prefix.size() - percent < 3;
    EXPECT_EQ(IsUriReference(prefix), !isCut) << prefix;
  }
}

} // namespace
} // namespace Tarvel
