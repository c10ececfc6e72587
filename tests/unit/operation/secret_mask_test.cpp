// SPDX-License-Identifier: Apache-2.0

#include "operation/secret_mask.h"

#include "support/data_file.h"

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace SsoClient {
namespace {

using Tarvel::StringUtil;

std::string Masked(const std::string &password, const std::string &text) {
  SecretMask mask;
  mask.AddPassword(password);
  return mask.Apply(text);
}

std::string Base64(const std::string &text) {
  return StringUtil::Base64Encode(std::vector<std::uint8_t>(text.begin(), text.end()));
}

TEST(SecretMask, LeavesTextWithoutSecretsAsItIs) {
  EXPECT_EQ(Masked("wonderland", "unknown user or wrong password"), "unknown user or wrong password");
  EXPECT_EQ(Masked("wonderland", ""), "");
  EXPECT_EQ(SecretMask().Apply("<a>text</a>"), "<a>text</a>");
}

TEST(SecretMask, MasksEachOccurrenceOfAPassword) {
  EXPECT_EQ(Masked("wonderland", "not wonderland, never wonderland"), "not ***, never ***");
  EXPECT_EQ(Masked("wonderland", "wonderlandwonderland"), "******");
}

TEST(SecretMask, MasksAPasswordEscapedForXmlInEachForm) {
  const std::string password = "a<b>&\"c'd";
  for (const char *form :
       {"a<b>&\"c'd", "a&lt;b&gt;&amp;\"c'd", "a&lt;b&gt;&amp;&quot;c&apos;d", "a&lt;b&gt;&amp;&#34;c&#39;d",
        "a&lt;b&gt;&amp;&quot;c&#x27;d", "a&lt;b&gt;&amp;&#x22;c'd", "a&amp;lt;b&amp;gt;&amp;amp;\"c'd"}) {
    EXPECT_EQ(Masked(password, std::string("[") + form + "]"), "[***]") << form;
  }
}

TEST(SecretMask, MasksAPasswordInBase64) {
  EXPECT_EQ(Masked("wonderland", "[" + Base64("wonderland") + "]"), "[***]");
}

TEST(SecretMask, MasksAPasswordThatTheServiceHasTrimmed) {
  EXPECT_EQ(Masked(" wonderland\n", "[wonderland]"), "[***]");
  EXPECT_EQ(Masked(" wonderland\n", "[" + Base64("wonderland") + "]"), "[***]");
  EXPECT_EQ(Masked(" wonderland\n", "[ wonderland\n]"), "[***]");
}

TEST(SecretMask, MasksShortPasswordsEverywhere) {
  EXPECT_EQ(Masked("a", "a banana"), "*** b***n***n***");
  EXPECT_EQ(Masked("ab", "cab"), "c***");
  EXPECT_EQ(Masked("abc", "abcd"), "***d");
}

TEST(SecretMask, IgnoresAnEmptyPassword) {
  EXPECT_EQ(Masked("", "any text"), "any text");
  EXPECT_EQ(Masked("", " "), " ");
}

TEST(SecretMask, LeavesNothingOfSecretsThatOverlap) {
  EXPECT_EQ(Masked("abab", "ababab!"), "***!");
  SecretMask mask;
  mask.AddPassword("first-second");
  mask.AddPassword("second-third");
  EXPECT_EQ(mask.Apply("[first-second-third]"), "[***]");
}

// The beginning of a secret that extends beyond the cut would remain if the text were cut first.
TEST(SecretMask, MasksASecretThatTheCutWouldDivide) {
  const std::string password(200, 'p');
  for (std::size_t before = StringUtil::MAX_VALUE_BYTES - 250; before < StringUtil::MAX_VALUE_BYTES + 10; ++before) {
    const std::string masked = Masked(password, std::string(before, '.') + password + "end");
    EXPECT_EQ(masked.find('p'), std::string::npos) << before;
    EXPECT_LE(masked.size(), StringUtil::MAX_VALUE_BYTES + 30);
  }
}

TEST(SecretMask, MasksTheBeginningOfASecretAtTheEndOfAText) {
  EXPECT_EQ(Masked("correct-horse-battery", "You sent correct-horse-batt"), "You sent ***");
  EXPECT_EQ(Masked("correct-horse-battery", "You sent correct-"), "You sent ***"); // eight bytes
  EXPECT_EQ(Masked("correct-horse-battery", "You sent correct"), "You sent correct");
}

TEST(SecretMask, CutsLongTextsAndShowsHowMuchIsMissing) {
  const std::string most(StringUtil::MAX_VALUE_BYTES, '.');
  EXPECT_EQ(Masked("secret", most), most);
  EXPECT_EQ(Masked("secret", most + "12345"), most + "... (5 more bytes)");
  // A character is not divided, and all bytes of a secret count.
  EXPECT_EQ(Masked("secret", most.substr(1) + "\xC3\xBC!"), most.substr(1) + "... (3 more bytes)");
  EXPECT_EQ(Masked("secret", most + "secret"), most + "... (6 more bytes)");
}

TEST(SecretMask, MakesTextsPrintable) {
  EXPECT_EQ(Masked("secret", "a\nb\x1b[2J\xE2\x80\xAE"), "a\\u000Ab\\u001B[2J\\u202E");
  EXPECT_EQ(Masked("secret", "\xC3\xBC\xFF\xE2\x82"), "\xC3\xBC\xFF\xE2\\u0082");
}

TEST(SecretMask, MasksALegInBase64) {
  SecretMask mask;
  mask.AddLeg({1, 2, 3, 4, 5, 6});
  mask.AddLeg({});
  EXPECT_EQ(mask.Apply("leg AQIDBAUG refused"), "leg *** refused");
}

TEST(SecretMask, MasksATokenAndTheValuesOfItsSignature) {
  const std::string token = Testing::ReadDataFile("tokens/bearer.xml");
  const auto between = [&](const std::string &begin, const std::string &end) {
    const std::size_t first = token.find(begin) + begin.size();
    return token.substr(first, token.find(end, first) - first);
  };
  SecretMask mask;
  mask.AddToken(token);
  EXPECT_EQ(mask.Apply("[" + token + "]"), "[***]");
  const std::string signature = between("<ds:SignatureValue>", "<");
  const std::string digest = between("<ds:DigestValue>", "<");
  ASSERT_GT(signature.size(), 300u);
  ASSERT_GT(digest.size(), 40u);
  EXPECT_EQ(mask.Apply("[" + signature + "] [" + digest + "]"), "[***] [***]");
}

TEST(SecretMask, MasksASignatureValueWithAndWithoutItsLineBreaks) {
  SecretMask mask;
  mask.AddRequest("<e><ds:SignatureValue>\nAbCd\nEfGh\n</ds:SignatureValue><DigestValue x=''>ZzZz</DigestValue></e>");
  EXPECT_EQ(mask.Apply("[AbCdEfGh] [\nAbCd\nEfGh\n] ZzZz"), "[***] [***] ***");
}

TEST(SecretMask, IgnoresEmptyValuesAndTextThatIsNotXml) {
  SecretMask mask;
  for (const char *xml : {"", "<", "<SignatureValue", "<SignatureValue>", "<SignatureValue/>", "a < b", "<:>",
                          "<SignatureValue></SignatureValue>"}) {
    mask.AddRequest(xml);
  }
  EXPECT_EQ(mask.Apply("any text"), "any text");
}

// A service may repeat a token that is not this operation's, or this operation's token in another form.
TEST(SecretMask, MasksTheMarkupOfEachSecretElement) {
  const std::pair<const char *, const char *> cases[] = {
      {"[<saml2:Assertion ID='x'>any</saml2:Assertion>]", "[***>]"},
      {"[&lt;Assertion&gt;any&lt;/Assertion&gt;]", "[***&gt;]"},
      {"[&amp;amp;lt;a:Assertion&amp;amp;gt;any&amp;amp;lt;/a:Assertion&amp;amp;gt;]", "[***&amp;amp;gt;]"},
      {"[&amp;Assertion&amp;/Assertion]", "[&amp;Assertion&amp;/Assertion]"},
      {"[<ds:Signature><ds:SignatureValue>a</ds:SignatureValue></ds:Signature>]", "[***>]"},
      {"[<Password>a<Password>b</Password>c</Password>d]", "[***>d]"},
      {"[<Password>a</PasswordHint>b</Password>c]", "[***>c]"}, // the end tag of another element
      {"[<wsse:BinarySecurityToken>MII", "[***"},
      {"[<Assertion/>", "[***"},
      {"[<AssertionConsumer>text</AssertionConsumer>]", "[<AssertionConsumer>text</AssertionConsumer>]"},
  };
  for (const auto &[text, masked] : cases) {
    EXPECT_EQ(SecretMask().Apply(text), masked) << text;
  }
}

TEST(SecretMask, MasksAllTextAfterAMegabyteOfSecretsThatOverlap) {
  const std::size_t megabyte = 1u << 20;
  EXPECT_EQ(Masked("aa", std::string(megabyte - 10, 'a') + " text"), "*** text");
  EXPECT_EQ(Masked("aa", std::string(megabyte + 10, 'a') + " text"), "***");
}

// Each of these would take minutes if every position of the text were compared with the whole rest of the text.
TEST(SecretMask, EndsInLinearTimeForHostileTexts) {
  const std::size_t length = 10u << 20;
  EXPECT_LE(Masked(std::string(1000, 'a'), std::string(length, 'a')).size(), 2000u);
  EXPECT_LE(Masked(std::string(1000, 'a') + "b", std::string(length, 'a')).size(), 2000u);
  std::string names;
  for (int i = 0; names.size() < length; ++i) {
    names += "<Signature" + std::to_string(i) + "></Signature" + std::to_string(i) + ">";
  }
  EXPECT_LE(Masked("secret", names).size(), 2000u);
}

TEST(SecretMask, EndsSoonForMarkupThatHasNoNames) {
  const std::string text(10000000, '<');
  EXPECT_EQ(Masked("wonderland", text), std::string(1024, '<') + "... (9998976 more bytes)");
}

TEST(SecretMask, MasksTheRestAfterATagWhoseNameIsTooLong) {
  const std::string name(256, 'n');
  EXPECT_EQ(Masked("wonderland", "<" + name + "> text"), "<" + name + "> text");
  EXPECT_EQ(Masked("wonderland", "a <" + name + "n> text"), "a ***");
}

TEST(SecretMask, EndsSoonForANameThatRepeatsItself) {
  const std::string half(5000000, 'a');
  EXPECT_EQ(Masked("wonderland", "<" + half + ":Password " + half), "***");
}

TEST(SecretMask, FindsTheEndOfATagWithoutABlank) {
  EXPECT_EQ(Masked("wonderland", "<a<Password>w</Password> b"), "<a***> b");
}

TEST(SecretMask, AddsTheValuesOfATokenInLinearTime) {
  std::string inInstruction;
  while (inInstruction.size() < 10000000) {
    inInstruction += "<DigestValue ";
  }
  SecretMask mask;
  mask.AddToken("<a><?p " + std::string(10000000, '<') + inInstruction + "?><DigestValue>abcd</DigestValue></a>");
  EXPECT_EQ(mask.Apply("digest abcd, other abce"), "digest ***, other abce");
}

TEST(SecretMask, MasksEveryTextAfterTooManySecrets) {
  std::string token = "<a>";
  for (int i = 0; i < 99; ++i) {
    token += "<DigestValue>" + std::to_string(1000 + i) + "</DigestValue>";
  }
  SecretMask mask;
  mask.AddToken(token); // itself, and 99 values
  EXPECT_EQ(mask.Apply("1000 1098 text"), "*** *** text");
  mask.AddToken("<a/>");
  EXPECT_EQ(mask.Apply("text"), "***");
}

TEST(SecretMask, AddsAnyNumberOfValuesInLinearTime) {
  std::string token = "<a>";
  for (int i = 0; i < 500000; ++i) {
    token += "<DigestValue>" + std::to_string(i) + "</DigestValue>";
  }
  SecretMask mask;
  mask.AddToken(token);
  EXPECT_EQ(mask.Apply("text"), "***");
}

TEST(SecretMask, MasksTheRestOfATextThatNeedsTooManyComparisons) {
  const std::vector<std::uint8_t> zeros(3000000); // four million letters A in Base64
  SecretMask mask;
  mask.AddLeg(zeros);
  EXPECT_EQ(mask.Apply(std::string(9000000, 'A') + " text"), "***");
  EXPECT_EQ(mask.Apply(std::string(3999999, 'A') + " text"), "AAAAAAAAAAAAAAAA***");
}

} // namespace
} // namespace SsoClient
