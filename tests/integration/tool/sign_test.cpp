// SPDX-License-Identifier: Apache-2.0
// What `sign` writes, what the echo service of the development service says of it, and what it refuses to sign.

#include "message_test.h"

#include "tls_client.h"

#include <tarvel/system/date_time.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

namespace ToolTest {
namespace {

using DevStsTest::HttpAnswer;
using testing::HasSubstr;
namespace fs = std::filesystem;

constexpr const char *WITH_TOKEN = "ssoclient sign --token token.xml ";
constexpr const char *SIGN = "ssoclient sign --token token.xml --key client.key ";

class SignCommand : public MessageTest {
protected:
  explicit SignCommand(const std::vector<std::string> &arguments = {}) : MessageTest(arguments) {}

  HttpAnswer Post(const std::string &message) const {
    const bool isSoap12 = message.find(SOAP12) != std::string::npos;
    return DevStsTest::Post(m_service, "", message, "/echo", isSoap12 ? "application/soap+xml" : "text/xml");
  }

  void ExpectEcho(const std::string &message, const std::string &subject = "client@corp.example",
                  const std::string &proof = "message-signature") const {
    const HttpAnswer answer = Post(message);
    EXPECT_EQ(200, answer.status) << answer.body;
    EXPECT_THAT(answer.body, HasSubstr("<echo:Subject>" + subject + "</echo:Subject>"));
    EXPECT_THAT(answer.body, HasSubstr("<echo:Proof>" + proof + "</echo:Proof>"));
    EXPECT_THAT(answer.body, HasSubstr(std::string(">") + ORDER + "</s:Body>"));
  }

  void ExpectFault(const std::string &message, const std::string &code, const std::string &reason) const {
    const HttpAnswer answer = Post(message);
    EXPECT_EQ(500, answer.status);
    EXPECT_THAT(answer.body, HasSubstr(">" + code + "</faultcode><faultstring>" + reason + "</faultstring>"));
  }
};

TEST_F(SignCommand, SignsAMessageThatTheServiceAcceptsOnce) {
  const std::string message = Sign();
  ExpectEcho(message);
  ExpectFault(message, "wsse:InvalidSecurity", "the message was received before");
}

TEST_F(SignCommand, SignsSoap12AndBothSpellingsOfTheTokenType) {
  m_folder.Write("envelope.xml", Envelope(SOAP12));
  ExpectEcho(Sign());
  ExpectEcho(Sign("--token token.xml --key client.key --token-type-reference standard envelope.xml"));
}

TEST_F(SignCommand, SignsTheBlocksThatAreAskedFor) {
  const std::string message =
      Sign("--token token.xml --key client.key --part {urn:example:trace}Trace --part Plain envelope.xml");
  ExpectEcho(message);
  for (const char *from : {">5<", "<Plain "}) {
    ExpectFault(Replaced(message, from, std::string(from) == ">5<" ? ">6<" : "<Plain new=\"\" "), "wsse:FailedCheck",
                "the message's signature is wrong, or made with another key than the token's");
  }
  ExpectEcho(Replaced(Sign(), ">5<", ">6<"));
}

TEST_F(SignCommand, MakesAMessageThatCannotBeChanged) {
  constexpr const char *WRONG = "the message's signature is wrong, or made with another key than the token's";
  const std::string message = Sign();
  ExpectFault(Replaced(message, ">7<", ">8<"), "wsse:FailedCheck", WRONG);
  const std::string expires = Between(message, "<wsu:Expires>", "<");
  ExpectFault(Replaced(message, expires, Replaced(expires, "Z", "1Z")), "wsse:FailedCheck", WRONG);
  const std::string created = Between(message, "<wsu:Created>", "<");
  ExpectFault(Replaced(Replaced(message, created, "2020-01-01T00:00:00Z"), expires, "2020-01-01T00:05:00Z"),
              "wsu:MessageExpired", "the message has expired");
  ExpectEcho(message);
}

TEST_F(SignCommand, KeepsWhatTheMessageContains) {
  m_folder.Write("envelope.xml", "<!-- before --><s:Envelope xmlns:s=\"" + std::string(SOAP11) + "\"><s:Body>" + ORDER +
                                     "<!-- inside --></s:Body></s:Envelope><?after all?>");
  const std::string message = Sign();
  EXPECT_THAT(message, testing::StartsWith("<!-- before -->"));
  EXPECT_THAT(message, HasSubstr(std::string(ORDER) + "<!-- inside --></s:Body></s:Envelope>"));
  EXPECT_THAT(message, testing::EndsWith("<?after all?>\n"));
}

TEST_F(SignCommand, SetsTheLifetimeAndTheReceiver) {
  const std::string message = Sign("--token token.xml --key client.key --lifetime 90s --actor urn:example:gateway "
                                   "envelope.xml");
  const Tarvel::System::DateTime created(Between(message, "<wsu:Created>", "<"));
  const Tarvel::System::DateTime expires(Between(message, "<wsu:Expires>", "<"));
  EXPECT_EQ(90'000'000, expires.MicrosecondsSince(created));
  EXPECT_THAT(message, HasSubstr(" s:actor=\"urn:example:gateway\""));
  EXPECT_THAT(message, HasSubstr(" s:mustUnderstand=\"1\""));
  EXPECT_THAT(Sign("--token token.xml --key client.key --optional envelope.xml"),
              testing::Not(HasSubstr("mustUnderstand")));
}

TEST_F(SignCommand, WritesAPrivateFileThatItReplacesOnlyIfAsked) {
  const std::string command = std::string(SIGN) + "--out signed.xml envelope.xml";
  ExpectResult(Run(command), 0, "", "");
  EXPECT_EQ(fs::perms::owner_read | fs::perms::owner_write, fs::status(m_folder / "signed.xml").permissions());
  const std::string message = m_folder.Read("signed.xml");
  ExpectEcho(message);
  ExpectResult(Run(command), 7, "", "ssoclient: file: signed.xml: already exists; --force replaces it\n");
  EXPECT_EQ(message, m_folder.Read("signed.xml"));
  ExpectResult(Run(command + " --force"), 0, "", "");
  EXPECT_NE(message, m_folder.Read("signed.xml"));
}

TEST_F(SignCommand, ReadsMessageTokenAndPassphraseFromStandardInput) {
  ExpectEcho(Sign("--token token.xml --key client.key - <envelope.xml"));
  ExpectEcho(Sign("--token - --key client.key envelope.xml <token.xml"));
  const std::string encrypt = "openssl pkey -in client.key -aes256 -passout pass:rabbit -out locked.key && "
                              "openssl pkcs12 -export -in client.pem -inkey client.key -passout pass:rabbit -out c.p12";
  ASSERT_EQ(0, Run(encrypt).exitCode);
  ExpectEcho(Sign("--token token.xml --key locked.key --passphrase-file - envelope.xml <<E\nrabbit\nE\n"));
  m_folder.Write("passphrase.txt", "rabbit\n");
  ExpectEcho(Sign("--token token.xml --p12 c.p12 --passphrase-file passphrase.txt envelope.xml"));
  ExpectResult(Run("ssoclient sign --token - --key client.key - <token.xml"), 2, "",
               "ssoclient: usage: FILE and --token cannot both read standard input\n");
  m_folder.Write("passphrase.txt", "hare\n");
  const Result wrong = Run(std::string(WITH_TOKEN) + "--key locked.key --passphrase-file passphrase.txt envelope.xml");
  EXPECT_EQ(7, wrong.exitCode);
  EXPECT_THAT(wrong.err, testing::StartsWith("ssoclient: passphrase: locked.key: "));
}

TEST_F(SignCommand, UsesOpenSslAsTheMachineConfiguresItIfAsked) {
  ExpectEcho(Sign("--token token.xml --key client.key --system-crypto envelope.xml"));
}

TEST_F(SignCommand, VerifiesTheTokenWithTheTrustedCertificatesOrItsOwn) {
  ExpectEcho(Sign("--token token.xml --trust sts.pem --key client.key envelope.xml"));
  const Result untrusted = Run(std::string(SIGN) + "--trust client.pem envelope.xml");
  EXPECT_EQ(6, untrusted.exitCode);
  EXPECT_THAT(untrusted.err, testing::StartsWith("ssoclient: signature invalid: "));
  m_folder.Write("token.xml", Replaced(m_folder.Read("token.xml"), "client@corp.example", "admin@corp.example"));
  const Result changed = Run(std::string(SIGN) + "envelope.xml");
  EXPECT_EQ(6, changed.exitCode);
  EXPECT_EQ("", changed.out);
  EXPECT_THAT(changed.err, testing::StartsWith("ssoclient: signature invalid: "));
}

TEST_F(SignCommand, NeedsACertificateToVerifyTheTokenWith) {
  const std::string token = m_folder.Read("token.xml");
  const std::size_t signature = token.find("<ds:Signature ");
  const std::size_t keyInfo = token.find("<ds:KeyInfo>", signature);
  const std::size_t end = token.find("</ds:KeyInfo>", signature);
  m_folder.Write("token.xml", token.substr(0, keyInfo) + token.substr(end + std::string("</ds:KeyInfo>").size()));
  ExpectResult(Run(std::string(SIGN) + "envelope.xml"), 2, "",
               "ssoclient: usage: the token's signature has no certificate to verify it with; give --trust\n");
  const Result checked = Check(Sign("--token token.xml --trust sts.pem --key client.key envelope.xml"));
  EXPECT_EQ(0, checked.exitCode) << checked.err;
}

TEST_F(SignCommand, RefusesAKeyThatIsNotTheTokens) {
  ExpectResult(Run(std::string(WITH_TOKEN) + "--key other-client.key envelope.xml"), 7, "",
               "ssoclient: key: The private key does not belong to the certificate CN=client,O=corp.example\n");
}

TEST_F(SignCommand, UsesTheKeyOfAHolderOfKeyTokenOnly) {
  ExpectResult(Run(std::string(WITH_TOKEN) + "envelope.xml"), 2, "",
               "ssoclient: usage: the token is bound to a key, which must sign the message; give --key or --p12\n");
  ExpectResult(Run("ssoclient sign --token bearer.xml --key client.key envelope.xml"), 2, "",
               "ssoclient: usage: the token is a bearer token, which has no key; leave out --key and --p12\n");
  ExpectResult(Run("ssoclient sign --token bearer.xml --part Plain envelope.xml"), 2, "",
               "ssoclient: usage: with a bearer token nothing is signed; leave out --part\n");
  ExpectFault(Sign("--token bearer.xml envelope.xml"), "wsse:InvalidSecurityToken",
              "this service accepts no bearer token");
}

TEST_F(SignCommand, RefusesAWrongCommandLine) {
  const auto expect = [this](const std::string &arguments, const std::string &reason) {
    ExpectResult(Run("ssoclient sign " + arguments), 2, "", "ssoclient: usage: " + reason + "\n");
  };
  expect("envelope.xml", "--token is required; see ssoclient --help");
  expect("--token token.xml", "FILE is required; see ssoclient --help");
  expect("--token token.xml --key client.key --p12 c.p12 envelope.xml", "--key excludes --p12; see ssoclient --help");
  expect("--token token.xml --passphrase-file p envelope.xml",
         "there is no key for the passphrase; give --key or --p12");
  expect("--token token.xml --key client.key --lifetime 0s envelope.xml", "--lifetime must be positive");
  expect("--token token.xml --key client.key --part {urn:x envelope.xml",
         "--part must be {NAMESPACE}NAME, and '{urn:x' has no closing brace");
  for (const char *part : {"{urn:x}", "a}b", "{urn:x}{y}z"}) {
    expect(std::string("--token token.xml --key client.key --part ") + part + " envelope.xml",
           std::string("--part must be {NAMESPACE}NAME, which '") + part + "' is not");
  }
}

TEST_F(SignCommand, RefusesAMessageThatItCannotSign) {
  m_folder.Write("envelope.xml", "<s>");
  const Result malformed = Run(std::string(SIGN) + "envelope.xml");
  EXPECT_EQ(5, malformed.exitCode);
  EXPECT_THAT(malformed.err, testing::StartsWith("ssoclient: message invalid: "));
  EXPECT_THAT(Run(std::string(SIGN) + "--format json envelope.xml").err, HasSubstr("\"class\":\"XMLParseException\""));
  m_folder.Write("envelope.xml", "<s/>");
  const Result notSoap = Run(std::string(SIGN) + "envelope.xml");
  EXPECT_EQ(5, notSoap.exitCode);
  EXPECT_THAT(notSoap.err, testing::StartsWith("ssoclient: message invalid: "));
  EXPECT_THAT(Run(std::string(SIGN) + "--format json envelope.xml").err,
              HasSubstr("\"class\":\"InvalidMessageException\""));
  m_folder.Write("envelope.xml", Envelope());
  const Result missing = Run(std::string(SIGN) + "--part {urn:x}Missing envelope.xml");
  EXPECT_EQ(5, missing.exitCode);
  EXPECT_THAT(missing.err, HasSubstr("{urn:x}Missing"));
  ExpectResult(Run(std::string(SIGN) + "missing.xml"), 7, "",
               "ssoclient: file: missing.xml: No such file or directory\n");
}

class SignForEchoBearer : public SignCommand {
protected:
  SignForEchoBearer() : SignCommand({"--echo-bearer"}) {}
};

TEST_F(SignForEchoBearer, AttachesABearerToken) {
  const std::string message = Sign("--token bearer.xml --trust sts.pem envelope.xml");
  EXPECT_THAT(message, HasSubstr("<saml:Assertion "));
  ExpectEcho(message, "alice@corp.example", "bearer");
}

} // namespace
} // namespace ToolTest
