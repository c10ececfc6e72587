// SPDX-License-Identifier: Apache-2.0

#include "compose/ws_trust.h"

#include "support/fixed_environment.h"
#include "support/token_stand_in.h"
#include "unit/compose/wire_uris.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;

std::string Lifetime(const std::string &expires) {
  return "<wst:Lifetime" + Declare("wsu", WSU_URI) +
         "><wsu:Created>2026-01-02T03:04:05.006Z</wsu:Created><wsu:Expires>" + expires +
         "</wsu:Expires></wst:Lifetime>";
}

const std::string IN_TEN_MINUTES = Lifetime("2026-01-02T03:14:05.006Z");
const std::string REQUEST = "<wst:RequestSecurityToken" + Declare("wst", WST_URI) + ">";
const std::string ISSUE = "<wst:TokenType>" + SAML_URI + "</wst:TokenType><wst:RequestType>" + WST_URI +
                          "/Issue</wst:RequestType><wst:KeyType>" + WST_URI;
const std::string PLAIN_TAIL = IN_TEN_MINUTES + "<wst:Renewing Allow=\"false\" OK=\"false\"></wst:Renewing>"
                                                "<wst:Delegatable>false</wst:Delegatable>";
const std::string USE_KEY = "<wst:UseKey Sig=\"holderOfKeyProofSignature\"></wst:UseKey>";
const std::string END = "</wst:RequestSecurityToken>";
const std::string BEARER_ISSUE = REQUEST + ISSUE + "/Bearer</wst:KeyType>" + PLAIN_TAIL;
const std::string PUBLIC_KEY_ISSUE = REQUEST + ISSUE + "/PublicKey</wst:KeyType>" + PLAIN_TAIL;

TokenSpec TenMinutes() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

const TokenStandIn TOKEN("x", "<a:Assertion xmlns:a=\"urn:a\"/>", SamlToken::HOLDER_OF_KEY);
const std::string TOKEN_ELEMENT = "<a:Assertion xmlns:a=\"urn:a\"></a:Assertion>";

TEST(AcquireSecurityTokenBuilder, AsksForABearerTokenWithoutUseKey) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(AcquireSecurityTokenBuilder(SamlToken::BEARER, TenMinutes())), BEARER_ISSUE + END);
}

TEST(AcquireSecurityTokenBuilder, EndsAHolderOfKeyRequestWithUseKey) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(AcquireSecurityTokenBuilder(SamlToken::HOLDER_OF_KEY, TenMinutes())),
            PUBLIC_KEY_ISSUE + USE_KEY + END);
}

TEST(AcquireSecurityTokenBuilder, OmitsUseKeyForAConfirmationThatIsNeitherBearerNorHolderOfKey) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(AcquireSecurityTokenBuilder(static_cast<SamlToken::ConfirmationType>(2), TenMinutes())),
            PUBLIC_KEY_ISSUE + END);
}

TEST(AcquireSecurityTokenBuilder, WritesEveryOptionalPartInItsPlace) {
  const FixedEnvironment environment;
  TokenSpec spec = TenMinutes();
  spec.delegateTo = std::string("bob");
  spec.audienceRestriction = {"urn:b", "urn:B", "urn:a"};
  spec.advice = {{"source", {}}};
  spec.renewable = true;
  spec.delegable = true;
  const std::string expected =
      REQUEST + ISSUE + "/PublicKey</wst:KeyType>" + IN_TEN_MINUTES +
      "<wst:Renewing Allow=\"true\" OK=\"false\"></wst:Renewing><wst:Delegatable>true</wst:Delegatable>"
      "<wst:DelegateTo><wsse:UsernameToken" +
      Declare("wsse", WSSE_URI) + "><wsse:Username>bob</wsse:Username></wsse:UsernameToken></wst:DelegateTo>" +
      "<wst:Participants" + Declare("wsa", WSA_URI) +
      "><wst:Participant><wsa:EndpointReference><wsa:Address>urn:B</wsa:Address></wsa:EndpointReference>"
      "</wst:Participant>"
      "<wst:Participant><wsa:EndpointReference><wsa:Address>urn:a</wsa:Address></wsa:EndpointReference>"
      "</wst:Participant>"
      "<wst:Participant><wsa:EndpointReference><wsa:Address>urn:b</wsa:Address></wsa:EndpointReference>"
      "</wst:Participant></wst:Participants><rsa-advice:AdviceSet" +
      Declare("rsa-advice", RSA_ADVICE_URI) + Declare("saml", SAML_URI) + Declare("xs", XS_URI) +
      Declare("xsi", XSI_URI) +
      "><rsa-advice:Advice AdviceSource=\"source\"></rsa-advice:Advice></rsa-advice:AdviceSet>" + USE_KEY + END;
  EXPECT_EQ(SerializeToXML(AcquireSecurityTokenBuilder(SamlToken::HOLDER_OF_KEY, spec)), expected);
}

TEST(AcquireSecurityTokenBuilder, AddsNothingForAnEmptySetOfAudiencesAndAnEmptyListOfAdvice) {
  const FixedEnvironment environment;
  TokenSpec spec = TenMinutes();
  spec.audienceRestriction.clear();
  spec.advice.clear();
  EXPECT_EQ(SerializeToXML(AcquireSecurityTokenBuilder(SamlToken::BEARER, spec)), BEARER_ISSUE + END);
}

TEST(AcquireSecurityTokenBuilder, SortsAudiencesByTheirBytes) {
  TokenSpec spec = TenMinutes();
  spec.audienceRestriction = {"urn:b", "urn:\xC3\xA4", "urn:B", "urn:a"};
  const std::string request = SerializeToXML(AcquireSecurityTokenBuilder(SamlToken::BEARER, spec));
  std::vector<std::size_t> places;
  for (const char *audience : {">urn:B<", ">urn:a<", ">urn:b<", ">urn:&#xE4;<"}) {
    places.push_back(request.find(audience));
  }
  EXPECT_TRUE(std::is_sorted(places.begin(), places.end()));
  EXPECT_NE(places.back(), std::string::npos);
}

TEST(AcquireSecurityTokenBuilder, WritesADelegateWhoseNameIsEmpty) {
  const FixedEnvironment environment;
  TokenSpec spec = TenMinutes();
  spec.delegateTo = std::string();
  EXPECT_EQ(SerializeToXML(AcquireSecurityTokenBuilder(SamlToken::BEARER, spec)),
            BEARER_ISSUE + "<wst:DelegateTo><wsse:UsernameToken" + Declare("wsse", WSSE_URI) +
                "><wsse:Username></wsse:Username></wsse:UsernameToken></wst:DelegateTo>" + END);
}

TEST(CommonAcquireSecurityTokenBuilder, AsksForAPublicKeyForEveryConfirmationButBearer) {
  const FixedEnvironment environment;
  const auto unknown = static_cast<SamlToken::ConfirmationType>(2);
  EXPECT_EQ(SerializeToXML(CommonAcquireSecurityTokenBuilder(unknown, TenMinutes())), PUBLIC_KEY_ISSUE + END);
}

TEST(CommonAcquireSecurityTokenBuilder, AllowsFurtherChildren) {
  const FixedEnvironment environment;
  const XMLCompositePtr request = CommonAcquireSecurityTokenBuilder(SamlToken::BEARER, TenMinutes());
  request->Add(ElementBuilder("wst", "More"));
  EXPECT_EQ(SerializeToXML(request), BEARER_ISSUE + "<wst:More></wst:More>" + END);
}

TEST(ExchangeSecurityTokenBuilder, NeverHasUseKey) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(ExchangeSecurityTokenBuilder(SamlToken::HOLDER_OF_KEY, TenMinutes())),
            PUBLIC_KEY_ISSUE + END);
  EXPECT_EQ(SerializeToXML(ExchangeSecurityTokenBuilder(SamlToken::BEARER, TenMinutes())), BEARER_ISSUE + END);
}

TEST(RenewSecurityTokenBuilder, PutsTheLifetimeBeforeTheTokenToRenew) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(RenewSecurityTokenBuilder(TOKEN, 600)),
            REQUEST + "<wst:TokenType>" + SAML_URI + "</wst:TokenType><wst:RequestType>" + WST_URI +
                "/Renew</wst:RequestType>" + IN_TEN_MINUTES + "<wst:RenewTarget>" + TOKEN_ELEMENT +
                "</wst:RenewTarget>" + END);
}

TEST(ValidateSecurityTokenBuilder, AsksForAStatusAndHasNoLifetime) {
  EXPECT_EQ(SerializeToXML(ValidateSecurityTokenBuilder(TOKEN)),
            REQUEST + "<wst:TokenType>" + WST_URI + "/RSTR/Status</wst:TokenType><wst:RequestType>" + WST_URI +
                "/Validate</wst:RequestType><wst:ValidateTarget>" + TOKEN_ELEMENT + "</wst:ValidateTarget>" + END);
}

TEST(WssuLifetimeBuilder, ExpiresSixHundredSecondsAfterItWasCreated) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(WssuLifetimeBuilder(600)), IN_TEN_MINUTES);
}

TEST(WssuLifetimeBuilder, ReadsTheClockOnce) {
  std::int64_t now = FIXED_NOW;
  const Tarvel::ScopedEnvironment environment({[&now] { return now += 1000000; }, {}});
  WssuLifetimeBuilder(600);
  EXPECT_EQ(now, FIXED_NOW + 1000000);
}

TEST(WssuLifetimeBuilder, CountsLifetimesBeyondThirtyTwoBits) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(WssuLifetimeBuilder(2148)), Lifetime("2026-01-02T03:39:53.006Z"));
  EXPECT_EQ(SerializeToXML(WssuLifetimeBuilder(5000000000)), Lifetime("2184-06-12T11:57:25.006Z"));
}

TEST(WssuLifetimeBuilder, EndsAtTheLastRepresentableMomentInsteadOfOverflowing) {
  const FixedEnvironment environment;
  const std::int64_t longest = std::numeric_limits<std::int64_t>::max();
  for (const std::int64_t seconds : {longest, longest / 1000000, longest / 1000000 + 1}) {
    EXPECT_EQ(SerializeToXML(WssuLifetimeBuilder(seconds)), Lifetime("9999-12-31T23:59:59.999Z")) << seconds;
  }
}

TEST(WssuLifetimeBuilder, WritesNegativeLifetimesAsGiven) {
  const FixedEnvironment environment;
  EXPECT_EQ(SerializeToXML(WssuLifetimeBuilder(-5)), Lifetime("2026-01-02T03:04:00.006Z"));
  EXPECT_EQ(SerializeToXML(WssuLifetimeBuilder(std::numeric_limits<std::int64_t>::min())),
            Lifetime("0001-01-01T00:00:00.000Z"));
}

TEST(WstRenewingBuilder, NeverRequestsRenewalAfterExpiry) {
  EXPECT_EQ(SerializeToXML(WstRenewingBuilder(true)), "<wst:Renewing Allow=\"true\" OK=\"false\"></wst:Renewing>");
  EXPECT_EQ(SerializeToXML(WstRenewingBuilder(false)), "<wst:Renewing Allow=\"false\" OK=\"false\"></wst:Renewing>");
}

TEST(WstSPNegoBinExchangeBuilder, WritesTheLegAsBase64WithTheOlderValueType) {
  const std::string start = "<wst:BinaryExchange EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
                            "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" "
                            "ValueType=\"http://schemas.xmlsoap.org/ws/2005/02/trust/spnego\">";
  EXPECT_EQ(SerializeToXML(WstSPNegoBinExchangeBuilder({0x00, 0xff, 0x10, 0x80})),
            start + "AP8QgA==</wst:BinaryExchange>");
  EXPECT_EQ(SerializeToXML(WstSPNegoBinExchangeBuilder({})), start + "</wst:BinaryExchange>");
}

} // namespace
} // namespace SsoClient
