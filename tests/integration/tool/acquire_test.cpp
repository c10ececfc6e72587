// SPDX-License-Identifier: Apache-2.0
// What acquire prints for every kind of answer of the service.

#include "expect_result.h"
#include "expected_output.h"
#include "refusals.h"
#include "service_test.h"
#include "token_values.h"

#include "support/data_file.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ctime>
#include <filesystem>
#include <iomanip>
#include <set>
#include <sstream>
#include <string>

namespace ToolTest {
namespace {

using testing::HasSubstr;
using testing::MatchesRegex;
using testing::Not;
using Testing::ReadDataFile;
using testing::StartsWith;

class Acquire : public ServiceTest {};

/// The seconds since the epoch of a date in the tool's output, without the fraction.
std::time_t SecondsOf(const std::string &text) {
  std::tm fields = {};
  std::istringstream(text) >> std::get_time(&fields, "%Y-%m-%dT%H:%M:%S");
  return timegm(&fields);
}

TEST_F(Acquire, ByPasswordShowsTheTokenAsText) {
  Result result = Run("ssoclient acquire " + Service() + PASSWORD + "--out token.xml");
  result.out = WithoutDistances(result.out);
  ExpectResult(result, 0, FillFrom(m_folder.Read("token.xml"), ReadDataFile("tool/acquired_by_password.txt")), "");
}

TEST_F(Acquire, AsksForEveryPropertyAndShowsTheTokenAsJson) {
  const Result result =
      Run("ssoclient acquire " + Service() + PASSWORD +
          "--lifetime 90m --audience https://mail.corp.example/ --audience https://files.corp.example/ --delegable "
          "--renewable --delegate-to bob@corp.example --advice urn:corp.example:mapper:color=green "
          "--advice audit:by='\xC3\xA9\\\\' --advice 'urn:corp.example:mapper:urn\\:corp.example\\:size=10' "
          "--advice urn:corp.example:mapper:color=a=b:c --format json --out token.xml");
  const std::string xml = m_folder.Read("token.xml");
  const std::string expected = Fill(FillFrom(xml, ReadDataFile("tool/acquired_with_everything.json")),
                                    "@DELEGATION_INSTANT@", AttributeIn(xml, "DelegationInstant"));
  ExpectResult({result.exitCode, WithoutDetails(result.out), result.err}, 0, expected, "");
  const std::string conditions = xml.substr(xml.find("Conditions "));
  EXPECT_EQ(90 * 60,
            SecondsOf(AttributeIn(conditions, "NotOnOrAfter")) - SecondsOf(AttributeIn(conditions, "NotBefore")));
}

TEST_F(Acquire, AsksForEightHoursWithoutALifetime) {
  Acquire::ServiceTest::Acquire("token.xml", PASSWORD);
  const std::string xml = m_folder.Read("token.xml");
  const std::string conditions = xml.substr(xml.find("Conditions "));
  EXPECT_EQ(8 * 60 * 60,
            SecondsOf(AttributeIn(conditions, "NotOnOrAfter")) - SecondsOf(AttributeIn(conditions, "NotBefore")));
}

TEST_F(Acquire, ByIdentityWithoutPasswordBindsTheTokenToTheKey) {
  const Result result = Run("ssoclient acquire " + Service() + IDENTITY + "--format json --out token.xml");
  const Result thumbprint = Run("openssl x509 -in client.pem -noout -fingerprint -sha256 | sed 's/.*=//;s/://g' | "
                                "tr -d '\\n' | tr A-F a-f");
  ExpectResult({result.exitCode, WithoutDetails(result.out), result.err}, 0,
               Fill(FillFrom(m_folder.Read("token.xml"), ReadDataFile("tool/acquired_by_identity.json")), "@SHA256@",
                    thumbprint.out),
               "");
}

TEST_F(Acquire, ByPasswordBindsTheTokenToTheIdentityUnlessABearerTokenIsAskedFor) {
  const std::string line = "ssoclient acquire " + Service() + PASSWORD + IDENTITY;
  const Result bound = Run(line);
  EXPECT_EQ(0, bound.exitCode) << bound.err;
  EXPECT_THAT(bound.out, HasSubstr("\nConfirmation:    holder-of-key\n"));
  EXPECT_THAT(bound.out, HasSubstr("\nCertificate:     CN=client,O=corp.example\n"));
  const Result bearer = Run(line + "--bearer");
  EXPECT_EQ(0, bearer.exitCode) << bearer.err;
  EXPECT_THAT(bearer.out, HasSubstr("\nConfirmation:    bearer\n"));
}

TEST_F(Acquire, InExchangeDelegatesTheToken) {
  Acquire::ServiceTest::Acquire("first.xml", std::string(IDENTITY) + "--delegable");
  const Result result = Run("ssoclient acquire " + Service() + IDENTITY +
                            "--token - --delegate-to bob@corp.example --out second.xml <first.xml");
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_THAT(result.out, HasSubstr("\nSubject:         client@corp.example\n"));
  EXPECT_THAT(result.out, HasSubstr("\nDelegate:        bob@corp.example at " +
                                    AttributeIn(m_folder.Read("second.xml"), "DelegationInstant") + "\n"));
}

TEST_F(Acquire, ReadsAnIdentityFromAKeyStoreAndAnEncryptedKey) {
  Run("openssl pkcs12 -export -in client.pem -inkey client.key -passout pass:'open sesame' -out client.p12");
  Run("openssl pkcs8 -topk8 -in client.key -passout pass:'open sesame' -out encrypted.key");
  m_folder.Write("passphrase.txt", "open sesame\n");
  for (const char *identity : {"--p12 client.p12 ", "--cert client.pem --key encrypted.key "}) {
    const Result result = Run("ssoclient acquire " + Service() + identity + "--passphrase-file passphrase.txt");
    EXPECT_EQ(0, result.exitCode) << result.err;
    EXPECT_THAT(result.out, HasSubstr("\nSubject:         client@corp.example\n"));
  }
}

TEST_F(Acquire, ReadsPasswordAndPassphraseFromFileDescriptors) {
  Run("openssl pkcs8 -topk8 -in client.key -passout pass:'open sesame' -out encrypted.key");
  m_folder.Write("passphrase.txt", "open sesame\n");
  const Result result = Run("ssoclient acquire " + Service() +
                            "--cert client.pem --key encrypted.key --passphrase-fd 5 5<passphrase.txt "
                            "--user alice@corp.example --password-fd 6 6<password.txt");
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_THAT(result.out, HasSubstr("\nConfirmation:    holder-of-key\n"));
}

TEST_F(Acquire, WritesTheTokenItselfToStandardOutput) {
  for (const char *options : {"--format xml", "--out -", "--out - --format xml"}) {
    const Result result = Run("ssoclient acquire " + Service() + PASSWORD + options + " >token.xml");
    ExpectResult(result, 0, "", "");
    EXPECT_EQ(0, Run("ssoclient verify --trust sts.pem token.xml").exitCode);
  }
}

TEST_F(Acquire, WritesTheTokenOnlyToTheFileWhenTheFormatIsXml) {
  ExpectResult(Run("ssoclient acquire " + Service() + PASSWORD + "--format xml --out token.xml"), 0, "", "");
  EXPECT_EQ(0, Run("ssoclient verify --trust sts.pem token.xml").exitCode);
}

TEST_F(Acquire, AcceptsTheServersThumbprintInsteadOfAnAuthority) {
  std::string withColons = m_service.GetThumbprint();
  for (std::size_t at = 2; at < withColons.size(); at += 3) {
    withColons.insert(at, ":");
  }
  const std::string line = "ssoclient acquire --sts " + m_service.GetUrl() + " --trust sts.pem " + PASSWORD;
  EXPECT_EQ(0, Run(line + "--thumbprint " + m_service.GetThumbprint()).exitCode);
  EXPECT_EQ(0, Run(line + "--thumbprint " + withColons).exitCode);
  const Result wrong = Run(line + "--thumbprint " + std::string(64, '0'));
  EXPECT_EQ(4, wrong.exitCode);
  EXPECT_THAT(wrong.err, StartsWith("ssoclient: communication failed: "));
}

TEST_F(Acquire, RefusesAServerWhoseCertificateTheAuthoritiesDidNotIssue) {
  for (const char *authority : {"", "--ca client.pem "}) {
    const Result result =
        Run("ssoclient acquire --sts " + m_service.GetUrl() + " --trust sts.pem " + authority + PASSWORD);
    EXPECT_EQ(4, result.exitCode);
    EXPECT_EQ("", result.out);
    EXPECT_THAT(result.err,
                HasSubstr("the server's certificate was not accepted: unable to get local issuer certificate"));
  }
}

TEST_F(Acquire, ChecksAnIssuedTokenWithANarrowerTolerance) {
  const std::string line = "ssoclient acquire " + Service() + PASSWORD + "--lifetime 1h --out token.xml ";
  const Result result = Run(line + "--tolerance -3600");
  EXPECT_EQ(5, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_THAT(result.err, StartsWith("ssoclient: token invalid: "));
  EXPECT_EQ(0u, m_folder.Names().count("token.xml"));
  EXPECT_EQ(0, Run(line + "--tolerance 0").exitCode);
}

constexpr const char *OPERATION = "[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}";

TEST_F(Acquire, ShowsTheLibrarysLogAndTheEventsWithoutSecrets) {
  const Result result = Run("ssoclient acquire -v " + Service() + PASSWORD + "--format xml");
  EXPECT_EQ(0, result.exitCode);
  std::istringstream lines(result.err);
  const std::string expected[] = {
      std::string("ssoclient: log: opId=") + OPERATION + " START operation TokenClient::AcquireToken",
      std::string("ssoclient: started AcquireToken ") + OPERATION,
      "ssoclient: log: Requested token for subject `alice@corp\\.example', spec `.*'",
      "ssoclient: request: http://docs\\.oasis-open\\.org/ws-sx/ws-trust/200512/RST/Issue, [0-9]+ octets",
      "ssoclient: response: 200 OK, text/xml; charset=utf-8, [0-9]+ octets, [0-9]+ ms",
      "ssoclient: log: Successfully acquired token: .*",
      "ssoclient: ended: succeeded after [0-9]+ ms",
      std::string("ssoclient: log: opId=") + OPERATION + " END operation TokenClient::AcquireToken"};
  for (const std::string &pattern : expected) {
    std::string line;
    std::getline(lines, line);
    EXPECT_THAT(line, MatchesRegex(pattern));
  }
  EXPECT_EQ(std::istringstream::traits_type::eof(), lines.peek());
  EXPECT_THAT(result.err, Not(HasSubstr("wonderland")));
  EXPECT_THAT(result.err, Not(HasSubstr("SignatureValue")));
  EXPECT_THAT(result.err, Not(HasSubstr("saml:")));
}

TEST_F(Acquire, ShowsNoPasswordInAFailure) {
  m_folder.Write("wrong.txt", "l00king-glass\n");
  for (const char *fault : {"", "reset", "bad-status", "garbled-xml", "soap-fault-Unknown"}) {
    const Result result = Run("ssoclient acquire -v --format json " + Service(fault) +
                              "--user alice@corp.example --password-file wrong.txt");
    EXPECT_NE(0, result.exitCode);
    EXPECT_EQ("", result.out);
    EXPECT_THAT(result.err, Not(HasSubstr("l00king-glass"))) << fault;
  }
}

struct Answer {
  const char *name;
  const char *fault;
  const char *options;
  int exitCode;
  const char *exceptionClass;
  const char *label;
  const char *message; ///< contains no character that JSON escapes
};

const Answer ANSWERS[] = {
    {"WrongPassword", "", "--user alice@corp.example --password-file wrong.txt ", 3, "InvalidCredentialsException",
     "credentials refused", "Authentication failed: unknown user or wrong password"},
    {"UnknownUser", "", "--user mallory@corp.example --password-file password.txt ", 3, "InvalidCredentialsException",
     "credentials refused", "Authentication failed: unknown user or wrong password"},
    {"UnknownIdentity", "", "--cert foreign.pem --key foreign.key ", 3, "InvalidCredentialsException",
     "credentials refused",
     "Authentication failed: the certificate is not a client certificate of the service's authority"},
    {"FailedAuthentication", "soap-fault-FailedAuthentication", PASSWORD, 3, "InvalidCredentialsException",
     "credentials refused", "Authentication failed: a fault was asked for"},
    {"BrokenConnection", "reset", PASSWORD, 4, "CommunicationException", "communication failed",
     "The TLS connection to localhost broke: The connection to localhost:@PORT@ broke: Connection reset by peer"},
    {"StatusOfFailure", "bad-status", PASSWORD, 4, "CommunicationException", "communication failed",
     "Server returned error: 503 Service Unavailable"},
    {"AnswerThatIsNotHttp", "garbage", PASSWORD, 4, "CommunicationException", "communication failed",
     "Bad response from localhost:@PORT@: its header is not HTTP/1.x (bad version)"},
    {"TamperedToken", "tampered-token", PASSWORD, 6, "InvalidSignatureException", "signature invalid",
     "Failed to verify signature: token might have been tampered with."},
    {"ForeignToken", "wrong-signer", PASSWORD, 6, "InvalidSignatureException", "signature invalid",
     "Failed to verify signature: token might have been tampered with."},
    {"AnswerWithoutToken", "no-token", PASSWORD, 8, "SsoException", "service fault", "Unexpected XML format"},
    {"AnswerThatIsNotSoap", "not-soap", PASSWORD, 8, "SsoException", "service fault",
     "Unexpected response format: missing SAOP Body."},
    {"UnknownFault", "soap-fault-Unknown", PASSWORD, 8, "SsoException", "service fault",
     "Unexpected SOAP fault: devsts:Unknown; request failed."},
    {"TokenOfAnotherKey", "", "--cert other-client.pem --key other-client.key --token client.xml ", 8, "SsoException",
     "service fault", "Unexpected SOAP fault: wsse:FailedCheck; request failed."},
    {"DelegationThatIsNotAllowed", "",
     "--cert client.pem --key client.key --token client.xml --delegate-to bob@corp.example ", 8, "SsoException",
     "service fault", "Unexpected SOAP fault: wst:RequestFailed; request failed."},
};

class AcquireRefusal : public ServiceTest, public testing::WithParamInterface<Answer> {
protected:
  AcquireRefusal() {
    Acquire("client.xml", IDENTITY);
    std::filesystem::copy_file(m_service.PathOf("foreign.crt"), m_folder / "foreign.pem");
    std::filesystem::copy_file(m_service.PathOf("foreign.key"), m_folder / "foreign.key");
    m_before = m_folder.Names();
  }

  std::string Line() const {
    return "ssoclient acquire " + Service(GetParam().fault) + GetParam().options + "--out token.xml ";
  }

  std::string Message() const { return Fill(GetParam().message, "@PORT@", std::to_string(m_service.GetPort())); }

  /// Only the refusal of a token that the service issued has a hint.
  std::string Hint() const { return IsAboutToken(GetParam().exceptionClass) ? SAVE_HINT : ""; }

  std::set<std::string> m_before;
};

TEST_P(AcquireRefusal, IsALineOfTextAndAnExitCodeAndNoFile) {
  ExpectResult(Run(Line()), GetParam().exitCode, "", RefusalText(GetParam().label, Message(), Hint()));
  EXPECT_EQ(m_before, m_folder.Names());
}

TEST_P(AcquireRefusal, IsOneJsonObjectAndTheSameExitCode) {
  ExpectResult(Run(Line() + "--format json"), GetParam().exitCode, "",
               RefusalJson(GetParam().exceptionClass, Message(), Hint()));
  EXPECT_EQ(m_before, m_folder.Names());
}

INSTANTIATE_TEST_SUITE_P(Of, AcquireRefusal, testing::ValuesIn(ANSWERS),
                         [](const auto &answer) { return std::string(answer.param.name); });

TEST_F(Acquire, RefusesAnAnswerThatIsCutShort) {
  const Result result = Run("ssoclient acquire " + Service("truncate") + PASSWORD + "--out token.xml");
  EXPECT_EQ(4, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_THAT(result.err, MatchesRegex("ssoclient: communication failed: Bad response from localhost:[0-9]+: the "
                                       "connection ended after [0-9]+ of the body's [0-9]+ bytes\n"));
  EXPECT_EQ(0u, m_folder.Names().count("token.xml"));
}

TEST_F(Acquire, RefusesATokenThatIsNotSigned) {
  const Result result = Run("ssoclient acquire " + Service("unsigned-token") + PASSWORD + "--out token.xml");
  EXPECT_EQ(8, result.exitCode);
  EXPECT_EQ("", result.out);
  EXPECT_THAT(result.err, MatchesRegex("ssoclient: service fault: Signature syntax error: Expected ds:Signature, "
                                       "found \"saml:Subject\" at line 1, column [0-9]+\n"
                                       "ssoclient: hint: " +
                                       std::string(SAVE_HINT) + "\n"));
  EXPECT_EQ(0u, m_folder.Names().count("token.xml"));
}

TEST_F(Acquire, RefusesAnIssuedTokenThatIsOutOfDate) {
  for (const char *fault : {"expired-token", "early-token"}) {
    const Result result = Run("ssoclient acquire --format json " + Service(fault) + PASSWORD + "--out token.xml");
    EXPECT_EQ(8, result.exitCode);
    EXPECT_EQ("", result.out);
    EXPECT_THAT(result.err, StartsWith(R"({"schema":1,"error":{"class":"SsoException","message":")"));
    EXPECT_EQ(0u, m_folder.Names().count("token.xml"));
  }
}

} // namespace
} // namespace ToolTest
