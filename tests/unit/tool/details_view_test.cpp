// SPDX-License-Identifier: Apache-2.0
// The JSON and the text of a token's details.

#include "details_view.h"

#include "token_view.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <string>

namespace SsoClient::Tool {
namespace {

using nlohmann::ordered_json;
using Tarvel::System::DateTime;
using testing::HasSubstr;
using testing::Not;

TokenDetails Details() {
  TokenDetails details;
  details.issuer.value = "https://idp.example/";
  details.issueInstant = DateTime("2026-01-01T11:00:00Z");
  details.subject = {"alice", std::string("urn:f"), std::string("urn:q"), std::string("urn:sp"), std::string("a-17")};
  ConfirmationDetails other;
  other.method = "urn:other";
  ConfirmationDetails used;
  used.method = "urn:used";
  used.nameId = NameId{"bob", boost::none, boost::none, boost::none, boost::none};
  used.notBefore = DateTime("2026-01-01T11:30:00Z");
  used.notOnOrAfter = DateTime("2026-01-01T13:00:00Z");
  used.recipient = "https://sp.example/acs";
  used.inResponseTo = "_request";
  used.address = "192.0.2.7";
  used.publicKey = {1, 2, 3};
  details.confirmations = {other, used};
  details.usedConfirmation = 1;
  details.audienceRestrictions = {{"urn:a", "urn:b"}, {"urn:c"}};
  details.isOneTimeUse = true;
  details.proxyRestriction = ProxyDetails{std::uint64_t(2), {"urn:proxy"}};
  AuthnStatementDetails statement;
  statement.authnInstant = DateTime("2026-01-01T10:00:00Z");
  statement.sessionIndex = "s-1";
  statement.sessionNotOnOrAfter = DateTime("2026-01-01T14:00:00Z");
  statement.localityAddress = "192.0.2.8";
  statement.localityDnsName = "pc.example";
  statement.contextClass = "urn:class";
  statement.contextDeclaration = "urn:declaration";
  statement.authenticatingAuthorities = {"urn:first"};
  details.authnStatements = {statement};
  details.attributes = {
      {"mail", std::string("urn:format"), std::string("Mail"), {{"a", false, false}, {"<v></v>", true, false}}},
      {"gone", boost::none, boost::none, {{"", false, true}}},
      {SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity", boost::none, boost::none, {}}};
  return details;
}

ordered_json JsonOf(const TokenDetails &details) {
  ordered_json json = ordered_json::object();
  AddDetails(details, json);
  return json;
}

std::string LinesOf(const TokenDetails &details) {
  LabelledLines lines;
  AddConfirmationLines(details, lines);
  AddDetailLines(details, DateTime("2026-01-01T12:00:00Z"), lines);
  return lines.Get();
}

TEST(AddDetails, WritesEachValueUnderItsKey) {
  const ordered_json json = JsonOf(Details());
  EXPECT_EQ(R"({"value":"alice","format":"urn:f","nameQualifier":"urn:q","spNameQualifier":"urn:sp",)"
            R"("spProvidedId":"a-17"})",
            json["nameId"].dump());
  EXPECT_EQ(R"({"value":"https://idp.example/","format":null,"nameQualifier":null,"spNameQualifier":null,)"
            R"("spProvidedId":null})",
            json["issuer"].dump());
  EXPECT_EQ("2026-01-01T11:00:00.000Z", json["issueInstant"]);
  EXPECT_EQ(R"({"method":"urn:other","used":false,"nameId":null,"notBefore":null,"notOnOrAfter":null,)"
            R"("recipient":null,"inResponseTo":null,"address":null,"certificate":null,"publicKey":null})",
            json["confirmations"][0].dump());
  EXPECT_EQ(R"({"method":"urn:used","used":true,"nameId":{"value":"bob","format":null,"nameQualifier":null,)"
            R"("spNameQualifier":null,"spProvidedId":null},"notBefore":"2026-01-01T11:30:00.000Z",)"
            R"("notOnOrAfter":"2026-01-01T13:00:00.000Z","recipient":"https://sp.example/acs",)"
            R"("inResponseTo":"_request","address":"192.0.2.7","certificate":null,"publicKey":"AQID"})",
            json["confirmations"][1].dump());
  EXPECT_EQ(R"([["urn:a","urn:b"],["urn:c"]])", json["audienceRestrictions"].dump());
  EXPECT_EQ(true, json["oneTimeUse"]);
  EXPECT_EQ(R"({"count":2,"audiences":["urn:proxy"]})", json["proxyRestriction"].dump());
  EXPECT_EQ(R"([{"authnInstant":"2026-01-01T10:00:00.000Z","sessionIndex":"s-1",)"
            R"("sessionNotOnOrAfter":"2026-01-01T14:00:00.000Z","localityAddress":"192.0.2.8",)"
            R"("localityDnsName":"pc.example","contextClass":"urn:class","contextDeclaration":"urn:declaration",)"
            R"("authenticatingAuthorities":["urn:first"]}])",
            json["authnStatements"].dump());
  EXPECT_EQ(R"({"name":"mail","nameFormat":"urn:format","friendlyName":"Mail","values":[)"
            R"({"text":"a","xml":false,"nil":false},{"text":"<v></v>","xml":true,"nil":false}]})",
            json["attributes"][0].dump());
  EXPECT_EQ(R"({"name":"gone","nameFormat":null,"friendlyName":null,"values":[{"text":"","xml":false,"nil":true}]})",
            json["attributes"][1].dump());
}

TEST(AddDetails, HasNullForEachKeyWithoutDetails) {
  ordered_json json = ordered_json::object();
  AddDetails(boost::none, json);
  EXPECT_EQ(JsonOf(Details()).size(), json.size());
  for (const auto &item : json.items()) {
    EXPECT_TRUE(item.value().is_null()) << item.key();
  }
}

TEST(DetailLines, ShowWhatTheOtherLinesDoNot) {
  EXPECT_EQ(R"(Not used:        urn:other
Recipient:       https://sp.example/acs
In response to:  _request
Sender address:  192.0.2.7
Name here:       a-17
One-time use:    yes
Proxy audience:  urn:proxy
Session:         s-1
Session end:     2026-01-01T14:00:00.000Z (in 2 h)
Attribute:       mail
                 = a
                 = <v></v>
Attribute:       gone
                 (nil)
)",
            LinesOf(Details()));
}

TEST(DetailLines, AreEmptyForAPlainToken) {
  TokenDetails details;
  details.confirmations.emplace_back();
  details.authnStatements.emplace_back();
  details.proxyRestriction.emplace();
  EXPECT_EQ("", LinesOf(details));
}

TEST(DetailLines, DoNotCallTheOnlyConfirmationUnused) {
  TokenDetails details;
  details.confirmations.emplace_back().recipient = "urn:us";
  details.usedConfirmation = 1; // none can be used
  EXPECT_EQ("Recipient:       urn:us\n", LinesOf(details));
}

TEST(DetailLines, LetNothingControlTheTerminal) {
  TokenDetails details = Details();
  const std::string hostile = "\x1B[2J\n\xE2\x80\xAE";
  details.subject.spProvidedId = hostile;
  details.confirmations[0].method = hostile;
  details.confirmations[1].recipient = hostile;
  details.confirmations[1].inResponseTo = hostile;
  details.confirmations[1].address = hostile;
  details.proxyRestriction->audiences = {hostile};
  details.authnStatements[0].sessionIndex = hostile;
  details.attributes[0].name = hostile;
  details.attributes[0].values[0].text = hostile;
  const std::string text = LinesOf(details);
  EXPECT_THAT(text, Not(HasSubstr("\x1B")));
  EXPECT_THAT(text, Not(HasSubstr("\xE2")));
  EXPECT_THAT(text, HasSubstr("= \\u001B[2J\\u000A\\u202E\n"));
}

} // namespace
} // namespace SsoClient::Tool
