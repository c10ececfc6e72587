// SPDX-License-Identifier: Apache-2.0
// Tokens with a genuine signature that are refused for their content.

#include "verifiers.h"

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/signed_again.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace Reports {
namespace {

using SsoClient::TokenReport;
using Testing::JudgedVerifier;
using Testing::Judgement;
using Testing::JudgeText;
using Testing::SignedAgain;

struct SignedChange {
  const char *name;
  const char *from;
  const char *to;
  const char *refusal;
  TokenReport::Check check = TokenReport::Check::NAMES;
  const char *file = "tokens/full.xml";
};

const SignedChange CHANGES[] = {
    {"SubjectFormat", "claims/UPN\">alice", "claims/DN\">alice",
     "Invalid or unsupported NameId format 'http://schemas.xmlsoap.org/claims/DN'"},
    {"SubjectWithoutDomain", ">alice@corp.example<", ">alice<",
     "Failed to parse the UPN NameID: `alice'; name or domain part is missing."},
    {"SubjectThatControlsATerminal", ">alice@corp.example<", ">\xC2\x9B&#x202E;&#13;<",
     "Failed to parse the UPN NameID: `\xC2\x9B\xE2\x80\xAE\r'; name or domain part is missing."},
    {"GroupWithoutDomain", ">corp.example\\Users<", ">Users<",
     "Failed to parse Group Identity value: `Users'; domain or group missing"},
    {"SolutionWithTwoValues", "<saml:AttributeValue>TRUE</saml:AttributeValue>",
     "<saml:AttributeValue>TRUE</saml:AttributeValue><saml:AttributeValue>TRUE</saml:AttributeValue>",
     "More than one value found for attribute isSolution."},
    {"Version", " Version=\"2.0\"", " Version=\"1.1\"", "Invalid token version", TokenReport::Check::IDENTIFIERS},
    {"ConfirmationThatEndsBeforeTheToken", "Data NotOnOrAfter=\"2120", "Data NotOnOrAfter=\"2119",
     "Invalid token subject validity", TokenReport::Check::CONFIRMATION, "tokens/bearer.xml"},
    {"DelegateThatIsNotTheLast", ">backup@corp.example</saml:NameID><saml:SubjectConfirmationData",
     ">gateway@corp.example</saml:NameID><saml:SubjectConfirmationData",
     "The SubjectConfirmation delegate id does not match the id of the last delegate", TokenReport::Check::DELEGATION},
    {"TwoFaults", " Version=\"2.0\"", " Version=\"1.1\" x=\"\"", "Unexpected attributes on element 'saml:Assertion'",
     TokenReport::Check::FORM},
};

std::string ReplacedOnce(std::string text, const std::string &from, const std::string &to) {
  const std::size_t place = text.find(from);
  if (place == std::string::npos) {
    throw std::logic_error("nothing to replace: " + from);
  }
  return text.replace(place, from.size(), to);
}

class ReportsOnSignedTokens : public testing::TestWithParam<SignedChange> {
private:
  const Testing::FixedEnvironment m_clock;
};

TEST_P(ReportsOnSignedTokens, PassTheSignatureAndRefuseTheContent) {
  const SignedChange &change = GetParam();
  const std::string xml = SignedAgain(ReplacedOnce(Testing::ReadDataFile(change.file), change.from, change.to));
  for (const JudgedVerifier &verifier : AllVerifiers()) {
    ASSERT_EQ("", JudgeText(verifier, xml).contradictions);
  }
  const Judgement judgement = JudgeText(UsualVerifier(), xml);
  EXPECT_EQ(change.refusal, judgement.report.refusal);
  const TokenReport::CheckResult *const failed = judgement.report.FirstFailed();
  ASSERT_TRUE(failed);
  EXPECT_STREQ(SsoClient::GetCheckName(change.check), SsoClient::GetCheckName(failed->check));
  for (const TokenReport::Check check :
       {TokenReport::Check::ALGORITHMS, TokenReport::Check::KEYS, TokenReport::Check::REFERENCES,
        TokenReport::Check::SIGNATURE, TokenReport::Check::DIGESTS}) {
    EXPECT_STREQ("passed", SsoClient::GetOutcomeName(judgement.report.Get(check).outcome))
        << SsoClient::GetCheckName(check);
  }
}

INSTANTIATE_TEST_SUITE_P(Change, ReportsOnSignedTokens, testing::ValuesIn(CHANGES),
                         [](const auto &change) { return std::string(change.param.name); });

TEST(ReportOnASignedToken, ListsEveryFaultInOrder) {
  const Testing::FixedEnvironment clock;
  std::string xml = Testing::ReadDataFile("tokens/full.xml");
  xml = ReplacedOnce(xml, " Version=\"2.0\"", " Version=\"1.1\"");
  xml = ReplacedOnce(xml, "NotOnOrAfter=\"2120", "NotOnOrAfter=\"2021");
  xml = ReplacedOnce(xml, ">corp.example\\Users<", ">Users<");
  xml = ReplacedOnce(xml, ">alice@corp.example<", ">alice<");
  Tarvel::Crypto::CertificateList strangers = {Certificate("other")};
  SsoClient::VerifyOptions options;
  options.acceptedAudiences = {"https://elsewhere.example/"};
  options.requiredConfirmation = SsoClient::SamlToken::BEARER;
  const Judgement judgement = JudgeText(JudgedVerifier(strangers, options), SignedAgain(xml));
  EXPECT_EQ("", judgement.contradictions);
  std::string found;
  for (const TokenReport::CheckResult &result : judgement.report.checks) {
    for (const TokenReport::Finding &finding : result.findings) {
      found += std::string(SsoClient::GetCheckName(result.check)) + ": " + finding.message + '\n';
    }
  }
  EXPECT_EQ("identifiers: Invalid token version\n"
            "validity: The token has expired at: 2021-01-01T00:00:00.000Z\n"
            "signature: Failed to verify signature: token might have been tampered with.\n"
            "names: Failed to parse the UPN NameID: `alice'; name or domain part is missing.\n"
            "names: Failed to parse Group Identity value: `Users'; domain or group missing\n"
            "audience: The token is restricted to other audiences: https://files.corp.example/, "
            "https://mail.corp.example/\n"
            "required-confirmation: The token's confirmation is holder-of-key, but bearer is required\n",
            found);
}

} // namespace
} // namespace Reports
