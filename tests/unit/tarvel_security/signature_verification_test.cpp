// SPDX-License-Identifier: Apache-2.0

#include "documents.h"
#include "genuine_token.h"
#include "support/data_file.h"
#include "support/throws_message.h"

#include <tarvel/core/exception.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <ostream>
#include <string>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Tarvel::Xml::Security::CreateTrustSetKeyResolver;
using Tarvel::Xml::Security::XmlSecurityException;
using Testing::GenuineToken;
using Testing::IdOf;
using Testing::ParseDocument;
using Testing::ReadDataFile;
using Testing::Refusal;
using Testing::RefusalOf;
using Testing::Replaced;
using Testing::SignatureOf;
using Testing::Trusted;
using Testing::VerifyText;

struct SignedFixture {
  const char *name;
  const char *certificate;
};

void PrintTo(const SignedFixture &fixture, std::ostream *out) {
  *out << fixture.name;
}

// Signed by xmlsec1, those with RSA-PSS by openssl.
constexpr SignedFixture SIGNED_FIXTURES[] = {
    {"rsa-sha256", "sts-rsa"},
    {"rsa-sha384", "sts-rsa"},
    {"rsa-sha512", "sts-rsa"},
    {"rsa-pss-sha256", "sts-rsa"},
    {"rsa-pss-sha384", "sts-rsa"},
    {"rsa-pss-sha512", "sts-rsa"},
    {"rsa3072", "sts-rsa3072"},
    {"ecdsa-p256-sha256", "sts-ec256"},
    {"ecdsa-p256-sha384", "sts-ec256"},
    {"ecdsa-p256-sha512", "sts-ec256"},
    {"ecdsa-p384-sha256", "sts-ec384"},
    {"ecdsa-p384-sha384", "sts-ec384"},
    {"ecdsa-p384-sha512", "sts-ec384"},
    {"ecdsa-p521-sha256", "sts-ec521"},
    {"ecdsa-p521-sha384", "sts-ec521"},
    {"ecdsa-p521-sha512", "sts-ec521"},
    {"c14n-exclusive-with-comments", "sts-rsa"},
    {"c14n-inclusive", "sts-rsa"},
    {"c14n-inclusive-with-comments", "sts-rsa"},
    {"c14n-inclusive-prefixes", "sts-rsa"},
    {"c14n-mixed", "sts-rsa"},
    {"reference-empty-uri", "sts-rsa"},
    {"reference-two", "sts-rsa"},
};

class VerifyTest : public ::testing::TestWithParam<SignedFixture> {
protected:
  std::string Text() const { return ReadDataFile(std::string("tokens/") + GetParam().name + ".xml"); }
};

TEST_P(VerifyTest, AcceptsSignaturesOfOtherImplementations) {
  EXPECT_TRUE(VerifyText(Text(), {GetParam().certificate}));
}

TEST_P(VerifyTest, AnswersFalseWhenContentWasChanged) {
  EXPECT_FALSE(VerifyText(Replaced(Text(), "alice", "malice"), {GetParam().certificate}));
}

TEST_P(VerifyTest, AnswersFalseWhenTheSignatureValueWasChanged) {
  std::string text = Text();
  const std::size_t value = text.find("SignatureValue>") + 20;
  text[value] = text[value] == 'A' ? 'B' : 'A';
  EXPECT_FALSE(VerifyText(text, {GetParam().certificate}));
}

TEST_P(VerifyTest, FindsTheKeyAmongAllTrustedOnes) {
  EXPECT_TRUE(
      VerifyText(Text(), {"other", "sts-rsa-2", "sts-ec521", "sts-ec384", "sts-ec256", "sts-rsa3072", "sts-rsa"}));
}

INSTANTIATE_TEST_SUITE_P(Verify, VerifyTest, ::testing::ValuesIn(SIGNED_FIXTURES), [](const auto &fixture) {
  std::string name = fixture.param.name;
  std::replace(name.begin(), name.end(), '-', '_');
  return name;
});

TEST(Verify, RefusesRsaKeysWithoutASoundExponent) {
  const std::string text = ReadDataFile("tokens/rsa-sha256.xml");
  const std::size_t begin = text.find("<ds:SignatureValue>") + 19;
  const std::string genuine = text.substr(begin, text.find('<', begin) - begin);
  const std::string forged = Replaced(text, genuine, ReadDataFile("tokens/sts-rsa-e1.forged-value"));
  const std::string refusal = "No trusted key can be used with the signature algorithm "
                              "\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"";
  for (const char *const certificate : {"sts-rsa-e1", "sts-rsa-e2"}) {
    EXPECT_THROWS_MESSAGE(VerifyText(forged, {certificate}), XmlSecurityException, refusal) << certificate;
  }
  EXPECT_FALSE(VerifyText(forged, {"sts-rsa-e3"}));
  EXPECT_FALSE(VerifyText(forged, {"sts-rsa-e1", "sts-rsa"}));
}

TEST(Verify, AddsTheSignedUrisWhenTheResultIsTrue) {
  const auto resolver = CreateTrustSetKeyResolver(Trusted({"sts-rsa"}));
  std::set<std::string> uris{"before"};
  EXPECT_TRUE(SignatureOf(*ParseDocument(GenuineToken()))->Verify(*resolver, uris));
  EXPECT_EQ((std::set<std::string>{"before", "#" + IdOf(GenuineToken())}), uris);
}

TEST(Verify, DoesNotChangeTheUrisWhenTheResultIsFalse) {
  const auto resolver = CreateTrustSetKeyResolver(Trusted({"sts-rsa"}));
  std::set<std::string> uris;
  EXPECT_FALSE(SignatureOf(*ParseDocument(Replaced(GenuineToken(), "alice", "malice")))->Verify(*resolver, uris));
  EXPECT_TRUE(uris.empty());
}

TEST(Verify, ReturnsTheSameResultEachTime) {
  const auto signature = SignatureOf(*ParseDocument(GenuineToken()));
  const auto resolver = CreateTrustSetKeyResolver(Trusted({"sts-rsa"}));
  std::set<std::string> uris;
  EXPECT_TRUE(signature->Verify(*resolver, uris));
  EXPECT_TRUE(signature->Verify(*resolver, uris));
}

TEST(Verify, AnswersFalseWhenNoTrustedKeyMadeTheSignature) {
  EXPECT_FALSE(VerifyText(GenuineToken(), {"other", "sts-rsa-2"}));
  EXPECT_FALSE(VerifyText(ReadDataFile("tokens/signed-by-other.xml")));
}

TEST(Verify, AcceptsAnotherCertificateOfATrustedKeyAndOneThatHasExpired) {
  EXPECT_TRUE(VerifyText(GenuineToken(), {"sts-rsa-reissued"}));
  EXPECT_TRUE(VerifyText(GenuineToken(), {"sts-rsa-expired"}));
}

TEST(Verify, RefusesWhenNoTrustedKeyMatchesTheAlgorithm) {
  const std::string refusal = "No trusted key can be used with the signature algorithm \"";
  EXPECT_THROWS_MESSAGE(VerifyText(GenuineToken(), {}), XmlSecurityException,
                        refusal + std::string(Uri::RSA_SHA256) + "\"");
  EXPECT_THROWS_MESSAGE(VerifyText(GenuineToken(), {"sts-ec256"}), XmlSecurityException,
                        refusal + std::string(Uri::RSA_SHA256) + "\"");
  EXPECT_THROWS_MESSAGE(VerifyText(ReadDataFile("tokens/ecdsa-p256-sha256.xml"), {"sts-rsa"}), XmlSecurityException,
                        refusal + std::string(Uri::ECDSA_SHA256) + "\"");
}

TEST(Verify, RefusesAnRsaKeyOfLessThan2048Bits) {
  EXPECT_THROWS_MESSAGE(VerifyText(ReadDataFile("tokens/rsa1024.xml"), {"sts-rsa1024"}), XmlSecurityException,
                        "No trusted key can be used with the signature algorithm \"" + std::string(Uri::RSA_SHA256) +
                            "\"");
}

struct UriRefusal {
  const char *uri;
  const char *why;
};

TEST(Verify, RefusesEachReferenceUriThatIsNeitherEmptyNorABareName) {
  constexpr UriRefusal REFUSALS[] = {
      {"#", "it names nothing"},
      {"#xpointer(/)", "it is an XPointer"},
      {"#xpointer(id('a'))", "it is an XPointer"},
      {"http://example.com/", "it points outside the document"},
      {"file:///etc/passwd", "it points outside the document"},
      {"other.xml#a", "it points outside the document"},
      {" ", "it points outside the document"},
      {"#nobody", "no element has that identifier"},
  };
  const std::string uri = "#" + IdOf(GenuineToken());
  for (const UriRefusal &refusal : REFUSALS) {
    EXPECT_EQ(std::string("The reference URI \"") + refusal.uri + "\" is not accepted: " + refusal.why,
              Refusal(uri, refusal.uri));
  }
}

TEST(Verify, RefusesAnIdentifierThatTwoElementsHaveWhateverTheAttribute) {
  const std::string id = IdOf(GenuineToken());
  const std::string refusal =
      "The reference URI \"#" + id + "\" is not accepted: several elements have that identifier";
  const std::string wsu =
      "xmlns:u='http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd' u:Id";
  for (const std::string &name : {std::string("ID"), std::string("Id"), std::string("xml:id"), wsu}) {
    const std::string duplicate = "<x " + name + "='" + id + "'/>";
    EXPECT_EQ(refusal, Refusal("</saml:Assertion>", duplicate + "</saml:Assertion>")) << name;
    EXPECT_EQ(refusal, Refusal("</ds:X509Data>", "</ds:X509Data>" + duplicate)) << name;
  }
}

TEST(Verify, TreatsNoOtherAttributeAsAnIdentifier) {
  const std::string id = IdOf(GenuineToken());
  for (const std::string name : {"id", "iD", "xmlns:u='urn:u' u:Id", "xmlns:u='urn:u' u:ID", "AssertionID"}) {
    EXPECT_EQ("accepted", Refusal("</ds:X509Data>", "</ds:X509Data><x " + name + "='" + id + "'/>")) << name;
  }
}

TEST(Verify, FindsAnElementByEachKindOfIdentifier) {
  for (const std::string name :
       {"Id", "xml:id",
        "xmlns:u=\"http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd\" u:Id"}) {
    EXPECT_EQ("wrong", Refusal(" ID=", " " + name + "=")) << name; // found, but not what was signed
  }
}

TEST(Verify, RefusesAnEnvelopedTransformWhoseReferenceDoesNotEnvelopTheSignature) {
  const std::string uri = "#" + IdOf(GenuineToken());
  std::string text = Replaced(GenuineToken(), uri, "#elsewhere");
  text = Replaced(text, "<saml:Subject>", "<saml:Subject ID=\"elsewhere\">");
  EXPECT_EQ(
      "The reference URI \"#elsewhere\" has the enveloped-signature transform, but does not envelop the signature",
      RefusalOf(text));
}

TEST(Verify, RefusesAnEnvelopedTransformOfTheSignatureItself) {
  const std::string uri = "#" + IdOf(GenuineToken());
  std::string text = Replaced(GenuineToken(), uri, "#signature");
  text = Replaced(text, "<ds:Signature ", "<ds:Signature Id=\"signature\" ");
  EXPECT_EQ(
      "The reference URI \"#signature\" has the enveloped-signature transform, but does not envelop the signature",
      RefusalOf(text));
}

TEST(Verify, RefusesASignatureThatRemovesAllThatItCovers) {
  std::string text = ReadDataFile("tokens/reference-empty-uri.xml");
  const std::size_t begin = text.find("<ds:Signature ");
  text = text.substr(begin, text.find("</ds:Signature>") + 15 - begin);
  const std::string refusal = "The reference URI \"\" covers nothing but the signature, which the enveloped-signature "
                              "transform removes";
  EXPECT_EQ(refusal, RefusalOf(text));
  EXPECT_EQ(refusal, RefusalOf("<?target data?>" + text + "<!-- after -->"));
  EXPECT_EQ("wrong", RefusalOf("<r>" + text + "</r>"));
}

TEST(Verify, RefusesATreeWithoutACanonicalForm) {
  EXPECT_EQ(0u, Refusal("<saml:Subject>", "<saml:Subject><foo:bar/>").find("No canonical form: "));
}

// The changed digests are signed too: otherwise the signature value would be wrong, and no digest would be compared.

/// The result for the token whose digest was changed in that way.
std::string VerifyResigned(const std::string &change) {
  return RefusalOf(ReadDataFile("attacks/digest-resigned-" + change + ".xml"));
}

TEST(Verify, AcceptsAResignedTokenWhoseDigestIsUnchanged) {
  EXPECT_EQ("accepted", VerifyResigned("unchanged"));
}

TEST(Verify, AnswersFalseForASignedDigestThatIsTooShort) {
  EXPECT_EQ("wrong", VerifyResigned("one-octet"));
  EXPECT_EQ("wrong", VerifyResigned("31-octets"));
}

TEST(Verify, AnswersFalseForASignedDigestThatIsTooLong) {
  EXPECT_EQ("wrong", VerifyResigned("one-octet-more"));
  EXPECT_EQ("wrong", VerifyResigned("32-zeros-more"));
}

TEST(Verify, AnswersFalseForASignedDigestWithOneWrongBit) {
  EXPECT_EQ("wrong", VerifyResigned("first-bit"));
  EXPECT_EQ("wrong", VerifyResigned("last-bit"));
}

TEST(Verify, DoesNotCoverComments) {
  EXPECT_EQ("accepted", Refusal("<saml:Subject>", "<!-- not signed --><saml:Subject>"));
  std::string text = ReadDataFile("tokens/c14n-exclusive-with-comments.xml");
  EXPECT_EQ("accepted", RefusalOf(Replaced(text, "<saml:Subject>", "<!-- not signed --><saml:Subject>")));
}

TEST(Verify, TreatsCDataAsText) {
  EXPECT_EQ("accepted", Refusal("alice@corp.example", "al<![CDATA[ice@corp]]>.example"));
}

TEST(Verify, RemovesThisSignatureAndNoOther) {
  const std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:Signature ");
  const std::string signature = text.substr(begin, text.find("</ds:Signature>") + 15 - begin);
  EXPECT_EQ("wrong", Refusal("</saml:Assertion>", signature + "</saml:Assertion>"));
}

/// A resolver whose keys cannot be read.
class BrokenResolver final : public Tarvel::Xml::Security::KeyInfoResolver {
public:
  CertificateList Resolve(const Tarvel::Xml::ElementNode *) const override {
    throw Tarvel::Crypto::CryptoException("the key cannot be read");
  }
};

TEST(Verify, ThrowsXmlSecurityExceptionForAFailureOfCryptography) {
  std::set<std::string> uris;
  EXPECT_THROWS_MESSAGE(SignatureOf(*ParseDocument(GenuineToken()))->Verify(BrokenResolver(), uris),
                        XmlSecurityException, "the key cannot be read");
  EXPECT_TRUE(uris.empty());
}

/// A host's own resolver, which returns the given candidates.
class PlainResolver final : public Tarvel::Xml::Security::KeyInfoResolver {
public:
  explicit PlainResolver(CertificateList candidates) : m_candidates(std::move(candidates)) {}
  CertificateList Resolve(const Tarvel::Xml::ElementNode *) const override { return m_candidates; }

private:
  const CertificateList m_candidates;
};

TEST(Verify, IgnoresNullCandidates) {
  Tarvel::Crypto::CertificateList candidates = Trusted({"sts-rsa"});
  candidates.insert(candidates.begin(), nullptr);
  candidates.push_back(nullptr);
  std::set<std::string> uris;
  EXPECT_TRUE(SignatureOf(*ParseDocument(GenuineToken()))->Verify(PlainResolver(candidates), uris));
}

TEST(Verify, KeepsTheTreeAliveAfterTheDocumentIsGone) {
  Tarvel::Ref<Tarvel::Xml::Security::Signature> signature;
  {
    const auto document = ParseDocument(GenuineToken());
    signature = SignatureOf(*document);
  }
  std::set<std::string> uris;
  EXPECT_TRUE(signature->Verify(*CreateTrustSetKeyResolver(Trusted({"sts-rsa"})), uris));
}

TEST(ParsedSignature, CanOnlyBeVerified) {
  const auto signature = SignatureOf(*ParseDocument(GenuineToken()));
  const std::string refusal = "A signature that was taken from a document can only be verified";
  EXPECT_THROWS_MESSAGE(signature->AddReference("", "", ""), Tarvel::InvalidStateException, refusal);
  EXPECT_THROWS_MESSAGE(signature->SetKeyInfo({}), Tarvel::InvalidStateException, refusal);
  EXPECT_THROWS_MESSAGE(signature->GetElement(), Tarvel::InvalidStateException, refusal);
}

} // namespace
