// SPDX-License-Identifier: Apache-2.0
// Signatures by other engines and by us, some of them changed. We and the other engines must reach the same verdict,
// except where we are stricter.

#include "generated_document.h"
#include "pss_oracle.h"
#include "signature_template.h"
#include "xmlsec_oracle.h"

#include "support/data_file.h"
#include "support/repetitions.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

#include <functional>
#include <ostream>
#include <set>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;
using Tarvel::Xml::Security::Signature;
using Testing::RandomSource;

const std::size_t DOCUMENTS = Testing::Repetitions<std::size_t>(10000, 1000); // for each algorithm
constexpr std::size_t CHANGES = 4; // documents made from one signature, because signing is slow

const std::string KEYS = Testing::DataPath("tokens/");

Ref<Document> Parse(const std::string &text) {
  const Ref<Tarvel::Object> result =
      Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*Tarvel::CreateStringReader(text));
  return Ref<Document>(&dynamic_cast<Document &>(*result));
}

const ElementNode *FindSignature(const ElementNode &root) {
  for (const Tarvel::Xml::Node *child = root.GetFirstChild(); child; child = child->GetNextSibling()) {
    const ElementNode *element = Tarvel::Xml::AsElement(child);
    if (element && element->GetLocalName() == "Signature") {
      return element;
    }
  }
  return nullptr;
}

/// Our verdict: "genuine", "wrong", or the message of the refusal.
std::string Judge(const std::string &text, const KeyInfoResolver &resolver) {
  try {
    const Ref<Document> document = Parse(text);
    const ElementNode &root = *document->GetDocumentElement();
    const ElementNode *element = FindSignature(root);
    if (!element) {
      return "no signature";
    }
    Ref<Signature> signature;
    Tarvel::Xml::Security::CreateSignatureFromDom(root, *element, signature);
    std::set<std::string> uris;
    return signature->Verify(resolver, uris) ? "genuine" : "wrong";
  } catch (const Tarvel::Xml::XMLParseException &exception) {
    return std::string("not parsed: ") + exception.what();
  } catch (const Tarvel::Xml::Security::XmlSecurityException &exception) {
    return exception.what();
  }
}

/// Where we intentionally refuse a document that others accept, for example with names that XML Namespaces does not
/// allow.
bool IsOurStrictness(const std::string &verdict) {
  for (const char *reason :
       {"is not Base64", "is relative", "several elements have that identifier", "no element has that identifier",
        "Unexpected content", "Unexpected attribute", "must have text", "is not bound", "not parsed: "}) {
    if (verdict.find(reason) != std::string::npos) {
      return true;
    }
  }
  return false;
}

struct SignedBy {
  const char *name;
  std::string_view uri;
  const char *key;
  std::uint64_t seed;
  std::size_t documents = DOCUMENTS;
};

void PrintTo(const SignedBy &signedBy, std::ostream *out) {
  *out << signedBy.name;
}

struct Tally {
  std::size_t genuine = 0;
  std::size_t refused = 0;
  std::size_t stricter = 0;
  std::size_t notComparable = 0;
};

using Verifier = std::function<bool(xmlDoc &)>;

/// Compares verdicts on one text. We must not accept a signature that the others refuse.
void Compare(const std::string &text, const Verifier &verify, const KeyInfoResolver &resolver, Tally &tally) {
  const Testing::XmlDocHandle document = Testing::ParseWithLibxml2(text);
  if (document && Testing::HasRelativeNamespaceName(*document)) {
    ++tally.notComparable;
    return;
  }
  const bool theirs = document && verify(*document);
  const std::string ours = Judge(text, resolver);
  if (ours == "genuine") {
    ++tally.genuine;
    ASSERT_TRUE(theirs) << "genuine for us alone:\n" << text;
    return;
  }
  ++tally.refused;
  if (theirs) {
    ++tally.stricter;
    ASSERT_TRUE(IsOurStrictness(ours)) << ours << ", but genuine for others:\n" << text;
  }
}

using Signer = std::function<bool(xmlDoc &)>;

void CompareOnGeneratedDocuments(const SignedBy &signedBy, const Signer &sign, const Verifier &verify) {
  RandomSource random(signedBy.seed);
  const auto resolver =
      Tarvel::Xml::Security::CreateTrustSetKeyResolver(Tarvel::Crypto::LoadCertificates(KEYS + signedBy.key + ".crt"));
  Tally tally;
  for (std::size_t count = 0; count < signedBy.documents; count += CHANGES) {
    const std::string unsignedText =
        Testing::AddSignatureTemplate(Testing::GenerateDocument(random), signedBy.uri, random);
    const Testing::XmlDocHandle document = Testing::ParseWithLibxml2(unsignedText);
    ASSERT_TRUE(document) << unsignedText;
    ASSERT_TRUE(sign(*document)) << unsignedText;
    const std::string signedText = Testing::Serialise(*document);
    ASSERT_EQ("genuine", Judge(signedText, *resolver)) << signedText;
    for (std::size_t change = 0; change < CHANGES; ++change) {
      const std::string text = change == 0 ? signedText : Testing::ChangeSomething(signedText, random);
      ASSERT_NO_FATAL_FAILURE(Compare(text, verify, *resolver, tally));
    }
  }
  EXPECT_GT(tally.genuine, signedBy.documents / 4);
  EXPECT_GT(tally.refused, signedBy.documents / 4);
  EXPECT_LT(tally.stricter, signedBy.documents / 20);
  EXPECT_LT(tally.notComparable, signedBy.documents / 50);
  ::testing::Test::RecordProperty("genuine", std::to_string(tally.genuine));
  ::testing::Test::RecordProperty("refused", std::to_string(tally.refused));
  ::testing::Test::RecordProperty("stricter", std::to_string(tally.stricter));
}

class XmlSecOracle : public ::testing::TestWithParam<SignedBy> {};

TEST_P(XmlSecOracle, AgreesWithUsOnGeneratedDocuments) {
  const Testing::XmlSecKeyHandle key = Testing::LoadXmlSecKey(KEYS + GetParam().key + ".key");
  CompareOnGeneratedDocuments(
      GetParam(), [&key](xmlDoc &document) { return Testing::SignWithXmlSec(document, *key); },
      [&key](xmlDoc &document) { return Testing::VerifiesWithXmlSec(document, *key); });
}

const SignedBy ALGORITHMS[] = {
    {"RsaSha256", Uri::RSA_SHA256, "sts-rsa", 11},
    {"RsaSha384", Uri::RSA_SHA384, "sts-rsa", 12},
    {"RsaSha512", Uri::RSA_SHA512, "sts-rsa", 13},
    {"EcdsaP256Sha256", Uri::ECDSA_SHA256, "sts-ec256", 14},
    {"EcdsaP256Sha384", Uri::ECDSA_SHA384, "sts-ec256", 15},
    {"EcdsaP256Sha512", Uri::ECDSA_SHA512, "sts-ec256", 16},
    {"EcdsaP384Sha384", Uri::ECDSA_SHA384, "sts-ec384", 17,
     DOCUMENTS / 10}, // a slow curve; another row tests the algorithm more often
    {"EcdsaP521Sha512", Uri::ECDSA_SHA512, "sts-ec521", 18, DOCUMENTS / 10},
};

std::string NameOf(const ::testing::TestParamInfo<SignedBy> &parameters) {
  return parameters.param.name;
}

INSTANTIATE_TEST_SUITE_P(All, XmlSecOracle, ::testing::ValuesIn(ALGORITHMS), NameOf);

class PssOracle : public ::testing::TestWithParam<SignedBy> {};

TEST_P(PssOracle, AgreesWithUsOnGeneratedDocuments) {
  const Testing::PssOracle oracle(GetParam().name, std::string(GetParam().uri), KEYS + GetParam().key + ".key",
                                  KEYS + "sts-ec256.key");
  CompareOnGeneratedDocuments(
      GetParam(), [&oracle](xmlDoc &document) { return oracle.Sign(document); },
      [&oracle](xmlDoc &document) { return oracle.Verifies(document); });
}

const SignedBy PSS_ALGORITHMS[] = {{"SHA256", Uri::RSA_PSS_SHA256, "sts-rsa", 21},
                                   {"SHA384", Uri::RSA_PSS_SHA384, "sts-rsa", 22},
                                   {"SHA512", Uri::RSA_PSS_SHA512, "sts-rsa", 23}};

INSTANTIATE_TEST_SUITE_P(All, PssOracle, ::testing::ValuesIn(PSS_ALGORITHMS), NameOf);

class OurSignature : public ::testing::TestWithParam<SignedBy> {};

TEST_P(OurSignature, VerifiesWithXmlSecUnlessSomethingIsChanged) {
  RandomSource random(GetParam().seed);
  const Testing::XmlSecKeyHandle theirKey = Testing::LoadXmlSecKey(KEYS + GetParam().key + ".key");
  const auto ourKey = Tarvel::Crypto::LoadPrivateKey(KEYS + GetParam().key + ".key");
  const auto resolver = Tarvel::Xml::Security::CreateTrustSetKeyResolver(
      Tarvel::Crypto::LoadCertificates(KEYS + GetParam().key + ".crt"));
  const Verifier verify = [&theirKey](xmlDoc &document) { return Testing::VerifiesWithXmlSec(document, *theirKey); };
  Tally tally;
  for (std::size_t count = 0; count < GetParam().documents; count += CHANGES) {
    const Testing::GeneratedDocument generated = Testing::GenerateDocument(random);
    const Ref<Document> document = Parse(generated.text);
    const Ref<ElementNode> root(document->GetDocumentElement());
    Ref<Signature> signature;
    Tarvel::Xml::Security::CreateBlankSignature(root, Tarvel::Xml::Security::CanonicalizationUri::EXCLUSIVE,
                                                GetParam().uri, random.OneOf({"ds", "", "a"}), signature);
    // Any element but the document element, which will contain the signature.
    for (std::size_t references = 1 + random.Below(3); references != 0 && generated.elements > 1; --references) {
      const std::string uri = "#e" + std::to_string(1 + random.Below(generated.elements - 1));
      signature->AddReference(uri, random.OneOf({Uri::DIGEST_SHA256, Uri::DIGEST_SHA384, Uri::DIGEST_SHA512}),
                              Tarvel::Xml::Security::CanonicalizationUri::EXCLUSIVE);
    }
    if (signature->GetReferences().empty()) {
      continue;
    }
    signature->Sign(*ourKey);
    root->AppendChild(signature->GetElement().get());
    const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
    root->WriteTo(*writer);
    ASSERT_EQ("genuine", Judge(writer->GetText(), *resolver)) << writer->GetText();
    for (std::size_t change = 0; change < CHANGES; ++change) {
      const std::string text = change == 0 ? writer->GetText() : Testing::ChangeSomething(writer->GetText(), random);
      ASSERT_NO_FATAL_FAILURE(Compare(text, verify, *resolver, tally));
    }
  }
  EXPECT_GT(tally.genuine, GetParam().documents / 8);
  EXPECT_GT(tally.refused, GetParam().documents / 8);
}

INSTANTIATE_TEST_SUITE_P(
    All, OurSignature,
    ::testing::Values(SignedBy{"RsaSha256", Uri::RSA_SHA256, "sts-rsa", 31},
                      SignedBy{"RsaSha384", Uri::RSA_SHA384, "sts-rsa", 32},
                      SignedBy{"RsaSha512", Uri::RSA_SHA512, "sts-rsa", 33},
                      SignedBy{"EcdsaP256Sha256", Uri::ECDSA_SHA256, "sts-ec256", 34},
                      SignedBy{"EcdsaP384Sha384", Uri::ECDSA_SHA384, "sts-ec384", 35, DOCUMENTS / 10},
                      SignedBy{"EcdsaP521Sha512", Uri::ECDSA_SHA512, "sts-ec521", 36, DOCUMENTS / 10}),
    NameOf);

} // namespace
