// SPDX-License-Identifier: Apache-2.0
// An answer that cannot be read is a fault of the service, and says nothing about the caller's token.

#include "expect_result.h"
#include "process.h"
#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/soap_responses.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace ToolTest {
namespace {

struct MalformedAnswer {
  const char *name;
  const char *commandLine;
};

const MalformedAnswer COMMANDS[] = {
    {"AcquireByPassword", "acquire --user alice --password-fd 5 5<sts-rsa.crt"},
    {"AcquireByIdentity", "acquire --cert holder.crt --key holder.key"},
    {"AcquireByToken", "acquire --cert holder.crt --key holder.key --token holder-of-key.xml"},
    {"Renew", "renew --cert holder.crt --key holder.key holder-of-key.xml"},
    {"Validate", "validate bearer.xml"},
};

class MalformedFault : public testing::TestWithParam<MalformedAnswer> {
protected:
  static Result Run(const std::string &answer, const std::string &more) {
    const Testing::PostingServer server({answer});
    return RunShell(std::string("ssoclient ") + GetParam().commandLine + " --allow-http --trust sts-rsa.crt --sts " +
                    server.GetUrl() + more);
  }
};

TEST_P(MalformedFault, IsAFaultOfTheService) {
  const std::string fault = Testing::FaultResponse("nobody:Fault", "no");
  ExpectResult(Run(fault, ""), 8, "",
               "ssoclient: service fault: Element faultcodeat 2,279 uses undefined prefix: `nobody'\n");
  ExpectResult(Run(fault, " --format json"), 8, "",
               R"({"schema":1,"error":{"class":"SsoException","message":)"
               R"("Element faultcodeat 2,279 uses undefined prefix: `nobody'"}})"
               "\n");
}

INSTANTIATE_TEST_SUITE_P(Of, MalformedFault, testing::ValuesIn(COMMANDS),
                         [](const auto &command) { return std::string(command.param.name); });

constexpr const char *ACQUIRE =
    "ssoclient acquire --user alice --password-fd 5 5<sts-rsa.crt --allow-http --trust sts-rsa.crt ";

TEST(MalformedToken, ThatTheServiceIssuesIsAFaultOfTheService) {
  std::string token = Testing::ReadDataFile("tokens/bearer.xml");
  token.insert(token.find("ID="), "nobody:");
  const Testing::PostingServer server({Testing::IssueResponse(token)});
  ExpectResult(
      RunShell(ACQUIRE + std::string("--sts ") + server.GetUrl()), 8, "",
      "ssoclient: service fault: No canonical form: the prefix \"nobody\" is not bound at line 2, column 370\n");
}

TEST(MalformedResponse, ToADoubtfulRequestHasNoHint) {
  const Testing::PostingServer server({"<html/>"});
  ExpectResult(RunShell(ACQUIRE +
                        std::string("--cert holder.crt --key holder.key --delegate-to bob --format json --sts ") +
                        server.GetUrl()),
               8, "",
               R"({"schema":1,"error":{"class":"SsoException","message":"Unexpected response format: )"
               R"(missing SAOP Body."}})"
               "\n");
}

} // namespace
} // namespace ToolTest
