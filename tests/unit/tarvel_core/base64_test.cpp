// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/string_util.h>

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>
#include <openssl/evp.h>

#include <random>

namespace Tarvel {
namespace {

std::vector<std::uint8_t> Bytes(std::string_view text) {
  return std::vector<std::uint8_t>(text.begin(), text.end());
}

std::string Encoded(std::string_view text) {
  return StringUtil::Base64Encode(Bytes(text));
}

std::string Decoded(std::string_view text) {
  const std::vector<std::uint8_t> bytes = StringUtil::Base64Decode(text);
  return std::string(bytes.begin(), bytes.end());
}

std::string RefusalOf(std::string_view text) {
  try {
    StringUtil::Base64Decode(text);
  } catch (const Base64FormatException &error) {
    return error.what();
  }
  return "accepted";
}

struct Vector {
  const char *bytes;
  const char *text;
};

/// RFC 4648, section 10.
constexpr Vector RFC_4648_VECTORS[] = {{"", ""},
                                       {"f", "Zg=="},
                                       {"fo", "Zm8="},
                                       {"foo", "Zm9v"},
                                       {"foob", "Zm9vYg=="},
                                       {"fooba", "Zm9vYmE="},
                                       {"foobar", "Zm9vYmFy"}};

TEST(Base64Encode, WritesTheVectorsOfRfc4648) {
  for (const Vector &vector : RFC_4648_VECTORS) {
    EXPECT_EQ(Encoded(vector.bytes), vector.text);
  }
}

TEST(Base64Decode, ReadsTheVectorsOfRfc4648) {
  for (const Vector &vector : RFC_4648_VECTORS) {
    EXPECT_EQ(Decoded(vector.text), vector.bytes);
  }
}

TEST(Base64Encode, AgreesWithOpenSslForEveryLengthOfALastGroup) {
  std::mt19937 random(4648);
  for (std::size_t length = 0; length < 300; ++length) {
    std::vector<std::uint8_t> bytes(length);
    for (std::uint8_t &byte : bytes) {
      byte = static_cast<std::uint8_t>(random());
    }
    std::string expected(length * 2 + 8, '\0');
    const int written =
        EVP_EncodeBlock(reinterpret_cast<unsigned char *>(expected.data()), bytes.data(), static_cast<int>(length));
    expected.resize(static_cast<std::size_t>(written));
    const std::string text = StringUtil::Base64Encode(bytes);
    EXPECT_EQ(text, expected);
    EXPECT_EQ(StringUtil::Base64Decode(text), bytes) << text;
  }
}

TEST(Base64Encode, WritesNoLineBreaks) {
  EXPECT_EQ(Encoded(std::string(300, '\0')), std::string(400, 'A'));
}

TEST(Base64EncodedLength, IsTheNumberOfCharactersWritten) {
  for (std::size_t length = 0; length < 10; ++length) {
    const std::vector<std::uint8_t> bytes(length, 0xFF);
    std::string text(Base64_EncodedLength(length) + 1, '!');
    EXPECT_EQ(Base64_Encode(bytes.data(), length, text.data()), Base64_EncodedLength(length)) << length;
    EXPECT_EQ(text.back(), '!') << "wrote past the room that was asked for, length " << length;
  }
}

TEST(Base64EncodedLength, DoesNotOverflowForLargeLengths) {
  const std::size_t third = std::size_t{1} << 61;
  EXPECT_EQ(Base64_EncodedLength(third * 3 / 2), third * 2);
}

TEST(Base64Decode, AllowsXmlWhiteSpaceAnywhere) {
  for (const char *text :
       {" Zm9vYg==", "Zm9vYg== ", "Z m 9 v Y g = =", "Zm9v\r\nYg==\r\n", "Zm9vYg=\n=", "\tZm9vYg\t==", "Zm9\nvYg=="}) {
    EXPECT_EQ(Decoded(text), "foob") << text;
  }
  EXPECT_EQ(Decoded(" \t\r\n"), "");
}

TEST(Base64Decode, ReadsTheLinesOfAPemBody) {
  const std::string bytes(1000, '\x5A');
  std::string text = Encoded(bytes);
  for (std::size_t i = 64; i < text.size(); i += 65) {
    text.insert(i, "\n");
  }
  EXPECT_EQ(Decoded(text), bytes);
}

TEST(Base64Decode, KeepsZeroBytesAtTheEnd) {
  EXPECT_EQ(StringUtil::Base64Decode("AAA="), std::vector<std::uint8_t>(2));
  EXPECT_EQ(StringUtil::Base64Decode("AA=="), std::vector<std::uint8_t>(1));
}

struct Malformed {
  std::string text;
  const char *message;
};

TEST(Base64Decode, RefusesMalformedText) {
  const Malformed table[] = {
      {"Z", "Base64 text: a last group without its padding at character 2"},
      {"Zg", "Base64 text: a last group without its padding at character 3"},
      {"Zm8", "Base64 text: a last group without its padding at character 4"},
      {"Zm9vY", "Base64 text: a last group without its padding at character 6"},
      {"Zg=", "Base64 text: padding cut short at character 4"},
      {"=", "Base64 text: misplaced padding at character 1"},
      {"====", "Base64 text: misplaced padding at character 1"},
      {"Z===", "Base64 text: misplaced padding at character 2"},
      {"Zm9v=", "Base64 text: misplaced padding at character 5"},
      {"Zm9v====", "Base64 text: misplaced padding at character 5"},
      {"Zg===", "Base64 text: character after the padding at character 5"},
      {"Zm8==", "Base64 text: character after the padding at character 5"},
      {"Zg==Zg==", "Base64 text: character after the padding at character 5"},
      {"Zm8=Zm9v", "Base64 text: character after the padding at character 5"},
      {"Zg=a", "Base64 text: character after the padding at character 4"},
      {"Zh==", "Base64 text: padding bits that are not zero at character 3"},
      {"Zm9=", "Base64 text: padding bits that are not zero at character 4"},
      {"Zm9v-", "Base64 text: character outside the alphabet at character 5"},
      {"Zm_v", "Base64 text: character outside the alphabet at character 3"},
      {"Zm\x0B"
       "9v",
       "Base64 text: character outside the alphabet at character 3"},
      {"Zm9v\x0C", "Base64 text: character outside the alphabet at character 5"},
      {"Zm9v\xC2\xA0", "Base64 text: character outside the alphabet at character 5"},
      {"\xFF\xFF\xFF\xFF", "Base64 text: character outside the alphabet at character 1"},
      {std::string("Zm9v\0", 5), "Base64 text: character outside the alphabet at character 5"},
      {std::string("\0\0\0\0", 4), "Base64 text: character outside the alphabet at character 1"},
      {"-----BEGIN", "Base64 text: character outside the alphabet at character 1"},
  };
  for (const Malformed &row : table) {
    EXPECT_EQ(RefusalOf(row.text), row.message) << row.text;
  }
}

TEST(Base64Decode, RefusesEveryByteOutsideAlphabetPaddingAndWhiteSpace) {
  const std::string allowed = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/ \t\r\n";
  for (int byte = 0; byte < 256; ++byte) {
    const char c = static_cast<char>(byte);
    const bool accepted = RefusalOf(std::string("Zm9v") + c + std::string("Zm9vZg==").substr(1)) == "accepted";
    const bool blank = allowed.find(c, 64) != std::string::npos;
    const bool letter = !blank && allowed.find(c) != std::string::npos;
    // Without the byte the group is one character short: a letter completes it, white space does not.
    EXPECT_EQ(accepted, letter) << byte;
    EXPECT_EQ(RefusalOf(std::string("Zm9v") + c + "Zm9v") == "accepted", blank) << byte;
  }
}

TEST(Base64Decode, RefusesEveryPrefixThatEndsInsideAGroup) {
  const std::string text = "Zm9vYmFyZm9vYg==";
  for (std::size_t length = 0; length <= text.size(); ++length) {
    EXPECT_EQ(RefusalOf(text.substr(0, length)) == "accepted", length % 4 == 0) << length;
  }
}

TEST(Base64Decode, ReadsTextOfSeveralMebibytes) {
  const std::string bytes(3 << 20, 'x');
  EXPECT_EQ(Decoded(Encoded(bytes)), bytes);
}

} // namespace
} // namespace Tarvel
