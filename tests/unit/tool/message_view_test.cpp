// SPDX-License-Identifier: Apache-2.0
// The JSON and the text of a checked message and of its report.

#include "message_view.h"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <string>

namespace SsoClient::Tool {
namespace {

using Check = MessageReport::Check;
using Outcome = TokenReport::Outcome;
using nlohmann::ordered_json;
using Tarvel::System::DateTime;

constexpr const char *CREATED = "2026-01-01T12:00:00Z";

AcceptedMessage Signed() {
  AcceptedMessage message;
  message.proof = ProofKind::MESSAGE_SIGNATURE;
  message.covered = {"/s:Envelope/s:Header/wsse:Security/wsu:Timestamp", "/s:Envelope/s:Body"};
  message.created = DateTime(CREATED);
  message.expires = DateTime("2026-01-01T12:05:00Z");
  message.token.verified = true;
  message.token.facts = TokenFacts();
  message.token.facts->id = "_1";
  return message;
}

MessageView ViewAt(const char *now) {
  MessageView view;
  view.accepted = Signed();
  view.now = DateTime(now);
  return view;
}

MessageReport Refused() {
  MessageReport report;
  report.refusal = "The message is too old";
  report.checks.push_back({Check::WELL_FORMED, Outcome::PASSED, "As it should be.", {}});
  TokenReport::Finding finding;
  finding.message = report.refusal;
  finding.line = 3;
  report.checks.push_back({Check::TIMESTAMP, Outcome::FAILED, "One deviation.", {finding}});
  report.covered = {"/s:Envelope/s:Body"};
  report.token = TokenReport();
  report.token->refusal = "of the token";
  return report;
}

TEST(MessageJson, HasTheKeysOfSchema1InTheirOrder) {
  const ordered_json json = ordered_json::parse(MessageJson(ViewAt(CREATED)));
  ordered_json expected = ordered_json::parse(R"({"schema":1,"verified":true,"proof":"message-signature",
      "covered":["/s:Envelope/s:Header/wsse:Security/wsu:Timestamp","/s:Envelope/s:Body"],
      "created":"2026-01-01T12:00:00.000Z","expires":"2026-01-01T12:05:00.000Z","replay":"not-guarded"})");
  expected["token"] = TokenJsonObject(Signed().token);
  EXPECT_EQ(json.dump(), expected.dump());
  EXPECT_EQ(json["token"]["id"], "_1");
  EXPECT_EQ(json["token"]["schema"], 1);
}

TEST(MessageJson, StatesWhatIsNotKnownAsNull) {
  MessageView view = ViewAt(CREATED);
  view.accepted->proof = ProofKind::TLS_CERTIFICATE;
  view.accepted->covered.clear();
  view.accepted->created = boost::none;
  view.accepted->expires = boost::none;
  view.accepted->replay = ReplayProtection::GUARDED;
  const ordered_json json = ordered_json::parse(MessageJson(view));
  EXPECT_EQ(json["proof"], "tls-certificate");
  EXPECT_EQ(json["covered"].dump(), "[]");
  EXPECT_TRUE(json["created"].is_null());
  EXPECT_TRUE(json["expires"].is_null());
  EXPECT_EQ(json["replay"], "guarded");
}

TEST(MessageJson, OfARefusedMessageHasNothingThatTheMessageStates) {
  MessageView view;
  view.report = Refused();
  const ordered_json json = ordered_json::parse(MessageJson(view));
  ordered_json report = json["report"];
  const ordered_json token = report["token"];
  report["token"] = nullptr;
  EXPECT_EQ(report.dump(), ordered_json::parse(R"({"accepted":false,"refusal":"The message is too old","checks":[
      {"name":"well-formed","outcome":"passed","summary":"As it should be.","findings":[]},
      {"name":"timestamp","outcome":"failed","summary":"One deviation.","findings":[
        {"message":"The message is too old","element":null,"attribute":null,"path":null,"line":3,"column":null,
         "wanted":null,"found":null,"missedBySec":null,"remedy":null}]}],
      "covered":["/s:Envelope/s:Body"],"token":null})")
                               .dump());
  EXPECT_EQ(token["refusal"], "of the token");
  ordered_json facts = json;
  facts.erase("report");
  EXPECT_EQ(facts.dump(), R"({"schema":1,"verified":false,"proof":null,"covered":[],"created":null,"expires":null,)"
                          R"("replay":null,"token":null})");
}

TEST(MessageJson, OfAReportWithoutATokenHasNull) {
  MessageView view;
  view.report = MessageReport();
  view.report->accepted = true;
  const ordered_json json = ordered_json::parse(MessageJson(view));
  EXPECT_EQ(json["report"].dump(), R"({"accepted":true,"refusal":null,"checks":[],"covered":[],"token":null})");
}

TEST(MessageJson, IsAsciiEvenIfAPathIsNot) {
  MessageView view = ViewAt(CREATED);
  view.accepted->covered = {"/\xC3\xA9", "/\xC3"};
  const std::string json = MessageJson(view);
  EXPECT_NE(json.find("/\\u00e9"), std::string::npos);
  EXPECT_EQ(json.find_first_of("\xC3\xA9"), std::string::npos);
}

TEST(MessageText, ShowsTheProofTheCoveredElementsAndTheToken) {
  const std::string text = MessageText(ViewAt("2026-01-01T12:01:00Z"), TextStyle());
  const std::string message = "Verified:        yes\n"
                              "Proof:           message-signature\n"
                              "Covered:         /s:Envelope/s:Header/wsse:Security/wsu:Timestamp\n"
                              "                 /s:Envelope/s:Body\n"
                              "Created:         2026-01-01T12:00:00.000Z (1 min ago)\n"
                              "Expires:         2026-01-01T12:05:00.000Z (in 4 min)\n"
                              "Replay:          not-guarded\n"
                              "\nToken\n";
  EXPECT_EQ(text.substr(0, message.size()), message);
  TokenView token = Signed().token;
  token.now = DateTime("2026-01-01T12:01:00Z");
  EXPECT_EQ(text.substr(message.size()), TokenText(token, TextStyle()));
}

TEST(MessageText, ShowsWhatIsNotCoveredAndNotStated) {
  MessageView view = ViewAt(CREATED);
  view.accepted->covered.clear();
  view.accepted->created = boost::none;
  view.accepted->expires = boost::none;
  const std::string text = MessageText(view, TextStyle());
  EXPECT_NE(text.find("\nCovered:         nothing\nCreated:         not stated\nExpires:         not stated\n"),
            std::string::npos)
      << text;
}

TEST(MessageText, OfARefusedMessageHasOnlyItsReport) {
  MessageView view;
  view.report = Refused();
  EXPECT_EQ(MessageText(view, TextStyle()), "Verified:        no\n\n" + WriteMessageReport(Refused()));
}

TEST(MessageText, LetsNoPathControlTheTerminal) {
  MessageView view = ViewAt(CREATED);
  view.accepted->covered = {"/a\x1B[2J"};
  EXPECT_EQ(MessageText(view, TextStyle()).find('\x1B'), std::string::npos);
}

TEST(Render, OfAMessageEndsInALineEnd) {
  EXPECT_EQ(Render(ViewAt(CREATED), Format::JSON).back(), '\n');
  MessageView view;
  EXPECT_EQ(Render(view, Format::TEXT), "Verified:        no\n");
}

} // namespace
} // namespace SsoClient::Tool
