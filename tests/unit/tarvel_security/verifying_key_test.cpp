// SPDX-License-Identifier: Apache-2.0
// Signatures that are verified with one key, and what they cover.

#include "documents.h"
#include "genuine_token.h"
#include "support/throws_message.h"

#include <tarvel/crypto/message_digest.h>
#include <tarvel/crypto/subject_public_key.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

namespace {

using namespace Testing;
using Tarvel::Ref;
using Tarvel::Crypto::ComputeDigest;
using Tarvel::Crypto::HashAlgorithm;
using Tarvel::Crypto::VerifyingKey;
using Tarvel::Xml::Document;
using Tarvel::Xml::Security::Signature;
using Tarvel::Xml::Security::XmlSecurityException;
namespace CanonicalizationUri = Tarvel::Xml::Security::CanonicalizationUri;

/// The key of a certificate, made from its SubjectPublicKeyInfo.
Ref<const VerifyingKey> KeyOf(const std::string &name) {
  return Tarvel::Crypto::CreateVerifyingKey(Tarvel::Crypto::GetSubjectPublicKey(*Trusted({name}).front()));
}

/// A document, the result of the verification of its signature, and the coverage.
struct Verified {
  Verified(const std::string &text, const std::string &key)
      : document(ParseDocument(text)), result(SignatureOf(*document)->Verify(*KeyOf(key), coverage)) {}

  Ref<Document> document;
  Signature::Coverage coverage;
  bool result;
};

std::vector<std::uint8_t> DigestOfSignedInfo(const Document &document, HashAlgorithm algorithm) {
  return ComputeDigest(algorithm, CanonicalForm(FindElement(document, "SignedInfo"), CanonicalizationUri::EXCLUSIVE));
}

TEST(VerifyWithKey, AcceptsTheSignatureOfTheKeyAndNoOther) {
  EXPECT_TRUE(Verified(GenuineToken(), "sts-rsa").result);
  EXPECT_FALSE(Verified(GenuineToken(), "sts-rsa-2").result);
  EXPECT_TRUE(Verified(ReadDataFile("tokens/ecdsa-p384-sha384.xml"), "sts-ec384").result);
  EXPECT_TRUE(Verified(ReadDataFile("tokens/rsa-pss-sha512.xml"), "sts-rsa").result);
}

TEST(VerifyWithKey, AcceptsTheKeyOfACertificate) {
  Signature::Coverage coverage;
  EXPECT_TRUE(SignatureOf(*ParseDocument(GenuineToken()))
                  ->Verify(*Tarvel::Crypto::CreateVerifyingKey(Trusted({"sts-rsa"}).front()), coverage));
}

TEST(VerifyWithKey, AnswersFalseWhenContentWasChanged) {
  EXPECT_FALSE(Verified(Replaced(GenuineToken(), "alice", "malice"), "sts-rsa").result);
}

TEST(VerifyWithKey, DoesNotReadKeyInfo) {
  EXPECT_TRUE(
      Verified(Replaced(GenuineToken(), "<ds:X509Certificate>", "<ds:X509Certificate>no certificate"), "sts-rsa")
          .result);
}

TEST(VerifyWithKey, ReportsTheTargetsInTheOrderOfTheReferences) {
  const Verified verified(ReadDataFile("tokens/reference-two.xml"), "sts-rsa");
  ASSERT_TRUE(verified.result);
  const std::vector<Signature::Coverage::Target> &targets = verified.coverage.targets;
  ASSERT_EQ(SignatureOf(*verified.document)->GetReferences().size(), targets.size());
  ASSERT_EQ(2u, targets.size());
  EXPECT_EQ(&FindElement(*verified.document, "KeyInfo"), targets[0].node);
  EXPECT_FALSE(targets[0].omitsSignature);
  EXPECT_EQ(verified.document->GetDocumentElement(), targets[1].node);
  EXPECT_TRUE(targets[1].omitsSignature);
}

TEST(VerifyWithKey, ReportsTheDocumentForAnEmptyUri) {
  const Verified verified(ReadDataFile("tokens/reference-empty-uri.xml"), "sts-rsa");
  ASSERT_TRUE(verified.result);
  ASSERT_EQ(1u, verified.coverage.targets.size());
  EXPECT_EQ(verified.document->GetDocumentNode(), verified.coverage.targets[0].node);
}

TEST(VerifyWithKey, ReportsTheDigestOfTheCanonicalSignedInfo) {
  const Verified sha256(GenuineToken(), "sts-rsa");
  EXPECT_EQ(DigestOfSignedInfo(*sha256.document, HashAlgorithm::SHA256), sha256.coverage.signedInfoDigest);
  const Verified sha384(ReadDataFile("tokens/rsa-sha384.xml"), "sts-rsa");
  EXPECT_EQ(DigestOfSignedInfo(*sha384.document, HashAlgorithm::SHA384), sha384.coverage.signedInfoDigest);
}

TEST(VerifyWithKey, DoesNotChangeTheCoverageWhenTheResultIsFalse) {
  const auto document = ParseDocument(Replaced(GenuineToken(), "alice", "malice"));
  Signature::Coverage coverage;
  coverage.signedInfoDigest = {1};
  EXPECT_FALSE(SignatureOf(*document)->Verify(*KeyOf("sts-rsa"), coverage));
  EXPECT_TRUE(coverage.targets.empty());
  EXPECT_EQ(std::vector<std::uint8_t>{1}, coverage.signedInfoDigest);
}

TEST(VerifyWithKey, RefusesKeysThatTheAlgorithmCannotUse) {
  const std::string refusal =
      "The key cannot be used with the signature algorithm \"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"";
  EXPECT_THROWS_MESSAGE(Verified(GenuineToken(), "sts-ec256"), XmlSecurityException, refusal);
  EXPECT_THROWS_MESSAGE(Verified(GenuineToken(), "sts-rsa1024"), XmlSecurityException, refusal);
  EXPECT_THROWS_MESSAGE(Verified(GenuineToken(), "sts-rsa-e1"), XmlSecurityException, refusal);
}

TEST(VerifyWithKey, RefusesWhatTheProfileRefuses) {
  EXPECT_THROWS_MESSAGE(Verified(Replaced(GenuineToken(), "#" + IdOf(GenuineToken()), "#nobody"), "sts-rsa"),
                        XmlSecurityException,
                        "The reference URI \"#nobody\" is not accepted: no element has that identifier");
}

TEST(VerifyWithKey, VerifiesTheSignatureThatABlankOneHasMade) {
  const auto document = ParseDocument("<r><a Id='a'>text</a></r>");
  const Ref<Tarvel::Xml::ElementNode> root(document->GetDocumentElement());
  Ref<Signature> signature;
  Tarvel::Xml::Security::CreateBlankSignature(root, CanonicalizationUri::EXCLUSIVE,
                                              Tarvel::Xml::Security::SignatureUri::RSA_SHA256, "ds", signature);
  signature->AddReference("#a", Tarvel::Xml::Security::SignatureUri::DIGEST_SHA256, CanonicalizationUri::EXCLUSIVE);
  signature->Sign(*Tarvel::Crypto::LoadPrivateKey(DataPath("tokens/sts-rsa.key")));
  Signature::Coverage coverage;
  EXPECT_TRUE(signature->Verify(*KeyOf("sts-rsa"), coverage));
  ASSERT_EQ(1u, coverage.targets.size());
  EXPECT_EQ(&FindElement(*document, "a"), coverage.targets[0].node);
}

} // namespace
