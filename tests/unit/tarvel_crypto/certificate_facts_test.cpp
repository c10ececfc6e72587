// SPDX-License-Identifier: Apache-2.0

#include "unit/tarvel_crypto/fixtures.h"

#include <tarvel/crypto/certificate_facts.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace Tarvel::Crypto {
namespace {

using testing::ElementsAre;

CertificateFacts FactsOf(const std::string &file) {
  return ReadCertificateFacts(*LoadCertificates(Testing::DataPath(file)).front());
}

TEST(ReadCertificateFacts, NamesTheKindAndTheSizeOfTheKey) {
  EXPECT_EQ("RSA, 2048 bits", FactsOf("crypto/rsa2048.crt").key);
  EXPECT_EQ("RSA, 1024 bits", FactsOf("crypto/rsa1024.crt").key);
  EXPECT_EQ("EC, P-256", FactsOf("crypto/p256.crt").key);
  EXPECT_EQ("EC, P-384", FactsOf("crypto/p384.crt").key);
  EXPECT_EQ("EC, P-521", FactsOf("crypto/p521.crt").key);
  EXPECT_EQ("EC, 224 bits", FactsOf("crypto/p224.crt").key);
  EXPECT_EQ("ED25519, 256 bits", FactsOf("crypto/ed25519.crt").key);
}

TEST(ReadCertificateFacts, AcceptsTheKeysWhoseSignaturesAreAccepted) {
  for (const char *const file : {"rsa2048", "rsa3072", "p256", "p384", "p521"}) {
    EXPECT_EQ("", FactsOf(std::string("crypto/") + file + ".crt").keyRefusal) << file;
  }
  EXPECT_EQ("", FactsOf("tokens/sts-rsa-e3.crt").keyRefusal);
}

TEST(ReadCertificateFacts, StatesWhyNoSignatureByTheKeyIsAccepted) {
  EXPECT_EQ("the RSA key has only 1024 bits; 2048 are the minimum", FactsOf("crypto/rsa1024.crt").keyRefusal);
  const std::string kind = "the key is neither RSA nor on the curves P-256, P-384 and P-521";
  EXPECT_EQ(kind, FactsOf("crypto/p224.crt").keyRefusal);
  EXPECT_EQ(kind, FactsOf("crypto/ed25519.crt").keyRefusal);
  EXPECT_EQ("the RSA key's public exponent is even or 1", FactsOf("tokens/sts-rsa-e1.crt").keyRefusal);
  EXPECT_EQ("the RSA key's public exponent is even or 1", FactsOf("tokens/sts-rsa-e2.crt").keyRefusal);
}

TEST(ReadCertificateFacts, ListsTheHostNamesAndAddressesOfAServer) {
  const CertificateFacts facts = FactsOf("tls/localhost.crt");
  EXPECT_THAT(facts.names, ElementsAre("localhost", "127.0.0.1", "::1"));
  EXPECT_EQ(3u, facts.nameCount);
  EXPECT_THAT(FactsOf("tls/other-host.crt").names, ElementsAre("other.example"));
}

TEST(ReadCertificateFacts, ListsTheCommonNameOfACertificateWithoutAHostName) {
  EXPECT_THAT(FactsOf("tls/authority.crt").names, ElementsAre("authority"));
}

} // namespace
} // namespace Tarvel::Crypto
