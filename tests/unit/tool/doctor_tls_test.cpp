// SPDX-License-Identifier: Apache-2.0

#include "doctor_texts.h"
#include "doctor_tls.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

using Tarvel::Ssl::AddressProbe;
using Tarvel::Ssl::HandshakeProbe;
using Tarvel::Ssl::ServerProbe;
using Tarvel::Ssl::ServerRefusal;
using Tarvel::System::DateTime;
using testing::HasSubstr;
using Kind = ServerRefusal::Kind;
using Outcome = HandshakeProbe::Outcome;

const DoctorTarget TARGET{true, "sts.corp.example", 443, "/sts"};

constexpr const char *COMPARE =
    "                        The server is not verified: compare the thumbprint in another way, "
    "such as by telephone with its operators, before you trust it.\n";

HandshakeProbe HandshakeOf(const std::string &certificate, Outcome outcome = Outcome::ACCEPTED) {
  HandshakeProbe handshake;
  handshake.outcome = outcome;
  handshake.version = "TLSv1.3";
  handshake.cipher = "TLS_AES_256_GCM_SHA384";
  handshake.durationMicroseconds = 4000;
  handshake.chain = CertificatesOf("tls/" + certificate);
  handshake.chainLength = 1;
  return handshake;
}

ServerProbe ProbeOf(const HandshakeProbe &handshake) {
  ServerProbe probe;
  probe.addresses.resize(1);
  probe.addresses[0].outcome = AddressProbe::Outcome::ANSWERED;
  probe.handshake = handshake;
  return probe;
}

DoctorCheck Check(const HandshakeProbe &handshake, bool usesThumbprint = false, const DateTime &now = NOON) {
  return CheckTls(TARGET, ProbeOf(handshake), usesThumbprint, now);
}

/// A handshake with a server that is refused for these reasons, each with the server's certificate.
HandshakeProbe Refused(const std::string &certificate, const std::vector<Kind> &kinds) {
  HandshakeProbe handshake = HandshakeOf(certificate, Outcome::CERTIFICATE_REFUSED);
  for (const Kind kind : kinds) {
    ServerRefusal refusal;
    refusal.kind = kind;
    refusal.text = "the server's certificate was not accepted: no reason";
    refusal.certificate = handshake.chain.front();
    handshake.refusals.push_back(refusal);
  }
  return handshake;
}

std::string ThumbprintOf(const std::string &certificate) {
  return CertificatesOf("tls/" + certificate).front()->GetSha256Thumbprint();
}

TEST(CheckTls, ShowsVersionCipherThumbprintAndChain) {
  EXPECT_EQ("tls           fine      TLSv1.3 with TLS_AES_256_GCM_SHA384; the server is accepted (4 ms).\n"
            "                        SHA-256 thumbprint of its certificate: " +
                ThumbprintOf("localhost") +
                "\n"
                "                        Certificate 1: CN=localhost, issued by CN=authority; 34331 days left.\n",
            TextOf(Check(HandshakeOf("localhost"))));
  EXPECT_THAT(TextOf(Check(HandshakeOf("localhost"), true)),
              HasSubstr("; the server is accepted by its thumbprint (4 ms).\n"));
}

TEST(CheckTls, NamesEachReasonAndWhatToDo) {
  const DoctorCheck check = Check(Refused("expired", {Kind::UNKNOWN_ISSUER, Kind::EXPIRED, Kind::OTHER_NAME}));
  EXPECT_EQ(
      "tls           failed    TLSv1.3 with TLS_AES_256_GCM_SHA384; the server is refused (4 ms).\n"
      "                        The certificate CN=expired is issued by CN=authority, which is not known here.\n"
      "                        The certificate CN=expired expired 1826 days ago.\n"
      "                        The certificate is for localhost, 127.0.0.1, ::1, and not for sts.corp.example.\n"
      "                        SHA-256 thumbprint of its certificate: " +
          ThumbprintOf("expired") + "\n" + COMPARE +
          "                        Certificate 1: CN=expired, issued by CN=authority; expired 1826 days ago.\n"
          "              to do     Give the certificate of the issuer, or of an authority above it, with --ca; or have "
          "the server send the certificates between.\n"
          "                        Have the certificate renewed. If it is still valid, correct this machine's clock.\n"
          "                        Use a name of the certificate in --sts, or have a certificate issued for this "
          "name.\n",
      TextOf(check));
  EXPECT_EQ(ExitCode::COMMUNICATION, check.exitCode);
}

TEST(CheckTls, DescribesTheOtherReasons) {
  struct Case {
    const char *certificate;
    Kind kind;
    const char *text;
  };
  for (const Case &refused :
       {Case{"not-yet-valid", Kind::NOT_YET_VALID, "The certificate CN=not-yet-valid becomes valid in 30679 days."},
        Case{"self-signed", Kind::SELF_SIGNED, "The certificate CN=self-signed is its own issuer, and is not trusted."},
        Case{"localhost-rsa1024", Kind::WEAK_KEY,
             "The certificate CN=localhost-rsa1024 has a weak key (RSA, 1024 bits)."},
        Case{"localhost", Kind::WEAK_SIGNATURE, "The certificate CN=localhost is signed with a weak algorithm."},
        Case{"not-for-servers", Kind::WRONG_PURPOSE, "The server's certificate was not accepted: no reason."},
        Case{"localhost", Kind::OTHER, "The server's certificate was not accepted: no reason."}}) {
    const DoctorCheck check = Check(Refused(refused.certificate, {refused.kind}));
    ASSERT_LE(2u, check.found.size());
    EXPECT_EQ(refused.text, check.found[1]);
    EXPECT_EQ(1u, check.todo.size());
  }
}

TEST(CheckTls, AdvisesAThumbprintOnlyForTheServersOwnCertificate) {
  HandshakeProbe handshake = Refused("self-signed", {Kind::SELF_SIGNED});
  EXPECT_EQ(std::vector<std::string>{"Give this certificate with --ca, or its thumbprint with --thumbprint, after you "
                                     "have compared it in another way."},
            Check(handshake).todo);
  handshake.refusals[0].depth = 1;
  EXPECT_EQ(std::vector<std::string>{"Give this authority's certificate with --ca, after you have compared it in "
                                     "another way."},
            Check(handshake).todo);
}

TEST(CheckTls, GivesTheSameAdviceOnlyOnceAndCutsTheListOfReasons) {
  const DoctorCheck check = Check(Refused("expired", std::vector<Kind>(99, Kind::EXPIRED)));
  EXPECT_EQ(1u, check.todo.size());
  ASSERT_LE(12u, check.found.size());
  EXPECT_EQ("And 89 more reasons.", check.found[11]);
}

TEST(CheckTls, WarnsThatAnotherMachineMayAnswerIfTheThumbprintDiffers) {
  HandshakeProbe handshake = Refused("localhost", {Kind::OTHER_THUMBPRINT});
  handshake.refusals[0].certificate = nullptr;
  const DoctorCheck check = Check(handshake, true);
  EXPECT_EQ(std::vector<std::string>{"If the server has a new certificate, ask its operators for the new thumbprint. "
                                     "Otherwise another machine answers in the place of the server."},
            check.todo);
  EXPECT_THAT(TextOf(check), HasSubstr(COMPARE));
}

TEST(CheckTls, DescribesAHandshakeThatBreaks) {
  struct Case {
    Outcome outcome;
    const char *text;
  };
  for (const Case &broken :
       {Case{Outcome::PLAIN_HTTP,
             "tls           failed    The server answers with HTTP, without TLS.\n"
             "              to do     Correct the port in --sts, or have TLS enabled at that port.\n"},
        Case{Outcome::NOT_TLS, "tls           failed    The server answers, but not with TLS.\n"
                               "              to do     Correct the port in --sts.\n"},
        Case{Outcome::NO_COMMON_VERSION, "tls           failed    The server offers neither TLS 1.2 nor TLS 1.3.\n"
                                         "              to do     Have TLS 1.2 or 1.3 enabled on the server.\n"},
        Case{Outcome::TOO_LONG, "tls           failed    A message of the handshake is too long, usually the server's "
                                "chain of certificates.\n"
                                "              to do     Have the server send its own certificate and those up to its "
                                "authority, and no others.\n"},
        Case{Outcome::TIMED_OUT,
             "tls           failed    The server accepts the connection, but does not end the "
             "handshake in time.\n"
             "              to do     Look into the server's log, correct the port in --sts, or raise "
             "--timeout.\n"},
        Case{Outcome::FAILED, "tls           failed    The TLS handshake failed: no reason.\n"
                              "              to do     Look into the server's log.\n"}}) {
    HandshakeProbe handshake;
    handshake.outcome = broken.outcome;
    handshake.failure = "The TLS handshake failed: no reason";
    const DoctorCheck check = Check(handshake);
    EXPECT_EQ(broken.text, TextOf(check));
    EXPECT_EQ(ExitCode::COMMUNICATION, check.exitCode);
  }
}

TEST(CheckTls, WarnsOfACertificateThatEndsWithin30Days) {
  const auto end = CertificatesOf("tls/localhost").front()->GetNotAfter(); // 2120-01-02T03:04:05Z
  constexpr std::int64_t DAY = 24 * 60 * 60;
  EXPECT_EQ(CheckOutcome::FINE, Check(HandshakeOf("localhost"), false, end.PlusSeconds(-30 * DAY)).outcome);
  const DoctorCheck check = Check(HandshakeOf("localhost"), false, end.PlusSeconds(-30 * DAY + 1));
  EXPECT_EQ(CheckOutcome::WARNING, check.outcome);
  EXPECT_EQ(std::vector<std::string>{"Have the certificate CN=localhost renewed (29 days left)."}, check.todo);
}

TEST(CheckTls, CountsTheCertificatesThatAreNotShown) {
  HandshakeProbe handshake = HandshakeOf("localhost");
  handshake.chain.emplace_back(); // one that cannot be read
  handshake.chainLength = 12;
  EXPECT_EQ((std::vector<std::string>{"Certificate 1: CN=localhost, issued by CN=authority; 34331 days left.",
                                      "Certificate 2: cannot be read.", "And 10 more."}),
            Check(handshake).details);
}

TEST(CheckTls, WarnsOfPlainHttp) {
  EXPECT_EQ("tls           warning   The address is plain http: nothing is encrypted, and the server is not verified.\n"
            "              to do     Use an https address: otherwise passwords and tokens are sent unencrypted.\n",
            TextOf(CheckTls({false, "sts.corp.example", 80, "/"}, ServerProbe(), false, NOON)));
}

TEST(CheckTls, IsNotDoneWithoutAConnection) {
  EXPECT_EQ("tls           not done  There is no connection.\n", TextOf(CheckTls(TARGET, ServerProbe(), false, NOON)));
}

TEST(CheckTls, HasItsFactsInJson) {
  const std::string thumbprint = ThumbprintOf("expired");
  EXPECT_EQ(
      R"("version":"TLSv1.3","cipher":"TLS_AES_256_GCM_SHA384","accepted":false,"failure":null,)"
      R"("reasons":[{"kind":"expired","subject":"CN=expired","text":"the server's certificate was not accepted: no )"
      R"(reason"}],"names":["localhost","127.0.0.1","::1"],"thumbprint":")" +
          thumbprint +
          R"(","chain":[{"subject":"CN=expired","issuer":"CN=authority","notBefore":"2020-01-02T03:04:05.000Z",)"
          R"("notAfter":"2021-01-02T03:04:05.000Z","daysLeft":-1827,"key":"EC, P-256","sha256":")" +
          thumbprint + R"("}],"chainLength":1,"durationMs":4})",
      [] {
        const std::string json = JsonOf(Check(Refused("expired", {Kind::EXPIRED}))).dump();
        return json.substr(json.find("\"version\""));
      }());
}

TEST(MaySend, IsFalseForEveryHandshakeThatWasNotAccepted) {
  for (const Outcome outcome : {Outcome::CERTIFICATE_REFUSED, Outcome::PLAIN_HTTP, Outcome::NOT_TLS,
                                Outcome::NO_COMMON_VERSION, Outcome::TOO_LONG, Outcome::TIMED_OUT, Outcome::FAILED}) {
    EXPECT_FALSE(MaySend(TARGET, ProbeOf(HandshakeOf("localhost", outcome))));
  }
  EXPECT_TRUE(MaySend(TARGET, ProbeOf(HandshakeOf("localhost"))));
}

TEST(MaySend, NeedsOnlyAConnectionForPlainHttp) {
  const DoctorTarget plain{false, "sts.corp.example", 80, "/"};
  EXPECT_FALSE(MaySend(plain, ServerProbe()));
  ServerProbe probe = ProbeOf(HandshakeOf("localhost"));
  probe.handshake = boost::none;
  EXPECT_TRUE(MaySend(plain, probe));
  EXPECT_FALSE(MaySend(TARGET, probe));
}

TEST(LeftText, CountsWholeDays) {
  const auto certificate = CertificatesOf("tls/expired").front(); // 2020-01-02T03:04:05Z to 2021-01-02T03:04:05Z
  EXPECT_EQ("becomes valid in less than a day", LeftText(*certificate, DateTime("2020-01-02T03:04:04Z")));
  EXPECT_EQ("1 day left", LeftText(*certificate, DateTime("2021-01-01T03:04:05Z")));
  EXPECT_EQ("less than a day left", LeftText(*certificate, DateTime("2021-01-02T03:04:05Z")));
  EXPECT_EQ("expired less than a day ago", LeftText(*certificate, DateTime("2021-01-02T03:04:06Z")));
  EXPECT_EQ("expired 1 day ago", LeftText(*certificate, DateTime("2021-01-03T03:04:05Z")));
  EXPECT_EQ(0, DaysLeft(*certificate, DateTime("2021-01-02T03:04:05Z")));
  EXPECT_EQ(-1, DaysLeft(*certificate, DateTime("2021-01-02T03:04:06Z")));
}

} // namespace
} // namespace SsoClient::Tool
