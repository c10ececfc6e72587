// SPDX-License-Identifier: Apache-2.0
// Keys and the certificates of KeyInfo in the report on a signature.

#include "explained.h"
#include "genuine_token.h"
#include "support/throws_message.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <openssl/x509.h>

#include <cstddef>
#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace {

namespace Uri = Tarvel::Xml::Security::SignatureUri;
using Tarvel::StringUtil;
using Tarvel::Crypto::CertificateList;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;
using Tarvel::Xml::Security::SignatureReport;
using Tarvel::Xml::Security::SignatureRule;
using Testing::Explain;
using Testing::Explained;
using Testing::GenuineToken;
using Testing::ReadDataFile;
using Testing::RefusalsOf;
using Testing::Replaced;
using Testing::Texts;
using Testing::Trusted;
using Testing::WRONG_VALUE;

const std::string UNUSABLE = "KEYS\nNo trusted key can be used with the signature algorithm \"" +
                             std::string(Uri::RSA_SHA256) + "\"\nds:SignatureMethod\n";

std::string Base64Of(const std::string &name) {
  return StringUtil::Base64Encode(Trusted({name}).front()->GetDer());
}

std::string CertificateElement(const std::string &text) {
  return "<ds:X509Certificate>" + text + "</ds:X509Certificate>";
}

/// The genuine token with this content in its only ds:X509Data, which is not signed.
std::string WithCertificates(const std::string &content) {
  const std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:X509Data>") + 13;
  return std::string(text).replace(begin, text.find("</ds:X509Data>") - begin, content);
}

/// For each key, those of the words "named", "usable" and "made" that are true.
Texts KeysOf(const Explained &explained) {
  Texts keys;
  for (const SignatureReport::Key &key : explained.report.keys) {
    keys.push_back(std::string(key.isNamed ? "named " : "") + (key.isUsable ? "usable " : "") +
                   (key.madeSignature ? "made" : ""));
  }
  return keys;
}

/// The subjects of the certificates in KeyInfo, and whether they are trusted.
Texts NamesOf(const Explained &explained) {
  Texts names;
  for (const SignatureReport::NamedCertificate &certificate : explained.report.namedCertificates) {
    names.push_back(certificate.subject + (certificate.isTrusted ? " is trusted" : ""));
  }
  return names;
}

std::string SubjectOf(const std::string &name) {
  return Trusted({name}).front()->GetSubject();
}

// Which key

TEST(Explain, ShowsWhichOfAllTrustedKeysMadeTheSignature) {
  const Explained explained =
      Explain(WithCertificates(""), {"other", "sts-rsa1024", "sts-ec256", "sts-rsa", "sts-rsa-reissued"});
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ((Texts{"usable ", "", "", "usable made", "usable made"}), KeysOf(explained));
  EXPECT_EQ(Trusted({"sts-rsa"}).front()->GetDer(), explained.report.keys[3].certificate->GetDer());
}

TEST(Explain, ShowsWhichKeyTheKeyInfoSelects) {
  const Explained explained = Explain(WithCertificates(CertificateElement(Base64Of("sts-rsa"))), {"other", "sts-rsa"});
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ((Texts{"usable ", "named usable made"}), KeysOf(explained));
}

TEST(Explain, ShowsThatTheKeyInfoContainsEveryTrustedKey) {
  EXPECT_EQ(Texts{"named usable made"},
            KeysOf(Explain(WithCertificates(CertificateElement(Base64Of("sts-rsa"))), {"sts-rsa"})));
  EXPECT_EQ(
      (Texts{"named usable ", "named usable made"}),
      KeysOf(Explain(WithCertificates(CertificateElement(Base64Of("sts-rsa")) + CertificateElement(Base64Of("other"))),
                     {"other", "sts-rsa"})));
}

TEST(Explain, NamesNoKeyForAnotherCertificateOfTheSameKey) {
  const Explained explained =
      Explain(WithCertificates(CertificateElement(Base64Of("sts-rsa-reissued"))), {"other", "sts-rsa"});
  EXPECT_EQ((Texts{"usable ", "usable made"}), KeysOf(explained));
  EXPECT_EQ(Texts{SubjectOf("sts-rsa-reissued")}, NamesOf(explained));
}

/// The text of a refusal if a trusted key made the signature, but KeyInfo selects another key.
std::string UnselectedMaker(const std::string &name) {
  const auto certificate = Trusted({name}).front();
  return "a signature by the trusted key of \"" + certificate->GetSubject() + "\" (SHA-256 thumbprint " +
         certificate->GetSha256Thumbprint() + "), which KeyInfo does not select";
}

TEST(Explain, ShowsThatAnUnselectedTrustedKeyMadeTheSignature) {
  const Explained explained = Explain(WithCertificates(CertificateElement(Base64Of("other"))), {"sts-rsa", "other"});
  EXPECT_EQ(Texts{"VALUE\n\nds:SignatureValue\n" + UnselectedMaker("sts-rsa") + "\na signature by a trusted key"},
            RefusalsOf(explained));
  EXPECT_EQ((Texts{"usable made", "named usable "}), KeysOf(explained));
  EXPECT_TRUE(explained.report.isValueChecked);
}

TEST(Explain, ShowsThatTheKeyInfoSelectsOnlyAKeyThatCannotBeUsed) {
  const Explained explained =
      Explain(WithCertificates(CertificateElement(Base64Of("sts-ec256"))), {"sts-ec256", "sts-rsa"});
  EXPECT_EQ(Texts{UNUSABLE + UnselectedMaker("sts-rsa") +
                  "\nan RSA key of at least 2048 bits with an odd public exponent of at least 3"},
            RefusalsOf(explained));
  EXPECT_EQ((Texts{"named ", "usable made"}), KeysOf(explained));
}

TEST(Explain, ShowsThatNoTrustedKeyMadeTheSignature) {
  const Explained explained = Explain(GenuineToken(), {"other", "sts-rsa-2"});
  EXPECT_EQ(Texts{WRONG_VALUE}, RefusalsOf(explained));
  EXPECT_EQ((Texts{"usable ", "usable "}), KeysOf(explained));
}

TEST(Explain, ShowsWhichKeysCannotBeUsed) {
  const std::string wanted = "\nan RSA key of at least 2048 bits with an odd public exponent of at least 3";
  EXPECT_EQ(Texts{UNUSABLE + "no trusted key" + wanted}, RefusalsOf(Explain(GenuineToken(), Texts())));
  EXPECT_EQ(Texts{UNUSABLE +
                  "an RSA key of 1024 bits, an EC key of 256 bits, an RSA key of 2048 bits with an unsafe "
                  "public exponent" +
                  wanted},
            RefusalsOf(Explain(GenuineToken(), {"sts-rsa1024", "sts-ec256", "sts-rsa-e1"})));
  EXPECT_EQ(Texts{"KEYS\nNo trusted key can be used with the signature algorithm \"" + std::string(Uri::ECDSA_SHA256) +
                  "\"\nds:SignatureMethod\nan RSA key of 2048 bits\nan EC key on the curve P-256, P-384 or P-521"},
            RefusalsOf(Explain(ReadDataFile("tokens/ecdsa-p256-sha256.xml"), {"sts-rsa"})));
}

TEST(Explain, NeverTriesAKeyThatCannotBeUsed) {
  const std::string text = ReadDataFile("tokens/rsa1024.xml");
  Explained explained = Explain(text, {"sts-rsa1024"});
  EXPECT_EQ(Texts{"named "}, KeysOf(explained));
  EXPECT_FALSE(explained.report.isValueChecked);
  explained = Explain(text, {"sts-rsa1024", "sts-rsa"});
  EXPECT_EQ(Texts{UNUSABLE + "an RSA key of 1024 bits\nan RSA key of at least 2048 bits with an odd public exponent of "
                             "at least 3"},
            RefusalsOf(explained));
  EXPECT_EQ((Texts{"named ", "usable "}), KeysOf(explained));
}

/// A host's own resolver: a function of the KeyInfo.
class FunctionResolver final : public KeyInfoResolver {
public:
  explicit FunctionResolver(std::function<CertificateList(const ElementNode *)> resolve)
      : m_resolve(std::move(resolve)) {}
  CertificateList Resolve(const ElementNode *keyInfo) const override { return m_resolve(keyInfo); }

private:
  const std::function<CertificateList(const ElementNode *)> m_resolve;
};

TEST(Explain, DescribesAtMostTenKeysInOneText) {
  const FunctionResolver resolver(
      [](const ElementNode *) { return CertificateList(12, Trusted({"sts-ec256"}).front()); });
  std::string found = "an EC key of 256 bits";
  for (int more = 1; more < 10; ++more) {
    found += ", an EC key of 256 bits";
  }
  EXPECT_EQ(found + ", and 2 more", Explain(GenuineToken(), resolver).report.refusals.front().found);
}

TEST(Explain, ListsEachCandidateOnceAndNoNulls) {
  const FunctionResolver resolver([](const ElementNode *) {
    CertificateList candidates = Trusted({"sts-rsa", "sts-rsa", "other"});
    candidates.insert(candidates.begin(), nullptr);
    return candidates;
  });
  const Explained explained = Explain(GenuineToken(), resolver);
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ((Texts{"named usable made", "usable "}), KeysOf(explained));
}

TEST(Explain, ListsAKeyThatTheResolverReturnsOnlyForTheKeyInfo) {
  const FunctionResolver resolver([](const ElementNode *keyInfo) { return Trusted({keyInfo ? "sts-rsa" : "other"}); });
  const Explained explained = Explain(WithCertificates(""), resolver);
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ((Texts{"usable ", "named usable made"}), KeysOf(explained));
}

TEST(Explain, ShowsThatTheKeysCannotBeReadAndChecksTheDigests) {
  const FunctionResolver resolver(
      [](const ElementNode *) -> CertificateList { throw Tarvel::Crypto::CryptoException("the key cannot be read"); });
  const Explained explained = Explain(Replaced(GenuineToken(), "alice", "malice"), resolver);
  const Texts refusals = RefusalsOf(explained);
  ASSERT_EQ(2u, refusals.size());
  EXPECT_EQ("KEYS\nthe key cannot be read\nds:KeyInfo\n\n", refusals.front());
  EXPECT_EQ(SignatureRule::DIGESTS, explained.report.refusals.back().rule);
  EXPECT_TRUE(explained.report.keys.empty());
}

TEST(Explain, AcceptsIfOnlyUnselectedKeysCannotBeRead) {
  const FunctionResolver resolver([](const ElementNode *keyInfo) {
    if (!keyInfo) {
      throw Tarvel::Xml::Security::XmlSecurityException("which keys?");
    }
    return Trusted({"sts-rsa"});
  });
  const Explained explained = Explain(GenuineToken(), resolver);
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ(Texts{"named usable made"}, KeysOf(explained));
}

TEST(Explain, PassesOnExceptionsThatAreNotVerdicts) {
  const FunctionResolver cleanedUp([](const ElementNode *) -> CertificateList {
    throw Tarvel::InvalidStateException("OpenSSL has cleaned itself up");
  });
  EXPECT_THROWS_MESSAGE(Explain(GenuineToken(), cleanedUp), Tarvel::InvalidStateException,
                        "OpenSSL has cleaned itself up");
  const FunctionResolver noMemory([](const ElementNode *keyInfo) -> CertificateList {
    if (keyInfo) {
      return Trusted({"sts-rsa"});
    }
    throw Tarvel::OutOfMemoryException();
  });
  EXPECT_THROWS_MESSAGE(Explain(GenuineToken(), noMemory), Tarvel::OutOfMemoryException, "There is not enough memory");
}

// Certificates in KeyInfo

TEST(Explain, NamesAnUntrustedCertificateAndNeverTriesItsKey) {
  const Explained explained =
      Explain(Replaced(ReadDataFile("tokens/signed-by-other.xml"), "<ds:KeyInfo>",
                       "<ds:KeyInfo><ds:X509Data>" + CertificateElement(Base64Of("other")) + "</ds:X509Data>"),
              {"sts-rsa", "sts-rsa-2"});
  EXPECT_EQ(Texts{WRONG_VALUE}, RefusalsOf(explained));
  EXPECT_EQ((Texts{"usable ", "usable "}), KeysOf(explained));
  ASSERT_LE(1u, explained.report.namedCertificates.size());
  const SignatureReport::NamedCertificate &stranger = explained.report.namedCertificates.front();
  EXPECT_EQ(SubjectOf("other"), stranger.subject);
  EXPECT_EQ(Trusted({"other"}).front()->GetSha256Thumbprint(), stranger.thumbprint);
  EXPECT_FALSE(stranger.isTrusted);
}

TEST(Explain, NamesTrustedAndUntrustedCertificatesInTheirOrder) {
  const Explained explained = Explain(
      WithCertificates(CertificateElement(Base64Of("other")) + CertificateElement("\n" + Base64Of("sts-rsa") + "\n")),
      {"sts-rsa"});
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ((Texts{SubjectOf("other"), SubjectOf("sts-rsa") + " is trusted"}), NamesOf(explained));
  EXPECT_EQ(Trusted({"sts-rsa"}).front()->GetSha256Thumbprint(), explained.report.namedCertificates[1].thumbprint);
}

TEST(Explain, ListsUndecodableCertificatesWithoutAName) {
  const std::string text = Base64Of("other");
  const Explained explained = Explain(WithCertificates(
      CertificateElement("!") + CertificateElement(" ") + CertificateElement("AAAA") +
      CertificateElement(text + "AAAA") + CertificateElement(text.substr(0, 100)) + CertificateElement(text)));
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ((Texts{"", "", "", "", "", SubjectOf("other")}), NamesOf(explained));
  EXPECT_EQ("", explained.report.namedCertificates.front().thumbprint);
}

TEST(Explain, ListsNoCertificatesWithoutKeyInfo) {
  std::string text = GenuineToken();
  const std::size_t begin = text.find("<ds:KeyInfo");
  text.erase(begin, text.find("</ds:KeyInfo>") + 13 - begin);
  const Explained explained = Explain(text, {"sts-rsa", "other"});
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ(Texts(), NamesOf(explained));
  EXPECT_EQ((Texts{"usable made", "usable "}), KeysOf(explained));
}

/// A certificate in DER with an extension of this many bytes.
std::vector<std::uint8_t> LargeCertificate(std::size_t extensionBytes) {
  const std::vector<std::uint8_t> small = Trusted({"other"}).front()->GetDer();
  const unsigned char *position = small.data();
  X509 *const certificate = d2i_X509(nullptr, &position, static_cast<long>(small.size()));
  const std::string content(extensionBytes, 'x');
  ASN1_OCTET_STRING *const octets = ASN1_OCTET_STRING_new();
  ASN1_OCTET_STRING_set(octets, reinterpret_cast<const unsigned char *>(content.data()),
                        static_cast<int>(content.size()));
  X509_EXTENSION *const extension = X509_EXTENSION_create_by_NID(nullptr, NID_netscape_comment, 0, octets);
  X509_add_ext(certificate, extension, -1);
  i2d_re_X509_tbs(certificate, nullptr);
  unsigned char *encoded = nullptr;
  const int length = i2d_X509(certificate, &encoded);
  std::vector<std::uint8_t> der(encoded, encoded + length);
  OPENSSL_free(encoded);
  X509_EXTENSION_free(extension);
  ASN1_OCTET_STRING_free(octets);
  X509_free(certificate);
  return der;
}

TEST(Explain, DoesNotReadAnUntrustedCertificateOfMoreThan64KiB) {
  const std::size_t overhead = LargeCertificate(64000).size() - 64000;
  const std::vector<std::uint8_t> largest = LargeCertificate(64 * 1024 - overhead);
  const std::vector<std::uint8_t> tooLarge = LargeCertificate(64 * 1024 - overhead + 1);
  ASSERT_EQ(64u * 1024, largest.size());
  ASSERT_EQ(64u * 1024 + 1, tooLarge.size());
  const Explained explained = Explain(WithCertificates(CertificateElement(StringUtil::Base64Encode(tooLarge)) +
                                                       CertificateElement(StringUtil::Base64Encode(largest))),
                                      {"sts-rsa"});
  EXPECT_EQ((Texts{"", SubjectOf("other")}), NamesOf(explained));
}

TEST(Explain, NamesATrustedCertificateOfMoreThan64KiB) {
  const std::vector<std::uint8_t> large = LargeCertificate(100 * 1024);
  CertificateList trusted = Trusted({"sts-rsa"});
  trusted.push_back(Tarvel::Crypto::CreateCertificateFromDer(large.data(), large.size()));
  const Explained explained = Explain(WithCertificates(CertificateElement(StringUtil::Base64Encode(large))),
                                      *Tarvel::Xml::Security::CreateTrustSetKeyResolver(trusted));
  EXPECT_EQ(Texts{SubjectOf("other") + " is trusted"}, NamesOf(explained));
  EXPECT_EQ((Texts{"usable made", "named usable "}), KeysOf(explained));
}

TEST(Explain, ListsOnlySixteenOfAHundredThousandCertificates) {
  std::string certificates;
  for (int count = 0; count < 100000; ++count) {
    certificates += CertificateElement("AAAA");
  }
  const Explained explained = Explain(WithCertificates(certificates));
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ(16u, explained.report.namedCertificates.size());
}

TEST(Explain, AcceptsASignatureWithFifteenMillionCharactersOfACertificate) {
  const Explained explained = Explain(WithCertificates(CertificateElement(std::string(15000000, 'A'))));
  EXPECT_EQ(Texts(), RefusalsOf(explained));
  EXPECT_EQ(Texts{""}, NamesOf(explained));
}

} // namespace
