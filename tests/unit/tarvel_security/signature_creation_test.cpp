// SPDX-License-Identifier: Apache-2.0

#include "documents.h"
#include "support/data_file.h"
#include "support/throws_message.h"

#include <tarvel/core/exception.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Tarvel::Ref;
using Tarvel::Crypto::PrivateKey;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::CreateBlankSignature;
using Tarvel::Xml::Security::CreateTrustSetKeyResolver;
using Tarvel::Xml::Security::Signature;
using Tarvel::Xml::Security::XmlSecurityException;
using Testing::ParseDocument;
using Testing::Replaced;
using Testing::Trusted;
using Testing::VerifyText;

constexpr std::string_view EXCLUSIVE = Tarvel::Xml::Security::CanonicalizationUri::EXCLUSIVE;
constexpr std::string_view MESSAGE = "<e:Envelope xmlns:e='urn:e'><e:Header ID='h'>one</e:Header>"
                                     "<e:Body ID='b' xmlns:x='urn:x'><x:y>two</x:y></e:Body></e:Envelope>";

Ref<const PrivateKey> Key(const std::string &name) {
  return Tarvel::Crypto::CreatePrivateKey(Testing::ReadDataFile("tokens/" + name + ".key"));
}

Ref<Signature> BlankSignatureOf(Document &document, std::string_view algorithm = Uri::RSA_SHA256,
                                std::string_view prefix = "ds") {
  Ref<Signature> signature;
  CreateBlankSignature(Ref<ElementNode>(document.GetDocumentElement()), EXCLUSIVE, algorithm, prefix, signature);
  return signature;
}

std::string Serialise(const Document &document) {
  const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  document.GetDocumentElement()->WriteTo(*writer);
  return writer->GetText();
}

/// The message with a signature over header and body, as text.
std::string SignedMessage(std::string_view algorithm, std::string_view digest, std::string_view prefix = "ds") {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document, algorithm, prefix);
  signature->AddReference("#b", digest, EXCLUSIVE);
  signature->AddReference("#h", digest, EXCLUSIVE);
  signature->Sign(*Key("sts-rsa"));
  document->GetDocumentElement()->AppendChild(signature->GetElement().get());
  return Serialise(*document);
}

TEST(Sign, MakesASignatureThatVerifiesAfterWritingAndParsing) {
  for (const std::string_view algorithm : {Uri::RSA_SHA256, Uri::RSA_SHA384, Uri::RSA_SHA512}) {
    for (const std::string_view digest : {Uri::DIGEST_SHA256, Uri::DIGEST_SHA384, Uri::DIGEST_SHA512}) {
      const std::string text = SignedMessage(algorithm, digest);
      EXPECT_TRUE(VerifyText(text)) << text;
      EXPECT_FALSE(VerifyText(Replaced(text, "one", "One")));
      EXPECT_FALSE(VerifyText(Replaced(text, "two", "Two")));
    }
  }
}

TEST(Sign, MakesEcdsaSignaturesOnEachCurve) {
  for (const std::string key : {"sts-ec256", "sts-ec384", "sts-ec521"}) {
    for (const std::string_view algorithm : {Uri::ECDSA_SHA256, Uri::ECDSA_SHA384, Uri::ECDSA_SHA512}) {
      const Ref<Document> document = ParseDocument(MESSAGE);
      const Ref<Signature> signature = BlankSignatureOf(*document, algorithm);
      signature->AddReference("#b", Uri::DIGEST_SHA256, EXCLUSIVE);
      signature->Sign(*Key(key));
      document->GetDocumentElement()->AppendChild(signature->GetElement().get());
      EXPECT_TRUE(VerifyText(Serialise(*document), {key})) << key << " " << algorithm;
      EXPECT_FALSE(VerifyText(Replaced(Serialise(*document), "two", "Two"), {key}));
    }
  }
}

TEST(Sign, WorksWithAnyPrefixAndWithoutOne) {
  EXPECT_TRUE(VerifyText(SignedMessage(Uri::RSA_SHA256, Uri::DIGEST_SHA256, "")));
  EXPECT_TRUE(VerifyText(SignedMessage(Uri::RSA_SHA256, Uri::DIGEST_SHA256, "e")));
}

TEST(Sign, WritesTheElementsInTheirOrderWithoutWhiteSpace) {
  const std::string text = SignedMessage(Uri::RSA_SHA256, Uri::DIGEST_SHA256);
  const std::string begin =
      "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:SignedInfo><ds:CanonicalizationMethod "
      "Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"></ds:CanonicalizationMethod><ds:SignatureMethod "
      "Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"></ds:SignatureMethod><ds:Reference "
      "URI=\"#b\"><ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"></ds:Transform>"
      "</ds:Transforms><ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"></ds:DigestMethod>"
      "<ds:DigestValue>";
  EXPECT_EQ(begin, text.substr(text.find("<ds:Signature "), begin.size()));
  EXPECT_NE(std::string::npos, text.find("</ds:SignedInfo><ds:SignatureValue>"));
}

TEST(Sign, PutsTheKeyInfoAfterTheSignatureValue) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document);
  signature->AddReference("#b", Uri::DIGEST_SHA256, EXCLUSIVE);
  Ref<ElementNode> content;
  Tarvel::Xml::CreateElementNode("", "pointer", content);
  signature->SetKeyInfo(content);
  signature->Sign(*Key("sts-rsa"));
  document->GetDocumentElement()->AppendChild(signature->GetElement().get());
  const std::string text = Serialise(*document);
  EXPECT_NE(std::string::npos,
            text.find("</ds:SignatureValue><ds:KeyInfo><pointer></pointer></ds:KeyInfo></ds:Signature>"));
  EXPECT_TRUE(VerifyText(text));
}

TEST(Sign, MakesASignatureThatVerifiesInPlace) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document);
  signature->AddReference("#b", Uri::DIGEST_SHA256, EXCLUSIVE);
  signature->Sign(*Key("sts-rsa"));
  document->GetDocumentElement()->AppendChild(signature->GetElement().get());
  std::set<std::string> uris;
  EXPECT_TRUE(signature->Verify(*CreateTrustSetKeyResolver(Trusted({"sts-rsa"})), uris));
  EXPECT_EQ(std::set<std::string>{"#b"}, uris);
}

TEST(Explain, ShowsTheKeyThatMadeASignatureInPlace) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document);
  signature->AddReference("#b", Uri::DIGEST_SHA256, EXCLUSIVE);
  const auto resolver = CreateTrustSetKeyResolver(Trusted({"sts-rsa"}));
  EXPECT_THROWS_MESSAGE(signature->Explain(*resolver), Tarvel::InvalidStateException,
                        "The signature has not been signed yet");
  signature->Sign(*Key("sts-rsa"));
  const Tarvel::Xml::Security::SignatureReport report = signature->Explain(*resolver);
  EXPECT_TRUE(report.refusals.empty());
  EXPECT_TRUE(report.keys.front().madeSignature);
  EXPECT_EQ("e:Body", static_cast<const ElementNode *>(report.references.front().target)->GetName());
}

TEST(CreateBlankSignature, RefusesAlgorithmsThatAreNotSupported) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<ElementNode> root(document->GetDocumentElement());
  Ref<Signature> signature;
  EXPECT_THROWS_MESSAGE(CreateBlankSignature(root, EXCLUSIVE, Uri::RSA_PSS_SHA256, "ds", signature),
                        XmlSecurityException,
                        "Signing with the signature algorithm "
                        "\"http://www.w3.org/2007/05/xmldsig-more#sha256-rsa-MGF1\" is not supported");
  EXPECT_THROWS_MESSAGE(
      CreateBlankSignature(root, EXCLUSIVE, "http://www.w3.org/2000/09/xmldsig#rsa-sha1", "ds", signature),
      XmlSecurityException,
      "Signing with the signature algorithm \"http://www.w3.org/2000/09/xmldsig#rsa-sha1\" is not supported");
  EXPECT_THROWS_MESSAGE(CreateBlankSignature(root, "urn:c14n", Uri::RSA_SHA256, "ds", signature), XmlSecurityException,
                        "Signing with the canonicalization algorithm \"urn:c14n\" is not supported");
  EXPECT_THROWS_MESSAGE(CreateBlankSignature({}, EXCLUSIVE, Uri::RSA_SHA256, "ds", signature),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : a signature needs an element to resolve its references in");
}

TEST(AddReference, RefusesAlgorithmsThatAreNotSupported) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document);
  EXPECT_THROWS_MESSAGE(
      signature->AddReference("#b", "http://www.w3.org/2000/09/xmldsig#sha1", EXCLUSIVE), XmlSecurityException,
      "Signing with the digest algorithm \"http://www.w3.org/2000/09/xmldsig#sha1\" is not supported");
  EXPECT_THROWS_MESSAGE(signature->AddReference("#b", Uri::DIGEST_SHA256, Uri::ENVELOPED_SIGNATURE),
                        XmlSecurityException,
                        "Signing with the canonicalization algorithm "
                        "\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\" is not supported");
  EXPECT_TRUE(signature->GetReferences().empty());
}

TEST(Sign, RefusesAReferenceThatDoesNotResolveAndStaysBlank) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document);
  EXPECT_THROWS_MESSAGE(signature->Sign(*Key("sts-rsa")), XmlSecurityException,
                        "A signature without a reference signs nothing");
  signature->AddReference("#nobody", Uri::DIGEST_SHA256, EXCLUSIVE);
  EXPECT_THROWS_MESSAGE(signature->Sign(*Key("sts-rsa")), XmlSecurityException,
                        "The reference URI \"#nobody\" is not accepted: no element has that identifier");
  EXPECT_THROWS_MESSAGE(signature->GetElement(), Tarvel::InvalidStateException,
                        "The signature has not been signed yet");
  std::set<std::string> uris;
  EXPECT_THROWS_MESSAGE(signature->Verify(*CreateTrustSetKeyResolver({}), uris), Tarvel::InvalidStateException,
                        "The signature has not been signed yet");
}

TEST(Sign, RefusesAKeyOfAnotherKind) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document);
  signature->AddReference("#b", Uri::DIGEST_SHA256, EXCLUSIVE);
  EXPECT_THROW(signature->Sign(*Key("sts-ec256")), XmlSecurityException);
  EXPECT_NO_THROW(signature->Sign(*Key("sts-rsa")));
}

TEST(Sign, RefusesAnyChangeAfterSigning) {
  const Ref<Document> document = ParseDocument(MESSAGE);
  const Ref<Signature> signature = BlankSignatureOf(*document);
  signature->AddReference("#b", Uri::DIGEST_SHA256, EXCLUSIVE);
  signature->Sign(*Key("sts-rsa"));
  const std::string refusal = "The signature has been signed already";
  EXPECT_THROWS_MESSAGE(signature->Sign(*Key("sts-rsa")), Tarvel::InvalidStateException, refusal);
  EXPECT_THROWS_MESSAGE(signature->AddReference("#h", Uri::DIGEST_SHA256, EXCLUSIVE), Tarvel::InvalidStateException,
                        refusal);
  EXPECT_THROWS_MESSAGE(signature->SetKeyInfo({}), Tarvel::InvalidStateException, refusal);
}

} // namespace
