// SPDX-License-Identifier: Apache-2.0
// The dialect options of the commands that call a service, and the command that shows dialects.

#include "built_files.h"
#include "closed_port.h"
#include "expect_result.h"
#include "refusals.h"
#include "service_test.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"

#include <gmock/gmock.h>

#include <string>

namespace ToolTest {
namespace {

using testing::HasSubstr;
using testing::Not;

constexpr const char *NAMES = "default, cxf";
constexpr const char *WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";

#define SWITCHES                                                                                                       \
  "charset, applies-to, addressing, delegatable, renewing, use-key, delegation, token-type, token-type-reference, "    \
  "credential-faults, any-response"

struct Mistake {
  const char *name;
  const char *options;
  int exitCode;
  const char *label;
  std::string message;
};

const Mistake MISTAKES[] = {
    {"UnknownName", "--dialect cfx", 2, "usage",
     std::string("'cfx' is neither a dialect nor a file; the dialects are ") + NAMES},
    {"MissingFile", "--dialect missing.json", 7, "file", "missing.json: No such file or directory"},
    {"MissingFolder", "--dialect missing/cxf", 7, "file", "missing/cxf: No such file or directory"},
    {"Folder", "--dialect templates", 7, "file", "templates: is not a regular file"},
    {"StandardInput", "--dialect -", 2, "usage",
     std::string("'-' is neither a dialect nor a file; the dialects are ") + NAMES},
    {"FileThatIsNotJson", "--dialect sts-rsa.crt", 7, "file", "sts-rsa.crt: is not JSON at line 1, column 2"},
    {"SwitchWithoutValue", "--dialect-switch charset", 2, "usage",
     "--dialect-switch 'charset' is not of the form NAME=VALUE"},
    {"UnknownSwitch", "--dialect-switch encoding=utf-8", 2, "usage",
     "--dialect-switch encoding=utf-8: unknown switch; the switches are " SWITCHES},
    {"UnknownValue", "--dialect-switch charset=latin-1", 2, "usage",
     "--dialect-switch charset=latin-1: must be none or utf-8"},
    {"EmptyValue", "--dialect-switch token-type=", 2, "usage", "--dialect-switch token-type=: must be a URI"},
    {"UnknownStatement", "--dialect-switch renewing=true", 2, "usage",
     "--dialect-switch renewing=true: must be always, when-true or never"},
    {"MalformedFault", "--dialect-switch credential-faults=SecurityError", 2, "usage",
     "--dialect-switch credential-faults=SecurityError: must be none, or {NAMESPACE}NAME once or more, separated by "
     "blanks"},
    {"SwitchWithTwoValues", "--dialect-switch charset=none --dialect-switch charset=utf-8", 2, "usage",
     "--dialect-switch charset=none and --dialect-switch charset=utf-8 contradict each other"},
    {"FlagAndSwitch", "--dialect-switch addressing=false --addressing", 2, "usage",
     "--addressing and --dialect-switch addressing=false contradict each other"},
    {"AddressAndSwitch", "--applies-to urn:a --dialect-switch applies-to=urn:b", 2, "usage",
     "--applies-to urn:a and --dialect-switch applies-to=urn:b contradict each other"},
    {"AddressAndNone", "--applies-to urn:a --dialect-switch applies-to=none", 2, "usage",
     "--applies-to urn:a and --dialect-switch applies-to=none contradict each other"},
    {"SwitchWithTwoValuesOfWhichOneIsUnknown", "--dialect-switch charset=none --dialect-switch charset=x", 2, "usage",
     "--dialect-switch charset=none and --dialect-switch charset=x contradict each other"},
    {"AddressThatIsNotAUri", "--applies-to mail", 2, "usage",
     "Invalid argument : ServiceDialect::appliesTo is not an absolute URI: \"mail\""},
    {"PresetWithAnAddressThatIsNotAUri", "--dialect cxf --dialect-switch applies-to=mail", 2, "usage",
     "Invalid argument : ServiceDialect::appliesTo is not an absolute URI: \"mail\""},
};

class WrongDialect : public testing::TestWithParam<Mistake> {};

// There is no password, no identity file and no token: the wrong dialect is refused before any of them is read.
TEST_P(WrongDialect, IsRefusedByEachCommandBeforeAnythingElseIsReadOrSent) {
  const std::string service = " --sts https://127.0.0.1:9/sts --trust missing.crt ";
  for (const std::string &command :
       {"acquire" + service + "--user alice ", "renew" + service + "--cert missing.crt --key missing.key missing.xml ",
        "validate" + service + "missing.xml "}) {
    ExpectResult(RunShell("setsid -w ssoclient " + command + GetParam().options), GetParam().exitCode, "",
                 RefusalText(GetParam().label, GetParam().message, ""));
  }
}

INSTANTIATE_TEST_SUITE_P(Of, WrongDialect, testing::ValuesIn(MISTAKES),
                         [](const auto &mistake) { return std::string(mistake.param.name); });

TEST(DialectOptions, MayRepeatTheSameValue) {
  const ClosedPort port;
  ExpectResult(RunShell("ssoclient validate --trust sts-rsa.crt --sts https://" + port.HostAndPort() +
                        " --addressing --dialect-switch addressing=true --applies-to urn:a --dialect-switch "
                        "applies-to=urn:a --dialect-switch charset=utf-8 --dialect-switch charset=utf-8 bearer.xml"),
               4, "",
               "ssoclient: communication failed: Cannot connect to " + port.HostAndPort() + ": Connection refused\n");
}

TEST(DialectOptions, CannotAskForWhatTheDialectNeverWrites) {
  const std::string acquire = "setsid -w ssoclient acquire --sts https://127.0.0.1:9/sts --trust missing.crt --user x ";
  ExpectResult(RunShell(acquire + "--renewable --dialect-switch renewing=never"), 2, "",
               "ssoclient: usage: --renewable cannot be asked for, because the dialect's switch renewing is never\n");
  ExpectResult(
      RunShell(acquire + "--delegable --dialect-switch delegatable=never"), 2, "",
      "ssoclient: usage: --delegable cannot be asked for, because the dialect's switch delegatable is never\n");
}

TEST(DialectCommand, ListsTheNames) {
  ExpectResult(RunShell("ssoclient dialect"), 0, "default\ncxf\n", "");
  ExpectResult(RunShell("ssoclient dialect --format json"), 0, "{\"schema\":1,\"dialects\":[\"default\",\"cxf\"]}\n",
               "");
}

TEST(DialectCommand, WritesADialectThatItReadsAgain) {
  const Testing::WorkFolder folder;
  const Result written =
      RunShell("ssoclient dialect cxf >cxf.json; ssoclient dialect --format json cxf", folder.Path());
  EXPECT_EQ(0, written.exitCode);
  EXPECT_EQ(written.out, folder.Read("cxf.json"));
  EXPECT_THAT(written.out, HasSubstr("\n  \"use-key\": \"certificate\",\n"));
  ExpectResult(RunShell("ssoclient dialect cxf.json", folder.Path()), 0, written.out, "");
}

TEST(DialectCommand, PrefersTheNameToAFileOfThatName) {
  const Testing::WorkFolder folder;
  folder.Write("cxf", "{}");
  const std::string known = RunShell("ssoclient dialect cxf", folder.Path()).out;
  EXPECT_THAT(known, HasSubstr("\"charset\": \"utf-8\""));
  EXPECT_THAT(RunShell("ssoclient dialect ./cxf", folder.Path()).out, HasSubstr("\"charset\": \"none\""));
}

TEST(DialectCommand, ReadsTheFileInTheManual) {
  const Testing::WorkFolder folder;
  const Result example = RunShell("sed -n '/^{$/,/^}$/p' " + ProjectPath("docs/man/ssoclient.1") +
                                      " | sed 's/\\\\-/-/g' >example.json; "
                                      "ssoclient dialect example.json",
                                  folder.Path());
  EXPECT_EQ(0, example.exitCode) << example.err;
  EXPECT_THAT(example.out, HasSubstr("\n  \"applies-to\": \"https://files.corp.example/\",\n"));
  EXPECT_THAT(example.out, HasSubstr("\n      \"name\": \"BadPassword\"\n"));
  EXPECT_THAT(example.out, HasSubstr("\n  \"charset\": \"utf-8\",\n"));
}

TEST(DialectCommand, RefusesWhatIsNotADialect) {
  ExpectResult(RunShell("ssoclient dialect cfx"), 2, "",
               "ssoclient: usage: 'cfx' is neither a dialect nor a file; the dialects are default, cxf\n");
  ExpectResult(RunShell("ssoclient dialect cxf --format xml"), 2, "",
               "ssoclient: usage: a dialect has no XML form; give --format text or json\n");
  ExpectResult(RunShell("ssoclient dialect \"\""), 2, "",
               "ssoclient: usage: DIALECT: must not be empty; see ssoclient --help\n");
  ExpectResult(RunShell("ssoclient dialect --format json missing.json"), 7, "",
               RefusalJson("IOException", "missing.json: No such file or directory", ""));
}

class DialectService : public ServiceTest {};

constexpr const char *ON_BEHALF_OF = "--dialect-switch delegation=on-behalf-of --delegate-to ";

TEST_F(DialectService, ServesEachCommandInItsDialect) {
  m_folder.Write("full.json", R"({"charset": "utf-8", "delegatable": "when-true", "renewing": "when-true",
    "use-key": "certificate", "token-type-reference": "standard"})");
  const std::string dialect = "--dialect full.json --addressing --applies-to https://files.example/ ";
  Acquire("token.xml", std::string(PASSWORD) + IDENTITY + "--renewable " + dialect);
  ExpectResult(Run("ssoclient validate " + Service() + dialect + "token.xml"), 0, "valid\n", "");
  const Result renewed = Run("ssoclient renew " + Service() + IDENTITY + dialect + "--out renewed.xml token.xml");
  EXPECT_EQ(0, renewed.exitCode) << renewed.err;
  EXPECT_EQ("", renewed.err);
  const Result exchanged = Run("ssoclient acquire " + Service() + IDENTITY + dialect + "--token renewed.xml");
  EXPECT_EQ(0, exchanged.exitCode) << exchanged.err;
  EXPECT_EQ("", exchanged.err);
}

TEST_F(DialectService, IsAskedInItsDialectToRenewAndToValidate) {
  Acquire("token.xml", std::string(IDENTITY) + "--renewable");
  const Testing::PostingServer server(
      {Testing::FaultResponse("wst:RequestFailed", "no"), Testing::FaultResponse("wst:RequestFailed", "no")});
  const std::string service = "--trust sts.pem --allow-http --sts " + server.GetUrl() + " --addressing ";
  ExpectResult(Run("ssoclient renew " + service + IDENTITY + "token.xml"), 8, "",
               "ssoclient: service fault: Unexpected SOAP fault: wst:RequestFailed; request failed.\n");
  ExpectResult(Run("ssoclient validate " + service + "token.xml"), 8, "",
               "ssoclient: service fault: Unexpected SOAP fault: wst:RequestFailed; request failed.\n");
  ASSERT_EQ(2u, server.GetRequests().size());
  EXPECT_THAT(server.GetRequests()[0], HasSubstr("/RST/Renew</wsa:Action>"));
  EXPECT_THAT(server.GetRequests()[1], HasSubstr("/RST/Validate</wsa:Action>"));
}

// The service answers with the token type that was asked for, and the library accepts no other type. If only one of
// them received the switch, the command would fail.
TEST_F(DialectService, GetsASwitchOfTheCommandLine) {
  const std::string type = "--dialect-switch "
                           "token-type=http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0 ";
  Acquire("token.xml", std::string(PASSWORD) + type);
  const Result other = Run("ssoclient acquire " + Service() + PASSWORD + "--dialect-switch token-type=urn:other");
  ExpectResult(other, 8, "", "ssoclient: service fault: Unexpected SOAP fault: wst:InvalidRequest; request failed.\n");
  EXPECT_THAT(m_service.GetLog(), HasSubstr("unsupported token type 'urn:other'"));
}

TEST_F(DialectService, GetsTheSwitchesOfTheCommandLineInsteadOfThoseOfThePreset) {
  // The preset writes wst:OnBehalfOf; the switch makes it wst:DelegateTo again.
  const Result result = Run("ssoclient acquire " + Service() + PASSWORD +
                            "--dialect cxf --dialect-switch delegation=delegate-to --delegate-to bob@corp.example");
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.err);
  EXPECT_THAT(result.out, HasSubstr("\nDelegate:        bob@corp.example at "));
}

TEST_F(DialectService, IssuesATokenAboutTheOtherPartyWithoutAWarning) {
  const Result result = Run("ssoclient acquire " + Service() + PASSWORD + ON_BEHALF_OF + "bob@corp.example");
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.err);
  EXPECT_THAT(result.out, HasSubstr("\nSubject:         bob@corp.example\n"));
  EXPECT_THAT(result.out, Not(HasSubstr("\nDelegate:")));
}

TEST_F(DialectService, ThatIgnoresWhatTheDialectAsksForCausesAWarning) {
  Acquire("alice.xml", std::string(PASSWORD) + "--lifetime 9h");
  const Testing::PostingServer server({Testing::IssueResponse(m_folder.Read("alice.xml"))});
  const Result result =
      Run("ssoclient acquire --trust sts.pem --allow-http --out token.xml --sts " + server.GetUrl() + " " + PASSWORD +
          ON_BEHALF_OF + "bob@corp.example --dialect-switch charset=utf-8 --applies-to urn:files --addressing");
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("ssoclient: warning: asked for, but not given by the service: a token about bob@corp.example; the token is "
            "about alice@corp.example\n",
            result.err);
  ASSERT_EQ(1u, server.GetRequests().size());
  const std::string request = server.GetRequests().front();
  EXPECT_THAT(request, HasSubstr("text/xml;"));
  EXPECT_THAT(request, HasSubstr("charset=utf-8"));
  EXPECT_THAT(request, HasSubstr("<wsa:To "));
  EXPECT_THAT(request, HasSubstr("<wsa:Address>urn:files</wsa:Address>"));
  EXPECT_THAT(request, HasSubstr("<wst:OnBehalfOf><wsse:UsernameToken"));
}

TEST_F(DialectService, EndsWith3WhenItsFaultMeansRefusedCredentials) {
  const std::string acquire = "ssoclient acquire " + Service("soap-fault-wsse-FailedAuthentication") + PASSWORD;
  ExpectResult(Run(acquire), 8, "",
               "ssoclient: service fault: Unexpected SOAP fault: wsse:FailedAuthentication; request failed.\n");
  ExpectResult(Run(acquire + "--dialect-switch 'credential-faults={" + WSSE + "}FailedAuthentication'"), 3, "",
               "ssoclient: credentials refused: Authentication failed: a fault was asked for\n");
  ExpectResult(Run(acquire + "--dialect-switch 'credential-faults={urn:other}FailedAuthentication'"), 8, "",
               "ssoclient: service fault: Unexpected SOAP fault: wsse:FailedAuthentication; request failed.\n");
}

} // namespace
} // namespace ToolTest
