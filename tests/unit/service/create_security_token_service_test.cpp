// SPDX-License-Identifier: Apache-2.0

#include "support/identity.h"
#include "support/posting_server.h"
#include "support/reporting_ssl_context.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>
#include <tarvel/http/url.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient {
namespace {

using Testing::ConfigFor;
using Testing::PostingServer;

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  return spec;
}

std::string Issued() {
  return Testing::IssueResponse(Testing::ReadDataFile("tokens/bearer.xml"));
}

TEST(CreateSecurityTokenService, MakesAServiceThatAcquiresTokensOverTlsAfterTheConfigurationIsDestroyed) {
  const PostingServer server({Issued()}, Testing::TlsSettings());
  const auto context = Testing::ContextThatTrustsTheTestAuthority();
  std::shared_ptr<const SecurityTokenService> service;
  {
    SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
    config.sslContext = context.get();
    service = CreateSecurityTokenService(config);
  }
  const auto token = service->AcquireToken("alice@corp.example", "pass", Spec());
  ASSERT_NE(token, nullptr);
  EXPECT_EQ(token->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
  ASSERT_EQ(server.GetRequests().size(), 1u);
  EXPECT_EQ(server.GetRequests()[0].rfind("POST /sts HTTP/1.1\r\n", 0), 0u);
}

TEST(CreateSecurityTokenService, KeepsTheContextThatItsCallerReleases) {
  const PostingServer server({Issued()}, Testing::TlsSettings());
  std::shared_ptr<const SecurityTokenService> service;
  {
    const auto context = Testing::ContextThatTrustsTheTestAuthority();
    SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
    config.sslContext = context.get();
    service = CreateSecurityTokenService(config);
  }
  EXPECT_NE(service->AcquireToken("alice@corp.example", "pass", Spec()), nullptr);
}

TEST(CreateSecurityTokenService, ReleasesTheContextWhenTheServiceIsDestroyed) {
  const auto isDestroyed = std::make_shared<bool>(false);
  std::shared_ptr<const SecurityTokenService> service;
  {
    const auto context = Tarvel::MakeRef<Testing::ReportingSslContext>(isDestroyed);
    SecurityTokenServiceConfig config = ConfigFor("https://localhost/");
    config.sslContext = context.get();
    service = CreateSecurityTokenService(config);
  }
  EXPECT_FALSE(*isDestroyed);
  service.reset();
  EXPECT_TRUE(*isDestroyed);
}

TEST(CreateSecurityTokenService, PassesTheSslParameterToTheHandshake) {
  const PostingServer server({Issued()}, Testing::TlsSettings());
  const auto context = Testing::ContextThatTrustsTheTestAuthority();
  SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
  config.sslContext = context.get();
  config.sslParameter = std::string(64, '0'); // not the thumbprint of any certificate
  const auto shown = Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile("tls/localhost.crt"));
  EXPECT_THROWS_MESSAGE(
      CreateSecurityTokenService(config)->AcquireToken("alice@corp.example", "pass", Spec()), CommunicationException,
      "The TLS handshake with localhost failed: the server's certificate has the SHA-256 thumbprint " +
          shown->GetSha256Thumbprint() + " instead of " + config.sslParameter);
}

TEST(CreateSecurityTokenService, UsesTheDialectInRequestsAndResponses) {
  const std::string fault = "<soapenv:Fault xmlns:x='urn:faults'><faultcode>x:Denied</faultcode></soapenv:Fault>";
  const std::string outside = Testing::RenewResponse(Testing::ReadDataFile("tokens/bearer.xml"));
  const PostingServer server({outside, Testing::Envelope(fault)});
  ServiceOptions options;
  options.dialect.declaresCharset = true;
  options.dialect.addressing = true;
  options.dialect.appliesTo = std::string("urn:service");
  options.dialect.credentialFaults = {{"urn:faults", "Denied"}};
  options.dialect.acceptsAnyResponse = true;
  const auto service = CreateSecurityTokenService(ConfigFor(server.GetUrl()), options);
  EXPECT_NE(service->AcquireToken("alice@corp.example", "pass", Spec()), nullptr);
  const std::string request = server.GetRequests().at(0);
  EXPECT_NE(request.find("\r\nContent-Type: text/xml; charset=utf-8\r\n"), std::string::npos) << request;
  EXPECT_NE(request.find(">" + server.GetUrl() + "</wsa:To>"), std::string::npos) << request;
  EXPECT_NE(request.find("<wsa:Address>urn:service</wsa:Address>"), std::string::npos) << request;
  EXPECT_THROWS_MESSAGE(service->AcquireToken("alice@corp.example", "pass", Spec()), InvalidCredentialsException,
                        "Authentication failed");
}

TEST(CreateSecurityTokenService, DeclaresNoCharsetByDefault) {
  const PostingServer server({Issued()});
  CreateSecurityTokenService(ConfigFor(server.GetUrl()))->AcquireToken("alice@corp.example", "pass", Spec());
  const std::string request = server.GetRequests().at(0);
  EXPECT_NE(request.find("\r\nContent-Type: text/xml\r\n"), std::string::npos) << request;
}

TEST(CreateSecurityTokenService, RefusesADialectThatIsNotValid) {
  ServiceOptions options;
  options.dialect.tokenType = "urn:oasis:names:tc:SAML:1.1:assertion";
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(ConfigFor("http://localhost/"), options),
                        Tarvel::InvalidArgumentException,
                        "Invalid argument : ServiceDialect::tokenType asks for tokens that this client cannot read, "
                        "which are not SAML 2.0: \"urn:oasis:names:tc:SAML:1.1:assertion\"");
}

TEST(CreateSecurityTokenService, SendsNothingWhenTheDialectCannotStateWhatTheSpecAsksFor) {
  const PostingServer server({Issued()});
  ServiceOptions options;
  options.dialect.delegatable = ServiceDialect::Statement::NEVER;
  TokenSpec spec = Spec();
  spec.delegable = true;
  EXPECT_THROWS_MESSAGE(
      CreateSecurityTokenService(ConfigFor(server.GetUrl()), options)->AcquireToken("alice", "pass", spec),
      Tarvel::InvalidArgumentException,
      "Invalid argument : TokenSpec::delegable is true, but the dialect of the service has no wst:Delegatable");
  EXPECT_TRUE(server.GetRequests().empty());
}

TEST(CreateSecurityTokenService, SignsRequestsWithTheHolderOfKeyIdentity) {
  const PostingServer server({Issued()});
  SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(config)->AcquireTokenByCertificate(Spec()),
                        Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to acquire token by certificate");
  config.holderOfKeyConfig = Testing::HolderIdentity();
  EXPECT_NE(CreateSecurityTokenService(config)->AcquireTokenByCertificate(Spec()), nullptr);
  EXPECT_NE(server.GetRequests().at(0).find("ds:SignatureValue"), std::string::npos);
}

TEST(CreateSecurityTokenService, RefusesAnIdentityWithoutKeyAndCertificate) {
  SecurityTokenServiceConfig config = ConfigFor("http://localhost/");
  config.holderOfKeyConfig = HolderOfKeyConfig();
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(config), Tarvel::InvalidArgumentException,
                        "Invalid argument : HolderOfKeyConfig lacks its private key or its certificate");
}

TEST(CreateSecurityTokenService, RefusesHttpsWithoutAContextAndAnAddressThatIsNotValid) {
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(ConfigFor("https://localhost/")), Tarvel::InvalidArgumentException,
                        "Invalid argument : HTTPS connection requested but no SSLContext provided.");
  EXPECT_THROWS_MESSAGE(CreateSecurityTokenService(ConfigFor("localhost")), Tarvel::Http::MalformedURLException,
                        "Malformed URL \"localhost\": the scheme is not http or https");
}

TEST(CreateSecurityTokenService, AcceptsAnEmptyListOfCertificatesAlthoughNoTokenWillBeAccepted) {
  const PostingServer server({Issued()});
  SecurityTokenServiceConfig config = ConfigFor(server.GetUrl());
  config.signingCertificates.clear();
  const auto service = CreateSecurityTokenService(config);
  EXPECT_THROWS_MESSAGE(service->AcquireToken("alice@corp.example", "pass", Spec()), InvalidSignatureException,
                        "Signature verification error. No trusted key can be used with the signature algorithm "
                        "\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"");
}

} // namespace
} // namespace SsoClient
