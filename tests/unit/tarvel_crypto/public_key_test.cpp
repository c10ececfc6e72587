// SPDX-License-Identifier: Apache-2.0

#include "crypto/public_key.h"

#include "fixtures.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <openssl/err.h>

#include <array>
#include <atomic>
#include <thread>

namespace Tarvel::Crypto {

namespace {

using Testing::FixtureCertificate;
using Testing::FixtureKey;
using Testing::ReadFixture;

struct SignedFixture {
  const char *key;
  SignatureScheme scheme;
  DigestAlgorithm algorithm;
  const char *file; // the signature value over message.txt
};

void PrintTo(const SignedFixture &fixture, std::ostream *out) {
  *out << fixture.file;
}

using DigestValue = std::array<std::uint8_t, MAX_DIGEST_BYTES>;

DigestValue DigestOf(DigestAlgorithm algorithm, const std::string &message) {
  DigestValue value{};
  Digest digest(algorithm);
  digest.Update(message);
  digest.Finish(value.data());
  return value;
}

bool VerifyMessage(const Certificate &certificate, SignatureScheme scheme, DigestAlgorithm algorithm,
                   const std::string &value) {
  return VerifyDigest(certificate, scheme, algorithm, DigestOf(algorithm, ReadFixture("message.txt")).data(),
                      reinterpret_cast<const std::uint8_t *>(value.data()), value.size());
}

class VerifyDigestTest : public ::testing::TestWithParam<SignedFixture> {
protected:
  bool VerifyValue(const std::string &value) const {
    return VerifyMessage(*m_certificate, GetParam().scheme, GetParam().algorithm, value);
  }

  const std::string m_value = ReadFixture(GetParam().file);
  const Ref<const Certificate> m_certificate = FixtureCertificate(GetParam().key);
};

TEST_P(VerifyDigestTest, RepeatedlyAcceptsAValueMadeByOpenssl) {
  for (int round = 0; round < 3; ++round) {
    EXPECT_TRUE(VerifyValue(m_value));
  }
}

TEST_P(VerifyDigestTest, RefusesAnyChangedByteAndThenStillAcceptsTheOriginal) {
  for (std::size_t at = 0; at < m_value.size(); ++at) {
    std::string changed = m_value;
    changed[at] = static_cast<char>(changed[at] ^ 1);
    EXPECT_FALSE(VerifyValue(changed)) << "byte " << at;
  }
  EXPECT_TRUE(VerifyValue(m_value));
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST_P(VerifyDigestTest, RefusesAnotherLength) {
  for (std::size_t length = 0; length < m_value.size(); ++length) {
    EXPECT_FALSE(VerifyValue(m_value.substr(0, length))) << length << " bytes";
  }
  EXPECT_FALSE(VerifyValue(m_value + std::string(1, '\0')));
  EXPECT_FALSE(VerifyValue(std::string(1, '\0') + m_value));
  EXPECT_FALSE(VerifyValue(std::string(1 << 16, 'x')));
}

TEST_P(VerifyDigestTest, RefusesExtremeNumbers) {
  EXPECT_FALSE(VerifyValue(std::string(m_value.size(), '\0')));
  EXPECT_FALSE(VerifyValue(std::string(m_value.size(), '\xff')));
  EXPECT_EQ(ERR_peek_error(), 0U);
}

TEST_P(VerifyDigestTest, RefusesAValueOverAnotherDigest) {
  DigestValue digest = DigestOf(GetParam().algorithm, ReadFixture("message.txt"));
  digest[0] ^= 1;
  EXPECT_FALSE(VerifyDigest(*m_certificate, GetParam().scheme, GetParam().algorithm, digest.data(),
                            reinterpret_cast<const std::uint8_t *>(m_value.data()), m_value.size()));
}

TEST_P(VerifyDigestTest, RefusesEveryOtherSchemeAndDigestAlgorithm) {
  for (const auto scheme : {SignatureScheme::RSA_PKCS1, SignatureScheme::RSA_PSS, SignatureScheme::ECDSA}) {
    for (const auto algorithm : {DigestAlgorithm::SHA256, DigestAlgorithm::SHA384, DigestAlgorithm::SHA512}) {
      const bool same = scheme == GetParam().scheme && algorithm == GetParam().algorithm;
      EXPECT_EQ(VerifyMessage(*m_certificate, scheme, algorithm, m_value), same);
    }
  }
}

TEST_P(VerifyDigestTest, RefusesEveryOtherCertificate) {
  for (const char *other : {"rsa1024", "rsa2048", "rsa3072", "p256", "p384", "p521", "p224", "ed25519"}) {
    const bool same = std::string(other) == GetParam().key;
    EXPECT_EQ(VerifyMessage(*FixtureCertificate(other), GetParam().scheme, GetParam().algorithm, m_value), same)
        << other;
  }
}

TEST_P(VerifyDigestTest, AcceptsAValueOfTheSameSizeMadeBySignDigest) {
  const DigestValue digest = DigestOf(GetParam().algorithm, ReadFixture("message.txt"));
  const std::vector<std::uint8_t> ours =
      SignDigest(*FixtureKey(GetParam().key), GetParam().scheme, GetParam().algorithm, digest.data());
  const std::string value(ours.begin(), ours.end());
  EXPECT_EQ(value.size(), m_value.size());
  EXPECT_TRUE(VerifyValue(value));
  // PKCS#1 v1.5 has no random part.
  EXPECT_EQ(value == m_value, GetParam().scheme == SignatureScheme::RSA_PKCS1);
}

constexpr auto PKCS1 = SignatureScheme::RSA_PKCS1;
constexpr auto PSS = SignatureScheme::RSA_PSS;
constexpr auto ECDSA = SignatureScheme::ECDSA;
constexpr auto SHA256 = DigestAlgorithm::SHA256;
constexpr auto SHA384 = DigestAlgorithm::SHA384;
constexpr auto SHA512 = DigestAlgorithm::SHA512;

INSTANTIATE_TEST_SUITE_P(All, VerifyDigestTest,
                         ::testing::Values(SignedFixture{"rsa2048", PKCS1, SHA256, "rsa2048-pkcs1-sha256.sig"},
                                           SignedFixture{"rsa2048", PKCS1, SHA384, "rsa2048-pkcs1-sha384.sig"},
                                           SignedFixture{"rsa2048", PKCS1, SHA512, "rsa2048-pkcs1-sha512.sig"},
                                           SignedFixture{"rsa2048", PSS, SHA256, "rsa2048-pss-sha256.sig"},
                                           SignedFixture{"rsa2048", PSS, SHA384, "rsa2048-pss-sha384.sig"},
                                           SignedFixture{"rsa2048", PSS, SHA512, "rsa2048-pss-sha512.sig"},
                                           SignedFixture{"rsa3072", PKCS1, SHA256, "rsa3072-pkcs1-sha256.sig"},
                                           SignedFixture{"rsa3072", PKCS1, SHA384, "rsa3072-pkcs1-sha384.sig"},
                                           SignedFixture{"rsa3072", PKCS1, SHA512, "rsa3072-pkcs1-sha512.sig"},
                                           SignedFixture{"rsa3072", PSS, SHA256, "rsa3072-pss-sha256.sig"},
                                           SignedFixture{"rsa3072", PSS, SHA384, "rsa3072-pss-sha384.sig"},
                                           SignedFixture{"rsa3072", PSS, SHA512, "rsa3072-pss-sha512.sig"},
                                           SignedFixture{"p256", ECDSA, SHA256, "p256-ecdsa-sha256.raw"},
                                           SignedFixture{"p256", ECDSA, SHA384, "p256-ecdsa-sha384.raw"},
                                           SignedFixture{"p256", ECDSA, SHA512, "p256-ecdsa-sha512.raw"},
                                           SignedFixture{"p384", ECDSA, SHA256, "p384-ecdsa-sha256.raw"},
                                           SignedFixture{"p384", ECDSA, SHA384, "p384-ecdsa-sha384.raw"},
                                           SignedFixture{"p384", ECDSA, SHA512, "p384-ecdsa-sha512.raw"},
                                           SignedFixture{"p521", ECDSA, SHA256, "p521-ecdsa-sha256.raw"},
                                           SignedFixture{"p521", ECDSA, SHA384, "p521-ecdsa-sha384.raw"},
                                           SignedFixture{"p521", ECDSA, SHA512, "p521-ecdsa-sha512.raw"}),
                         [](const auto &fixture) { return Testing::TestName(fixture.param.file); });

TEST(VerifyDigest, RefusesPssWithAnotherSaltLengthOrMaskDigest) {
  const auto certificate = FixtureCertificate("rsa2048");
  EXPECT_FALSE(VerifyMessage(*certificate, PSS, SHA256, ReadFixture("rsa2048-pss-salt20-sha256.sig")));
  EXPECT_FALSE(VerifyMessage(*certificate, PSS, SHA256, ReadFixture("rsa2048-pss-mgf1-sha1-sha256.sig")));
}

TEST(VerifyDigest, RefusesAnEcdsaValueInDer) {
  EXPECT_FALSE(VerifyMessage(*FixtureCertificate("p256"), ECDSA, SHA256, ReadFixture("p256-ecdsa-sha256.sig")));
}

TEST(VerifyDigest, KeepsTheErrorsOfTheHost) {
  ERR_clear_error();
  ERR_raise(ERR_LIB_USER, 7);
  EXPECT_FALSE(VerifyMessage(*FixtureCertificate("rsa2048"), PKCS1, SHA256, std::string(256, '\xff')));
  EXPECT_EQ(ERR_GET_REASON(ERR_get_error()), 7);
  EXPECT_EQ(ERR_get_error(), 0U);
}

TEST(VerifyDigest, AnswersCorrectlyOnManyThreadsWithOneCertificate) {
  constexpr int THREADS = 8;
  constexpr int ROUNDS = 200;
  const auto certificate = FixtureCertificate("rsa2048");
  const std::string genuine = ReadFixture("rsa2048-pkcs1-sha256.sig");
  std::string forged = genuine;
  forged[100] = static_cast<char>(forged[100] ^ 1);
  const DigestValue digest = DigestOf(SHA256, ReadFixture("message.txt"));
  const auto verify = [&](const std::string &value) {
    return VerifyDigest(*certificate, PKCS1, SHA256, digest.data(),
                        reinterpret_cast<const std::uint8_t *>(value.data()), value.size());
  };
  std::atomic<int> wrongAnswers{0};
  std::vector<std::thread> threads;
  for (int i = 0; i < THREADS; ++i) {
    threads.emplace_back([&] {
      for (int round = 0; round < ROUNDS; ++round) {
        wrongAnswers += verify(genuine) ? 0 : 1;
        wrongAnswers += verify(forged) ? 1 : 0;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrongAnswers, 0);
}

TEST(SignDigest, RefusesAKeyThatDoesNotMatchTheScheme) {
  const DigestValue digest{};
  EXPECT_THROWS_MESSAGE(SignDigest(*FixtureKey("p256"), PKCS1, SHA256, digest.data()), CryptoException,
                        "A key of algorithm EC cannot make a signature of this scheme");
  EXPECT_THROWS_MESSAGE(SignDigest(*FixtureKey("rsa2048"), ECDSA, SHA256, digest.data()), CryptoException,
                        "A key of algorithm RSA cannot make a signature of this scheme");
}

TEST(SignDigest, SignsTwoKindsOfDigestsOnManyThreadsWithOneKey) {
  constexpr int THREADS = 8;
  constexpr int ROUNDS = 20;
  const auto key = FixtureKey("rsa2048");
  const auto isSignedCorrectly = [&](DigestAlgorithm algorithm, const DigestValue &digest,
                                     const std::string &expected) {
    const std::vector<std::uint8_t> value = SignDigest(*key, PKCS1, algorithm, digest.data());
    return std::string(value.begin(), value.end()) == expected;
  };
  const DigestValue shortDigest = DigestOf(SHA256, ReadFixture("message.txt"));
  const DigestValue longDigest = DigestOf(SHA512, ReadFixture("message.txt"));
  const std::string shortExpected = ReadFixture("rsa2048-pkcs1-sha256.sig");
  const std::string longExpected = ReadFixture("rsa2048-pkcs1-sha512.sig");
  std::atomic<int> wrongValues{0};
  std::vector<std::thread> threads;
  for (int i = 0; i < THREADS; ++i) {
    threads.emplace_back([&] {
      for (int round = 0; round < ROUNDS; ++round) {
        wrongValues += isSignedCorrectly(SHA256, shortDigest, shortExpected) ? 0 : 1;
        wrongValues += isSignedCorrectly(SHA512, longDigest, longExpected) ? 0 : 1;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrongValues, 0);
}

struct KindOfKey {
  const char *certificate;
  KeyKind kind;
  unsigned bits;
};

TEST(GetKeyKind, RecognisesEveryKind) {
  for (const KindOfKey &expected :
       {KindOfKey{"rsa1024", KeyKind::RSA, 1024}, KindOfKey{"rsa2048", KeyKind::RSA, 2048},
        KindOfKey{"rsa3072", KeyKind::RSA, 3072}, KindOfKey{"p256", KeyKind::EC_P256, 256},
        KindOfKey{"p384", KeyKind::EC_P384, 384}, KindOfKey{"p521", KeyKind::EC_P521, 521},
        KindOfKey{"p224", KeyKind::OTHER, 224}, KindOfKey{"ed25519", KeyKind::OTHER, 256}}) {
    unsigned bits = 0;
    EXPECT_EQ(GetKeyKind(*FixtureCertificate(expected.certificate), bits), expected.kind) << expected.certificate;
    if (expected.kind != KeyKind::OTHER) {
      EXPECT_EQ(bits, expected.bits) << expected.certificate;
    }
  }
}

class ForeignCertificate final : public Certificate {
public:
  const std::vector<std::uint8_t> &GetDer() const noexcept override { return m_der; }
  std::string GetSubject() const override { return {}; }
  std::string GetIssuer() const override { return {}; }
  std::string GetSha256Thumbprint() const override { return {}; }
  System::DateTime GetNotBefore() const override { return {}; }
  System::DateTime GetNotAfter() const override { return {}; }
  std::string ToPem() const override { return {}; }

private:
  std::vector<std::uint8_t> m_der;
};

TEST(GetKeyKind, RefusesACertificateOfAnotherClass) {
  unsigned bits = 0;
  EXPECT_THROWS_MESSAGE(GetKeyKind(*MakeRef<ForeignCertificate>(), bits), TypeMismatchException,
                        "Type mismatch : expected Tarvel::Crypto::CertificateImpl, but the object is "
                        "Tarvel::Crypto::(anonymous namespace)::ForeignCertificate");
}

} // namespace

} // namespace Tarvel::Crypto
