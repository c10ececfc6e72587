// SPDX-License-Identifier: Apache-2.0
// Negotiations that fail in the realm, at the service, or because of the service's answer.

#include "integration/gssapi/negotiation_fixture.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <ostream>
#include <string>

namespace SsoClient::Gssapi {
namespace {

using Testing::Bytes;
using Testing::GssAcceptor;
using Testing::RealmWithAlice;
using Testing::SettingsFor;

void MakeFirstLeg(const SpnegoSettings &settings) {
  CreateSpnegoHandler(settings)->NegotiateLeg({});
}

TEST(Negotiation, FailsForAnUnknownService) {
  const RealmWithAlice world;
  world.LogIn();
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(SettingsFor("nobody@localhost")), GssNegotiationException,
                          "The negotiation with nobody@localhost failed: Unspecified GSS failure.",
                          "Server nobody/localhost@EXAMPLE.TEST not found in Kerberos database");
}

TEST(Negotiation, FailsForAServiceOfAnUntrustedRealm) {
  const RealmWithAlice world;
  world.LogIn();
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(SettingsFor("sts/localhost@OTHER.TEST")), GssNegotiationException,
                          "The negotiation with sts/localhost@OTHER.TEST failed: ",
                          "Server krbtgt/OTHER.TEST@EXAMPLE.TEST not found in Kerberos database");
}

TEST(Negotiation, FailsForANameThatKerberosCannotRead) {
  const RealmWithAlice world;
  world.LogIn();
  EXPECT_FAILS_WITH_WORDS(MakeFirstLeg(SettingsFor("sts/localhost@A@B")), GssNegotiationException,
                          "The negotiation with sts/localhost@A@B failed: ", "Malformed representation of principal");
}

TEST(Negotiation, FailsWhenTheRealmDoesNotAnswer) {
  RealmWithAlice world;
  world.LogIn();
  world.realm.Stop();
  EXPECT_FAILS_WITH_WORDS(
      MakeFirstLeg(SettingsFor()), GssNegotiationException,
      "The negotiation with sts@localhost failed: ", "Cannot contact any KDC for realm 'EXAMPLE.TEST'");
}

/// The realm's clock, which the client adopts, differs from the machine's clock, which the service uses.
struct WrongClock {
  std::string name;
  int offsetSec;
  std::string words; ///< in the failure's text, at the service and at the client
};

void PrintTo(const WrongClock &clock, std::ostream *out) {
  *out << clock.name;
}

std::string NameOfClock(const testing::TestParamInfo<WrongClock> &info) {
  return info.param.name;
}

class NegotiationWithAWrongClock : public testing::TestWithParam<WrongClock> {};

TEST_P(NegotiationWithAWrongClock, FailsAtTheServiceWithAReason) {
  const RealmWithAlice world({.clockOffsetSec = GetParam().offsetSec, .adoptsClock = true});
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const auto handler = CreateSpnegoHandler(SettingsFor());
  const Bytes refusal = service.Accept(*handler->NegotiateLeg({}));
  EXPECT_NE(service.GetFailure().find(GetParam().words), std::string::npos) << service.GetFailure();
  EXPECT_FAILS_WITH_WORDS(handler->NegotiateLeg(refusal), GssNegotiationException,
                          "The negotiation with sts@localhost failed: ", GetParam().words);
}

INSTANTIATE_TEST_SUITE_P(Realm, NegotiationWithAWrongClock,
                         testing::Values(WrongClock{"Early", 3600, "Ticket not yet valid"},
                                         WrongClock{"Late", -1000, "Clock skew too great"}),
                         NameOfClock);

TEST(Negotiation, FailsWhenTheServiceHasTheKeyOfAnotherService) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service(world.realm.AddPrincipal("impostor/localhost"), world.realm.GetFolder());
  const auto handler = CreateSpnegoHandler(SettingsFor());
  const Bytes refusal = service.Accept(*handler->NegotiateLeg({}));
  EXPECT_FALSE(service.IsComplete());
  EXPECT_THROW(handler->NegotiateLeg(refusal), GssNegotiationException);
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());
}

TEST(Negotiation, FailsWithTheFinalLegOfAnotherNegotiation) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const Bytes others = service.Accept(*CreateSpnegoHandler(SettingsFor())->NegotiateLeg({}));
  ASSERT_TRUE(service.IsComplete());
  const auto handler = CreateSpnegoHandler(SettingsFor());
  handler->NegotiateLeg({});
  EXPECT_FAILS_WITH_WORDS(handler->NegotiateLeg(others), GssNegotiationException,
                          "The negotiation with sts@localhost failed: ", "");
  EXPECT_THROWS_MESSAGE(handler->RequireMutualAuthentication(), GssNegotiationException,
                        "The service sts@localhost was not authenticated: the negotiation is not complete");
}

struct InvalidLeg {
  std::string name;
  Bytes leg;
};

void PrintTo(const InvalidLeg &leg, std::ostream *out) {
  *out << leg.name;
}

std::string NameOf(const testing::TestParamInfo<InvalidLeg> &info) {
  return info.param.name;
}

class NegotiationWithAnInvalidLeg : public testing::TestWithParam<InvalidLeg> {};

TEST_P(NegotiationWithAnInvalidLeg, FailsPermanently) {
  const RealmWithAlice world;
  world.LogIn();
  const auto handler = CreateSpnegoHandler(SettingsFor());
  handler->NegotiateLeg({});
  EXPECT_FAILS_WITH_WORDS(handler->NegotiateLeg(GetParam().leg), GssNegotiationException,
                          "The negotiation with sts@localhost failed: ", "");
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg(GetParam().leg), Tarvel::InvalidStateException,
                        "The negotiation with sts@localhost has already failed");
}

INSTANTIATE_TEST_SUITE_P(
    Service, NegotiationWithAnInvalidLeg,
    testing::Values(InvalidLeg{"OneNull", {0}}, InvalidLeg{"Text", {'h', 'e', 'l', 'l', 'o'}},
                    InvalidLeg{"Nulls", Bytes(4096, 0)}, InvalidLeg{"Ones", Bytes(4096, 0xff)},
                    // RFC 4178, NegTokenResp: only negState
                    InvalidLeg{"AcceptedWithoutAProof", {0xa1, 0x07, 0x30, 0x05, 0xa0, 0x03, 0x0a, 0x01, 0x00}},
                    InvalidLeg{"IncompleteWithoutALeg", {0xa1, 0x07, 0x30, 0x05, 0xa0, 0x03, 0x0a, 0x01, 0x01}},
                    InvalidLeg{"Rejected", {0xa1, 0x07, 0x30, 0x05, 0xa0, 0x03, 0x0a, 0x01, 0x02}},
                    InvalidLeg{"UnknownState", {0xa1, 0x07, 0x30, 0x05, 0xa0, 0x03, 0x0a, 0x01, 0x63}},
                    InvalidLeg{"LengthBeyondItsEnd", {0xa1, 0x84, 0xff, 0xff, 0xff, 0xff, 0x30, 0x05, 0xa0, 0x03}},
                    // a NegTokenInit, which only the client may send
                    InvalidLeg{"InitialToken",
                               {0x60, 0x0e, 0x06, 0x06, 0x2b, 0x06, 0x01, 0x05, 0x05, 0x02, 0xa0, 0x04, 0x30, 0x02,
                                0xa0, 0x00}}),
    NameOf);

TEST(Negotiation, FailsWithEachPrefixOfAFinalLeg) {
  const RealmWithAlice world;
  world.LogIn();
  for (std::size_t length = 1, end = 2; length < end; ++length) {
    GssAcceptor service = world.MakeAcceptor();
    const auto handler = CreateSpnegoHandler(SettingsFor());
    Bytes leg = service.Accept(*handler->NegotiateLeg({}));
    end = leg.size();
    ASSERT_GT(end, 100u);
    leg.resize(std::min(length, end - 1)); // this leg can be shorter than the one before
    EXPECT_THROW(handler->NegotiateLeg(leg), GssNegotiationException) << "the first " << length << " bytes";
    EXPECT_FALSE(handler->IsMutuallyAuthenticated()) << "the first " << length << " bytes";
  }
}

TEST(Negotiation, FailsWithEachChangeOfTheProofInAFinalLeg) {
  const RealmWithAlice world;
  world.LogIn();
  constexpr std::size_t ENCRYPTED = 50; // at least this many bytes at the end are encrypted
  for (std::size_t back = 1; back <= ENCRYPTED; ++back) {
    GssAcceptor service = world.MakeAcceptor();
    const auto handler = CreateSpnegoHandler(SettingsFor());
    Bytes leg = service.Accept(*handler->NegotiateLeg({}));
    ASSERT_GT(leg.size(), 2 * ENCRYPTED);
    leg[leg.size() - back] ^= 0x10;
    EXPECT_THROW(handler->NegotiateLeg(leg), GssNegotiationException) << back << " bytes from the end";
    EXPECT_FALSE(handler->IsMutuallyAuthenticated()) << back << " bytes from the end";
  }
}

TEST(Negotiation, FailsWhenTheServiceSendsNoLegBeforeTheEnd) {
  const RealmWithAlice world;
  world.LogIn();
  const auto handler = CreateSpnegoHandler(SettingsFor());
  handler->NegotiateLeg({});
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg({}), GssNegotiationException,
                        "The service sts@localhost sent no leg, but the negotiation is not complete");
}

TEST(Negotiation, FailsWhenTheServiceSendsALegAfterTheEnd) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const auto handler = CreateSpnegoHandler(SettingsFor());
  const Bytes finalLeg = service.Accept(*handler->NegotiateLeg({}));
  handler->NegotiateLeg(finalLeg);
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg(finalLeg), GssNegotiationException,
                        "The service sts@localhost sent a further leg, but the negotiation is complete");
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());
}

TEST(Negotiation, RefusesALegOfTheServiceAtTheBeginning) {
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_THROWS_MESSAGE(handler->NegotiateLeg({1, 2, 3}), Tarvel::InvalidArgumentException,
                        "Invalid argument : The first leg is the client's");
}

} // namespace
} // namespace SsoClient::Gssapi
