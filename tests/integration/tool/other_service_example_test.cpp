// SPDX-License-Identifier: Apache-2.0
// The example that uses a service of another maker, with the development service in the place of that service.

#include "built_files.h"
#include "expect_result.h"
#include "service_test.h"

#include <gmock/gmock.h>

#include <string>

namespace ToolTest {
namespace {

class OtherServiceExample : public ServiceTest {
protected:
  Result RunExample(const std::string &variables, const std::string &arguments = "client.pem client.key") const {
    return Run("STS_URL=" + m_service.GetUrl() + " STS_CA=ca.pem STS_CERT=sts.pem STS_USER=alice@corp.example " +
               variables + " " + ExampleOtherServicePath() + " " + arguments);
  }
};

TEST_F(OtherServiceExample, AcquiresRenewsValidatesAndExchangesAToken) {
  const Result result = RunExample("STS_PASSWORD=wonderland");
  EXPECT_EQ(0, result.exitCode);
  EXPECT_EQ("", result.err);
  const std::string facts = ": alice@corp\\.example, in admins users, from [0-9T:.-]+Z to [0-9T:.-]+Z\n";
  EXPECT_THAT(result.out,
              testing::MatchesRegex("acquired" + facts + "renewed" + facts + "valid\n" + "exchanged" + facts));
}

TEST_F(OtherServiceExample, ReportsWhyItFails) {
  ExpectResult(RunExample("STS_PASSWORD=looking-glass"), 1, "",
               "failed: Authentication failed: unknown user or wrong password\n");
  ExpectResult(RunExample(""), 1, "", "failed: the variable STS_PASSWORD is not set\n");
  ExpectResult(RunExample("STS_PASSWORD=wonderland", ""), 1, "",
               "failed: usage: other_service CERTIFICATE-FILE KEY-FILE\n");
}

} // namespace
} // namespace ToolTest
