// SPDX-License-Identifier: Apache-2.0

#include "unit/tarvel_crypto/fixtures.h"

#include "support/throws_message.h"

#include <tarvel/core/string_util.h>
#include <tarvel/crypto/subject_public_key.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel::Crypto {
namespace {

using Octets = std::vector<std::uint8_t>;
using Testing::FixtureCertificate;

constexpr std::size_t EXPONENT_END = 5; // the last octets of a key with the exponent 65537: 02 03 01 00 01

const Octets EXPONENT{1, 0, 1};

/// The last octets of the certificate's key: a point of a curve.
Octets PointOf(const char *certificate, std::size_t octets) {
  const Octets der = GetSubjectPublicKey(*FixtureCertificate(certificate));
  return {der.end() - static_cast<std::ptrdiff_t>(octets), der.end()};
}

Octets ModulusOf(const char *certificate, std::size_t octets) {
  const Octets der = GetSubjectPublicKey(*FixtureCertificate(certificate));
  const auto end = der.end() - static_cast<std::ptrdiff_t>(EXPONENT_END);
  return {end - static_cast<std::ptrdiff_t>(octets), end};
}

TEST(GetSubjectPublicKey, IsTheKeyThatOpenSslWritesForTheCertificate) {
  EXPECT_EQ("MFkwEwYHKoZIzj0CAQYIKoZIzj0DAQcDQgAEe7u9VhSkAJbbme3hZXVtObEEzhOa"
            "xQznwNg8UN+HiFekOCuzydU+YYAlgs58dm+qqkzaUGYax3YbplS347pxiw==",
            StringUtil::Base64Encode(GetSubjectPublicKey(*FixtureCertificate("p256"))));
}

TEST(GetSubjectPublicKey, ReturnsAKeyThatIsNeitherRsaNorEc) {
  EXPECT_EQ("MCowBQYDK2VwAyEASY4IOzO2gIwbGN57fQagupnRw3JMIzhsYQgdyn9yyMk=",
            StringUtil::Base64Encode(GetSubjectPublicKey(*FixtureCertificate("ed25519"))));
}

TEST(MakeRsaPublicKey, MakesTheKeyOfTheCertificateWithTheseNumbers) {
  const SubjectPublicKey key = MakeRsaPublicKey(ModulusOf("rsa2048", 256), EXPONENT);
  EXPECT_EQ(GetSubjectPublicKey(*FixtureCertificate("rsa2048")), key.der);
  EXPECT_EQ("", key.refusal);
}

TEST(MakeRsaPublicKey, IgnoresZerosAtTheBeginning) {
  Octets modulus = ModulusOf("rsa2048", 256);
  modulus.insert(modulus.begin(), 3000, 0);
  EXPECT_EQ(GetSubjectPublicKey(*FixtureCertificate("rsa2048")), MakeRsaPublicKey(modulus, {0, 0, 1, 0, 1}).der);
}

TEST(MakeRsaPublicKey, StatesWhyNoSignatureByTheKeyIsAccepted) {
  const SubjectPublicKey small = MakeRsaPublicKey(ModulusOf("rsa1024", 128), EXPONENT);
  EXPECT_EQ("the RSA key has only 1024 bits; 2048 are the minimum", small.refusal);
  EXPECT_EQ(GetSubjectPublicKey(*FixtureCertificate("rsa1024")), small.der);
  const Octets modulus = ModulusOf("rsa2048", 256);
  for (const Octets &exponent : {Octets{1}, Octets{2}, Octets{1, 0, 0}, Octets{0}, Octets{}}) {
    EXPECT_EQ("the RSA key's public exponent is even or 1", MakeRsaPublicKey(modulus, exponent).refusal);
  }
  EXPECT_EQ("", MakeRsaPublicKey(modulus, {3}).refusal);
}

TEST(MakeRsaPublicKey, RefusesAKeyWithoutAModulus) {
  for (const Octets &modulus : {Octets{}, Octets{0}}) {
    EXPECT_EQ("the RSA key has only 0 bits; 2048 are the minimum", MakeRsaPublicKey(modulus, EXPONENT).refusal);
  }
}

TEST(MakeRsaPublicKey, DoesNotReadNumbersBeyondTheLimits) {
  EXPECT_EQ("", MakeRsaPublicKey(Octets(2048, 255), EXPONENT).refusal);
  const SubjectPublicKey large = MakeRsaPublicKey(Octets(2049, 255), EXPONENT);
  EXPECT_EQ("the RSA key's modulus has more than 16384 bits", large.refusal);
  EXPECT_TRUE(large.der.empty());
  const Octets modulus = ModulusOf("rsa2048", 256);
  EXPECT_EQ("", MakeRsaPublicKey(modulus, Octets(32, 255)).refusal);
  const SubjectPublicKey largeExponent = MakeRsaPublicKey(modulus, Octets(33, 255));
  EXPECT_EQ("the RSA key's exponent has more than 256 bits", largeExponent.refusal);
  EXPECT_TRUE(largeExponent.der.empty());
}

TEST(MakeEcPublicKey, MakesTheKeyOfTheCertificateWithThisPoint) {
  EXPECT_EQ(GetSubjectPublicKey(*FixtureCertificate("p256")),
            MakeEcPublicKey(NamedCurve::P256, PointOf("p256", 65)).der);
  EXPECT_EQ(GetSubjectPublicKey(*FixtureCertificate("p384")),
            MakeEcPublicKey(NamedCurve::P384, PointOf("p384", 97)).der);
  EXPECT_EQ(GetSubjectPublicKey(*FixtureCertificate("p521")),
            MakeEcPublicKey(NamedCurve::P521, PointOf("p521", 133)).der);
  EXPECT_EQ("", MakeEcPublicKey(NamedCurve::P256, PointOf("p256", 65)).refusal);
}

TEST(MakeEcPublicKey, RefusesOtherForms) {
  Octets point = PointOf("p256", 65);
  const std::string form = " bytes are not an uncompressed point on P-256";
  EXPECT_THROWS_MESSAGE(MakeEcPublicKey(NamedCurve::P256, {}), CryptoException, "The 0" + form);
  EXPECT_THROWS_MESSAGE(MakeEcPublicKey(NamedCurve::P256, {0}), CryptoException, "The 1" + form);
  EXPECT_THROWS_MESSAGE(MakeEcPublicKey(NamedCurve::P256, PointOf("p384", 97)), CryptoException, "The 97" + form);
  Octets compressed(point.begin(), point.begin() + 33);
  compressed.front() = 2;
  EXPECT_THROWS_MESSAGE(MakeEcPublicKey(NamedCurve::P256, compressed), CryptoException, "The 33" + form);
  point.front() = 6; // the hybrid form
  EXPECT_THROWS_MESSAGE(MakeEcPublicKey(NamedCurve::P256, point), CryptoException, "The 65" + form);
}

TEST(MakeEcPublicKey, RefusesAPointThatIsNotOnTheCurve) {
  Octets point = PointOf("p256", 65);
  point.back() ^= 1U;
  EXPECT_THROWS_MESSAGE(
      MakeEcPublicKey(NamedCurve::P256, point), CryptoException,
      "The numbers are not a public key: error:0800006B:elliptic curve routines::point is not on curve");
}

TEST(HasPublicKey, ComparesTheKeyOfTheCertificate) {
  for (const char *const name : {"rsa2048", "p256", "p384", "p521", "ed25519"}) {
    const Octets key = GetSubjectPublicKey(*FixtureCertificate(name));
    EXPECT_TRUE(HasPublicKey(*FixtureCertificate(name), key)) << name;
    EXPECT_EQ(std::string("rsa3072") == name, HasPublicKey(*FixtureCertificate("rsa3072"), key)) << name;
  }
  EXPECT_FALSE(HasPublicKey(*FixtureCertificate("p256"), MakeEcPublicKey(NamedCurve::P384, PointOf("p384", 97)).der));
}

TEST(HasPublicKey, IsFalseForWhatIsNotAKey) {
  EXPECT_FALSE(HasPublicKey(*FixtureCertificate("p256"), {}));
  EXPECT_FALSE(HasPublicKey(*FixtureCertificate("p256"), {1, 2, 3}));
}

} // namespace
} // namespace Tarvel::Crypto
