// SPDX-License-Identifier: Apache-2.0

#include "documents.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/key_info_resolver.h>

#include <gtest/gtest.h>

namespace {

using Tarvel::Crypto::CertificateList;
using Tarvel::Xml::Security::CreateTrustSetKeyResolver;
using Testing::ParseDocument;
using Testing::Trusted;

std::string Base64Of(const std::string &name) {
  return Tarvel::StringUtil::Base64Encode(Trusted({name}).front()->GetDer());
}

/// What a resolver over `trusted` returns for a `ds:KeyInfo` with that content.
CertificateList Resolve(const CertificateList &trusted, const std::string &content) {
  const auto document =
      ParseDocument("<ds:KeyInfo xmlns:ds='http://www.w3.org/2000/09/xmldsig#'>" + content + "</ds:KeyInfo>");
  return CreateTrustSetKeyResolver(trusted)->Resolve(document->GetDocumentElement());
}

std::string X509(const std::string &text) {
  return "<ds:X509Data><ds:X509Certificate>" + text + "</ds:X509Certificate></ds:X509Data>";
}

class TrustSetKeyResolver : public ::testing::Test {
protected:
  const CertificateList m_trusted = Trusted({"sts-rsa", "sts-rsa-2", "sts-ec256"});
};

TEST_F(TrustSetKeyResolver, ReturnsTheWholeSetWithoutKeyInfo) {
  EXPECT_EQ(m_trusted, CreateTrustSetKeyResolver(m_trusted)->Resolve(nullptr));
}

TEST_F(TrustSetKeyResolver, SelectsTheTrustedCertificateThatKeyInfoContains) {
  EXPECT_EQ(CertificateList{m_trusted[1]}, Resolve(m_trusted, X509(Base64Of("sts-rsa-2"))));
}

TEST_F(TrustSetKeyResolver, IgnoresWhiteSpaceInTheCertificate) {
  std::string text = Base64Of("sts-rsa-2");
  for (std::size_t at = 0; at < text.size(); at += 65) {
    text.insert(at, "\n");
  }
  EXPECT_EQ(CertificateList{m_trusted[1]}, Resolve(m_trusted, X509(" " + text + "\t")));
}

// With the longest certificate, because its length limits how much of a text is read.
TEST_F(TrustSetKeyResolver, ReturnsTheWholeSetForATextThatOnlyBeginsWithATrustedCertificate) {
  std::string longest;
  for (const char *const name : {"sts-rsa", "sts-rsa-2", "sts-ec256"}) {
    const std::string text = Base64Of(name);
    longest = text.size() > longest.size() ? text : longest;
  }
  EXPECT_EQ(1u, Resolve(m_trusted, X509(longest + " ")).size());
  EXPECT_EQ(m_trusted, Resolve(m_trusted, X509(longest + " A")));
}

TEST_F(TrustSetKeyResolver, SelectsAllTrustedCertificatesThatKeyInfoContains) {
  EXPECT_EQ((CertificateList{m_trusted[2], m_trusted[0]}),
            Resolve(m_trusted, X509(Base64Of("sts-ec256")) + X509(Base64Of("other")) + X509(Base64Of("sts-rsa")) +
                                   X509(Base64Of("sts-ec256"))));
}

TEST_F(TrustSetKeyResolver, NeverTakesACertificateFromTheMessage) {
  EXPECT_EQ(m_trusted, Resolve(m_trusted, X509(Base64Of("other"))));
  EXPECT_TRUE(Resolve({}, X509(Base64Of("other"))).empty());
}

TEST_F(TrustSetKeyResolver, ReturnsTheWholeSetForAnotherCertificateOfATrustedKey) {
  EXPECT_EQ(m_trusted, Resolve(m_trusted, X509(Base64Of("sts-rsa-reissued"))));
}

TEST_F(TrustSetKeyResolver, ReturnsTheWholeSetForEverythingElse) {
  const std::string trusted = Base64Of("sts-rsa-2");
  for (const std::string &content :
       {std::string(), std::string("text"), std::string("<ds:KeyName>sts</ds:KeyName>"), std::string("<ds:X509Data/>"),
        X509(""), X509("!"), X509("AAAA"), X509(trusted.substr(0, trusted.size() - 4)), X509(trusted + "AAAA"),
        X509(trusted + "="), X509("<!--x-->" + trusted), X509(trusted.substr(0, 99) + "<a/>" + trusted.substr(99)),
        "<ds:X509Certificate>" + trusted + "</ds:X509Certificate>",
        "<X509Data><X509Certificate>" + trusted + "</X509Certificate></X509Data>",
        std::string("<ds:KeyValue><ds:RSAKeyValue><ds:Modulus>AQAB</ds:Modulus></ds:RSAKeyValue></ds:KeyValue>")}) {
    EXPECT_EQ(m_trusted, Resolve(m_trusted, content)) << content.substr(0, 80);
  }
}

TEST_F(TrustSetKeyResolver, IgnoresDuplicatesAndNulls) {
  CertificateList trusted = Trusted({"sts-rsa", "sts-rsa"});
  trusted.push_back({});
  EXPECT_EQ(CertificateList{trusted.front()}, CreateTrustSetKeyResolver(trusted)->Resolve(nullptr));
}

TEST_F(TrustSetKeyResolver, ComparesOnlySixteenCertificates) {
  std::string content;
  for (int count = 0; count < 16; ++count) {
    content += X509("AAAA");
  }
  EXPECT_EQ(m_trusted, Resolve(m_trusted, content + X509(Base64Of("sts-rsa"))));
}

} // namespace
