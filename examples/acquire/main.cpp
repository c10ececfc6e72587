// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires a token by user name and password and writes its XML to standard output.
///
/// As: acquire https://sts.corp.example/STS/trust authority.pem sts.pem alice@corp.example <password.txt >token.xml

#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/secure_wipe.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <exception>
#include <iostream>
#include <memory>
#include <string>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2, REFUSED = 3, UNREACHABLE = 4 };

struct Arguments {
  std::string url;       // the service's endpoint
  std::string authority; // PEM: whoever issued the certificate of the service's web server
  std::string signers;   // PEM: the certificates that the service signs tokens with; not the web server's
  std::string user;
};

/// A password that leaves nothing behind in memory, however the block ends that it stands in.
struct Password {
  std::string text;
  ~Password() { Tarvel::SecureWipe(text); }
};

std::shared_ptr<const SsoClient::SamlToken> Acquire(const Arguments &arguments) {
  // TLS and the token's signature are two different matters, with two different sets of certificates.
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
  tls->TrustFile(arguments.authority);

  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = arguments.url;
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(arguments.signers);
  config.sslContext = tls.get(); // not owned: `tls` must outlive the service
  const std::shared_ptr<const SsoClient::SecurityTokenService> service = SsoClient::CreateSecurityTokenService(config);

  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 8 * 60 * 60; // a request; the token says what was granted

  Password password; // a password does not belong on a command line, where every process can read it
  std::getline(std::cin, password.text);
  return service->AcquireToken(arguments.user, password.text, spec); // blocks, up to four minutes
}

void Print(const SsoClient::SamlToken &token) {
  std::cerr << "acquired " << token.GetId() << " for " << token.GetSubject().name << " of " << token.GetSubject().domain
            << ", valid until " << token.GetEndDate().ToString() << '\n';
  // Whoever has a bearer token can use it. Never log it; a file with it is like a file with a password.
  std::cout << token.ToXml() << std::flush;
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 5) {
    std::cerr << "usage: acquire URL AUTHORITY-FILE SIGNER-FILE USER <PASSWORD-FILE >TOKEN-FILE\n";
    return USAGE;
  }
  try {
    // What is handed out here was parsed strictly, is valid now, and is signed with a trusted key.
    const auto token = Acquire({argv[1], argv[2], argv[3], argv[4]});
    Print(*token);
    return std::cout ? DONE : FAILED;
  } catch (const SsoClient::InvalidCredentialsException &error) {
    std::cerr << "refused: " << error.what() << '\n'; // to ask for the password again may help
    return REFUSED;
  } catch (const SsoClient::CommunicationException &error) {
    std::cerr << "unreachable: " << error.what() << '\n'; // to try again later may help
    return UNREACHABLE;
  } catch (const std::exception &error) {
    // The rest: another fault of the service, a token that cannot be believed, a file that cannot be read. All of them
    // are Tarvel::Exception, which is a std::exception.
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }
}
