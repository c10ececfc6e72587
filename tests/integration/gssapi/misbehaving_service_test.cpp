// SPDX-License-Identifier: Apache-2.0
// Services that really negotiate, but handle cookies, contexts or the end in an unusual way.

#include "integration/gssapi/negotiating_server.h"
#include "integration/gssapi/negotiation_fixture.h"
#include "support/data_file.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/gss_negotiation_context.h>
#include <ssoclient/security_token_service.h>

#include <gtest/gtest.h>

#include <string>

namespace SsoClient::Gssapi {
namespace {

using namespace Testing;

std::shared_ptr<const SamlToken> Acquire(const NegotiatingServer &server, SpnegoHandler &handler) {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return CreateSecurityTokenService(server.MakeConfig())->AcquireTokenByGSS(spec, handler);
}

std::shared_ptr<SpnegoHandler> HandlerInDceStyle() {
  SpnegoSettings settings = SettingsFor();
  settings.dceStyle = true;
  return CreateSpnegoHandler(settings);
}

/// The answer of a service that does nothing unusual.
std::string UsualAnswer(const NegotiationLeg &leg, const std::string &context) {
  return leg.isLast ? FinalLeg(context, leg.answer, ReadDataFile("tokens/bearer.xml"))
                    : IntermediateLeg(context, leg.answer);
}

bool HasCookie(const NegotiationLeg &leg) {
  return leg.request.find("\r\nCookie: negotiation=7\r\n") != std::string::npos;
}

/// A service that identifies its negotiations by a cookie, which it sets with `attribute`.
NegotiatingServer::Script CookieService(const std::string &attribute) {
  return [attribute](const NegotiationLeg &leg) -> NegotiationAnswer {
    if (leg.number > 1 && !HasCookie(leg)) {
      return {"", FaultResponse("wst:RequestFailed", "no cookie")};
    }
    return {"Set-Cookie: negotiation=7" + attribute + "\r\n", UsualAnswer(leg, "context")};
  };
}

TEST(MisbehavingService, ReceivesItsCookieWithTheNextLeg) {
  const RealmWithAlice world;
  world.LogIn();
  const NegotiatingServer server(world.serviceKeytab, world.realm.GetFolder(), CookieService("; Path=/"));
  const auto handler = HandlerInDceStyle();
  EXPECT_NE(Acquire(server, *handler), nullptr);
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
  EXPECT_EQ(server.GetContexts().size(), 2u);
}

TEST(MisbehavingService, RefusesTheNextLegWithoutItsCookie) {
  const RealmWithAlice world;
  world.LogIn();
  const NegotiatingServer server(world.serviceKeytab, world.realm.GetFolder(), CookieService("; Path=/elsewhere"));
  EXPECT_THROWS_MESSAGE(Acquire(server, *HandlerInDceStyle()), SsoException,
                        "Unexpected SOAP fault: wst:RequestFailed; request failed.");
  EXPECT_EQ(server.GetContexts().size(), 2u);
}

TEST(MisbehavingService, MayChangeTheContext) {
  const RealmWithAlice world;
  world.LogIn();
  const NegotiatingServer server(world.serviceKeytab, world.realm.GetFolder(),
                                 [](const NegotiationLeg &leg) -> NegotiationAnswer {
                                   return {"", UsualAnswer(leg, "context-" + std::to_string(leg.number))};
                                 });
  EXPECT_NE(Acquire(server, *HandlerInDceStyle()), nullptr);
  ASSERT_EQ(server.GetContexts().size(), 2u);
  EXPECT_EQ(server.GetContexts()[0].rfind("urn:uuid:", 0), 0u);
  EXPECT_EQ(server.GetContexts()[1], "context-1");
}

/// Never issues a token, and always answers with another leg.
NegotiatingServer::Script EndlessService() {
  return [first = std::string()](const NegotiationLeg &leg) mutable -> NegotiationAnswer {
    if (leg.number == 1) {
      first = leg.answer;
    }
    return {"", IntermediateLeg("context", leg.answer.empty() ? first : leg.answer)};
  };
}

TEST(MisbehavingService, EndsTheAcquisitionByALegAfterTheNegotiationsEnd) {
  const RealmWithAlice world;
  world.LogIn();
  const NegotiatingServer server(world.serviceKeytab, world.realm.GetFolder(), EndlessService());
  EXPECT_THROWS_MESSAGE(Acquire(server, *CreateSpnegoHandler(SettingsFor())), GssNegotiationException,
                        "The service sts@localhost sent a further leg, but the negotiation is complete");
  EXPECT_EQ(server.GetContexts().size(), 2u);
}

TEST(MisbehavingService, EndsTheAcquisitionByReachingTheLimitOnLegs) {
  const RealmWithAlice world;
  world.LogIn();
  const NegotiatingServer server(world.serviceKeytab, world.realm.GetFolder(), EndlessService());
  SpnegoSettings settings = SettingsFor();
  settings.dceStyle = true;
  settings.maximumLegs = 2;
  EXPECT_THROWS_MESSAGE(Acquire(server, *CreateSpnegoHandler(settings)), GssLimitException,
                        "The negotiation with sts@localhost reached its limit on legs: 2");
  EXPECT_EQ(server.GetContexts().size(), 2u);
}

TEST(MisbehavingService, MayIssueTheTokenOneLegLater) {
  const RealmWithAlice world;
  world.LogIn();
  const NegotiatingServer server(
      world.serviceKeytab, world.realm.GetFolder(), [](const NegotiationLeg &leg) -> NegotiationAnswer {
        return {"", leg.number == 1 ? IntermediateLeg("context", leg.answer) : UsualAnswer(leg, "context")};
      });
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_NE(Acquire(server, *handler), nullptr);
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
  EXPECT_EQ(server.GetContexts().size(), 2u);
}

TEST(MisbehavingService, MaySendNoContextToACallerThatNegotiatesLegByLeg) {
  const RealmWithAlice world;
  world.LogIn();
  const NegotiatingServer server(world.serviceKeytab, world.realm.GetFolder(),
                                 [](const NegotiationLeg &leg) -> NegotiationAnswer {
                                   return {"", UsualAnswer(leg, "")};
                                 });
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  const auto context = InternalApi::CreateGssNegotiationContext(server.MakeConfig(), spec);
  const auto handler = HandlerInDceStyle();
  const auto first = context->NegotiateToken(*handler->NegotiateLeg({}));
  EXPECT_EQ(first.token, nullptr);
  const auto second = context->NegotiateToken(*handler->NegotiateLeg(*first.serverLeg));
  EXPECT_NE(second.token, nullptr);
  // Without a context of the service, each leg begins a new negotiation, whose context the client generates.
  EXPECT_EQ(server.GetContexts()[1].rfind("urn:uuid:", 0), 0u);
}

} // namespace
} // namespace SsoClient::Gssapi
