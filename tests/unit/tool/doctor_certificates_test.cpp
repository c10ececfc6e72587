// SPDX-License-Identifier: Apache-2.0

#include "doctor_certificates.h"
#include "doctor_texts.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

using Tarvel::Ssl::HandshakeProbe;
using Tarvel::Ssl::ServerProbe;
using Tarvel::System::DateTime;
using testing::ElementsAre;

CertificateFile Trust(const std::string &name) {
  return {"sts.pem", false, CertificatesOf(name)};
}

CertificateFile Authority(const std::string &name) {
  return {"ca.pem", true, CertificatesOf(name)};
}

DoctorCheck Check(const std::vector<CertificateFile> &files, const DateTime &now = NOON) {
  return CheckCertificates(files, ServerProbe(), now);
}

/// A probe of a server whose chain ends in the first certificate of the file, or in no trusted one for an empty name.
ServerProbe ProbeWithAnchor(const std::string &name) {
  ServerProbe probe;
  probe.handshake = HandshakeProbe();
  probe.handshake->chain = CertificatesOf("tls/localhost");
  if (!name.empty()) {
    probe.handshake->anchor = CertificatesOf(name).front();
  }
  return probe;
}

TEST(CheckCertificates, ListsTheCertificates) {
  EXPECT_EQ("certificates  fine      2 certificates.\n"
            "                        CN=localhost of sts.pem: EC, P-256; 34331 days left.\n"
            "                        CN=authority of ca.pem: EC, P-256; 34331 days left.\n",
            TextOf(Check({Trust("tls/localhost"), Authority("tls/authority")})));
}

TEST(CheckCertificates, IsNotDoneWithoutCertificates) {
  EXPECT_EQ("certificates  not done  Neither --trust nor --ca is given.\n", TextOf(Check({})));
}

TEST(CheckCertificates, WarnsOfACertificateThatHasEnded) {
  EXPECT_EQ("certificates  warning   1 certificate.\n"
            "                        CN=expired of sts.pem expired 1826 days ago.\n"
            "                        CN=expired of sts.pem: EC, P-256; expired 1826 days ago.\n"
            "              to do     Get the service's next certificate, and give it with --trust. The key of this one "
            "stays trusted.\n",
            TextOf(Check({Trust("tls/expired")})));
  EXPECT_EQ("certificates  warning   1 certificate.\n"
            "                        CN=expired of ca.pem expired 1826 days ago.\n"
            "                        CN=expired of ca.pem: EC, P-256; expired 1826 days ago.\n"
            "              to do     Get the authority's next certificate, and give it with --ca: a server is accepted "
            "only while this one is valid.\n",
            TextOf(Check({Authority("tls/expired")})));
}

TEST(CheckCertificates, WarnsOfACertificateThatIsNotValidYet) {
  const DoctorCheck trusted = Check({Trust("tls/not-yet-valid")});
  EXPECT_THAT(trusted.found, ElementsAre("1 certificate.", "CN=not-yet-valid of sts.pem becomes valid in 30679 days."));
  EXPECT_THAT(trusted.todo, ElementsAre("Correct this machine's clock if it is wrong. If it is right, get the "
                                        "service's present certificate, and give it with --trust. The key of this one "
                                        "stays trusted."));
  EXPECT_THAT(Check({Authority("tls/not-yet-valid")}).todo,
              ElementsAre("Correct this machine's clock if it is wrong. If it is right, get the authority's present "
                          "certificate, and give it with --ca: a server is accepted only while this one is valid."));
}

TEST(CheckCertificates, WarnsOfACertificateThatEndsWithin30Days) {
  const DateTime end = CertificatesOf("tls/localhost").front()->GetNotAfter();
  constexpr std::int64_t DAY = 24 * 60 * 60;
  EXPECT_EQ(CheckOutcome::FINE, Check({Trust("tls/localhost")}, end.PlusSeconds(-30 * DAY)).outcome);
  const DoctorCheck check = Check({Trust("tls/localhost")}, end.PlusSeconds(-30 * DAY + 1));
  EXPECT_EQ(CheckOutcome::WARNING, check.outcome);
  EXPECT_THAT(check.found, ElementsAre("1 certificate.", "CN=localhost of sts.pem has 29 days left."));
}

TEST(CheckCertificates, FailsWhenNoKeyIsAccepted) {
  const DoctorCheck check = Check({Trust("crypto/rsa1024")});
  EXPECT_EQ(CheckOutcome::FAILED, check.outcome);
  EXPECT_EQ(ExitCode::FILE_OR_KEY, check.exitCode);
  ASSERT_LE(2u, check.found.size());
  const std::string subject = CertificatesOf("crypto/rsa1024").front()->GetSubject();
  EXPECT_EQ("No token signed with the key of " + subject +
                " of sts.pem is accepted: the RSA key has only 1024 bits; 2048 are the minimum.",
            check.found[1]);
  EXPECT_THAT(
      check.todo,
      ElementsAre("Have tokens signed with an RSA key of at least 2048 bits, or an EC key on P-256, P-384 or "
                  "P-521.",
                  "Give a certificate with --trust whose key is accepted: with these, every token is refused."));
}

TEST(CheckCertificates, OnlyWarnsWhenAnotherKeyIsAccepted) {
  EXPECT_EQ(CheckOutcome::WARNING, Check({Trust("crypto/rsa1024"), Trust("tls/localhost")}).outcome);
}

TEST(CheckCertificates, DoesNotApplyTheRulesOfTokensToAnAuthority) {
  EXPECT_EQ(CheckOutcome::FINE,
            Check({Authority("crypto/rsa1024")}, CertificatesOf("crypto/rsa1024").front()->GetNotBefore()).outcome);
}

TEST(CheckCertificates, ReportsWhetherTheServersChainEndsInTheAuthorities) {
  const auto foundWith = [](const ServerProbe &probe) {
    return CheckCertificates({Authority("tls/authority")}, probe, NOON);
  };
  EXPECT_THAT(foundWith(ProbeWithAnchor("tls/authority")).found,
              ElementsAre("1 certificate.", "The server's chain ends in CN=authority of ca.pem."));
  EXPECT_THAT(foundWith(ProbeWithAnchor("")).found,
              ElementsAre("1 certificate.", "The server's chain ends in no certificate of ca.pem."));
  EXPECT_THAT(foundWith(ProbeWithAnchor("tls/unknown-authority")).found,
              ElementsAre("1 certificate.", "The server's chain ends in no certificate of ca.pem."));
  EXPECT_EQ(true, JsonOf(foundWith(ProbeWithAnchor("tls/authority"))).at("chainEndsInCa").get<bool>());
  EXPECT_EQ(false, JsonOf(foundWith(ProbeWithAnchor(""))).at("chainEndsInCa").get<bool>());
  EXPECT_TRUE(JsonOf(foundWith(ServerProbe())).at("chainEndsInCa").is_null());
}

TEST(CheckCertificates, HasItsFactsInJson) {
  const std::string thumbprint = CertificatesOf("tls/expired").front()->GetSha256Thumbprint();
  EXPECT_EQ(R"([{"file":"sts.pem","use":"trust","subject":"CN=expired","issuer":"CN=authority",)"
            R"("notBefore":"2020-01-02T03:04:05.000Z","notAfter":"2021-01-02T03:04:05.000Z","daysLeft":-1827,)"
            R"("key":"EC, P-256","sha256":")" +
                thumbprint + R"("}])",
            JsonOf(Check({Trust("tls/expired")})).at("certificates").dump());
}

} // namespace
} // namespace SsoClient::Tool
