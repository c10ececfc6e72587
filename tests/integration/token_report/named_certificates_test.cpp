// SPDX-License-Identifier: Apache-2.0
// Certificates in the KeyInfo of a signature are shown, and never become trusted keys.

#include "verifiers.h"

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/work_folder.h"

#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

namespace Reports {
namespace {

using SsoClient::TokenReport;
using Testing::Judgement;

/// A new certificate, made by openssl, with the common name `subject`.
Tarvel::Ref<const Tarvel::Crypto::Certificate> NewCertificate(const std::string &subject) {
  const Testing::WorkFolder folder;
  const std::string configuration =
      folder.Write("configuration", "[req]\nprompt=no\ndistinguished_name=name\nutf8=yes\n"
                                    "[name]\nCN=" +
                                        subject + "\n");
  const std::string command = "openssl req -x509 -utf8 -newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes -keyout " +
                              folder / "key" + " -out " + folder / "certificate" + " -config " + configuration + " 2>" +
                              folder / "log";
  EXPECT_EQ(0, std::system(command.c_str())) << folder.Read("log");
  return Tarvel::Crypto::CreateCertificateFromPem(folder.Read("certificate"));
}

/// The token with `elements` in place of its own certificate.
std::string WithKeyInfo(const std::string &elements) {
  std::string xml = Testing::ReadDataFile("tokens/bearer.xml");
  const std::size_t begin = xml.find("<ds:X509Certificate>");
  const std::string end = "</ds:X509Certificate>";
  return xml.replace(begin, xml.find(end) + end.size() - begin, elements);
}

std::string ElementOf(const Tarvel::Crypto::Certificate &certificate) {
  return "<ds:X509Certificate>" + Tarvel::StringUtil::Base64Encode(certificate.GetDer()) + "</ds:X509Certificate>";
}

TEST(NamedCertificate, ThatIsNotTrustedIsShownInPrintableFormAndNotUsed) {
  const Testing::FixedEnvironment clock;
  const auto stranger = NewCertificate("stranger\x1B[31m\xE2\x80\xAE\xC2\x9B");
  const Judgement judgement = JudgeText(UsualVerifier(), WithKeyInfo(ElementOf(*stranger)));
  EXPECT_EQ("", judgement.contradictions);
  EXPECT_TRUE(judgement.report.accepted);
  ASSERT_EQ(1u, judgement.report.namedCertificates.size());
  const TokenReport::NamedCertificate &named = judgement.report.namedCertificates.front();
  EXPECT_FALSE(named.isTrusted);
  EXPECT_EQ(stranger->GetSha256Thumbprint(), named.thumbprint);
  EXPECT_NE(std::string::npos, named.subject.find("stranger")) << named.subject;
  for (const TokenReport::TrustedKey &key : judgement.report.trustedKeys) {
    EXPECT_NE(named.thumbprint, key.thumbprint);
    EXPECT_FALSE(key.isNamed);
  }
}

TEST(NamedCertificate, ThatIsTrustedButDidNotSignIsReportedWithTheKeyThatDid) {
  const Testing::FixedEnvironment clock;
  const auto other = Certificate("other");
  const Testing::JudgedVerifier verifier({other, Certificate("sts-rsa")}, {});
  const Judgement judgement = JudgeText(verifier, WithKeyInfo(ElementOf(*other)));
  EXPECT_EQ("", judgement.contradictions);
  EXPECT_EQ("Failed to verify signature: token might have been tampered with.", judgement.report.refusal);
  ASSERT_EQ(2u, judgement.report.trustedKeys.size());
  EXPECT_TRUE(judgement.report.trustedKeys[0].isNamed);
  EXPECT_FALSE(judgement.report.trustedKeys[0].madeSignature);
  EXPECT_FALSE(judgement.report.trustedKeys[1].isNamed);
  EXPECT_TRUE(judgement.report.trustedKeys[1].madeSignature);
}

TEST(NamedCertificates, BeyondSixteenAreLeftOut) {
  const Testing::FixedEnvironment clock;
  std::string elements;
  for (int i = 0; i < 40; ++i) {
    elements += ElementOf(*Certificate("holder"));
  }
  const Judgement judgement = JudgeText(UsualVerifier(), WithKeyInfo(elements));
  EXPECT_EQ("", judgement.contradictions);
  EXPECT_EQ(16u, judgement.report.namedCertificates.size());
}

} // namespace
} // namespace Reports
