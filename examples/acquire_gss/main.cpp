// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires a token with a Kerberos ticket and writes the token's XML to standard output. The ticket is in the default
/// credential cache, or is obtained with a keytab.
///
/// Usage: kinit alice && acquire_gss https://sts.corp.example/STS/trust authority.pem sts.pem HTTP@sts.corp.example
/// >token.xml

#include <ssoclient/exceptions.h>
#include <ssoclient/gssapi/exceptions.h>
#include <ssoclient/gssapi/spnego_handler.h>
#include <ssoclient/security_token_service.h>

#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <exception>
#include <iostream>
#include <memory>
#include <string>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2, REFUSED = 3, UNREACHABLE = 4 };

struct Arguments {
  std::string url;          // the service's endpoint
  std::string authority;    // PEM: the authority that issued the certificate of the service's web server
  std::string signers;      // PEM: the certificates that the service signs tokens with
  std::string service;      // its name in Kerberos, such as HTTP@sts.corp.example
  std::string clientKeytab; // empty: the ticket is in the default credential cache
};

std::shared_ptr<const SsoClient::SamlToken> Acquire(const Arguments &arguments) {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
  tls->TrustFile(arguments.authority);

  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = arguments.url;
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(arguments.signers);
  config.sslContext = tls.get(); // the service takes its own reference
  const std::shared_ptr<const SsoClient::SecurityTokenService> service = SsoClient::CreateSecurityTokenService(config);

  SsoClient::Gssapi::SpnegoSettings settings;
  settings.service = arguments.service;
  settings.clientKeytab = arguments.clientKeytab;
  settings.timeLimitSec = 30; // for the whole negotiation; the operation itself only limits each message

  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 8 * 60 * 60; // a request; the token says what was granted

  // A handler is for one negotiation: the next token needs a new one.
  const std::shared_ptr<SsoClient::Gssapi::SpnegoHandler> handler = SsoClient::Gssapi::CreateSpnegoHandler(settings);
  auto token = service->AcquireTokenByGSS(spec, *handler);

  // TLS and the token's signature have already authenticated the service. This line also requires that Kerberos has
  // done so. It refuses a service that leaves out its final leg. Remove it if you do not need that.
  handler->RequireMutualAuthentication();
  return token;
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 5 && argc != 6) {
    std::cerr << "usage: acquire_gss URL AUTHORITY-FILE SIGNER-FILE SERVICE [KEYTAB] >TOKEN-FILE\n";
    return USAGE;
  }
  try {
    const auto token = Acquire({argv[1], argv[2], argv[3], argv[4], argc == 6 ? argv[5] : ""});
    std::cerr << "acquired " << token->GetId() << " for " << token->GetSubject().name << " of "
              << token->GetSubject().domain << '\n';
    std::cout << token->ToXml() << std::flush;
    return std::cout ? DONE : FAILED;
  } catch (const SsoClient::Gssapi::GssCredentialException &error) {
    // Caught first, because it is an InvalidCredentialsException too. Nothing was sent to the service.
    std::cerr << "no ticket: " << error.what() << '\n'; // run kinit
    return REFUSED;
  } catch (const SsoClient::InvalidCredentialsException &error) {
    std::cerr << "refused: " << error.what() << '\n'; // the service refuses the ticket, or does not know its owner
    return REFUSED;
  } catch (const SsoClient::Gssapi::GssNegotiationException &error) {
    std::cerr << "not negotiated: " << error.what() << '\n'; // check the realm, the clocks, and SERVICE
    return UNREACHABLE;
  } catch (const SsoClient::CommunicationException &error) {
    std::cerr << "unreachable: " << error.what() << '\n'; // try again later
    return UNREACHABLE;
  } catch (const std::exception &error) {
    // Another fault of the service, a token that is not valid or not trusted, a file that cannot be read.
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }
}
