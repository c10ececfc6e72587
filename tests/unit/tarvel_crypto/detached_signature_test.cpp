// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/detached_signature.h>

#include "fixtures.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

namespace Tarvel::Crypto {

namespace {

using Octets = std::vector<std::uint8_t>;
using Testing::FixtureCertificate;
using Testing::FixtureKey;
using Testing::ReadFixture;

struct SignedMessage {
  const char *key;
  HashAlgorithm algorithm;
  const char *file; // the signature over message.txt, made by openssl
};

const std::vector<SignedMessage> MESSAGES = {
    {"rsa2048", HashAlgorithm::SHA256, "rsa2048-pkcs1-sha256.sig"},
    {"rsa2048", HashAlgorithm::SHA384, "rsa2048-pkcs1-sha384.sig"},
    {"rsa2048", HashAlgorithm::SHA512, "rsa2048-pkcs1-sha512.sig"},
    {"p256", HashAlgorithm::SHA256, "p256-ecdsa-sha256.raw"},
    {"p384", HashAlgorithm::SHA384, "p384-ecdsa-sha384.raw"},
    {"p521", HashAlgorithm::SHA512, "p521-ecdsa-sha512.raw"},
};

Octets ReadSignature(const std::string &file) {
  const std::string value = ReadFixture(file);
  return {value.begin(), value.end()};
}

Ref<const VerifyingKey> KeyOf(const std::string &name) {
  return CreateVerifyingKey(FixtureCertificate(name));
}

TEST(VerifyOctets, AcceptsWhatOpensslSigned) {
  for (const SignedMessage &message : MESSAGES) {
    EXPECT_TRUE(
        VerifyOctets(*KeyOf(message.key), message.algorithm, ReadFixture("message.txt"), ReadSignature(message.file)))
        << message.file;
  }
}

TEST(VerifyOctets, RefusesOtherOctetsAnotherAlgorithmAndAnotherKey) {
  for (const SignedMessage &message : MESSAGES) {
    const Octets value = ReadSignature(message.file);
    const std::string text = ReadFixture("message.txt");
    EXPECT_FALSE(VerifyOctets(*KeyOf(message.key), message.algorithm, text + " ", value)) << message.file;
    EXPECT_FALSE(VerifyOctets(*KeyOf("rsa3072"), message.algorithm, text, value)) << message.file;
    for (const auto other : {HashAlgorithm::SHA256, HashAlgorithm::SHA384, HashAlgorithm::SHA512}) {
      EXPECT_EQ(VerifyOctets(*KeyOf(message.key), other, text, value), other == message.algorithm) << message.file;
    }
  }
}

TEST(VerifyOctets, RefusesAnotherLengthAndAnEcdsaValueInDer) {
  const std::string text = ReadFixture("message.txt");
  for (const SignedMessage &message : MESSAGES) {
    Octets value = ReadSignature(message.file);
    value.push_back(0);
    EXPECT_FALSE(VerifyOctets(*KeyOf(message.key), message.algorithm, text, value)) << message.file;
    EXPECT_FALSE(VerifyOctets(*KeyOf(message.key), message.algorithm, text, {})) << message.file;
  }
  EXPECT_FALSE(VerifyOctets(*KeyOf("p256"), HashAlgorithm::SHA256, text, ReadSignature("p256-ecdsa-sha256.sig")));
}

TEST(VerifyOctets, RefusesAKeyWithWhichNoSignatureIsAccepted) {
  for (const char *const name : {"rsa1024", "p224"}) {
    const Octets value = SignOctets(*FixtureKey(name), HashAlgorithm::SHA256, "text");
    EXPECT_FALSE(value.empty());
    EXPECT_FALSE(VerifyOctets(*KeyOf(name), HashAlgorithm::SHA256, "text", value)) << name;
  }
  EXPECT_FALSE(VerifyOctets(*KeyOf("ed25519"), HashAlgorithm::SHA256, "text", Octets(64)));
}

TEST(VerifyOctets, AnswersCorrectlyOnManyThreadsWithOneKey) {
  const auto key = CreateVerifyingKey(*FixtureKey("p256"));
  const Octets value = ReadSignature("p256-ecdsa-sha256.raw");
  const std::string text = ReadFixture("message.txt");
  std::atomic<int> wrongAnswers{0};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 8; ++thread) {
    threads.emplace_back([&] {
      for (int round = 0; round < 50; ++round) {
        wrongAnswers += VerifyOctets(*key, HashAlgorithm::SHA256, text, value) ? 0 : 1;
        wrongAnswers += VerifyOctets(*key, HashAlgorithm::SHA256, text + "x", value) ? 1 : 0;
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrongAnswers, 0);
}

TEST(SignOctets, MakesTheSameRsaSignatureAsOpenssl) {
  EXPECT_EQ(SignOctets(*FixtureKey("rsa2048"), HashAlgorithm::SHA384, ReadFixture("message.txt")),
            ReadSignature("rsa2048-pkcs1-sha384.sig"));
}

TEST(SignOctets, MakesSignaturesThatAreAccepted) {
  for (const SignedMessage &message : MESSAGES) {
    const Octets value = SignOctets(*FixtureKey(message.key), message.algorithm, "text");
    EXPECT_EQ(value.size(), ReadSignature(message.file).size()) << message.file;
    EXPECT_TRUE(VerifyOctets(*KeyOf(message.key), message.algorithm, "text", value)) << message.file;
    EXPECT_FALSE(VerifyOctets(*KeyOf(message.key), message.algorithm, "texT", value)) << message.file;
  }
}

} // namespace

} // namespace Tarvel::Crypto
