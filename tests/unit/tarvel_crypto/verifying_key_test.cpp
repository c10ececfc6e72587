// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/verifying_key.h>

#include "crypto/verifying_key_impl.h"
#include "fixtures.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

namespace Tarvel::Crypto {

namespace {

using Octets = std::vector<std::uint8_t>;
using Testing::FixtureCertificate;
using Testing::FixtureKey;
using Testing::ReadFixture;

struct ExpectedKey {
  const char *name;
  const char *algorithm;
  unsigned bits;
  const char *refusal;
  const char *thumbprint; // computed by openssl dgst
};

constexpr const char *OTHER_KIND = "the key is neither RSA nor on the curves P-256, P-384 and P-521";

const std::vector<ExpectedKey> KEYS = {
    {"rsa1024", "RSA", 1024, "the RSA key has only 1024 bits; 2048 are the minimum",
     "bac4066f62babe0690232e7befb0f3e6b306e373ca5768e74057b028efe9775a"},
    {"rsa2048", "RSA", 2048, "", "235d333a9a840280c4cfed848cd176cf16a9f84e965295a5e566b031fa217f87"},
    {"p224", "EC", 224, OTHER_KIND, "239737af1dee61716e281712d3d350278783573ac863bea5a54c11d95ff79988"},
    {"p256", "EC", 256, "", "4ed265dc89207bc6354a824ad4538cfeba90e819fd116fa49d839946d87e3034"},
    {"p384", "EC", 384, "", "5cdea8ecb32af0052c04cb66d30b7a66af1f815a9e6631f216b59576d0d29cf7"},
    {"p521", "EC", 521, "", "cfb0f52abc55d2d12ff47313a87aaae06554745a58fe5226d289a5b012c0383e"},
    {"ed25519", "", 0, OTHER_KIND, "103aebaa3ce23accacbbc02f860e62f76c062110de4933ddb51c7d9d5300ab18"}};

Octets ReadKeyInfo(const std::string &name) {
  const std::string der = ReadFixture(name + ".spki.der");
  return {der.begin(), der.end()};
}

void ExpectKey(const VerifyingKey &key, const ExpectedKey &expected) {
  EXPECT_EQ(key.GetSubjectPublicKey(), ReadKeyInfo(expected.name)) << expected.name;
  EXPECT_EQ(key.GetAlgorithm(), expected.algorithm) << expected.name;
  EXPECT_EQ(key.GetBits(), expected.bits) << expected.name;
  EXPECT_EQ(key.GetRefusal(), expected.refusal) << expected.name;
  EXPECT_EQ(key.GetSha256Thumbprint(), expected.thumbprint) << expected.name;
}

TEST(CreateVerifyingKey, ReadsThePublicKeyThatOpensslWrote) {
  for (const ExpectedKey &expected : KEYS) {
    ExpectKey(*CreateVerifyingKey(ReadKeyInfo(expected.name)), expected);
  }
}

TEST(CreateVerifyingKey, HasTheKeyOfTheCertificate) {
  for (const ExpectedKey &expected : KEYS) {
    ExpectKey(*CreateVerifyingKey(FixtureCertificate(expected.name)), expected);
  }
}

TEST(CreateVerifyingKey, HasThePublicKeyOfThePrivateKey) {
  for (const ExpectedKey &expected : KEYS) {
    if (std::string(expected.name) != "ed25519") { // not a private key that is accepted
      ExpectKey(*CreateVerifyingKey(*FixtureKey(expected.name)), expected);
    }
  }
}

TEST(CreateVerifyingKey, SharesWhatTheCertificateHasPrepared) {
  const auto certificate = FixtureCertificate("rsa2048");
  const auto key = CreateVerifyingKey(certificate);
  EXPECT_EQ(&GetPreparedKey(*key), &GetPreparedKey(*certificate));
}

TEST(CreateVerifyingKey, OutlivesTheCertificate) {
  auto certificate = FixtureCertificate("p256");
  const auto key = CreateVerifyingKey(certificate);
  certificate.reset();
  EXPECT_TRUE(IsSameKey(*key, *CreateVerifyingKey(ReadKeyInfo("p256"))));
}

TEST(CreateVerifyingKey, RefusesOctetsThatAreNotAPublicKey) {
  EXPECT_THROWS_MESSAGE(CreateVerifyingKey(Octets()), CryptoException, "Public key of 0 bytes does not decode");
  EXPECT_THROWS_MESSAGE(CreateVerifyingKey(Octets{4, 1, 0}), CryptoException,
                        "Public key does not decode: error:068000A8:asn1 encoding routines::wrong tag; "
                        "error:0688010A:asn1 encoding routines::nested asn1 error (Type=X509_PUBKEY)");
}

TEST(CreateVerifyingKey, RefusesEveryPrefixOfAPublicKey) {
  const Octets whole = ReadKeyInfo("rsa2048");
  for (std::size_t length = 0; length < whole.size(); ++length) {
    EXPECT_THROW(CreateVerifyingKey(Octets(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(length))),
                 CryptoException)
        << length << " bytes";
  }
}

TEST(CreateVerifyingKey, RefusesFurtherBytes) {
  Octets longer = ReadKeyInfo("p256");
  longer.insert(longer.end(), {0, 0, 0});
  EXPECT_THROWS_MESSAGE(CreateVerifyingKey(longer), CryptoException, "Public key is followed by 3 further bytes");
}

TEST(CreateVerifyingKey, RefusesAnAlgorithmThatOpensslDoesNotKnow) {
  Octets unknown = ReadKeyInfo("ed25519");
  unknown[8] = 0x7f; // the last octet of the algorithm's identifier
  EXPECT_THROWS_MESSAGE(CreateVerifyingKey(unknown), CryptoException,
                        "Public key does not decode: error:03000072:digital envelope routines::decode error");
}

TEST(CreateVerifyingKey, RefusesAnEncodingThatIsNotDistinguished) {
  const Octets whole = ReadKeyInfo("p256");
  ASSERT_EQ(whole[1], 0x59);
  Octets longForm = whole;
  longForm.insert(longForm.begin() + 1, 0x81); // the length in two octets, where one is enough
  EXPECT_THROWS_MESSAGE(CreateVerifyingKey(longForm), CryptoException,
                        "Public key is not in the distinguished encoding (DER)");
}

class ForeignKey final : public VerifyingKey {
public:
  const Octets &GetSubjectPublicKey() const noexcept override { return m_der; }
  std::string GetAlgorithm() const override { return {}; }
  unsigned GetBits() const noexcept override { return 0; }
  std::string GetRefusal() const override { return {}; }
  std::string GetSha256Thumbprint() const override { return {}; }

private:
  Octets m_der;
};

TEST(IsSameKey, ComparesKeysAndNotEncodings) {
  const auto compressed = CreateVerifyingKey(ReadKeyInfo("p256-compressed"));
  EXPECT_TRUE(IsSameKey(*compressed, *CreateVerifyingKey(ReadKeyInfo("p256"))));
  EXPECT_TRUE(IsSameKey(*CreateVerifyingKey(FixtureCertificate("p256")), *compressed));
  EXPECT_NE(compressed->GetSha256Thumbprint(), CreateVerifyingKey(ReadKeyInfo("p256"))->GetSha256Thumbprint());
}

TEST(IsSameKey, DistinguishesEveryPairOfKeys) {
  for (const ExpectedKey &left : KEYS) {
    for (const ExpectedKey &right : KEYS) {
      EXPECT_EQ(IsSameKey(*CreateVerifyingKey(ReadKeyInfo(left.name)), *CreateVerifyingKey(ReadKeyInfo(right.name))),
                left.name == right.name)
          << left.name << " and " << right.name;
    }
  }
}

TEST(IsSameKey, RefusesAKeyOfAnotherClass) {
  EXPECT_THROWS_MESSAGE(IsSameKey(*CreateVerifyingKey(ReadKeyInfo("p256")), *MakeRef<ForeignKey>()),
                        TypeMismatchException,
                        "Type mismatch : expected Tarvel::Crypto::VerifyingKeyImpl, but the object is "
                        "Tarvel::Crypto::(anonymous namespace)::ForeignKey");
}

} // namespace

} // namespace Tarvel::Crypto
