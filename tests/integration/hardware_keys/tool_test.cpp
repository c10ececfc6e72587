// SPDX-License-Identifier: Apache-2.0
// The tool acquires and renews tokens with a key in a TPM, by the options that docs/guide/hardware-keys.md shows.
#include "software_tpm.h"

#include "support/dev_sts.h"

#include <gtest/gtest.h>

#include <string>

namespace Testing {
namespace {

/// The tool has its own TPM, because a TPM of the tests' process would keep it waiting.
class ToolWithAKeyInATpm : public ::testing::Test {
protected:
  void SetUp() override {
    if (!SoftwareTpm::FindMissing().empty()) {
      GTEST_SKIP() << SoftwareTpm::FindMissing();
    }
  }
};

std::string Tool(const std::string &command, const DevSts &service, const std::string &certificate,
                 const std::string &key, const std::string &rest) {
  return std::string(SoftwareTpm::GetTool()) + " " + command + " --system-crypto --sts " + service.GetUrl() + " --ca " +
         service.PathOf("authority.crt") + " --trust " + service.PathOf("signing.crt") + " --cert " + certificate +
         " --key " + key + " " + rest;
}

TEST_F(ToolWithAKeyInATpm, AcquiresAndRenewsTokens) {
  const DevSts service;
  SoftwareTpm tpm;
  const auto issue = [&](const std::string &key) {
    return tpm.IssueCertificate(key, service.PathOf("authority.crt"), service.PathOf("authority.key"));
  };
  for (const std::string &key : {tpm.MakeKey("rsa2048"), tpm.MakeKeyFile()}) {
    const std::string certificate = issue(key);
    tpm.Run(Tool("acquire", service, certificate, key, "--renewable --force --out token.xml"));
    tpm.Run(Tool("renew", service, certificate, key, "--force --out renewed.xml token.xml"));
    EXPECT_NE(tpm.GetFolder().Read("renewed.xml").find("urn:oasis:names:tc:SAML:2.0:cm:holder-of-key"),
              std::string::npos);
  }
}

TEST_F(ToolWithAKeyInATpm, CannotBeGivenTheKeyOfAnotherTpm) {
  const DevSts service;
  SoftwareTpm tpm;
  const SoftwareTpm other;
  const std::string key = tpm.MakeKeyFile();
  const std::string certificate =
      tpm.IssueCertificate(key, service.PathOf("authority.crt"), service.PathOf("authority.key"));
  const std::string command = Tool("acquire", service, certificate, key, "--force --out token.xml");
  tpm.Run(command);
  EXPECT_NE(other.Run("! " + command).find("ssoclient: "), std::string::npos);
}

TEST_F(ToolWithAKeyInATpm, HasAKeyThatCannotBeExported) {
  SoftwareTpm tpm;
  const std::string exported = tpm.Run("openssl pkey -in " + tpm.MakeKey("rsa2048"));
  EXPECT_EQ(exported.rfind("-----BEGIN TSS2 PRIVATE KEY-----", 0), 0u) << exported; // encrypted by the TPM
}

} // namespace
} // namespace Testing
