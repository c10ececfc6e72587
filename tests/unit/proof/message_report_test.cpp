// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/message_verifier.h>

#include "support/data_file.h"
#include "support/fixed_environment.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;
using Check = MessageReport::Check;
using Outcome = TokenReport::Outcome;

class MessageReportTest : public ::testing::Test {
protected:
  static MessageReport Explain(const std::string &text) {
    return MessageVerifier(
               TokenVerifier({Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt")).front()}))
        .Explain(text);
  }
  static std::string MessageOf(const std::string &name) {
    return Testing::ReadDataFile("messages/attacks/" + name + ".xml");
  }
  static const MessageReport::CheckResult &Get(const MessageReport &report, Check check) {
    return report.checks.at(static_cast<std::size_t>(check));
  }

private:
  const Testing::FixedEnvironment m_clock;
};

TEST_F(MessageReportTest, ShowsEachCheckOfAnAcceptedMessage) {
  const std::string text = WriteMessageReport(Explain(MessageOf("genuine-soap11")));
  EXPECT_EQ(0u, text.find(R"(The message is accepted.
well-formed            passed    The text is a well-formed XML document.
envelope               passed    The envelope is of SOAP 1.1.
security-header        passed    There is one security header for this receiver.
timestamp              passed    Created 2026-01-02T03:04:00.000Z, expires 2026-01-02T03:09:00.000Z; now 2026-01-02T03:04:05.006Z (tolerance 60 s, longest age 300 s).
token                  passed    There is one token, and it is accepted.
proof                  passed    The proof is: message-signature.
parts                  passed    Covered elements: 2.

The token is accepted.
)")) << text;
}

TEST_F(MessageReportTest, ListsTheCoveredPaths) {
  EXPECT_EQ((std::vector<std::string>{"/s:Envelope/s:Header/wsse:Security/wsu:Timestamp", "/s:Envelope/s:Body"}),
            Explain(MessageOf("genuine-soap11")).covered);
}

TEST_F(MessageReportTest, ContinuesAfterAFailure) {
  const MessageReport report = Explain(MessageOf("two-bodies-forged-first"));
  EXPECT_EQ("The envelope has a second body", report.refusal);
  EXPECT_EQ(Outcome::FAILED, Get(report, Check::ENVELOPE).outcome);
  EXPECT_EQ(Outcome::PASSED, Get(report, Check::TOKEN).outcome);
  EXPECT_EQ(Outcome::PASSED, Get(report, Check::PROOF).outcome);
  ASSERT_EQ(Outcome::FAILED, Get(report, Check::PARTS).outcome);
  const TokenReport::Finding &finding = Get(report, Check::PARTS).findings.at(0);
  EXPECT_EQ("The signature does not cover the body", finding.message);
  EXPECT_EQ("/s:Envelope/s:Body", finding.path);
  EXPECT_EQ(26u, finding.line);
}

TEST_F(MessageReportTest, StatesByHowMuchTheClockMisses) {
  const MessageReport report = Explain(MessageOf("created-too-long-ago"));
  const TokenReport::Finding &finding = Get(report, Check::TIMESTAMP).findings.at(0);
  EXPECT_EQ(1, finding.missedBySec);
  EXPECT_EQ("Synchronise the clocks of this machine and of the sender, or send the message sooner after it is made.",
            finding.remedy);
}

TEST_F(MessageReportTest, DoesNotDoWhatNeedsSomethingThatIsMissing) {
  const MessageReport text = Explain("text");
  EXPECT_EQ(Outcome::FAILED, Get(text, Check::WELL_FORMED).outcome);
  EXPECT_EQ(Outcome::NOT_DONE, Get(text, Check::ENVELOPE).outcome);
  EXPECT_EQ("The text could not be parsed.", Get(text, Check::PARTS).summary);
  const MessageReport element = Explain("<a/>");
  EXPECT_EQ(Outcome::FAILED, Get(element, Check::ENVELOPE).outcome);
  EXPECT_EQ("There is no envelope.", Get(element, Check::SECURITY_HEADER).summary);
  const MessageReport token = Explain(MessageOf("token-changed"));
  EXPECT_EQ(Outcome::FAILED, Get(token, Check::TOKEN).outcome);
  EXPECT_FALSE(token.token.value().accepted);
  EXPECT_EQ("There is no token whose key could be proved.", Get(token, Check::PROOF).summary);
  EXPECT_EQ(Outcome::NOT_DONE, Get(token, Check::PARTS).outcome);
}

TEST_F(MessageReportTest, ListsABoundedNumberOfFindings) {
  std::string parts;
  for (int part = 0; part < 3000; ++part) {
    parts += "<x/>";
  }
  std::string message = MessageOf("genuine-soap11");
  message.insert(message.find("</wsu:Timestamp>"), parts);
  const MessageReport report = Explain(message);
  const MessageReport::CheckResult &timestamp = Get(report, Check::TIMESTAMP);
  EXPECT_EQ(TokenReport::MAX_FINDINGS - 3, timestamp.findings.size());
  EXPECT_EQ(3000u, timestamp.findings.size() + timestamp.unlistedFindings);
  EXPECT_EQ(1u, Get(report, Check::PROOF).findings.size());
}

TEST_F(MessageReportTest, NamesEachCheck) {
  EXPECT_STREQ("security-header", GetCheckName(Check::SECURITY_HEADER));
  EXPECT_STREQ("unknown", GetCheckName(static_cast<Check>(99)));
}

} // namespace
