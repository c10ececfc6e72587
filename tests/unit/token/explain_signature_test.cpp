// SPDX-License-Identifier: Apache-2.0
// The report on the signature of a token: algorithms, keys, references, value and digests.

#include "unit/token/explained_token.h"

#include "support/data_file.h"

namespace {

using namespace SsoClient;
using namespace Testing;
using Check = TokenReport::Check;
using Tarvel::Crypto::CertificateList;

constexpr const char *TAMPERED = "Failed to verify signature: token might have been tampered with.";

std::string Attack(const std::string &name) {
  return ReadDataFile("attacks/" + name + ".xml");
}

std::string ThumbprintOf(const std::string &certificate) {
  return TokenCertificates({certificate}).front()->GetSha256Thumbprint();
}

class ExplainSignatureTest : public ExplainedTokenTest {
protected:
  static TokenReport ExplainWith(const CertificateList &trusted, const std::string &xml) {
    return TokenVerifier(trusted).Explain(xml);
  }
};

TEST_F(ExplainSignatureTest, DescribesAlgorithmsReferencesAndKey) {
  const TokenReport report = Explain(TokenFixture("bearer"));
  EXPECT_EQ("http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", report.signatureAlgorithm);
  EXPECT_EQ("http://www.w3.org/2001/10/xml-exc-c14n#", report.canonicalization);
  ASSERT_EQ(1u, report.references.size());
  const TokenReport::Reference &reference = report.references.front();
  EXPECT_EQ("#_2454ad61-c2ac-c04f-0a20-fabf7f2bc96f", reference.uri);
  EXPECT_TRUE(reference.resolves);
  EXPECT_TRUE(reference.coversToken);
  EXPECT_EQ("saml:Assertion", reference.target);
  EXPECT_EQ((std::vector<std::string>{"http://www.w3.org/2000/09/xmldsig#enveloped-signature",
                                      "http://www.w3.org/2001/10/xml-exc-c14n#"}),
            reference.transforms);
  EXPECT_EQ("http://www.w3.org/2001/04/xmlenc#sha256", reference.digestMethod);
  EXPECT_EQ(44u, reference.digestWanted.size());
  EXPECT_EQ(reference.digestWanted, reference.digestComputed);
  EXPECT_TRUE(reference.digestMatches);
  ASSERT_EQ(1u, report.namedCertificates.size());
  EXPECT_TRUE(report.namedCertificates.front().isTrusted);
  EXPECT_EQ("CN=sts,O=Example", report.namedCertificates.front().subject);
}

TEST_F(ExplainSignatureTest, NamesTheKeyThatMadeTheSignature) {
  const TokenReport report = ExplainWith(TokenCertificates({"other", "sts-ec256", "sts-rsa"}), TokenFixture("bearer"));
  EXPECT_EQ("", NotPassed(report));
  ASSERT_EQ(3u, report.trustedKeys.size());
  const TokenReport::TrustedKey &signer = report.trustedKeys[2];
  EXPECT_EQ("CN=sts,O=Example", signer.subject);
  EXPECT_EQ(ThumbprintOf("sts-rsa"), signer.thumbprint);
  EXPECT_TRUE(signer.isNamed && signer.isUsable && signer.madeSignature);
  EXPECT_TRUE(report.trustedKeys[0].isUsable);
  EXPECT_FALSE(report.trustedKeys[0].isNamed || report.trustedKeys[0].madeSignature);
  EXPECT_FALSE(report.trustedKeys[1].isUsable);
  EXPECT_EQ("2 of 3 trusted keys can be used with the signature.", report.Get(Check::KEYS).summary);
  EXPECT_EQ("Signed by CN=sts,O=Example (SHA-256 " + ThumbprintOf("sts-rsa") + ").",
            report.Get(Check::SIGNATURE).summary);
}

TEST_F(ExplainSignatureTest, FindsTheSecondTrustedKeyWithoutKeyInfo) {
  const TokenReport report = ExplainWith(TokenCertificates({"other", "sts-rsa"}), SignAgain(TokenFixture("bearer")));
  EXPECT_EQ("", NotPassed(report));
  EXPECT_TRUE(report.namedCertificates.empty());
  EXPECT_FALSE(report.trustedKeys.at(0).madeSignature);
  EXPECT_TRUE(report.trustedKeys.at(1).madeSignature);
}

TEST_F(ExplainSignatureTest, AnUntrustedCertificateIsNamedButNotUsed) {
  const TokenReport report = ExplainWith(TokenCertificates({"other"}), TokenFixture("bearer"));
  const std::string stranger = "CN=sts,O=Example (SHA-256 " + ThumbprintOf("sts-rsa") + ")";
  EXPECT_EQ("signature failed", NotPassed(report));
  EXPECT_EQ(TAMPERED, report.refusal);
  EXPECT_EQ("1 of 1 trusted keys can be used with the signature; KeyInfo names a certificate that is not trusted: " +
                stranger + "; it was not used.",
            report.Get(Check::KEYS).summary);
  ASSERT_EQ(1u, report.namedCertificates.size());
  EXPECT_FALSE(report.namedCertificates.front().isTrusted);
  EXPECT_EQ(ThumbprintOf("sts-rsa"), report.namedCertificates.front().thumbprint);
  EXPECT_EQ("No trusted key made the signature.", report.Get(Check::SIGNATURE).summary);
  const TokenReport::Finding finding = OnlyFinding(report, Check::SIGNATURE);
  EXPECT_EQ("/saml:Assertion/ds:Signature/ds:SignatureValue", finding.path);
  EXPECT_EQ(
      "Give the certificate of the service that issued the token; the signature names " + stranger +
          ". Compare it with what the service's operator says before you trust it. If it is given already, the token "
          "was changed: use it exactly as the service sent it.",
      finding.remedy);
}

TEST_F(ExplainSignatureTest, AsksForTheCertificateWithoutKeyInfo) {
  const TokenReport report = ExplainWith(TokenCertificates({"other"}), SignAgain(TokenFixture("bearer")));
  EXPECT_EQ(
      "Give the certificate of the service that issued the token. If it is given already, the token was changed: use "
      "it exactly as the service sent it.",
      OnlyFinding(report, Check::SIGNATURE).remedy);
}

TEST_F(ExplainSignatureTest, ASignatureThatOnlyClaimsATrustedCertificateMayBeForged) {
  SigningChoices choices;
  choices.key = "other";
  choices.keyInfo = KeyInfoOf({"sts-rsa"});
  const TokenReport report = Explain(SignAgain(TokenFixture("bearer"), choices));
  EXPECT_EQ("signature failed", NotPassed(report));
  EXPECT_TRUE(report.trustedKeys.at(0).isNamed);
  EXPECT_FALSE(report.trustedKeys.at(0).madeSignature);
  EXPECT_EQ("Use the token exactly as the service sent it. If it is unchanged, it may be forged: it names a trusted "
            "certificate whose key did not make its signature.",
            OnlyFinding(report, Check::SIGNATURE).remedy);
}

TEST_F(ExplainSignatureTest, AsksForTheRightKeyInfoIfItSelectsAnotherTrustedKey) {
  SigningChoices choices;
  choices.key = "other";
  choices.keyInfo = KeyInfoOf({"sts-rsa"});
  const TokenReport report =
      ExplainWith(TokenCertificates({"sts-rsa", "other"}), SignAgain(TokenFixture("bearer"), choices));
  EXPECT_EQ("signature failed", NotPassed(report));
  EXPECT_TRUE(report.trustedKeys.at(1).madeSignature);
  EXPECT_EQ("Ask the service's operator to put the certificate of the key that signs into KeyInfo.",
            OnlyFinding(report, Check::SIGNATURE).remedy);
}

TEST_F(ExplainSignatureTest, AsksForTheCertificateWithoutATrustedKey) {
  const TokenReport report = ExplainWith({}, TokenFixture("bearer"));
  EXPECT_EQ("keys failed, signature not done", NotPassed(report));
  EXPECT_EQ("Signature verification error. No trusted key can be used with the signature algorithm "
            "\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"",
            report.refusal);
  EXPECT_EQ(
      "Give the certificate of the service that issued the token; the signature names CN=sts,O=Example (SHA-256 " +
          ThumbprintOf("sts-rsa") + "). Compare it with what the service's operator says before you trust it.",
      OnlyFinding(report, Check::KEYS).remedy);
  EXPECT_EQ("No key could be tried.", report.Get(Check::SIGNATURE).summary);
  EXPECT_TRUE(report.trustedKeys.empty());
}

TEST_F(ExplainSignatureTest, AKeyThatDoesNotMatchTheAlgorithmCannotBeUsed) {
  const TokenReport report = ExplainWith(TokenCertificates({"sts-ec256"}), SignAgain(TokenFixture("bearer")));
  EXPECT_EQ("keys failed, signature not done", NotPassed(report));
  EXPECT_EQ("0 of 1 trusted keys can be used with the signature.", report.Get(Check::KEYS).summary);
  EXPECT_EQ(
      "Trust a certificate whose key fits the signature's algorithm: RSA of at least 2048 bits, or P-256, P-384 or "
      "P-521 for ECDSA.",
      OnlyFinding(report, Check::KEYS).remedy);
}

TEST_F(ExplainSignatureTest, AnAlgorithmThatIsNotAcceptedLeavesNoKeyToTry) {
  const TokenReport report = Explain(Attack("method-rsa-sha1"));
  EXPECT_EQ("algorithms failed, keys not done, signature not done", NotPassed(report));
  EXPECT_EQ(
      "Signature verification error. The signature algorithm \"http://www.w3.org/2000/09/xmldsig#rsa-sha1\" is not "
      "accepted",
      report.refusal);
  EXPECT_EQ("http://www.w3.org/2000/09/xmldsig#rsa-sha1", report.signatureAlgorithm);
  const TokenReport::Finding finding = OnlyFinding(report, Check::ALGORITHMS);
  EXPECT_EQ("ds:SignatureMethod", finding.element);
  EXPECT_EQ("http://www.w3.org/2000/09/xmldsig#rsa-sha1", finding.found);
  EXPECT_EQ(
      "Ask the service's operator to sign with accepted algorithms, such as RSA with SHA-256, digests with SHA-256 "
      "and exclusive canonicalization.",
      finding.remedy);
}

TEST_F(ExplainSignatureTest, AReferenceToSeveralElementsDoesNotResolve) {
  const TokenReport report = Explain(Attack("duplicate-ID-in-keyinfo"));
  EXPECT_EQ("references failed, digests not done", NotPassed(report));
  EXPECT_EQ(
      "Signature verification error. The reference URI \"#_2454ad61-c2ac-c04f-0a20-fabf7f2bc96f\" is not accepted: "
      "several elements have that identifier",
      report.refusal);
  EXPECT_EQ("0 of 1 references resolve.", report.Get(Check::REFERENCES).summary);
  EXPECT_EQ("Not all digests could be computed.", report.Get(Check::DIGESTS).summary);
  EXPECT_EQ(
      "Ask the service's operator to sign the assertion by its ID, and use the token in a document where no other "
      "element has that ID.",
      OnlyFinding(report, Check::REFERENCES).remedy);
  EXPECT_FALSE(report.references.at(0).resolves);
  EXPECT_FALSE(report.references.at(0).coversToken);
  EXPECT_EQ("", report.references.at(0).target);
}

TEST_F(ExplainSignatureTest, AChangedTokenHasAnotherDigest) {
  const TokenReport report =
      Explain(ReplaceOnce(TokenFixture("bearer"), ">alice@corp.example<", ">mallory@corp.example<"));
  EXPECT_EQ("digests failed", NotPassed(report));
  EXPECT_EQ(TAMPERED, report.refusal);
  const TokenReport::Finding finding = OnlyFinding(report, Check::DIGESTS);
  const TokenReport::Reference &reference = report.references.at(0);
  EXPECT_EQ("/saml:Assertion/ds:Signature/ds:SignedInfo/ds:Reference/ds:DigestValue", finding.path);
  EXPECT_EQ(reference.digestWanted, finding.wanted);
  EXPECT_EQ(reference.digestComputed, finding.found);
  EXPECT_NE(reference.digestWanted, reference.digestComputed);
  EXPECT_FALSE(reference.digestMatches);
  EXPECT_EQ("0 of 1 digests match.", report.Get(Check::DIGESTS).summary);
  EXPECT_EQ("Use the token exactly as the service sent it: not even its layout may change.", finding.remedy);
}

TEST_F(ExplainSignatureTest, AReferenceToTheDocumentCoversTheToken) {
  const TokenReport report = Explain(TokenFixture("reference-empty-uri"));
  EXPECT_EQ("", NotPassed(report));
  EXPECT_EQ("", report.references.at(0).uri);
  EXPECT_TRUE(report.references.at(0).coversToken);
  EXPECT_EQ("document", report.references.at(0).target);
}

TEST_F(ExplainSignatureTest, OnlyAReferenceToTheAssertionOrTheDocumentCoversTheToken) {
  const TokenReport report = Explain(TokenFixture("reference-two"));
  EXPECT_EQ("", NotPassed(report));
  ASSERT_EQ(2u, report.references.size());
  EXPECT_EQ("#_key", report.references[0].uri);
  EXPECT_TRUE(report.references[0].resolves);
  EXPECT_FALSE(report.references[0].coversToken);
  EXPECT_EQ("ds:KeyInfo", report.references[0].target);
  EXPECT_TRUE(report.references[1].coversToken);
}

TEST_F(ExplainSignatureTest, DoesNoCheckOfAMissingSignature) {
  const TokenReport report = Explain(Attack("unsigned"));
  EXPECT_EQ(
      "form failed, algorithms not done, keys not done, references not done, signature not done, digests not done",
      NotPassed(report));
  EXPECT_EQ("There is no signature that can be read.", report.Get(Check::KEYS).summary);
  EXPECT_EQ("Ask the service's operator to sign the assertion, with the Signature element after the Issuer.",
            OnlyFinding(report, Check::FORM).remedy);
  ASSERT_EQ(1u, report.trustedKeys.size());
  EXPECT_EQ("CN=sts,O=Example", report.trustedKeys.front().subject);
  EXPECT_EQ("", report.signatureAlgorithm);
}

TEST_F(ExplainSignatureTest, ASignatureOfAnotherElementDoesNotCoverTheToken) {
  const TokenReport report = Explain(Attack("reference-other-element"));
  EXPECT_EQ("Token's signature must cover the entire token", report.refusal);
  EXPECT_EQ("Ask the service's operator to sign the whole assertion.", OnlyFinding(report, Check::FORM).remedy);
  EXPECT_FALSE(report.references.at(0).coversToken);
}

} // namespace
