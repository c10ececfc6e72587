// SPDX-License-Identifier: Apache-2.0
/// @file
/// Gets a token from an Apache CXF service, renews, validates and exchanges it, and prints what each token states.
///
/// Usage: other_service client.pem client.key, with the variables STS_URL (the service's endpoint), STS_CA (PEM: the
/// authority of its web server), STS_CERT (PEM: the certificates with which it signs tokens), STS_USER and STS_PASSWORD
///
/// Other processes of the same user can read a password in the environment. The example `acquire` shows a better way.

#include <ssoclient/security_token_service.h>
#include <ssoclient/service_options.h>
#include <ssoclient/token_details.h>

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/ssl/ssl_context.h>

#include <cstdlib>
#include <exception>
#include <iostream>
#include <stdexcept>
#include <string>

namespace {

std::string Variable(const char *name) {
  const char *const value = std::getenv(name);
  return value ? value : throw std::runtime_error(std::string("the variable ") + name + " is not set");
}

void Print(const char *what, const SsoClient::SamlToken &token) {
  std::cout << what << ": " << SsoClient::GetNameId(token).value << ", in";
  for (const SsoClient::PrincipalId &group : token.GetGroups()) {
    std::cout << ' ' << group.name;
  }
  std::cout << ", from " << token.GetStartDate().ToString() << " to " << token.GetEndDate().ToString() << '\n';
}

} // namespace

int main(int argc, char **argv) try {
  if (argc != 3) {
    throw std::invalid_argument("usage: other_service CERTIFICATE-FILE KEY-FILE");
  }
  const auto tls = Tarvel::Ssl::CreateSSLContext();
  tls->TrustFile(Variable("STS_CA"));
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = Variable("STS_URL");
  config.sslContext = tls.get();
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(Variable("STS_CERT"));
  config.holderOfKeyConfig.emplace(); // the key to which the tokens are bound
  config.holderOfKeyConfig->certificate = Tarvel::Crypto::LoadCertificates(argv[1]).front();
  config.holderOfKeyConfig->privateKey = Tarvel::Crypto::LoadPrivateKey(argv[2]);
  SsoClient::ServiceOptions options;
  options.dialect = SsoClient::GetServiceDialect("cxf");
  options.verifyOptions.profile = SsoClient::TokenProfile::SAML2;
  const auto service = SsoClient::CreateSecurityTokenService(config, options);

  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 30 * 60;
  spec.renewable = true;
  const auto token = service->AcquireToken(Variable("STS_USER"), Variable("STS_PASSWORD"), spec);
  Print("acquired", *token);
  Print("renewed", *service->RenewToken(*token, spec.tokenLifetimeSec));
  std::cout << (service->ValidateSubject(*token) ? "valid\n" : "invalid\n");
  Print("exchanged", *service->AcquireTokenByToken(*token, spec));
  return std::cout.flush() ? EXIT_SUCCESS : EXIT_FAILURE;
} catch (const std::exception &error) {
  std::cerr << "failed: " << error.what() << '\n';
  return EXIT_FAILURE;
}
