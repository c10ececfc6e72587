// SPDX-License-Identifier: Apache-2.0

#include "proof/structured_fields.h"

#include "support/throws_message.h"

#include <ssoclient/proof/exceptions.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;

std::vector<StructuredMember> Read(const std::string &text) {
  return ReadDictionary("F", text);
}

/// The only member, an inner list, written again.
std::string WrittenAgain(const std::string &list) {
  return WriteStructured(std::get<StructuredInnerList>(Read("a=" + list).at(0).value));
}

const StructuredItem &ItemOf(const StructuredMember &member) {
  return std::get<StructuredItem>(member.value);
}

void ExpectRefusal(const std::string &text, std::size_t character, const std::string &reason) {
  EXPECT_THROWS_MESSAGE(Read(text), InvalidMessageException,
                        "The header field F is malformed at character " + std::to_string(character) + ": " + reason)
      << text;
}

TEST(ReadDictionary, ReadsEveryTypeOfItem) {
  const auto members =
      Read(" int=-42, dec=1.5 ,\t str=\"a\\\"b\\\\c\",tok=a/b:c,oct=:AQID:,no=?0,yes=?1,flag;x=1,*k-_.1=0 ");
  ASSERT_EQ(members.size(), 9U);
  EXPECT_EQ(members[0].key, "int");
  EXPECT_EQ(std::get<std::int64_t>(ItemOf(members[0]).value), -42);
  EXPECT_EQ(std::get<StructuredDecimal>(ItemOf(members[1]).value).thousandths, 1500);
  EXPECT_EQ(std::get<std::string>(ItemOf(members[2]).value), "a\"b\\c");
  EXPECT_EQ(std::get<StructuredToken>(ItemOf(members[3]).value).text, "a/b:c");
  EXPECT_EQ(std::get<std::vector<std::uint8_t>>(ItemOf(members[4]).value), (std::vector<std::uint8_t>{1, 2, 3}));
  EXPECT_FALSE(std::get<bool>(ItemOf(members[5]).value));
  EXPECT_TRUE(std::get<bool>(ItemOf(members[6]).value));
  EXPECT_TRUE(std::get<bool>(ItemOf(members[7]).value));
  EXPECT_EQ(std::get<std::int64_t>(*FindParameter(ItemOf(members[7]).parameters, "x")), 1);
  EXPECT_EQ(FindParameter(ItemOf(members[7]).parameters, "y"), nullptr);
  EXPECT_EQ(members[8].key, "*k-_.1");
}

TEST(ReadDictionary, ReadsAnEmptyField) {
  EXPECT_TRUE(Read("").empty());
  EXPECT_TRUE(Read("  ").empty());
}

TEST(ReadDictionary, ReadsTheLargestNumbers) {
  EXPECT_EQ(std::get<std::int64_t>(ItemOf(Read("a=999999999999999")[0]).value), 999999999999999);
  EXPECT_EQ(std::get<std::int64_t>(ItemOf(Read("a=-999999999999999")[0]).value), -999999999999999);
  EXPECT_EQ(std::get<StructuredDecimal>(ItemOf(Read("a=999999999999.999")[0]).value).thousandths, 999999999999999);
}

TEST(ReadDictionary, RefusesWhatIsNotADictionary) {
  ExpectRefusal("A=1", 1, "a key was expected");
  ExpectRefusal("1=1", 1, "a key was expected");
  ExpectRefusal("\ta=1", 1, "a key was expected");
  ExpectRefusal("a=1,,b=2", 5, "a key was expected");
  ExpectRefusal("a=1,", 5, "a member was expected after the comma");
  ExpectRefusal("a=1, ", 6, "a member was expected after the comma");
  ExpectRefusal("a=1 b=2", 5, "a comma was expected");
  ExpectRefusal("a =1", 3, "a comma was expected");
  ExpectRefusal("a=", 3, "a value was expected");
  ExpectRefusal("a= 1", 3, "a value was expected");
  ExpectRefusal("a=@1", 3, "a value was expected");
  ExpectRefusal("a=%\"x\"", 3, "a value was expected");
  ExpectRefusal(std::string("a=\0", 3), 3, "a value was expected");
  ExpectRefusal("a=1, b=2, a=3", 14, "the key a appears twice");
}

TEST(ReadDictionary, RefusesMalformedNumbers) {
  const std::string decimal = "a decimal must have at most 12 digits before the point, and one to three after it";
  ExpectRefusal("a=-", 4, "a digit was expected");
  ExpectRefusal("a=--1", 4, "a digit was expected");
  ExpectRefusal("a=1234567890123456", 19, "an integer has more than 15 digits");
  ExpectRefusal("a=1.", 5, decimal);
  ExpectRefusal("a=1.2345", 9, decimal);
  ExpectRefusal("a=1234567890123.1", 18, decimal);
  ExpectRefusal("a=1.2.3", 6, "a comma was expected");
}

TEST(ReadDictionary, RefusesMalformedStrings) {
  ExpectRefusal("a=\"x", 5, "a string does not end");
  ExpectRefusal("a=\"x\\", 6, "a string has a backslash before another character than a quote or a backslash");
  ExpectRefusal("a=\"x\\n\"", 6, "a string has a backslash before another character than a quote or a backslash");
  ExpectRefusal("a=\"x\ty\"", 5, "a string contains a character that is not printable ASCII");
  ExpectRefusal("a=\"\xC3\xA4\"", 4, "a string contains a character that is not printable ASCII");
  ExpectRefusal("a=\"\x7F\"", 4, "a string contains a character that is not printable ASCII");
}

TEST(ReadDictionary, RefusesBase64ThatIsNotCanonical) {
  ExpectRefusal("a=:AQID", 8, "octets do not end with a colon");
  for (const std::string octets : {"AQI", "AQID=", "AQ==AQ==", "AR==", "AQ I", "A", "AQ-_", "\xC3\xA4"}) {
    ExpectRefusal("a=:" + octets + ":", octets.size() + 5, "octets are not in canonical Base64");
  }
}

TEST(ReadDictionary, RefusesMalformedBooleansListsAndParameters) {
  ExpectRefusal("a=?", 4, "0 or 1 was expected");
  ExpectRefusal("a=?2", 4, "0 or 1 was expected");
  ExpectRefusal("a=(", 4, "a value was expected");
  ExpectRefusal("a=(1", 5, "a blank or a closing parenthesis was expected");
  ExpectRefusal("a=(1,2)", 5, "a blank or a closing parenthesis was expected");
  ExpectRefusal("a=(1\t2)", 5, "a blank or a closing parenthesis was expected");
  ExpectRefusal("a=((1))", 4, "a value was expected");
  ExpectRefusal("a=1;", 5, "a key was expected");
  ExpectRefusal("a=1;B", 5, "a key was expected");
  ExpectRefusal("a=1;b=", 7, "a value was expected");
  ExpectRefusal("a=1;b=(1)", 7, "a value was expected");
  ExpectRefusal("a=1 ;b", 5, "a comma was expected");
  ExpectRefusal("a=1;b;c;b=2", 10, "the parameter b appears twice");
}

std::string Repeat(std::size_t count, const std::string &separator, const std::string &prefix) {
  std::string text;
  for (std::size_t i = 0; i < count; ++i) {
    text += (i == 0 ? "" : separator) + prefix + std::to_string(i);
  }
  return text;
}

TEST(ReadDictionary, RefusesMoreThanItsLimits) {
  EXPECT_EQ(Read(Repeat(MAX_DICTIONARY_MEMBERS, ",", "a")).size(), 32U);
  ExpectRefusal(Repeat(MAX_DICTIONARY_MEMBERS + 1, ",", "a"), Repeat(32, ",", "a").size() + 2,
                "there are more than 32 members");
  EXPECT_EQ(WrittenAgain("(" + Repeat(MAX_INNER_LIST_ITEMS, " ", "") + ")"),
            "(" + Repeat(MAX_INNER_LIST_ITEMS, " ", "") + ")");
  ExpectRefusal("a=(" + Repeat(MAX_INNER_LIST_ITEMS + 1, " ", "") + ")", Repeat(128, " ", "").size() + 5,
                "there are more than 128 items in a list");
  EXPECT_EQ(ItemOf(Read("a;" + Repeat(MAX_PARAMETERS, ";", "b"))[0]).parameters.size(), 32U);
  ExpectRefusal("a;" + Repeat(MAX_PARAMETERS + 1, ";", "b"), Repeat(32, ";", "b").size() + 4,
                "there are more than 32 parameters");
}

TEST(ReadDictionary, RefusesOrReadsEveryPrefix) {
  const std::string whole = "a=(\"x\" \"y\\\"\";k=-1.5 t);p=:AQ==:;q=?1, b=?0;r=\"s\"";
  std::size_t accepted = 0;
  for (std::size_t length = 0; length <= whole.size(); ++length) {
    try {
      Read(whole.substr(0, length));
      ++accepted;
    } catch (const InvalidMessageException &) {
    }
  }
  // "", "a", "a=(...)", ";p" and "=:AQ==:" after it, ";q" and "=?1", "b", "b=?0", ";r", "=\"s\""
  EXPECT_EQ(accepted, 11U);
}

TEST(WriteStructured, WritesTheOnlySerialisation) {
  EXPECT_EQ(WrittenAgain("(  \"a\"   \"b\" );  created=007;x=?1;y=?0"), "(\"a\" \"b\");created=7;x;y=?0");
  EXPECT_EQ(WrittenAgain("();d=1.50;e=-0.05;f=-0.0;g=0.120;h=10.0"), "();d=1.5;e=-0.05;f=0.0;g=0.12;h=10.0");
  EXPECT_EQ(WrittenAgain("(\"\\\\\\\"\");o=:AQI=:;t=a*b;n=-0"), "(\"\\\\\\\"\");o=:AQI=:;t=a*b;n=0");
  EXPECT_EQ(WrittenAgain("(\"q\";name=\"Pet\" \"r\";sf)"), "(\"q\";name=\"Pet\" \"r\";sf)");
}

TEST(IsStructuredKey, FollowsTheStandard) {
  for (const char *const key : {"a", "*", "sig1", "a_b-c.d*"}) {
    EXPECT_TRUE(IsStructuredKey(key)) << key;
  }
  for (const char *const text : {"", "A", "1a", "-a", "_a", "a b", "a=", "aB"}) {
    EXPECT_FALSE(IsStructuredKey(text)) << text;
  }
}

} // namespace
