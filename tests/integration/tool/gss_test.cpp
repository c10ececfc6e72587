// SPDX-License-Identifier: Apache-2.0
// Acquiring by a Kerberos ticket, in a realm that the test starts.

#include "expect_result.h"
#include "service_test.h"
#include "ticket_world.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>

namespace ToolTest {
namespace {

using testing::HasSubstr;
using testing::StartsWith;

class AcquireByTicket : protected TicketWorld, public ServiceTest {
protected:
  explicit AcquireByTicket(const Testing::RealmSettings &settings = {.name = "CORP.EXAMPLE"})
      : TicketWorld(settings), ServiceTest(ServiceArguments()) {}

  Result AcquireWith(const std::string &options, const std::string &fault = {}) const {
    return Run("ssoclient acquire " + Service(fault) + "--gss --out token.xml " + options);
  }

  static void ExpectTokenOf(const std::string &subject, const Result &result) {
    EXPECT_EQ(0, result.exitCode);
    EXPECT_EQ("", result.err);
    EXPECT_THAT(result.out, StartsWith("Verified:        yes\n"));
    EXPECT_THAT(result.out, HasSubstr("\nSubject:         " + subject + "\n"));
  }

  /// Expects a failure in one line, and no token. The line begins with the text of the tool, `ours`. The text of the
  /// Kerberos library follows, which differs from version to version and must contain `words`.
  void ExpectFailure(int exitCode, const std::string &ours, const std::string &words, const Result &result) const {
    EXPECT_EQ(exitCode, result.exitCode);
    EXPECT_EQ("", result.out);
    EXPECT_THAT(result.err, StartsWith("ssoclient: " + ours));
    EXPECT_THAT(result.err.substr(std::min(ours.size(), result.err.size())), HasSubstr(words));
    EXPECT_EQ(result.err.size() - 1, result.err.find('\n')) << result.err;
    EXPECT_FALSE(std::filesystem::exists(m_folder / "token.xml"));
  }
};

TEST_F(AcquireByTicket, GivesTheTicketsOwnerABearerToken) {
  LogIn();
  const Result result = AcquireWith("");
  ExpectTokenOf("alice@corp.example", result);
  EXPECT_THAT(result.out, HasSubstr("\nConfirmation:    bearer\n"));
  EXPECT_THAT(m_service.GetLog(), HasSubstr("negotiated, issued"));
  ExpectResult(Run("ssoclient verify --format json --trust sts.pem token.xml | jq .subject.name"), 0, "\"alice\"\n",
               "");
}

TEST_F(AcquireByTicket, BindsTheTokenToAKeyWhenThereIsOne) {
  LogIn();
  const Result result = AcquireWith(IDENTITY);
  ExpectTokenOf("alice@corp.example", result);
  EXPECT_THAT(result.out, HasSubstr("\nConfirmation:    holder-of-key\n"));
}

TEST_F(AcquireByTicket, GivesABearerTokenDespiteAKeyIfAskedTo) {
  LogIn();
  const Result result = AcquireWith(std::string(IDENTITY) + "--bearer");
  ExpectTokenOf("alice@corp.example", result);
  EXPECT_THAT(result.out, HasSubstr("\nConfirmation:    bearer\n"));
}

TEST_F(AcquireByTicket, AsksForTheKindOfTokenThatTheOptionsChoose) {
  LogIn();
  const Result result = AcquireWith("--delegable --audience https://files.corp.example/");
  ExpectTokenOf("alice@corp.example", result);
  EXPECT_THAT(result.out, HasSubstr("\nDelegable:       yes\n"));
  EXPECT_THAT(result.out, HasSubstr("\nAudience:        https://files.corp.example/\n"));
}

TEST_F(AcquireByTicket, IsSentWithAWarningAndRefusedWithAHintForADelegatedTokenThatIsBoundToAKey) {
  LogIn();
  const std::string options = std::string(IDENTITY) + "--delegate-to bob@corp.example ";
  ExpectResult(
      AcquireWith(options), 8, "",
      "ssoclient: warning: with --delegate-to, the request asks for a token that is bound to the identity's key, "
      "but does not prove the key; services refuse that\n"
      "ssoclient: service fault: Unexpected SOAP fault: wst:InvalidRequest; request failed.\n"
      "ssoclient: hint: also give --bearer: with --user or --gss, a token for --delegate-to cannot be bound to "
      "a key\n");
  ExpectTokenOf("alice@corp.example", AcquireWith(options + "--bearer"));
}

TEST_F(AcquireByTicket, AcceptsTheServiceByItsHostOrAsAPrincipal) {
  LogIn();
  for (const char *service : {"HTTP@localhost", "HTTP/localhost", "HTTP/localhost@CORP.EXAMPLE"}) {
    ExpectTokenOf("alice@corp.example", AcquireWith(std::string("--force --service ") + service));
  }
}

TEST_F(AcquireByTicket, UsesTheTicketInTheGivenCache) {
  LogIn();
  const std::string cache = m_realm.NameFile("bob_cache");
  m_realm.GetTicket("bob", m_realm.AddPrincipal("bob"), cache);
  ExpectTokenOf("bob@corp.example", AcquireWith("--ccache " + cache));
}

TEST_F(AcquireByTicket, UsesTheTicketInTheCacheOfTheEnvironment) {
  const std::string cache = m_realm.NameFile("bob_cache");
  m_realm.GetTicket("bob", m_realm.AddPrincipal("bob"), cache);
  ExpectTokenOf("bob@corp.example", Run("KRB5CCNAME=" + cache + " ssoclient acquire " + Service() + "--gss"));
}

TEST_F(AcquireByTicket, GetsATicketWithAKeytabAndDoesNotKeepIt) {
  ExpectTokenOf("alice@corp.example", AcquireWith("--client-keytab " + PathOf(m_aliceKeytab)));
  EXPECT_FALSE(std::filesystem::exists(PathOf(m_realm.GetDefaultCache())));
}

TEST_F(AcquireByTicket, KeepsTheKeytabsTicketInTheGivenCache) {
  const std::string cache = "--ccache " + m_realm.NameFile("kept_cache");
  ExpectTokenOf("alice@corp.example", AcquireWith(cache + " --client-keytab " + PathOf(m_aliceKeytab)));
  ExpectTokenOf("alice@corp.example", AcquireWith("--force " + cache));
}

TEST_F(AcquireByTicket, FailsWithoutATicketBeforeTheServiceIsAsked) {
  ExpectFailure(3, "credentials: No credentials in the default credential cache: ", "No Kerberos credentials available",
                AcquireWith(""));
  EXPECT_EQ("", m_service.GetLog());
}

TEST_F(AcquireByTicket, ShowsTheHandlersExceptionClassInJson) {
  const Result result = AcquireWith("--format json");
  EXPECT_EQ(3, result.exitCode);
  EXPECT_THAT(result.err,
              StartsWith(R"({"schema":1,"error":{"class":"GssCredentialException","message":"No credentials in )"));
}

TEST_F(AcquireByTicket, FailsWhenTheGivenCacheDoesNotExist) {
  LogIn();
  const std::string cache = m_realm.NameFile("no_such_cache");
  ExpectFailure(3, "credentials: No credentials in the credential cache " + cache + ": ", "No credentials cache found",
                AcquireWith("--ccache " + cache));
}

TEST_F(AcquireByTicket, FailsWhenTheKeytabDoesNotExist) {
  LogIn();
  ExpectFailure(3, "credentials: No credentials in the keytab none.keytab: ", "No",
                AcquireWith("--client-keytab none.keytab"));
}

TEST_F(AcquireByTicket, FailsWithAFileThatIsNotAKeytab) {
  LogIn();
  m_folder.Write("garbage.keytab", "this is no keytab, whatever its name says");
  ExpectFailure(3, "credentials: No credentials in the keytab garbage.keytab: ", "",
                AcquireWith("--client-keytab garbage.keytab"));
}

TEST_F(AcquireByTicket, FailsForAServiceThatTheRealmDoesNotKnow) {
  LogIn();
  ExpectFailure(4, "communication failed: The negotiation with nobody@localhost failed: Unspecified GSS failure.",
                "Server nobody/localhost@CORP.EXAMPLE not found in Kerberos database",
                AcquireWith("--service nobody@localhost"));
}

TEST_F(AcquireByTicket, NegotiatesWithHttpAtTheAddressesHostByDefault) {
  LogIn();
  const Result result = Run("ssoclient acquire --sts https://127.0.0.1:" + std::to_string(m_service.GetPort()) +
                            "/sts --ca ca.pem --trust sts.pem --gss --out token.xml");
  ExpectFailure(4, "communication failed: The negotiation with HTTP@127.0.0.1 failed: Unspecified GSS failure.",
                "HTTP/127.0.0.1@", result);
}

TEST_F(AcquireByTicket, FailsForAServiceOfARealmThatTheClientsRealmDoesNotTrust) {
  LogIn();
  ExpectFailure(4, "communication failed: The negotiation with HTTP/localhost@OTHER.EXAMPLE failed: ",
                "Server krbtgt/OTHER.EXAMPLE@CORP.EXAMPLE not found in Kerberos database",
                AcquireWith("--service HTTP/localhost@OTHER.EXAMPLE"));
}

TEST_F(AcquireByTicket, FailsWhenTheRealmDoesNotAnswer) {
  LogIn();
  m_realm.Stop();
  ExpectFailure(4, "communication failed: The negotiation with HTTP@localhost failed: ",
                "Cannot contact any KDC for realm 'CORP.EXAMPLE'", AcquireWith(""));
}

TEST_F(AcquireByTicket, FailsWhenTheServicesFinalLegIsGarbage) {
  LogIn();
  ExpectFailure(4, "communication failed: The negotiation with HTTP@localhost failed: ", "Invalid token was supplied",
                AcquireWith("", "garbage-leg"));
}

TEST_F(AcquireByTicket, FailsWhenTheServiceNegotiatesWithoutAContext) {
  LogIn();
  ExpectResult(AcquireWith("", "no-context"), 4, "",
               "ssoclient: communication failed: Error processing the response to SPNego token request: no Context ID "
               "was returned.\n");
}

TEST_F(AcquireByTicket, IsRefusedForAUserThatTheServiceDoesNotKnow) {
  const std::string keytab = m_realm.AddPrincipal("mallory");
  ExpectResult(AcquireWith("--client-keytab " + PathOf(keytab)), 3, "",
               "ssoclient: credentials refused: Authentication failed: unknown user mallory@CORP.EXAMPLE\n");
}

TEST_F(AcquireByTicket, ReportsAServiceNameThatIsNotValidAsAWrongCommandLine) {
  LogIn();
  ExpectResult(
      AcquireWith("--service HTTP"), 2, "",
      "ssoclient: usage: Invalid argument : 'HTTP' is not a service name such as HTTP@host or HTTP/host@REALM\n");
}

/// The realm's clock is two hours slow. Its tickets are valid for one hour, so by every other clock they expired an
/// hour ago.
class AcquireByExpiredTicket : public AcquireByTicket {
protected:
  AcquireByExpiredTicket() : AcquireByTicket({.name = "CORP.EXAMPLE", .clockOffsetSec = -7200, .adoptsClock = false}) {}
};

TEST_F(AcquireByExpiredTicket, SaysThatItHasExpired) {
  LogIn();
  ExpectResult(AcquireWith(""), 3, "",
               "ssoclient: credentials: The ticket in the default credential cache has expired\n");
}

/// A realm with a wrong clock, which the client adopts and the service does not.
class AcquireInARealmWithAWrongClock : public AcquireByTicket {
protected:
  AcquireInARealmWithAWrongClock()
      : AcquireByTicket({.name = "CORP.EXAMPLE", .clockOffsetSec = -1000, .adoptsClock = true}) {}
};

TEST_F(AcquireInARealmWithAWrongClock, IsRefusedBecauseOfTheClock) {
  LogIn();
  ExpectFailure(3, "credentials refused: Authentication failed: Unspecified GSS failure.", "Clock skew too great",
                AcquireWith(""));
}

} // namespace
} // namespace ToolTest
