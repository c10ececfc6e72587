// SPDX-License-Identifier: Apache-2.0

#include "proof/content_digest.h"

#include "support/throws_message.h"

#include <ssoclient/proof/exceptions.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;

// RFC 9530, appendix D: the content and its digests.
const std::string CONTENT = "{\"hello\": \"world\"}";
const std::string SHA256 = "sha-256=:X48E9qOokqqrvdts8nOJRJN3OWDUoyWxBf7kbu9DBPE=:";
const std::string SHA512 =
    "sha-512=:WZDPaVn/7XgHaAy8pmojAkGWoRx2UFChF41A2svX+TaPm+AbwAgBWnrIiYllu7BNNyealdVLvRwEmTHWXvJwew==:";

TEST(WriteContentDigest, AgreesWithTheExampleOfTheStandard) {
  EXPECT_EQ(WriteContentDigest(CONTENT), SHA256);
}

TEST(CheckContentDigest, AcceptsBothAlgorithmsAndIgnoresOthers) {
  for (const std::string &field :
       {SHA256, SHA512, SHA256 + ", " + SHA512, "md5=:AAAA:, unixsum=1, x=(1 2)," + SHA256 + ";p=1"}) {
    EXPECT_NO_THROW(CheckContentDigest(field, CONTENT)) << field;
  }
}

TEST(CheckContentDigest, RefusesAnyDigestOfOtherContent) {
  const std::string other = WriteContentDigest("other");
  const std::string message = "The content of the request does not have the digest sha-256 of Content-Digest";
  EXPECT_THROWS_MESSAGE(CheckContentDigest(other, CONTENT), InvalidProofException, message);
  EXPECT_THROWS_MESSAGE(CheckContentDigest(SHA512 + "," + other, CONTENT), InvalidProofException, message);
  EXPECT_THROWS_MESSAGE(CheckContentDigest(other + "," + SHA512, CONTENT), InvalidProofException, message);
  EXPECT_THROWS_MESSAGE(CheckContentDigest(SHA256, ""), InvalidProofException, message);
  EXPECT_THROWS_MESSAGE(CheckContentDigest("sha-256=:AQID:", CONTENT), InvalidProofException, message);
  EXPECT_THROWS_MESSAGE(CheckContentDigest("sha-512=::", CONTENT), InvalidProofException,
                        "The content of the request does not have the digest sha-512 of Content-Digest");
}

TEST(CheckContentDigest, RefusesAFieldWithoutADigestByAKnownAlgorithm) {
  for (const char *const field : {"", "md5=:AAAA:", "sha-384=:AAAA:", "sha256=:AAAA:"}) {
    EXPECT_THROWS_MESSAGE(CheckContentDigest(field, CONTENT), InvalidMessageException,
                          "Content-Digest has neither a digest sha-256 nor a digest sha-512");
  }
}

TEST(CheckContentDigest, RefusesAMalformedField) {
  for (const char *const field : {"sha-256", "sha-256=\"X48E\"", "sha-256=(:AQID:)"}) {
    EXPECT_THROWS_MESSAGE(CheckContentDigest(field, CONTENT), InvalidMessageException,
                          "The digest sha-256 in Content-Digest does not consist of octets");
  }
  EXPECT_THROWS_MESSAGE(
      CheckContentDigest("sha-256=:AQI:", CONTENT), InvalidMessageException,
      "The header field Content-Digest is malformed at character 14: octets are not in canonical Base64");
}

} // namespace
