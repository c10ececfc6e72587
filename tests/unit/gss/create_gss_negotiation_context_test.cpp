// SPDX-License-Identifier: Apache-2.0

#include "support/identity.h"
#include "support/posting_server.h"
#include "support/reporting_ssl_context.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/gss_negotiation_context.h>
#include <tarvel/core/exception.h>
#include <tarvel/http/url.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient::InternalApi {
namespace {

using Testing::ConfigFor;
using Bytes = std::vector<std::uint8_t>;

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  return spec;
}

TEST(CreateGssNegotiationContext, MakesAContextThatNegotiatesOverTlsAfterTheConfigurationIsDestroyed) {
  const Testing::PostingServer server({Testing::IntermediateLeg("ctx", "AQID"),
                                       Testing::FinalLeg("ctx", "BAUG", Testing::ReadDataFile("tokens/bearer.xml"))},
                                      Testing::TlsSettings());
  const auto tls = Testing::ContextThatTrustsTheTestAuthority();
  std::shared_ptr<GssNegotiationContext> context;
  {
    SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
    config.sslContext = tls.get();
    context = CreateGssNegotiationContext(config, Spec());
  }
  const GssNegotiationResult first = context->NegotiateToken({7});
  EXPECT_EQ(*first.serverLeg, (Bytes{1, 2, 3}));
  EXPECT_EQ(first.token, nullptr);
  const GssNegotiationResult last = context->NegotiateToken({8});
  EXPECT_EQ(*last.serverLeg, (Bytes{4, 5, 6}));
  EXPECT_NE(last.token, nullptr);
}

TEST(CreateGssNegotiationContext, KeepsTheSslContextThatItsCallerReleases) {
  const Testing::PostingServer server({Testing::IntermediateLeg("ctx", "AQID")}, Testing::TlsSettings());
  std::shared_ptr<GssNegotiationContext> context;
  {
    const auto tls = Testing::ContextThatTrustsTheTestAuthority();
    SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
    config.sslContext = tls.get();
    context = CreateGssNegotiationContext(config, Spec());
  }
  EXPECT_EQ(*context->NegotiateToken({7}).serverLeg, (Bytes{1, 2, 3}));
}

TEST(CreateGssNegotiationContext, ReleasesTheSslContextWhenTheNegotiationIsDestroyed) {
  const auto isDestroyed = std::make_shared<bool>(false);
  std::shared_ptr<GssNegotiationContext> context;
  {
    const auto tls = Tarvel::MakeRef<Testing::ReportingSslContext>(isDestroyed);
    SecurityTokenServiceConfig config = ConfigFor("https://localhost/");
    config.sslContext = tls.get();
    context = CreateGssNegotiationContext(config, Spec());
  }
  EXPECT_FALSE(*isDestroyed);
  context.reset();
  EXPECT_TRUE(*isDestroyed);
}

TEST(CreateGssNegotiationContext, SignsRequestsWithTheHolderOfKeyIdentity) {
  const Testing::PostingServer server(
      {Testing::IntermediateLeg("ctx", "AQID"), Testing::IntermediateLeg("ctx", "AQID")});
  SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
  CreateGssNegotiationContext(config, Spec())->NegotiateToken({7});
  EXPECT_EQ(server.GetRequests().at(0).find("ds:SignatureValue"), std::string::npos);
  config.holderOfKeyConfig = Testing::HolderIdentity();
  CreateGssNegotiationContext(config, Spec())->NegotiateToken({7});
  EXPECT_NE(server.GetRequests().at(1).find("ds:SignatureValue"), std::string::npos);
}

TEST(CreateGssNegotiationContext, UsesTheDialectInEveryLeg) {
  const std::string last = Testing::ResponseElement("<wst:TokenType>urn:type</wst:TokenType>" +
                                                        Testing::Requested(Testing::ReadDataFile("tokens/bearer.xml")),
                                                    " Context='ctx'");
  const Testing::PostingServer server({Testing::IntermediateLeg("ctx", "AQID"), Testing::Envelope(last)});
  ServiceOptions options;
  options.dialect.declaresCharset = true;
  options.dialect.addressing = true;
  options.dialect.appliesTo = std::string("urn:service");
  options.dialect.tokenType = "urn:type";
  options.dialect.acceptsAnyResponse = true;
  const auto context = CreateGssNegotiationContext(ConfigFor(server.GetUrl()), Spec(), options);
  EXPECT_EQ(context->NegotiateToken({7}).token, nullptr);
  EXPECT_NE(context->NegotiateToken({8}).token, nullptr);
  const std::vector<std::string> requests = server.GetRequests();
  ASSERT_EQ(requests.size(), 2u);
  for (const std::string &request : requests) {
    EXPECT_NE(request.find("\r\nContent-Type: text/xml; charset=utf-8\r\n"), std::string::npos) << request;
    EXPECT_NE(request.find(">" + server.GetUrl() + "</wsa:To>"), std::string::npos) << request;
  }
  EXPECT_NE(requests[0].find("<wsp:AppliesTo "), std::string::npos);
  EXPECT_NE(requests[1].find("/RSTR/Issue</wsa:Action>"), std::string::npos);
}

TEST(CreateGssNegotiationContext, RefusesADialectThatIsNotValid) {
  ServiceOptions options;
  options.dialect.appliesTo = std::string("service");
  EXPECT_THROWS_MESSAGE(CreateGssNegotiationContext(ConfigFor("http://localhost/"), Spec(), options),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : ServiceDialect::appliesTo is not an absolute URI: \"service\"");
}

TEST(CreateGssNegotiationContext, RefusesAConfigurationWithoutTrustedCertificates) {
  SecurityTokenServiceConfig config = ConfigFor("http://localhost/");
  config.signingCertificates.clear();
  EXPECT_THROWS_MESSAGE(CreateGssNegotiationContext(config, Spec()), Tarvel::InvalidArgumentException,
                        "Invalid argument : No STS trusted certificates provided");
}

TEST(CreateGssNegotiationContext, RefusesHttpsWithoutAContextAndAnAddressThatIsNotValid) {
  EXPECT_THROWS_MESSAGE(CreateGssNegotiationContext(ConfigFor("https://localhost/"), Spec()),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : HTTPS connection requested but no SSLContext provided.");
  EXPECT_THROWS_MESSAGE(CreateGssNegotiationContext(ConfigFor("localhost"), Spec()),
                        Tarvel::Http::MalformedURLException,
                        "Malformed URL \"localhost\": the scheme is not http or https");
}

} // namespace
} // namespace SsoClient::InternalApi
