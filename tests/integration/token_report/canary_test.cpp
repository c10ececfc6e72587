// SPDX-License-Identifier: Apache-2.0
// A report never contains a signature's value, so a bearer token cannot be made again from it.

#include "token_changes.h"
#include "token_files.h"
#include "verifiers.h"

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/report_texts.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Reports {
namespace {

using SsoClient::TokenReport;
using SsoClient::TokenVerifier;

/// All texts of a report that a host could show or store.
std::string AllTextsOf(const TokenReport &report) {
  return Testing::DescribeReport(report) + SsoClient::WriteTokenReport(report);
}

/// The first line of each signature's value, if it has at least 40 characters of Base64.
std::vector<std::string> SignatureValuesOf(const std::string &xml) {
  std::vector<std::string> values;
  for (std::size_t name = xml.find("SignatureValue>"); name != std::string::npos;
       name = xml.find("SignatureValue>", name + 1)) {
    const std::size_t begin = name + std::string("SignatureValue>").size();
    const std::string value = xml.substr(begin, xml.find_first_of("<\n", begin) - begin);
    if (value.size() >= 40 &&
        value.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/=") ==
            std::string::npos) {
      values.push_back(value);
    }
  }
  return values;
}

void ExpectNoSignatureValue(const std::string &xml, const std::string &what) {
  const std::string texts = AllTextsOf(UsualVerifier().verifier.Explain(xml));
  for (const std::string &value : SignatureValuesOf(xml)) {
    ASSERT_EQ(std::string::npos, texts.find(value)) << what;
    ASSERT_EQ(std::string::npos, texts.find(value.substr(0, 32))) << what;
  }
}

TEST(ReportsAndSecrets, NoReportContainsTheSignatureValue) {
  const Testing::FixedEnvironment clock;
  std::size_t values = 0;
  for (const TokenFile &file : AllTokenFiles()) {
    ExpectNoSignatureValue(file.xml, file.name);
    ASSERT_FALSE(testing::Test::HasFatalFailure());
    values += SignatureValuesOf(file.xml).size();
  }
  EXPECT_GT(values, 200u);
}

TEST(ReportsAndSecrets, NoReportOnAChangedTokenContainsTheSignatureValue) {
  const Testing::FixedEnvironment clock;
  Testing::RandomSource random(16);
  const std::string &other = Testing::ReadDataFile("tokens/bearer.xml");
  for (const TokenFile &file : ReadTokenFiles("tokens")) {
    for (int change = 0; change < 20; ++change) {
      ExpectNoSignatureValue(ChangeToken(file.xml, other, random), file.name + ", change " + std::to_string(change));
      ASSERT_FALSE(testing::Test::HasFatalFailure());
    }
  }
}

/// Each element is refused for another reason. A finding could show the value that is refused.
TEST(ReportsAndSecrets, NoReportShowsASignatureValueThatItRefuses) {
  const Testing::FixedEnvironment clock;
  const std::string canary = "CanaryCanaryCanaryCanaryCanaryCanaryCanaryCanary";
  const std::string token = Testing::ReadDataFile("tokens/bearer.xml");
  const std::size_t begin = token.find("<ds:SignatureValue>");
  const std::size_t end = token.find("</ds:SignatureValue>") + std::string("</ds:SignatureValue>").size();
  for (const std::string &element :
       {"<ds:SignatureValue>" + canary + "</ds:SignatureValue>",
        "<ds:SignatureValue>" + canary + "*</ds:SignatureValue>",
        "<ds:SignatureValue>" + canary + "<a/></ds:SignatureValue>",
        "<ds:SignatureValue>" + canary + "<!-- -->" + canary + "</ds:SignatureValue>",
        "<ds:SignatureValue Id=\"x\" a=\"\">" + canary + "</ds:SignatureValue>",
        "<SignatureValue xmlns=\"urn:x\">" + canary + "</SignatureValue>", "<ds:SignatureValue/>" + canary,
        "<ds:SignatureValue>AAAA</ds:SignatureValue><ds:SignatureValue>" + canary + "</ds:SignatureValue>"}) {
    const std::string xml = token.substr(0, begin) + element + token.substr(end);
    const TokenReport report = UsualVerifier().verifier.Explain(xml);
    EXPECT_FALSE(report.accepted) << element;
    EXPECT_EQ(std::string::npos, AllTextsOf(report).find("Canary")) << element;
  }
}

TEST(ReportsAndSecrets, ATokenCannotBeMadeAgainFromItsReport) {
  const Testing::FixedEnvironment clock;
  for (const TokenFile &file : ReadTokenFiles("tokens")) {
    const TokenReport report = UsualVerifier().verifier.Explain(file.xml);
    // The certificates, too, appear as thumbprints only.
    for (const char *const part : {"X509Certificate>", "SignatureValue>"}) {
      const std::size_t begin = file.xml.find(part) + std::string(part).size();
      EXPECT_EQ(std::string::npos, AllTextsOf(report).find(file.xml.substr(begin, 60))) << file.name;
    }
  }
}

} // namespace
} // namespace Reports
