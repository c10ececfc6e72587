// SPDX-License-Identifier: Apache-2.0
// The tool uses OpenSSL's configuration only when it is asked to.
#include "process.h"

#include "support/work_folder.h"

#include <gtest/gtest.h>

#include <string>

namespace ToolTest {
namespace {

/// Runs the tool with an OpenSSL configuration file that contains `configuration`.
Result RunConfigured(const std::string &configuration, const std::string &arguments) {
  const Testing::WorkFolder folder;
  return RunShell("OPENSSL_CONF='" + folder.Write("openssl.cnf", configuration) + "' ssoclient " + arguments);
}

constexpr const char *REFUSED_BY_OPENSSL = "config_diagnostics = 1\nopenssl_conf = init\n[init]\nno_such_module = x\n";
constexpr const char *WITHOUT_ALGORITHMS = "openssl_conf = init\n[init]\nalg_section = all\n"
                                           "[all]\ndefault_properties = provider=nobody\n";

TEST(SystemCrypto, IsNotUsedUnlessItIsAskedFor) {
  for (const char *const configuration : {REFUSED_BY_OPENSSL, WITHOUT_ALGORITHMS}) {
    const Result result = RunConfigured(configuration, "verify --trust sts-rsa.crt bearer.xml");
    EXPECT_EQ(result.exitCode, 0) << result.err;
  }
}

TEST(SystemCrypto, IsUsedWhenItIsAskedFor) {
  const Result accepted = RunConfigured("", "verify --system-crypto --trust sts-rsa.crt bearer.xml");
  EXPECT_EQ(accepted.exitCode, 0) << accepted.err;
  const Result refused = RunConfigured(REFUSED_BY_OPENSSL, "verify --system-crypto --trust sts-rsa.crt bearer.xml");
  EXPECT_EQ(refused.exitCode, 7);
  EXPECT_EQ(refused.err.rfind("ssoclient: key or certificate: Cannot initialise OpenSSL: error:", 0), 0u)
      << refused.err;
  const Result without = RunConfigured(WITHOUT_ALGORITHMS, "verify --system-crypto --trust sts-rsa.crt bearer.xml");
  EXPECT_NE(without.exitCode, 0);
}

} // namespace
} // namespace ToolTest
