// SPDX-License-Identifier: Apache-2.0
// Command lines of acquire, renew and validate that end before a service is reached.

#include "closed_port.h"
#include "expect_result.h"
#include "process.h"
#include "refusals.h"
#include "support/work_folder.h"

#include <gtest/gtest.h>

#include <csignal>
#include <string>
#include <vector>

#include <sys/stat.h>

namespace ToolTest {
namespace {

using Testing::WorkFolder;

struct Refusal {
  const char *name;
  const char *commandLine; ///< run in the folder with the fixtures' tokens
  int exitCode;
  const char *exceptionClass;
  const char *label;
  const char *message; ///< in text; the only characters in it that JSON escapes are double quotes
};

#define STS "--sts https://127.0.0.1:9/sts --trust sts-rsa.crt "
#define USAGE 2, "UsageException", "usage"
#define SEE_HELP "; see ssoclient --help"
#define THUMBPRINT_FORM                                                                                                \
  "--thumbprint must be the 64 hexadecimal digits of a SHA-256 digest, with a colon after every two of them or with "  \
  "none"

const Refusal REFUSALS[] = {
    {"NoAddress", "acquire --trust sts-rsa.crt --user alice", USAGE, "--sts is required" SEE_HELP},
    {"NoTrust", "acquire --sts https://127.0.0.1:9/ --user alice", USAGE, "--trust is required" SEE_HELP},
    {"AcquireWithoutCredentials", "acquire " STS, USAGE,
     "there are no credentials; give --user, --token, --gss, or an identity (--cert and --key, or --p12)"},
    {"AcquireWithTwoKindsOfCredentials", "acquire " STS "--user alice --token bearer.xml", USAGE,
     "--user and --token exclude each other"},
    {"AcquireByPasswordAndTicket", "acquire " STS "--user alice --gss", USAGE, "--user and --gss exclude each other"},
    {"AcquireByTokenAndTicket", "acquire " STS "--token bearer.xml --gss", USAGE,
     "--token and --gss exclude each other"},
    {"ServiceWithoutGss", "acquire " STS "--user alice --service HTTP@localhost", USAGE,
     "--service requires --gss" SEE_HELP},
    {"CacheWithoutGss", "acquire " STS "--user alice --ccache FILE:cache", USAGE, "--ccache requires --gss" SEE_HELP},
    {"KeytabWithoutGss", "acquire " STS "--user alice --client-keytab alice.keytab", USAGE,
     "--client-keytab requires --gss" SEE_HELP},
    {"PasswordWithoutUser", "acquire " STS "--password-file pw", USAGE, "--password-file requires --user" SEE_HELP},
    {"TwoPasswords", "acquire " STS "--user alice --password-file pw --password-fd 3", USAGE,
     "--password-file excludes --password-fd" SEE_HELP},
    {"NegativeDescriptor", "acquire " STS "--user alice --password-fd -1", USAGE,
     "--password-fd: must be a number from 0 to 65535" SEE_HELP},
    {"DescriptorBeyondTheLast", "acquire " STS "--user alice --password-fd 65536", USAGE,
     "--password-fd: must be a number from 0 to 65535" SEE_HELP},
    {"DescriptorBeyondAllNumbers", "acquire " STS "--user alice --password-fd 99999999999999999999", USAGE,
     "--password-fd: is out of range" SEE_HELP},
    {"PasswordInPlaceOfItsDescriptor", "acquire " STS "--user alice --password-fd wonderland", USAGE,
     "--password-fd: must be a whole number" SEE_HELP},
    {"PasswordLikeAnOptionInPlaceOfItsDescriptor", "acquire " STS "--user alice --password-fd=--wonderland", USAGE,
     "--password-fd: must be a whole number" SEE_HELP},
    {"PasswordThatBeginsWithANumberInPlaceOfItsDescriptor", "acquire " STS "--user alice --password-fd 1wonderland",
     USAGE, "--password-fd: must be a whole number" SEE_HELP},
    {"PassphraseInPlaceOfItsDescriptor", "renew " STS "--p12 x.p12 --passphrase-fd wonderland full.xml", USAGE,
     "--passphrase-fd: must be a whole number" SEE_HELP},
    {"PasswordInPlaceOfTheTolerance", "acquire " STS "--user alice --tolerance wonderland", USAGE,
     "--tolerance: must be a whole number" SEE_HELP},
    {"HexadecimalTolerance", "acquire " STS "--user alice --tolerance 0x10", USAGE,
     "--tolerance: must be a whole number" SEE_HELP},
    {"PasswordJoinedToAFlag", "acquire " STS "--user alice --force=wonderland", USAGE,
     "--force: takes no argument" SEE_HELP},
    {"PasswordJoinedToTheCommonFlag", "acquire " STS "--user alice --verbose=wonderland", USAGE,
     "--verbose: takes no argument" SEE_HELP},
    {"PasswordAsAnArgument", "acquire " STS "--user alice wonderland", USAGE, "too many arguments" SEE_HELP},
    {"PasswordJoinedToAShortOption", "acquire " STS "--user alice -pwonderland", USAGE, "not expected: -p" SEE_HELP},
    {"PasswordAfterAShortOption", "acquire " STS "--user alice -p wonderland", USAGE, "not expected: -p" SEE_HELP},
    {"PasswordLikeAnOptionOnTheCommandLine", "acquire " STS "--user alice --password --wonderland", USAGE,
     "not expected: --password" SEE_HELP},
    {"PasswordBeforeTheCommand", "--password=wonderland acquire " STS "--user alice", USAGE,
     "not expected: --password" SEE_HELP},
    {"PasswordWithoutACommand", "--password=wonderland", USAGE, "unknown command or option '--password'" SEE_HELP},
    {"PasswordJoinedToAShortOptionWithoutACommand", "-pwonderland", USAGE, "unknown command or option '-p'" SEE_HELP},
    {"PasswordOnTheCommandLine", "acquire " STS "--user alice --password wonderland", USAGE,
     "not expected: --password" SEE_HELP},
    {"CertificateWithoutKey", "acquire " STS "--cert holder.crt", USAGE, "--cert requires --key" SEE_HELP},
    {"KeyWithoutCertificate", "acquire " STS "--key holder.key", USAGE, "--key requires --cert" SEE_HELP},
    {"KeyStoreAndKey", "acquire " STS "--cert holder.crt --key holder.key --p12 x.p12", USAGE,
     "--cert excludes --p12" SEE_HELP},
    {"PassphraseWithoutKey", "acquire " STS "--user alice --passphrase-fd 3", USAGE,
     "there is no key for the passphrase; give --cert and --key, or --p12"},
    {"ExchangeWithoutIdentity", "acquire " STS "--token bearer.xml", USAGE,
     "--token needs an identity to sign with; give --cert and --key, or --p12"},
    {"BearerWithOnlyAnIdentity", "acquire " STS "--bearer --cert holder.crt --key holder.key", USAGE,
     "--bearer cannot be combined with an identity alone, whose token is bound to its key"},
    {"StandardInputTwice", "acquire " STS "--p12 x.p12 --passphrase-file - --user alice --password-file -", USAGE,
     "--password-file and --passphrase-file cannot both read standard input"},
    {"StandardInputTwiceByDescriptor", "renew " STS "--p12 x.p12 --passphrase-fd 0 -", USAGE,
     "FILE and --passphrase-fd cannot both read standard input"},
    {"DescriptorTwice", "acquire " STS "--p12 x.p12 --passphrase-fd 3 --user alice --password-fd 3", USAGE,
     "--password-fd and --passphrase-fd cannot both read descriptor 3"},
    {"LifetimeThatIsNotANumber", "acquire " STS "--user alice --lifetime soon", USAGE,
     "--lifetime must be a duration such as 8h (units: s, m, h, d)"},
    {"LifetimeOfAnUnknownUnit", "acquire " STS "--user alice --lifetime 8w", USAGE,
     "--lifetime must be a duration such as 8h (units: s, m, h, d)"},
    {"LifetimeOfOnlyAUnit", "acquire " STS "--user alice --lifetime h", USAGE,
     "--lifetime must be a duration such as 8h (units: s, m, h, d)"},
    {"LifetimeOfZero", "acquire " STS "--user alice --lifetime 0h", USAGE, "--lifetime must be positive"},
    {"NegativeLifetime", "renew " STS "--p12 x.p12 --lifetime=-1h token.xml", USAGE, "--lifetime must be positive"},
    {"LifetimeBeyondACentury", "acquire " STS "--user alice --lifetime 36601d", USAGE,
     "--lifetime must be at most a hundred years"},
    {"LifetimeBeyondAllNumbers", "acquire " STS "--user alice --lifetime 99999999999999999999s", USAGE,
     "--lifetime must be at most a hundred years"},
    {"AdviceWithoutSource", "acquire " STS "--user alice --advice color=green", USAGE,
     "--advice 'color=green' is not of the form SOURCE:NAME=VALUE"},
    {"AdviceOfAnEmptySource", "acquire " STS "--user alice --advice :color=green", USAGE,
     "--advice ':color=green' is not of the form SOURCE:NAME=VALUE"},
    {"AdviceOfAnEmptyName", "acquire " STS "--user alice --advice urn:a:=green", USAGE,
     "--advice 'urn:a:=green' is not of the form SOURCE:NAME=VALUE"},
    {"AdviceOfAnEmptyValue", "acquire " STS "--user alice --advice urn:a:color=", USAGE,
     "--advice 'urn:a:color=' is not of the form SOURCE:NAME=VALUE"},
    {"AdviceWithoutValue", "acquire " STS "--user alice --advice urn:a:color", USAGE,
     "--advice 'urn:a:color' is not of the form SOURCE:NAME=VALUE"},
    {"PlainHttp", "acquire --sts http://127.0.0.1:9/ --trust sts-rsa.crt --user alice", USAGE,
     "--sts is a plain http address, which is not encrypted; --allow-http permits it"},
    {"PlainHttpForRenewal", "renew --sts HTTP://127.0.0.1:9/ --trust sts-rsa.crt --p12 x.p12 t.xml", USAGE,
     "--sts is a plain http address, which is not encrypted; --allow-http permits it"},
    {"PlainHttpForValidation", "validate --sts http://127.0.0.1:9/ --trust sts-rsa.crt bearer.xml", USAGE,
     "--sts is a plain http address, which is not encrypted; --allow-http permits it"},
    {"AuthorityForPlainHttp",
     "validate --sts http://127.0.0.1:9/ --allow-http --ca sts-rsa.crt --trust sts-rsa.crt bearer.xml", USAGE,
     "--ca and --thumbprint protect nothing on a plain http address"},
    {"AuthorityAndThumbprint", "validate " STS "--ca sts-rsa.crt --thumbprint 00 bearer.xml", USAGE,
     "--ca excludes --thumbprint" SEE_HELP},
    {"ThumbprintOfAnotherForm", "validate " STS "--thumbprint 00:11 bearer.xml", USAGE, THUMBPRINT_FORM},
    {"InvalidAddress", "validate --sts sts.corp.example --trust sts-rsa.crt bearer.xml", 2, "MalformedURLException",
     "usage", "Malformed URL \"sts.corp.example\": the scheme is not http or https"},
    {"RenewalWithoutIdentity", "renew " STS "holder-of-key.xml", USAGE,
     "renewing needs the key that the token is bound to; give --cert and --key, or --p12"},
    {"RenewalOfABearerToken", "renew " STS "--cert holder.crt --key holder.key bearer.xml", 2,
     "InvalidArgumentException", "usage",
     "Invalid argument : Unable to renew token: the provided token must be Holder Of Key"},
    {"RenewalWithoutToken", "renew " STS "--p12 x.p12", USAGE, "FILE is required" SEE_HELP},
    {"ValidationWithoutToken", "validate " STS, USAGE, "FILE is required" SEE_HELP},
    {"OptionOfAnotherCommand", "validate " STS "--lifetime 8h bearer.xml", USAGE, "not expected: --lifetime" SEE_HELP},
    {"ExpiredTokenToRenew", "renew " STS "--cert holder.crt --key holder.key expired.xml", 5, "ParseException",
     "token invalid", "The token has expired at: 2021-01-01T00:00:00.000Z"},
    {"ExpiredTokenToValidate", "validate " STS "expired.xml", 5, "ParseException", "token invalid",
     "The token has expired at: 2021-01-01T00:00:00.000Z"},
    {"ForeignTokenToExchange", "acquire " STS "--cert holder.crt --key holder.key --token signed-by-other.xml", 6,
     "InvalidSignatureException", "signature invalid",
     "Failed to verify signature: token might have been tampered with."},
    {"ForeignTokenToValidate", "validate " STS "signed-by-other.xml", 6, "InvalidSignatureException",
     "signature invalid", "Failed to verify signature: token might have been tampered with."},
    {"MissingToken", "validate " STS "missing.xml", 7, "IOException", "file", "missing.xml: No such file or directory"},
    {"MissingTrust", "validate --sts https://127.0.0.1:9/ --trust missing.crt bearer.xml", 7, "IOException", "file",
     "Cannot open missing.crt: No such file or directory"},
    {"MissingAuthority", "validate " STS "--ca missing.crt bearer.xml", 7, "IOException", "file",
     "Cannot open missing.crt: No such file or directory"},
    {"MissingKey", "acquire " STS "--cert holder.crt --key missing.key", 7, "IOException", "file",
     "Cannot open missing.key: No such file or directory"},
    {"MissingKeyStore", "acquire " STS "--p12 missing.p12", 7, "IOException", "file",
     "Cannot open missing.p12: No such file or directory"},
    {"KeyOfAnotherCertificate", "acquire " STS "--cert other.crt --key holder.key", 7, "KeyMismatchException", "key",
     "The private key does not belong to the certificate CN=not trusted,O=Example"},
    {"KeyFileWithoutKey", "acquire " STS "--cert holder.crt --key holder.crt", 7, "NoKeyException", "key",
     "holder.crt: There is no private key in the text"},
    {"KeyStoreWithoutKey",
     "acquire " STS "--p12 ../crypto/certificate-only.p12 --passphrase-file ../crypto/message.txt", 7,
     "WrongPassphraseException", "passphrase",
     "../crypto/certificate-only.p12: The passphrase of the PKCS#12 key store is wrong"},
    {"KeyThatIsNotRsa", "acquire " STS "--cert ../crypto/p256.crt --key ../crypto/p256.key", 7, "CryptoException",
     "key or certificate", "../crypto/p256.key: only an RSA key signs requests, and this is EC"},
    {"OutputThatExists", "acquire " STS "--user alice --out full.xml", 7, "IOException", "file",
     "full.xml: already exists; --force replaces it"},
    {"OutputThatIsAFolder", "acquire " STS "--user alice --out templates --force", 7, "IOException", "file",
     "templates: is not a regular file"},
    {"OutputThatIsADevice", "acquire " STS "--user alice --out /dev/null --force", 7, "IOException", "file",
     "/dev/null: is not a regular file"},
    {"OutputInAMissingFolder", "renew " STS "--p12 x.p12 --out missing/token.xml full.xml", 7, "IOException", "file",
     "missing/token.xml: No such file or directory"},
};

const char *HintFor(const Refusal &refusal) {
  return IsAboutToken(refusal.exceptionClass) ? EXPLAIN_HINT : "";
}

class ServiceRefusal : public testing::TestWithParam<Refusal> {
protected:
  // Without a terminal: a run that is accepted by mistake must not prompt at the terminal of the tests.
  static Result Run(const std::string &more) {
    return RunShell(std::string("setsid -w ssoclient ") + GetParam().commandLine + more);
  }
};

TEST_P(ServiceRefusal, IsALineOfTextAndAnExitCodeAndAHintIfItIsAboutTheToken) {
  ExpectResult(Run(""), GetParam().exitCode, "",
               RefusalText(GetParam().label, GetParam().message, HintFor(GetParam())));
}

TEST_P(ServiceRefusal, IsOneJsonObjectAndTheSameExitCode) {
  std::string message = GetParam().message;
  for (std::size_t quote = message.find('"'); quote != std::string::npos; quote = message.find('"', quote + 2)) {
    message.insert(quote, "\\");
  }
  ExpectResult(Run(" --format json"), GetParam().exitCode, "",
               RefusalJson(GetParam().exceptionClass, message, HintFor(GetParam())));
}

INSTANTIATE_TEST_SUITE_P(Of, ServiceRefusal, testing::ValuesIn(REFUSALS),
                         [](const auto &refusal) { return std::string(refusal.param.name); });

TEST(ServiceCommandLine, DoesNotMixTheTokenAndJsonOnStandardOutput) {
  ExpectResult(RunShell("ssoclient acquire " STS "--user alice --out - --format json"), 2, "",
               R"({"schema":1,"error":{"class":"UsageException","message":)"
               R"("--out - and --format json cannot share standard output"}})"
               "\n");
}

TEST(ServiceCommandLine, ShowsNoSecretThatWasPutOnTheCommandLine) {
  ExpectResult(RunShell("ssoclient acquire " STS "--user alice --password=wonderland"), 2, "",
               "ssoclient: usage: not expected: --password; see ssoclient --help\n");
  ExpectResult(RunShell("ssoclient --version=wonderland"), 2, "",
               "ssoclient: usage: Could not convert: --version; see ssoclient --help\n");
}

constexpr const char *THUMBPRINT = "2e9ddf5d0000000000000000000000000000000000000000000000000000ABCD";

std::string WithColons(const std::string &digits) {
  std::string text = digits;
  for (std::size_t at = 2; at < text.size(); at += 3) {
    text.insert(at, ":");
  }
  return text;
}

TEST(Thumbprint, IsAcceptedWithAllColonsOrWithNone) {
  const ClosedPort port;
  for (const std::string &thumbprint : {std::string(THUMBPRINT), WithColons(THUMBPRINT)}) {
    ExpectResult(RunShell("ssoclient validate --trust sts-rsa.crt --sts https://" + port.HostAndPort() +
                          " --thumbprint " + thumbprint + " bearer.xml"),
                 4, "",
                 "ssoclient: communication failed: Cannot connect to " + port.HostAndPort() + ": Connection refused\n");
  }
}

TEST(Thumbprint, OfAnyOtherFormIsAWrongCommandLine) {
  const std::string plain = THUMBPRINT;
  const std::string colons = WithColons(plain);
  const auto replaced = [](std::string text, std::size_t at, const char *with) {
    return text.replace(at, std::string(with).size(), with);
  };
  for (const std::string &thumbprint :
       {plain.substr(1), plain + "0", colons.substr(1), colons + ":", ":" + colons, replaced(colons, 92, "00"),
        replaced(colons, 0, "2e9:df5d"), replaced(plain, 0, "2e:9ddf5"), ":" + plain, plain + ":",
        replaced(plain, 0, "g"), "'" + plain.substr(1) + " '", replaced(colons, 2, "-"), std::string(95, ':'),
        std::string(64, ':'), std::string(95, '0')}) {
    SCOPED_TRACE(thumbprint);
    ExpectResult(RunShell("ssoclient validate " STS "--thumbprint " + thumbprint + " bearer.xml"), 2, "",
                 "ssoclient: usage: " THUMBPRINT_FORM "\n");
  }
}

TEST(ServiceCommandLine, RefusesAVerdictInXml) {
  ExpectResult(RunShell("ssoclient validate " STS "--format xml bearer.xml"), 2, "",
               "ssoclient: usage: a verdict has no XML form; give --format text or json\n");
}

TEST(Service, ThatCannotBeReachedEndsEachCommandWith4) {
  const ClosedPort port;
  const std::string service = "--sts https://" + port.HostAndPort() + "/sts --trust sts-rsa.crt ";
  const std::string identity = "--cert holder.crt --key holder.key ";
  for (const std::string &line :
       {"acquire " + service + "--user alice --password-fd 5 5<sts-rsa.crt", "acquire " + service + identity,
        "acquire " + service + identity + "--token holder-of-key.xml",
        "renew " + service + identity + "holder-of-key.xml", "validate " + service + "bearer.xml"}) {
    ExpectResult(RunShell("ssoclient " + line), 4, "",
                 "ssoclient: communication failed: Cannot connect to " + port.HostAndPort() + ": Connection refused\n");
  }
}

TEST(Service, ThatCannotBeReachedIsAFailureInJson) {
  const ClosedPort port;
  ExpectResult(RunShell("ssoclient validate --format json --trust sts-rsa.crt --sts https://" + port.HostAndPort() +
                        " bearer.xml"),
               4, "",
               R"({"schema":1,"error":{"class":"CommunicationException","message":"Cannot connect to )" +
                   port.HostAndPort() + ": Connection refused\"}}\n");
}

TEST(Service, ThatCannotBeReachedLeavesNoFile) {
  const ClosedPort port;
  const WorkFolder folder;
  const Result result =
      RunShell("ssoclient acquire --cert holder.crt --key holder.key --trust sts-rsa.crt --sts https://" +
               port.HostAndPort() + " --out " + folder / "token.xml");
  EXPECT_EQ(4, result.exitCode);
  EXPECT_TRUE(folder.Names().empty());
}

TEST(Service, ThatCannotBeReachedLeavesAnExistingFileUnchanged) {
  const ClosedPort port;
  const WorkFolder folder;
  folder.Write("token.xml", "what was there");
  const Result result =
      RunShell("ssoclient acquire --cert holder.crt --key holder.key --trust sts-rsa.crt --sts https://" +
               port.HostAndPort() + " --force --out " + folder / "token.xml");
  EXPECT_EQ(4, result.exitCode);
  EXPECT_EQ("what was there", folder.Read("token.xml"));
}

} // namespace
} // namespace ToolTest
