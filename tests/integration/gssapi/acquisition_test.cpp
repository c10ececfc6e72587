// SPDX-License-Identifier: Apache-2.0
// Tokens in exchange for Kerberos tickets. The development service issues them over TLS, and accepts the tickets with
// the system's GSSAPI. The tests acquire a token in one call, or negotiate leg by leg.

#include "integration/gssapi/service_world.h"
#include "support/process_resources.h"
#include "support/throws_message.h"
#include "support/work_folder.h"

#include <ssoclient/saml_token.h>

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace SsoClient::Gssapi {
namespace {

using InternalApi::CreateGssNegotiationContext;
using Testing::HourSpec;
using Testing::NegotiateByHand;
using Testing::ServiceWorld;
using Testing::SettingsFor;
using Testing::SubjectOf;

SpnegoSettings DceStyle() {
  SpnegoSettings settings = SettingsFor();
  settings.dceStyle = true;
  return settings;
}

/// Waits until the pool has released `handler`: the GSSAPI must not be in use when the process ends.
bool IsReleased(const std::shared_ptr<SpnegoHandler> &handler) {
  return Testing::Eventually([&handler] { return handler.use_count() == 1; });
}

std::size_t CountIn(const std::string &text, const std::string &word) {
  std::size_t count = 0;
  for (std::size_t at = text.find(word); at != std::string::npos; at = text.find(word, at + 1)) {
    ++count;
  }
  return count;
}

TEST(GssAcquisition, ReturnsABearerTokenForATicket) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  const auto token = CreateSecurityTokenService(world.MakeConfig())->AcquireTokenByGSS(HourSpec(), *handler);
  EXPECT_EQ(SubjectOf(*token), "alice@corp.example");
  EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::BEARER);
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
}

TEST(GssAcquisition, ReturnsAHolderOfKeyTokenToAClientThatAlsoHasAKey) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  const SecurityTokenServiceConfig config = world.MakeConfig("", "client");
  const auto token = CreateSecurityTokenService(config)->AcquireTokenByGSS(HourSpec(), *handler);
  EXPECT_EQ(SubjectOf(*token), "alice@corp.example");
  ASSERT_EQ(token->GetConfirmationMethod(), SamlToken::HOLDER_OF_KEY);
  EXPECT_EQ(token->GetConfirmationCertificate()->GetSha256Thumbprint(),
            config.holderOfKeyConfig->certificate->GetSha256Thumbprint());
}

TEST(GssAcquisition, CarriesTextBeyondAsciiToAndFromAServiceInLatin1) {
  const Testing::WorkFolder folder;
  const std::string users =
      folder.Write("users.json", R"([{"name":"alice@corp.example","password":"-","first":"Älice ł","last":"語 😀",
                         "groups":["größe-ł-語-😀@corp.example"]}])");
  const ServiceWorld world({.name = "CORP.EXAMPLE"}, {"--charset", "ISO-8859-1", "--users", users});
  TokenSpec spec = HourSpec();
  spec.advice = {{"https://advice.example/ü-ł", {{"größe-語", {"rød", "😀"}}}}};
  for (const char *const identity : {"", "client"}) {
    const auto handler = CreateSpnegoHandler(DceStyle());
    const auto token = CreateSecurityTokenService(world.MakeConfig("", identity))->AcquireTokenByGSS(spec, *handler);
    EXPECT_EQ(SubjectOf(*token), "alice@corp.example");
    std::vector<PrincipalId> groups;
    token->GetGroups(groups);
    ASSERT_EQ(groups.size(), 1u);
    EXPECT_EQ(groups[0].name, "größe-ł-語-😀");
    std::vector<Advice> advice;
    token->GetAdvice(advice);
    ASSERT_EQ(advice.size(), 1u);
    EXPECT_EQ(advice[0].source, "https://advice.example/ü-ł");
    ASSERT_EQ(advice[0].attributes.size(), 1u);
    EXPECT_EQ(advice[0].attributes[0].name, "größe-語");
    EXPECT_EQ(advice[0].attributes[0].values, (std::vector<std::string>{"rød", "😀"}));
  }
}

TEST(GssAcquisition, KeepsTheSpecOverSeveralLegs) {
  const ServiceWorld world;
  TokenSpec spec = HourSpec();
  spec.renewable = true;
  spec.audienceRestriction = {"https://a.example/"};
  const auto handler = CreateSpnegoHandler(DceStyle());
  const auto token = CreateSecurityTokenService(world.MakeConfig("", "client"))->AcquireTokenByGSS(spec, *handler);
  std::set<std::string> audience;
  token->GetAudience(audience);
  EXPECT_EQ(audience, std::set<std::string>{"https://a.example/"});
  EXPECT_TRUE(token->IsRenewable());
  EXPECT_EQ(token->GetEndDate().GetUtcTime() - token->GetStartDate().GetUtcTime(), std::int64_t{3600} * 1000000);
}

TEST(GssAcquisition, NeedsTwoMessagesInDceStyle) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(DceStyle());
  const auto token = CreateSecurityTokenService(world.MakeConfig())->AcquireTokenByGSS(HourSpec(), *handler);
  EXPECT_EQ(SubjectOf(*token), "alice@corp.example");
  EXPECT_TRUE(handler->IsMutuallyAuthenticated());
  EXPECT_EQ(CountIn(world.GetService().GetLog(), ": negotiating\n"), 1u);
  EXPECT_EQ(CountIn(world.GetService().GetLog(), ": negotiated, issued"), 1u);
}

TEST(GssAcquisition, AlsoRunsOnThePool) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  const auto service = CreateSecurityTokenService(world.MakeConfig());
  std::promise<std::string> outcome;
  service->AcquireTokenByGssAsync(HourSpec(), handler,
                                  [&](const std::shared_ptr<const SamlToken> &token, const Tarvel::Exception *failure) {
                                    outcome.set_value(failure ? failure->what() : SubjectOf(*token));
                                  });
  EXPECT_EQ(outcome.get_future().get(), "alice@corp.example");
  ASSERT_TRUE(IsReleased(handler));
}

TEST(GssAcquisition, RunsOnSeveralThreadsAtOnce) {
  constexpr std::size_t THREADS = 4;
  constexpr int ROUNDS = 5;
  const ServiceWorld world;
  const auto service = CreateSecurityTokenService(world.MakeConfig());
  SpnegoSettings withKeytab = SettingsFor();
  withKeytab.clientKeytab = world.GetRealm().AddPrincipal("bob");
  std::vector<std::future<std::string>> outcomes;
  for (std::size_t i = 0; i < THREADS; ++i) {
    const bool isBob = i % 2 == 1;
    outcomes.push_back(std::async(std::launch::async, [&service, settings = isBob ? withKeytab : SettingsFor()] {
      std::string subjects;
      for (int round = 0; round < ROUNDS; ++round) {
        const auto handler = CreateSpnegoHandler(settings);
        subjects += SubjectOf(*service->AcquireTokenByGSS(HourSpec(), *handler)) + " ";
        handler->RequireMutualAuthentication();
      }
      return subjects;
    }));
  }
  for (std::size_t i = 0; i < THREADS; ++i) {
    std::string expected;
    for (int round = 0; round < ROUNDS; ++round) {
      expected += i % 2 == 1 ? "bob@corp.example " : "alice@corp.example ";
    }
    EXPECT_EQ(outcomes[i].get(), expected);
  }
}

TEST(GssAcquisition, ReportsMissingCredentialsOnThePoolInTheirOwnClass) {
  const ServiceWorld world;
  SpnegoSettings settings = SettingsFor();
  settings.credentialCache = world.GetRealm().NameFile("no_such_cache");
  const auto handler = CreateSpnegoHandler(settings);
  const auto service = CreateSecurityTokenService(world.MakeConfig());
  std::promise<bool> outcome;
  service->AcquireTokenByGssAsync(HourSpec(), handler,
                                  [&](const std::shared_ptr<const SamlToken> &, const Tarvel::Exception *failure) {
                                    outcome.set_value(dynamic_cast<const GssCredentialException *>(failure) != nullptr);
                                  });
  EXPECT_TRUE(outcome.get_future().get());
  ASSERT_TRUE(IsReleased(handler));
}

TEST(GssNegotiationByHand, NeedsOneMessage) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  int legs = 0;
  const auto token = NegotiateByHand(*CreateGssNegotiationContext(world.MakeConfig(), HourSpec()), *handler, legs);
  EXPECT_EQ(SubjectOf(*token), "alice@corp.example");
  EXPECT_EQ(legs, 1);
}

TEST(GssNegotiationByHand, NeedsTwoMessagesInDceStyle) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(DceStyle());
  int legs = 0;
  const auto token = NegotiateByHand(*CreateGssNegotiationContext(world.MakeConfig(), HourSpec()), *handler, legs);
  EXPECT_EQ(SubjectOf(*token), "alice@corp.example");
  EXPECT_EQ(legs, 2);
}

TEST(GssNegotiationByHand, ReturnsAHolderOfKeyTokenToAClientThatAlsoHasAKey) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(DceStyle());
  int legs = 0;
  const auto context = CreateGssNegotiationContext(world.MakeConfig("", "client"), HourSpec());
  EXPECT_EQ(NegotiateByHand(*context, *handler, legs)->GetConfirmationMethod(), SamlToken::HOLDER_OF_KEY);
}

TEST(GssAcquisition, IsRefusedToAClientThatTheServiceDoesNotKnow) {
  const ServiceWorld world;
  SpnegoSettings settings = SettingsFor();
  settings.clientKeytab = world.GetRealm().AddPrincipal("mallory");
  const auto handler = CreateSpnegoHandler(settings);
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(world.MakeConfig())->AcquireTokenByGSS(HourSpec(), *handler),
                        InvalidCredentialsException, "Authentication failed: unknown user mallory@CORP.EXAMPLE");
}

TEST(GssAcquisition, IsRefusedForATicketOfAnotherService) {
  const ServiceWorld world;
  world.GetRealm().AddPrincipal("other/localhost");
  const auto handler = CreateSpnegoHandler(SettingsFor("other@localhost"));
  EXPECT_FAILS_WITH_WORDS(CreateSecurityTokenService(world.MakeConfig())->AcquireTokenByGSS(HourSpec(), *handler),
                          InvalidCredentialsException, "Authentication failed: Unspecified GSS failure.",
                          "other/localhost@CORP.EXAMPLE");
}

TEST(GssAcquisition, IsRefusedWhenTheClocksOfServiceAndRealmDiffer) {
  const ServiceWorld world({.name = "CORP.EXAMPLE", .clockOffsetSec = -1000, .adoptsClock = true});
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_FAILS_WITH_WORDS(CreateSecurityTokenService(world.MakeConfig())->AcquireTokenByGSS(HourSpec(), *handler),
                          InvalidCredentialsException, "Authentication failed: Unspecified GSS failure.",
                          "Clock skew too great");
}

TEST(GssAcquisition, SendsNothingWithoutATicket) {
  const ServiceWorld world;
  SpnegoSettings settings = SettingsFor();
  settings.credentialCache = world.GetRealm().NameFile("no_such_cache");
  const auto handler = CreateSpnegoHandler(settings);
  EXPECT_FAILS_WITH_WORDS(
      CreateSecurityTokenService(world.MakeConfig())->AcquireTokenByGSS(HourSpec(), *handler), GssCredentialException,
      "No credentials in the credential cache " + settings.credentialCache + ": ", "No credentials cache found");
  EXPECT_EQ(world.GetService().GetLog(), "");
}

TEST(GssAcquisition, FailsWhenTheFinalLegIsGarbageEvenIfTheTokenIsValid) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_FAILS_WITH_WORDS(
      CreateSecurityTokenService(world.MakeConfig("garbage-leg"))->AcquireTokenByGSS(HourSpec(), *handler),
      GssNegotiationException, "The negotiation with sts@localhost failed: ", "Invalid token was supplied");
}

TEST(GssAcquisition, FailsWhenALegInTheMiddleIsGarbage) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(DceStyle());
  EXPECT_FAILS_WITH_WORDS(
      CreateSecurityTokenService(world.MakeConfig("garbage-leg"))->AcquireTokenByGSS(HourSpec(), *handler),
      GssNegotiationException, "The negotiation with sts@localhost failed: ", "Invalid token was supplied");
  EXPECT_EQ(CountIn(world.GetService().GetLog(), "\n"), 1u) << "exactly one message";
}

TEST(GssAcquisition, ReturnsATokenOfAServiceThatSendsNoFinalLeg) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  const auto token = CreateSecurityTokenService(world.MakeConfig("no-leg"))->AcquireTokenByGSS(HourSpec(), *handler);
  EXPECT_EQ(SubjectOf(*token), "alice@corp.example");
  EXPECT_FALSE(handler->IsMutuallyAuthenticated());
  EXPECT_THROWS_MESSAGE(handler->RequireMutualAuthentication(), GssNegotiationException,
                        "The service sts@localhost was not authenticated: the negotiation is not complete");
}

TEST(GssAcquisition, FailsWhenALegInTheMiddleIsMissing) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(DceStyle());
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(world.MakeConfig("no-leg"))->AcquireTokenByGSS(HourSpec(), *handler),
                        SsoException, "Unexpected XML format");
}

TEST(GssAcquisition, FailsWhenTheServiceChangesToAnUnknownContext) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(DceStyle());
  EXPECT_THROWS_MESSAGE(
      CreateSecurityTokenService(world.MakeConfig("other-context"))->AcquireTokenByGSS(HourSpec(), *handler),
      SsoException, "Unexpected SOAP fault: wst:InvalidRequest; request failed.");
  EXPECT_EQ(CountIn(world.GetService().GetLog(), "no negotiation with that context is waiting for a leg"), 1u);
}

TEST(GssAcquisition, FailsWhenTheServiceSendsNoContext) {
  const ServiceWorld world;
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_THROWS_MESSAGE(
      CreateSecurityTokenService(world.MakeConfig("no-context"))->AcquireTokenByGSS(HourSpec(), *handler),
      CommunicationException, "Error processing the response to SPNego token request: no Context ID was returned.");
}

TEST(GssAcquisition, FailsWhenTheServiceTakesLongerThanTheHandlerAllows) {
  const ServiceWorld world;
  SpnegoSettings settings = SettingsFor();
  settings.timeLimitSec = 1;
  const auto handler = CreateSpnegoHandler(settings);
  EXPECT_THROWS_MESSAGE(
      CreateSecurityTokenService(world.MakeConfig("stall-then-answer-2"))->AcquireTokenByGSS(HourSpec(), *handler),
      GssLimitException, "The negotiation with sts@localhost reached its time limit: 1 s");
}

TEST(GssAcquisition, IsRefusedByAServiceWithoutAKeytab) {
  const ServiceWorld world;
  const Testing::DevSts service;
  SecurityTokenServiceConfig config = world.MakeConfig();
  config.stsUrl = service.GetUrl();
  const auto handler = CreateSpnegoHandler(SettingsFor());
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(config)->AcquireTokenByGSS(HourSpec(), *handler), SsoException,
                        "Unexpected SOAP fault: wst:RequestFailed; request failed.");
}

TEST(DevelopmentService, DoesNotStartWithANonExistentKeytab) {
  const Testing::KerberosRealm realm;
  try {
    const Testing::DevSts service({"--keytab", (realm.GetFolder() / "no.keytab").string()});
    ADD_FAILURE() << "it has started";
  } catch (const std::runtime_error &failure) {
    EXPECT_NE(std::string(failure.what()).find("ssoclient-devsts: --keytab: "), std::string::npos) << failure.what();
    EXPECT_NE(std::string(failure.what()).find("no.keytab"), std::string::npos) << failure.what();
  }
}

} // namespace
} // namespace SsoClient::Gssapi
