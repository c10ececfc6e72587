// SPDX-License-Identifier: Apache-2.0
// How the switches of a dialect change requests. The whole messages are in tests/data/requests/dialect-*.xml.
#include "compose/ws_trust.h"
#include "exchange/request_builder_impl.h"
#include "support/dialect_requests.h"
#include "support/fixed_environment.h"
#include "support/identity.h"
#include "support/throws_message.h"
#include "support/token_stand_in.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <random>
#include <set>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;
using Statement = ServiceDialect::Statement;
using UseKey = ServiceDialect::UseKey;
using Delegation = ServiceDialect::Delegation;

const std::vector<std::uint8_t> LEG = {0x60, 0x82, 0x01};
const TokenStandIn TOKEN("_1", "<a:Assertion xmlns:a=\"urn:a\" ID=\"_1\"></a:Assertion>", SamlToken::HOLDER_OF_KEY);

/// Every request that a builder can make from a specification.
using Operation = void (*)(const RequestBuilderImpl &, const TokenSpec &, Request &);
const Operation ISSUES[] = {
    [](const RequestBuilderImpl &b, const TokenSpec &s, Request &r) { b.BuildUserPassTokenRequest("u", "p", s, r); },
    [](const RequestBuilderImpl &b, const TokenSpec &s, Request &r) { b.BuildInitialSPNegoRequest(s, LEG, r); },
    [](const RequestBuilderImpl &b, const TokenSpec &s, Request &r) { b.BuildCertificateTokenRequest(s, r); },
    [](const RequestBuilderImpl &b, const TokenSpec &s, Request &r) { b.BuildExchangeTokenRequest(TOKEN, s, r); },
};

bool Has(const std::string &text, const std::string &part) {
  return text.find(part) != std::string::npos;
}

std::string Body(const RequestBuilderImpl &builder, Operation operation, const TokenSpec &spec) {
  const FixedEnvironment environment;
  Request request;
  operation(builder, spec, request);
  return request.body;
}

/// `text` without the elements of that name.
std::string Without(std::string text, const std::string &name) {
  const std::string endTag = "</" + name + ">";
  for (std::size_t at = 0; (at = text.find("<" + name)) != std::string::npos;) {
    text.erase(at, text.find(endTag, at) + endTag.size() - at);
  }
  return text;
}

class Random {
public:
  explicit Random(unsigned seed) : m_engine(seed) {}
  int Below(int limit) { return static_cast<int>(m_engine() % static_cast<unsigned>(limit)); }
  bool Coin() { return Below(2) != 0; }
  std::string Text() { return std::string(static_cast<std::size_t>(Below(9)), "a&<\">'b \t"[Below(9)]); }

  TokenSpec Spec() {
    TokenSpec spec;
    spec.tokenLifetimeSec = 1 + Below(100000);
    for (int i = Below(3); i > 0; --i) {
      spec.audienceRestriction.insert("urn:" + Text());
      spec.advice.push_back({Text(), {{Text(), {Text(), Text()}}}});
    }
    spec.delegable = Coin();
    spec.renewable = Coin();
    if (Coin()) {
      spec.delegateTo = Text();
    }
    return spec;
  }

  ServiceDialect Dialect() {
    ServiceDialect dialect;
    if (Coin()) {
      dialect.appliesTo = std::string("urn:service");
    }
    dialect.delegatable = static_cast<Statement>(Below(3));
    dialect.renewing = static_cast<Statement>(Below(3));
    dialect.useKey = static_cast<UseKey>(Below(3));
    dialect.delegation = static_cast<Delegation>(Below(3));
    dialect.tokenType = Coin() ? "" : "urn:type";
    return dialect;
  }

private:
  std::mt19937 m_engine;
};

TEST(DefaultDialect, ChangesNoOctetOfAnyRequest) {
  ServiceDialect onlyForResponses;
  onlyForResponses.declaresCharset = true;
  onlyForResponses.credentialFaults = {{"urn:faults", "Denied"}};
  onlyForResponses.acceptsAnyResponse = true;
  const RequestBuilderImpl established(HolderIdentity());
  Random random(20260102);
  for (int i = 0; i < 50; ++i) {
    const TokenSpec spec = random.Spec();
    for (const Operation operation : ISSUES) {
      const std::string expected = Body(established, operation, spec);
      for (const ServiceDialect &dialect : {ServiceDialect(), onlyForResponses}) {
        EXPECT_EQ(Body(RequestBuilderImpl(HolderIdentity(), dialect, SAMPLE_SERVICE), operation, spec), expected);
      }
    }
  }
}

bool IsWritten(Statement statement, bool value) {
  return statement == Statement::ALWAYS || (statement == Statement::WHEN_TRUE && value);
}

/// The parts of `request` that the switches cannot change.
std::string Common(std::string request) {
  for (const char *const name : {"wst:TokenType", "wsp:AppliesTo", "wst:Renewing", "wst:Delegatable", "wst:DelegateTo",
                                 "wst:OnBehalfOf", "wst14:ActAs", "wst:UseKey"}) {
    request = Without(request, name);
  }
  return request;
}

TEST(AnyDialect, ChangesOnlyTheElementsOfItsSwitches) {
  const FixedEnvironment environment;
  const HolderOfKeyConfig identity = HolderIdentity();
  Random random(20260103);
  for (int i = 0; i < 500; ++i) {
    const TokenSpec spec = random.Spec();
    const ServiceDialect dialect = random.Dialect();
    const bool holderOfKey = random.Coin();
    const auto confirmation = holderOfKey ? SamlToken::HOLDER_OF_KEY : SamlToken::BEARER;
    const std::string request =
        SerializeToXML(AcquireSecurityTokenBuilder(confirmation, spec, dialect, identity.certificate.get()));
    const std::string exchange =
        SerializeToXML(ExchangeSecurityTokenBuilder(confirmation, spec, dialect, identity.certificate.get()));
    EXPECT_EQ(Common(request), Common(SerializeToXML(AcquireSecurityTokenBuilder(confirmation, spec))));
    EXPECT_EQ(Common(exchange), Common(request));
    EXPECT_EQ(Has(request, "<wsp:AppliesTo "), dialect.appliesTo.has_value());
    EXPECT_EQ(Has(request, "<wst:Renewing "), IsWritten(dialect.renewing, spec.renewable));
    EXPECT_EQ(Has(request, "<wst:Delegatable>"), IsWritten(dialect.delegatable, spec.delegable));
    const bool delegated = spec.delegateTo.has_value();
    EXPECT_EQ(Has(request, "<wst:DelegateTo>"), delegated && dialect.delegation == Delegation::DELEGATE_TO);
    EXPECT_EQ(Has(request, "<wst:OnBehalfOf>"), delegated && dialect.delegation == Delegation::ON_BEHALF_OF);
    EXPECT_EQ(Has(request, "<wst14:ActAs "), delegated && dialect.delegation == Delegation::ACT_AS);
    EXPECT_EQ(Has(request, "<wst:UseKey Sig="), holderOfKey && dialect.useKey == UseKey::REFERENCE);
    EXPECT_EQ(Has(request, "<wst:UseKey><ds:KeyInfo "), holderOfKey && dialect.useKey == UseKey::CERTIFICATE);
    EXPECT_FALSE(Has(exchange, "<wst:UseKey Sig="));
    EXPECT_EQ(Has(exchange, "<wst:UseKey><ds:KeyInfo "), holderOfKey && dialect.useKey == UseKey::CERTIFICATE);
    EXPECT_EQ(Has(request, "<wst:TokenType>urn:type</wst:TokenType>"), !dialect.tokenType.empty());
  }
}

TEST(StatementNever, RefusesEachIssueThatAsksForIt) {
  ServiceDialect withoutDelegatable;
  withoutDelegatable.delegatable = Statement::NEVER;
  ServiceDialect withoutRenewing;
  withoutRenewing.renewing = Statement::NEVER;
  TokenSpec plain;
  plain.tokenLifetimeSec = 60;
  TokenSpec delegable(plain);
  delegable.delegable = true;
  TokenSpec renewable(plain);
  renewable.renewable = true;
  const RequestBuilderImpl noDelegatable(HolderIdentity(), withoutDelegatable, SAMPLE_SERVICE);
  const RequestBuilderImpl noRenewing(HolderIdentity(), withoutRenewing, SAMPLE_SERVICE);
  for (const Operation operation : ISSUES) {
    Request request;
    EXPECT_THROWS_MESSAGE(
        operation(noDelegatable, delegable, request), Tarvel::InvalidArgumentException,
        "Invalid argument : TokenSpec::delegable is true, but the dialect of the service has no wst:Delegatable");
    EXPECT_THROWS_MESSAGE(
        operation(noRenewing, renewable, request), Tarvel::InvalidArgumentException,
        "Invalid argument : TokenSpec::renewable is true, but the dialect of the service has no wst:Renewing");
    EXPECT_EQ(request.body, "");
    EXPECT_EQ(request.soapAction, "");
    EXPECT_NO_THROW(operation(noDelegatable, renewable, request));
    EXPECT_NO_THROW(operation(noRenewing, delegable, request));
  }
}

TEST(StatementNever, DoesNotAffectTheRenewalOfAToken) {
  ServiceDialect dialect;
  dialect.renewing = Statement::NEVER;
  Request request;
  EXPECT_NO_THROW(RequestBuilderImpl(HolderIdentity(), dialect, SAMPLE_SERVICE).BuildRenewRequest(TOKEN, 60, request));
}

TEST(UseKeyCertificate, NeedsACertificate) {
  ServiceDialect dialect;
  dialect.useKey = UseKey::CERTIFICATE;
  const TokenSpec spec;
  EXPECT_THROWS_MESSAGE(AcquireSecurityTokenBuilder(SamlToken::HOLDER_OF_KEY, spec, dialect),
                        Tarvel::InvalidArgumentException, "Invalid argument : wst:UseKey needs a certificate");
  EXPECT_NO_THROW(AcquireSecurityTokenBuilder(SamlToken::BEARER, spec, dialect));
}

TEST(UseKeyCertificate, IsNotWrittenWithoutAnIdentity) {
  ServiceDialect dialect;
  dialect.useKey = UseKey::CERTIFICATE;
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  Request request;
  RequestBuilderImpl(boost::none, dialect, SAMPLE_SERVICE).BuildUserPassTokenRequest("u", "p", spec, request);
  EXPECT_FALSE(Has(request.body, "wst:UseKey")) << request.body;
}

/// The text of the first element of that name.
std::string TextIn(const std::string &message, const std::string &name) {
  const std::size_t start = message.find('>', message.find("<" + name)) + 1;
  return message.substr(start, message.find('<', start) - start);
}

TEST(Addressing, StatesTheServiceAndTheActionOfEachRequest) {
  ServiceDialect dialect;
  dialect.addressing = true;
  const RequestBuilderImpl builder(HolderIdentity(), dialect, "https://sts.example/STS");
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  std::vector<Request> requests(7);
  for (std::size_t i = 0; i < 4; ++i) {
    ISSUES[i](builder, spec, requests[i]);
  }
  builder.BuildContinuedSPNegoRequest("c", LEG, requests[4]);
  builder.BuildValidateSubjectRequest(TOKEN, requests[5]);
  builder.BuildRenewRequest(TOKEN, 60, requests[6]);
  for (const Request &request : requests) {
    EXPECT_EQ(TextIn(request.body, "wsa:To"), "https://sts.example/STS");
    EXPECT_EQ(TextIn(request.body, "wsa:Action"), request.soapAction);
  }
}

TEST(Addressing, WritesANewMessageIdInEveryRequest) {
  ServiceDialect dialect;
  dialect.addressing = true;
  const RequestBuilderImpl builder(boost::none, dialect, SAMPLE_SERVICE);
  std::set<std::string> ids;
  for (int i = 0; i < 3; ++i) {
    Request request;
    builder.BuildContinuedSPNegoRequest("c", LEG, request);
    const std::string id = TextIn(request.body, "wsa:MessageID");
    EXPECT_EQ(id.substr(0, 9), "urn:uuid:");
    EXPECT_EQ(id.size(), 9u + 36u);
    ids.insert(id);
  }
  EXPECT_EQ(ids.size(), 3u);
}

} // namespace
} // namespace SsoClient
