// SPDX-License-Identifier: Apache-2.0
// The handler against the GSSAPI's own acceptor: which credentials it uses, for which client, and in how many legs.

#include "integration/gssapi/negotiation_fixture.h"
#include "memory_cache.h"
#include "support/process_resources.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <unistd.h>

namespace SsoClient::Gssapi {
namespace {

using Testing::Bytes;
using Testing::GssAcceptor;
using Testing::Negotiate;
using Testing::RealmWithAlice;
using Testing::SettingsFor;

TEST(SpnegoHandler, CompletesMutualAuthenticationWithTheServicesFinalLeg) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const auto handler = CreateSpnegoHandler(SettingsFor());

  const Bytes finalLeg = service.Accept(*handler->NegotiateLeg({}));
  EXPECT_TRUE(service.IsComplete()) << service.GetFailure();
  EXPECT_EQ(service.GetClient(), "alice@EXAMPLE.TEST");
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());

  EXPECT_TRUE(handler->NegotiateLeg(finalLeg)->empty());
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
  EXPECT_NO_THROW(handler->RequireMutualAuthentication());
}

TEST(SpnegoHandler, RequiresMutualAuthenticationOfAServiceThatSendsNoFinalLeg) {
  const RealmWithAlice world;
  world.LogIn();
  const auto handler = CreateSpnegoHandler(SettingsFor());
  handler->NegotiateLeg({});
  EXPECT_THROWS_MESSAGE(handler->RequireMutualAuthentication(), GssNegotiationException,
                        "The service sts@localhost was not authenticated: the negotiation is not complete");
}

TEST(SpnegoHandler, AcceptsAKerberosPrincipalAsTheService) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  const auto handler = CreateSpnegoHandler(SettingsFor("sts/localhost@EXAMPLE.TEST"));
  EXPECT_EQ(Negotiate(*handler, service), 2);
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
}

TEST(SpnegoHandler, MakesAThirdLegInDceStyle) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  SpnegoSettings settings = SettingsFor();
  settings.dceStyle = true;
  const auto handler = CreateSpnegoHandler(settings);

  Bytes answer = service.Accept(*handler->NegotiateLeg({}));
  EXPECT_FALSE(service.IsComplete());
  const auto second = handler->NegotiateLeg(answer);
  ASSERT_FALSE(second->empty());
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());

  answer = service.Accept(*second);
  EXPECT_TRUE(service.IsComplete()) << service.GetFailure();
  EXPECT_TRUE(handler->NegotiateLeg(answer)->empty());
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
}

TEST(SpnegoHandler, NeverDelegatesCredentials) {
  const RealmWithAlice world;
  world.LogIn();
  GssAcceptor service = world.MakeAcceptor();
  Negotiate(*CreateSpnegoHandler(SettingsFor()), service);
  EXPECT_TRUE(service.IsComplete());
  EXPECT_FALSE(service.HasDelegatedCredential());
}

TEST(SpnegoHandler, UsesTheConfiguredCacheAndNotTheDefaultOne) {
  const RealmWithAlice world;
  world.LogIn();
  const std::string cache = world.realm.NameFile("bob_cache");
  world.realm.GetTicket("bob", world.realm.AddPrincipal("bob"), cache);
  GssAcceptor service = world.MakeAcceptor();
  SpnegoSettings settings = SettingsFor();
  settings.credentialCache = cache;
  Negotiate(*CreateSpnegoHandler(settings), service);
  EXPECT_EQ(service.GetClient(), "bob@EXAMPLE.TEST");
}

TEST(SpnegoHandler, GetsATicketWithAKeytabAndLeavesTheDefaultCacheAlone) {
  const RealmWithAlice world;
  world.LogIn();
  const auto readDefaultCache = [&] {
    std::ifstream file(world.realm.GetFolder() / "default_cache", std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
  };
  const std::string before = readDefaultCache();
  ASSERT_FALSE(before.empty());
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.realm.AddPrincipal("robot");
  GssAcceptor service = world.MakeAcceptor();
  Negotiate(*CreateSpnegoHandler(settings), service);
  EXPECT_EQ(service.GetClient(), "robot@EXAMPLE.TEST");
  EXPECT_EQ(readDefaultCache(), before);
}

TEST(SpnegoHandler, LeavesTheEnvironmentAlone) {
  const RealmWithAlice world;
  const auto readEnvironment = [] {
    std::vector<std::string> variables;
    for (char **variable = environ; *variable != nullptr; ++variable) {
      variables.emplace_back(*variable);
    }
    return variables;
  };
  const std::vector<std::string> before = readEnvironment();
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.userKeytab;
  GssAcceptor service = world.MakeAcceptor();
  Negotiate(*CreateSpnegoHandler(settings), service);
  EXPECT_EQ(readEnvironment(), before);
}

TEST(SpnegoHandler, KeepsTheKeytabsTicketInTheConfiguredCache) {
  const RealmWithAlice world;
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.userKeytab;
  settings.credentialCache = world.realm.NameFile("kept_cache");
  GssAcceptor first = world.MakeAcceptor();
  Negotiate(*CreateSpnegoHandler(settings), first);
  EXPECT_TRUE(first.IsComplete());

  settings.clientKeytab.clear();
  GssAcceptor second = world.MakeAcceptor();
  Negotiate(*CreateSpnegoHandler(settings), second);
  EXPECT_EQ(second.GetClient(), "alice@EXAMPLE.TEST");
}

TEST(SpnegoHandler, NegotiatesAsTheConfiguredClient) {
  const RealmWithAlice world;
  SpnegoSettings settings = SettingsFor();
  settings.client = "alice@EXAMPLE.TEST";
  settings.clientKeytab = world.userKeytab;
  GssAcceptor service = world.MakeAcceptor();
  Negotiate(*CreateSpnegoHandler(settings), service);
  EXPECT_EQ(service.GetClient(), "alice@EXAMPLE.TEST");
}

TEST(SpnegoHandler, LeaksNoDescriptor) {
  const RealmWithAlice world;
  world.LogIn();
  SpnegoSettings withKeytab = SettingsFor();
  withKeytab.clientKeytab = world.userKeytab;
  const auto negotiateOnce = [&] {
    GssAcceptor service = world.MakeAcceptor();
    Negotiate(*CreateSpnegoHandler(SettingsFor()), service);
    GssAcceptor other = world.MakeAcceptor();
    CreateSpnegoHandler(withKeytab)->NegotiateLeg({}); // this negotiation is not completed
  };
  negotiateOnce();
  ASSERT_TRUE(Testing::DrainIoThreads()); // sockets of earlier tests may be closed late
  const std::size_t before = Testing::CountDescriptors();
  for (int i = 0; i < 10; ++i) {
    negotiateOnce();
  }
  EXPECT_TRUE(Testing::Eventually([&] { return Testing::CountDescriptors() <= before; }))
      << Testing::CountDescriptors() << " after " << before;
}

TEST(MemoryCache, HasAUniqueNameAndEndsWithItsObject) {
  const RealmWithAlice world;
  const auto hasPrincipal = [&](const std::string &cache) {
    SpnegoSettings settings = SettingsFor();
    settings.credentialCache = cache;
    try {
      CreateSpnegoHandler(settings)->NegotiateLeg({});
      return true;
    } catch (const GssCredentialException &) {
      return false;
    }
  };
  std::string name;
  {
    const MemoryCache cache;
    const MemoryCache another;
    EXPECT_NE(cache.GetName(), another.GetName());
    name = cache.GetName();
    SpnegoSettings settings = SettingsFor();
    settings.clientKeytab = world.userKeytab;
    settings.credentialCache = name;
    CreateSpnegoHandler(settings)->NegotiateLeg({});
    EXPECT_TRUE(hasPrincipal(name));
  }
  EXPECT_FALSE(hasPrincipal(name));
}

} // namespace
} // namespace SsoClient::Gssapi
