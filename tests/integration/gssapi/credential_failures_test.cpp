// SPDX-License-Identifier: Apache-2.0
// No credentials, or none that the realm takes: told before anything goes to the service, and without falling back to
// other credentials that happen to be there.

#include "integration/gssapi/negotiation_fixture.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <fstream>
#include <string>

namespace SsoClient::Gssapi {
namespace {

using Testing::RealmWithAlice;
using Testing::SettingsFor;

void MakeFirstLeg(const SpnegoSettings &settings) {
  CreateSpnegoHandler(settings)->NegotiateLeg({});
}

TEST(Credentials, AreMissingWithoutATicket) {
  const RealmWithAlice world;
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(SettingsFor()), GssCredentialException,
                          "No credentials in the default credential cache: ", "No Kerberos credentials available");
}

TEST(Credentials, AreToldWithMajorAndMinorText) {
  const RealmWithAlice world;
  EXPECT_FAILS_WITH_WORDS(
      MakeFirstLeg(SettingsFor()), GssCredentialException,
      "No credentials in the default credential cache: No credentials were supplied, or the credentials were "
      "unavailable or inaccessible: No",
      world.realm.GetDefaultCache().substr(5));
}

TEST(Credentials, AreMissingInANamedCacheThoughTheDefaultOneHasSome) {
  const RealmWithAlice world;
  world.LogIn();
  SpnegoSettings settings = SettingsFor();
  settings.credentialCache = world.realm.NameFile("no_such_cache");
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the credential cache " + settings.credentialCache + ": ",
                          "No credentials cache found");
}

TEST(Credentials, AreMissingInACacheThatIsNone) {
  const RealmWithAlice world;
  world.LogIn();
  std::ofstream(world.realm.GetFolder() / "garbage") << "this is not a cache at all, whatever its name says";
  SpnegoSettings settings = SettingsFor();
  settings.credentialCache = world.realm.NameFile("garbage");
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the credential cache " + settings.credentialCache + ": ", "format");
}

TEST(Credentials, AreMissingInACacheOfAnUnknownKind) {
  const RealmWithAlice world;
  world.LogIn();
  SpnegoSettings settings = SettingsFor();
  settings.credentialCache = "NOWHERE:cache";
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the credential cache NOWHERE:cache: ", "Unknown credential cache type");
}

TEST(Credentials, AreMissingForAClientThatTheCacheDoesNotKnow) {
  const RealmWithAlice world;
  world.LogIn();
  SpnegoSettings settings = SettingsFor();
  settings.client = "bob@EXAMPLE.TEST";
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the default credential cache for bob@EXAMPLE.TEST: ", "bob@EXAMPLE.TEST");
}

TEST(Credentials, HaveExpiredWithTheTicket) {
  // A clock that is two hours behind gives a ticket for one hour, which has expired an hour ago by everybody else's.
  const RealmWithAlice world({.clockOffsetSec = -7200, .adoptsClock = false});
  world.LogIn();
  EXPECT_THROWS_MESSAGE(MakeFirstLeg(SettingsFor()), GssCredentialException,
                        "The ticket in the default credential cache has expired");
}

TEST(Credentials, AreMissingWithoutTheKeytabThoughTheDefaultCacheHasSome) {
  const RealmWithAlice world;
  world.LogIn();
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.realm.NameFile("no_such_keytab");
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the keytab " + settings.clientKeytab + ": ", "No");
}

TEST(Credentials, AreRefusedWithAKeyThatIsNoLongerTheClients) {
  const RealmWithAlice world;
  world.realm.ChangeKey("alice");
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.userKeytab;
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the keytab " + settings.clientKeytab + ": ",
                          "Decrypt integrity check failed");
}

TEST(Credentials, AreMissingForAClientWhoseKeyIsNotInTheKeytab) {
  const RealmWithAlice world;
  SpnegoSettings settings = SettingsFor();
  settings.client = "bob@EXAMPLE.TEST";
  settings.clientKeytab = world.userKeytab;
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the keytab " + settings.clientKeytab + " for bob@EXAMPLE.TEST: ", "No");
}

TEST(Credentials, CannotBeHadWhenTheRealmDoesNotAnswer) {
  RealmWithAlice world;
  world.realm.Stop();
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.userKeytab;
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the keytab " + settings.clientKeytab + ": ",
                          "Cannot contact any KDC for realm 'EXAMPLE.TEST'");
}

TEST(Credentials, AreRefusedWhenTheRealmsClockIsFarFromOurs) {
  const RealmWithAlice world({.clockOffsetSec = 3600, .adoptsClock = false});
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.userKeytab;
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException,
                          "No credentials in the keytab " + settings.clientKeytab + ": ", "Clock skew too great");
}

TEST(Credentials, CannotBeHadWithABrokenConfiguration) {
  const RealmWithAlice world;
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.userKeytab;
  std::ofstream(world.realm.GetFolder() / "krb5.conf") << "[libdefaults\n";
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(settings), GssCredentialException, "No credential cache can be made in memory: ",
                          "Improper format of Kerberos configuration file");
}

TEST(Credentials, AreNoneOnceTheNegotiationHasFailed) {
  const RealmWithAlice world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_THROW(handler->NegotiateLeg({}), GssCredentialException);
  world.LogIn();
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg({}), Tarvel::InvalidStateException,
                        "The negotiation with sts@localhost has already failed");
}

TEST(Credentials, AreReportedAsRefusedCredentialsAreEverywhere) {
  const RealmWithAlice world;
  EXPECT_THROW(MakeFirstLeg(SettingsFor()), InvalidCredentialsException);
}

} // namespace
} // namespace SsoClient::Gssapi
