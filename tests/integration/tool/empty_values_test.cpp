// SPDX-License-Identifier: Apache-2.0
// An empty argument, which a shell makes of a variable that is not set, is refused: the tool does not treat it like an
// option that is not given.

#include "expect_result.h"
#include "help_options.h"
#include "process.h"
#include "token_values.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <string>

namespace ToolTest {
namespace {

using testing::IsSupersetOf;

const char *const COMMANDS[] = {"acquire", "token", "renew",         "validate", "verify",
                                "inspect", "sign",  "check-message", "doctor",   "dialect"};

class EmptyValue : public testing::TestWithParam<const char *> {};

TEST_P(EmptyValue, OfEachOptionIsAWrongCommandLine) {
  const std::string command = GetParam();
  for (const std::string &option : OptionsWithArgument(command)) {
    const std::string message = option + ": must not be empty; see ssoclient --help";
    ExpectResult(RunTool({command, option, ""}), 2, "", "ssoclient: usage: " + message + "\n");
    ExpectResult(RunTool({command, option + "="}), 2, "", "ssoclient: usage: " + message + "\n");
    ExpectResult(RunTool({command, option + "=", "--verbose"}), 2, "", "ssoclient: usage: " + message + "\n");
    if (option != "--format") {
      ExpectResult(RunTool({command, "--format", "json", option, ""}), 2, "",
                   R"({"schema":1,"error":{"class":"UsageException","message":")" + message + "\"}}\n");
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Of, EmptyValue, testing::ValuesIn(COMMANDS),
                         [](const auto &command) { return Fill(command.param, "-", "_"); });

TEST(EmptyValue, IsTestedForTheOptionsWithAnArgument) {
  const std::set<std::string> options = OptionsWithArgument("acquire");
  EXPECT_THAT(options, IsSupersetOf({"--sts",           "--ca",
                                     "--thumbprint",    "--trust",
                                     "--tolerance",     "--user",
                                     "--password-file", "--password-fd",
                                     "--token",         "--service",
                                     "--ccache",        "--client-keytab",
                                     "--cert",          "--key",
                                     "--p12",           "--passphrase-file",
                                     "--passphrase-fd", "--lifetime",
                                     "--audience",      "--delegate-to",
                                     "--advice",        "--out",
                                     "--format",        "--save-refused",
                                     "--dialect",       "--dialect-switch",
                                     "--applies-to"}));
  for (const char *flag : {"--help", "--verbose", "--allow-http", "--gss", "--delegable", "--renewable", "--bearer",
                           "--force", "--addressing"}) {
    EXPECT_EQ(0u, options.count(flag)) << flag;
  }
}

TEST(EmptyValue, AfterOtherValuesIsAWrongCommandLine) {
  for (const std::string option : {"--trust", "--audience", "--advice", "--dialect-switch"}) {
    ExpectResult(RunTool({"acquire", option, "a:b=c", option, "", option, "a:b=c"}), 2, "",
                 "ssoclient: usage: " + option + ": must not be empty; see ssoclient --help\n");
  }
}

TEST(EmptyValue, IsNotFoundInTheNameOfAFile) {
  ExpectResult(RunTool({"inspect", "--", "--out="}), 7, "", "ssoclient: file: --out=: No such file or directory\n");
}

TEST(EmptyValue, InPlaceOfTheTokenIsAWrongCommandLine) {
  for (const std::string command : {"renew", "validate", "verify", "inspect", "sign", "check-message"}) {
    ExpectResult(RunTool({command, ""}), 2, "", "ssoclient: usage: FILE: must not be empty; see ssoclient --help\n");
  }
}

} // namespace
} // namespace ToolTest
