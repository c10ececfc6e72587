// SPDX-License-Identifier: Apache-2.0
// Signed messages that were changed after signing, or signed with the wrong key or over the wrong elements.

#include "messages.h"

#include "compose/soap_envelope.h"
#include "compose/ws_security.h"
#include "compose/ws_trust.h"
#include "compose/xml_builder.h"
#include "model/namespaces.h"
#include "support/data_file.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

#include <utility>

namespace DevStsTest {
namespace {

constexpr const char *WRONG_SIGNATURE = "the message's signature is wrong";
constexpr const char *NOT_COVERED =
    "the signature must cover the body and the timestamp, and nothing else but headers of WS-Addressing";

class RefusedSignatures : public testing::Test {
protected:
  /// Sends the request with `from` replaced.
  HttpAnswer SendCorrupted(const std::string &from, const std::string &to) {
    return SendText(Replaced(m_request.body, from, to));
  }
  HttpAnswer SendText(const std::string &text) { return Post(m_service, m_request.soapAction, text); }

  Testing::DevSts m_service;
  const SsoClient::Request m_request = CertificateRequest(m_service);
};

TEST_F(RefusedSignatures, AcceptsTheSameMessageUnchanged) {
  EXPECT_TRUE(IsIssued(Send(m_service, m_request)));
}

/// A token's subject, and whether it may be delegated.
std::string SaidIn(const HttpAnswer &answer) {
  return Between(answer.body, "<saml:Subject>", "</saml:Subject>") +
         Between(answer.body, "<saml:ProxyRestriction ", ">");
}

TEST_F(RefusedSignatures, MessageWithOneBitChangedIsRefusedOrGetsWhatWasSigned) {
  constexpr std::size_t STEP = 3; // every octet would take too long
  const std::string signedSaying = SaidIn(Send(m_service, m_request));
  TlsClient client(m_service);
  std::size_t refusals = 0;
  for (std::size_t at = 0; at < m_request.body.size(); at += STEP) {
    std::string text = m_request.body;
    text[at] = static_cast<char>(text[at] ^ 1);
    client.Send(PostBytes(m_request.soapAction, text));
    const HttpAnswer answer = client.Receive();
    if (answer.status == 500) {
      ++refusals;
      continue;
    }
    ASSERT_TRUE(IsIssued(answer)) << at;
    EXPECT_EQ(SaidIn(answer), signedSaying) << at;
  }
  // The other changes are in text without meaning, such as the declaration of `wst` on the body, which the body's
  // content repeats.
  EXPECT_GT(refusals, m_request.body.size() / STEP * 95 / 100);
}

TEST_F(RefusedSignatures, SignatureValueOfAnotherMessage) {
  const std::string other = Between(CertificateRequest(m_service).body, "<ds:SignatureValue>", "<");
  const std::string own = Between(m_request.body, "<ds:SignatureValue>", "<");
  ASSERT_NE(own, other);
  EXPECT_TRUE(IsRefused(SendCorrupted(own, other), "wsse:FailedCheck", WRONG_SIGNATURE));
}

TEST_F(RefusedSignatures, EmptySignatureValue) {
  EXPECT_TRUE(IsRefused(SendCorrupted(Between(m_request.body, "<ds:SignatureValue>", "<"), ""), "wsse:FailedCheck",
                        WRONG_SIGNATURE));
}

TEST_F(RefusedSignatures, MissingSignatureDespiteACertificate) {
  EXPECT_TRUE(IsRefused(SendText(Without(m_request.body, "<ds:Signature ", "</ds:Signature>")), "wsse:InvalidSecurity",
                        "the message presents a token or certificate and is not signed"));
}

TEST_F(RefusedSignatures, MissingSignatureAndCertificate) {
  const std::string unsignedText = Without(m_request.body, "<ds:Signature ", "</ds:Signature>");
  EXPECT_TRUE(IsRefused(SendText(Without(unsignedText, "<wsse:BinarySecurityToken ", "</wsse:BinarySecurityToken>")),
                        "wst:FailedAuthentication", "the message does not say who sent it"));
}

TEST_F(RefusedSignatures, BodyChangedAfterSigning) {
  EXPECT_TRUE(
      IsRefused(SendCorrupted("<wst:Delegatable>false", "<wst:Delegatable>true"), "wsse:FailedCheck", WRONG_SIGNATURE));
}

TEST_F(RefusedSignatures, BodySwappedForThatOfAnotherSignedMessage) {
  const std::string other = CertificateRequest(m_service, RenewableSpec()).body;
  EXPECT_TRUE(IsRefused(SendCorrupted(Between(m_request.body, "<wst:RequestSecurityToken ", "</soapenv:Body>"),
                                      Between(other, "<wst:RequestSecurityToken ", "</soapenv:Body>")),
                        "wsse:FailedCheck", WRONG_SIGNATURE));
}

// The signed body is still in the message, and still verifies, but it is not the body that the service reads.
TEST_F(RefusedSignatures, SignedBodyReplacedAndKeptElsewhere) {
  const std::string signedBody = "<soapenv:Body " + Between(m_request.body, "<soapenv:Body ", "</soapenv:Body>");
  const std::string content = Between(m_request.body, "<wst:RequestSecurityToken ", "</wst:RequestSecurityToken>");
  const std::string forged = "<soapenv:Body><wst:RequestSecurityToken " +
                             Replaced(content, "<wst:Delegatable>false", "<wst:Delegatable>true") + signedBody +
                             "</soapenv:Body></wst:RequestSecurityToken>";
  EXPECT_TRUE(IsRefused(SendCorrupted(signedBody, forged), "wsse:InvalidSecurity", NOT_COVERED));
}

TEST_F(RefusedSignatures, SecondBodyNextToTheSignedOne) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<soapenv:Body ", "<soapenv:Body/><soapenv:Body "), "soapenv:Client",
                        "an envelope must contain one header and one body"));
}

TEST_F(RefusedSignatures, TimestampChangedAfterSigning) {
  const std::string expires = Between(m_request.body, "<wsu:Expires>", "<");
  const std::string later = Replaced(expires, "Z", "0Z");
  EXPECT_TRUE(IsRefused(SendCorrupted(expires, later), "wsse:FailedCheck", WRONG_SIGNATURE));
}

TEST_F(RefusedSignatures, SignedTimestampReplacedAndKeptElsewhere) {
  const std::string timestamp =
      "<wsu:Timestamp " + Between(m_request.body, "<wsu:Timestamp ", "</wsu:Timestamp>") + "</wsu:Timestamp>";
  const std::string created =
      "<wsu:Created>" + Between(timestamp, "<wsu:Created>", "</wsu:Expires>") + "</wsu:Expires>";
  const std::string forged = std::string("<wsu:Timestamp xmlns:wsu=\"") + std::string(SsoClient::Namespaces::WSU) +
                             "\">" + created + timestamp + "</wsu:Timestamp>";
  EXPECT_TRUE(IsRefused(SendCorrupted(timestamp, forged), "wsse:InvalidSecurity", NOT_COVERED));
}

TEST_F(RefusedSignatures, TimestampThatIsNotSigned) {
  const SsoClient::HolderOfKeyConfig identity = IdentityOf(m_service, "client");
  const auto header = std::make_shared<SsoClient::XMLCompositeBuilder>(
      SsoClient::ElementBuilder("wsse", "Security", {{"xmlns:wsse", std::string(SsoClient::Namespaces::WSSE)}}));
  const std::string message = SsoClient::SerializeToXML(SsoClient::CertRefSignedSoapBuilder(
      header, SsoClient::AcquireSecurityTokenBuilder(SsoClient::SamlToken::HOLDER_OF_KEY, PlainSpec()),
      identity.privateKey.get(), identity.certificate.get()));
  const std::string timestamp =
      "<wsu:Timestamp " + Between(PasswordRequest().body, "<wsu:Timestamp ", "</wsu:Timestamp>") + "</wsu:Timestamp>";
  EXPECT_TRUE(
      IsRefused(SendText(Replaced(message, "<wsse:BinarySecurityToken ", timestamp + "<wsse:BinarySecurityToken ")),
                "wsse:InvalidSecurity", NOT_COVERED));
}

TEST_F(RefusedSignatures, IdentifierThatOccursTwice) {
  const std::string id = Between(m_request.body, "<soapenv:Body xmlns:wst=", " wsu:Id=\"");
  const std::string bodyId = Between(m_request.body, id + " wsu:Id=\"", "\"");
  EXPECT_TRUE(IsRefused(SendCorrupted("<wst:TokenType>", "<wst:TokenType Id=\"" + bodyId + "\">"),
                        "wsse:InvalidSecurity", "the identifier '" + bodyId + "' occurs twice"));
}

TEST_F(RefusedSignatures, ElementWithTwoIdentifiers) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<soapenv:Body ", "<soapenv:Body Id=\"second\" "), "wsse:InvalidSecurity",
                        "one element has several identifiers"));
}

TEST_F(RefusedSignatures, XmlIdCountsAsIdentifier) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<wst:TokenType>", "<wst:TokenType xml:id=\"holderOfKeyCertificate\">"),
                        "wsse:InvalidSecurity", "the identifier 'holderOfKeyCertificate' occurs twice"));
}

TEST_F(RefusedSignatures, KeyOfAnotherCertificate) {
  SsoClient::HolderOfKeyConfig identity = IdentityOf(m_service, "client");
  identity.privateKey = IdentityOf(m_service, "other-client").privateKey;
  SsoClient::Request request;
  SsoClient::RequestBuilderImpl(identity).BuildCertificateTokenRequest(PlainSpec(), request);
  EXPECT_TRUE(IsRefused(Send(m_service, request), "wsse:FailedCheck", WRONG_SIGNATURE));
}

TEST_F(RefusedSignatures, CertificateOfAnotherAuthority) {
  EXPECT_TRUE(IsRefused(Send(m_service, CertificateRequest(m_service, PlainSpec(), "foreign")),
                        "wst:FailedAuthentication",
                        "the certificate is not a client certificate of the service's authority"));
}

TEST_F(RefusedSignatures, CertificateOfTheAuthorityThatIsNotForClients) {
  for (const char *name : {"signing", "tls", "authority"}) {
    EXPECT_TRUE(IsRefused(Send(m_service, CertificateRequest(m_service, PlainSpec(), name)), "wst:FailedAuthentication",
                          "the certificate is not a client certificate of the service's authority"))
        << name;
  }
}

TEST_F(RefusedSignatures, KeyOf1024Bits) {
  const SsoClient::HolderOfKeyConfig weak{
      Tarvel::Crypto::CreatePrivateKey(Testing::ReadDataFile("tokens/sts-rsa1024.key")),
      Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile("tokens/sts-rsa1024.crt"))};
  SsoClient::Request request;
  SsoClient::RequestBuilderImpl(weak).BuildCertificateTokenRequest(PlainSpec(), request);
  EXPECT_TRUE(IsRefused(Send(m_service, request), "wsse:InvalidSecurityToken",
                        "the signer's certificate must have an RSA key of at least 2048 bits"));
}

TEST_F(RefusedSignatures, KeyReferenceToAnElementThatIsNotACertificate) {
  EXPECT_TRUE(IsRefused(SendCorrupted("URI=\"#holderOfKeyCertificate\"", "URI=\"#holderOfKeyProofSignature\""),
                        "wsse:SecurityTokenUnavailable",
                        "the signature's key reference does not refer to a binary security token"));
}

TEST_F(RefusedSignatures, ReferenceToAnotherDocument) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<ds:Reference URI=\"#", "<ds:Reference URI=\"https://localhost/#"),
                        "wsse:InvalidSecurity", "a signature may refer only to elements of the message"));
}

TEST_F(RefusedSignatures, ReferenceThatIsAnXPointer) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<ds:Reference URI=\"#", "<ds:Reference URI=\"#xpointer(/)"),
                        "wsse:InvalidSecurity", "a signature may refer only to elements of the message"));
}

TEST_F(RefusedSignatures, ReferenceToAMissingElement) {
  EXPECT_TRUE(IsRefused(SendCorrupted("<ds:Reference URI=\"#", "<ds:Reference URI=\"#no"), "wsse:InvalidSecurity",
                        "the signature refers to an element that does not exist"));
}

struct Algorithm {
  const char *name;
  const char *from;
  const char *to;
  const char *refused; ///< the algorithm in the refusal
};

void PrintTo(const Algorithm &algorithm, std::ostream *out) {
  *out << algorithm.name;
}

class RefusedAlgorithms : public RefusedSignatures, public testing::WithParamInterface<Algorithm> {};

constexpr Algorithm ALGORITHMS[] = {
    {"Sha1Digest", "http://www.w3.org/2001/04/xmlenc#sha256", "http://www.w3.org/2000/09/xmldsig#sha1",
     "http://www.w3.org/2000/09/xmldsig#sha1"},
    {"RsaSha1", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "http://www.w3.org/2000/09/xmldsig#rsa-sha1",
     "http://www.w3.org/2000/09/xmldsig#rsa-sha1"},
    {"Hmac", "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "http://www.w3.org/2001/04/xmldsig-more#hmac-sha256",
     "http://www.w3.org/2001/04/xmldsig-more#hmac-sha256"},
    {"InclusiveCanonicalisation", "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"",
     "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/TR/2001/REC-xml-c14n-20010315\"",
     "http://www.w3.org/TR/2001/REC-xml-c14n-20010315"},
    {"XsltTransform", "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"",
     "<ds:Transform Algorithm=\"http://www.w3.org/TR/1999/REC-xslt-19991116\"",
     "http://www.w3.org/TR/1999/REC-xslt-19991116"},
    {"XPathTransform", "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"",
     "<ds:Transform Algorithm=\"http://www.w3.org/TR/1999/REC-xpath-19991116\"",
     "http://www.w3.org/TR/1999/REC-xpath-19991116"},
    {"TransformWithParameters", "</ds:Transform>",
     "<c:InclusiveNamespaces xmlns:c=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList=\"wst\"/></ds:Transform>",
     "http://www.w3.org/2001/10/xml-exc-c14n#"},
};

TEST_P(RefusedAlgorithms, AreNamed) {
  EXPECT_TRUE(IsRefused(SendCorrupted(GetParam().from, GetParam().to), "wsse:UnsupportedAlgorithm",
                        std::string("unsupported algorithm or parameters: '") + GetParam().refused + "'"));
}

INSTANTIATE_TEST_SUITE_P(Each, RefusedAlgorithms, testing::ValuesIn(ALGORITHMS),
                         [](const auto &instance) { return std::string(instance.param.name); });

TEST_F(RefusedSignatures, SecondTransform) {
  EXPECT_TRUE(IsRefused(SendCorrupted("</ds:Transforms>",
                                      "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
                                      "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
                                      "</ds:Transforms>"),
                        "wsse:UnsupportedAlgorithm", "unsupported number of transforms"));
}

TEST_F(RefusedSignatures, EnvelopedTransform) {
  EXPECT_TRUE(IsRefused(
      SendCorrupted(
          "<ds:Transforms>",
          "<ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/>"),
      "wsse:InvalidSecurity", "the signature refers to an element that does not exist"));
}

TEST_F(RefusedSignatures, ManifestInTheSignature) {
  EXPECT_TRUE(IsRefused(SendCorrupted("</ds:KeyInfo>", "</ds:KeyInfo><ds:Object><ds:Manifest/></ds:Object>"),
                        "wsse:InvalidSecurity", "unexpected content of ds:Signature"));
}

TEST_F(RefusedSignatures, SecondSignature) {
  const std::string signature =
      "<ds:Signature " + Between(m_request.body, "<ds:Signature ", "</ds:Signature>") + "</ds:Signature>";
  const std::string second = Replaced(signature, "holderOfKeyProofSignature", "second");
  EXPECT_TRUE(IsRefused(SendCorrupted(signature, signature + second), "wsse:InvalidSecurity",
                        "several Signature in the security header"));
}

} // namespace
} // namespace DevStsTest
