// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires a token by user name and password and writes its XML to standard output.
///
/// Usage: acquire https://sts.corp.example/STS/trust authority.pem sts.pem alice@corp.example <password.txt >token.xml

#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/secret_text.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <exception>
#include <iostream>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>

#include <unistd.h>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2, REFUSED = 3, UNREACHABLE = 4 };

struct Arguments {
  std::string url;       // the service's endpoint
  std::string authority; // PEM: the authority that issued the certificate of the service's web server
  std::string signers;   // PEM: the certificates that the service signs tokens with, not the web server's
  std::string user;
};

/// Reads a line of standard input, octet by octet. `std::getline` would leave copies of the password in memory: in the
/// buffer of the stream, and wherever the string was before it grew.
Tarvel::SecretText ReadPassword() {
  Tarvel::SecretText password;
  char octet = 0;
  while (read(STDIN_FILENO, &octet, 1) == 1 && octet != '\n') {
    password.Append(std::string_view(&octet, 1));
  }
  if (password.Get().empty()) {
    throw std::runtime_error("there is no password on standard input");
  }
  return password;
}

std::shared_ptr<const SsoClient::SamlToken> Acquire(const Arguments &arguments) {
  // The TLS connection and the token's signature are checked separately, each with certificates of its own.
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
  tls->TrustFile(arguments.authority);

  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = arguments.url;
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(arguments.signers);
  config.sslContext = tls.get(); // the service takes its own reference
  const std::shared_ptr<const SsoClient::SecurityTokenService> service = SsoClient::CreateSecurityTokenService(config);

  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 8 * 60 * 60; // a request; the token says what was granted

  const Tarvel::SecretText password = ReadPassword(); // not from the command line, which every process can read
  return service->AcquireToken(arguments.user, password.Get(), spec); // blocks for up to four minutes
}

void Print(const SsoClient::SamlToken &token) {
  std::cerr << "acquired " << token.GetId() << " for " << token.GetSubject().name << " of " << token.GetSubject().domain
            << ", valid until " << token.GetEndDate().ToString() << '\n';
  // A thief can use a bearer token, too: protect it like a password, and never log it.
  std::cout << token.ToXml() << std::flush;
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 5) {
    std::cerr << "usage: acquire URL AUTHORITY-FILE SIGNER-FILE USER <PASSWORD-FILE >TOKEN-FILE\n";
    return USAGE;
  }
  try {
    // A token that is returned was parsed strictly, is valid now, and is signed with a trusted key.
    const auto token = Acquire({argv[1], argv[2], argv[3], argv[4]});
    Print(*token);
    return std::cout ? DONE : FAILED;
  } catch (const SsoClient::InvalidCredentialsException &error) {
    std::cerr << "refused: " << error.what() << '\n'; // ask for the password again
    return REFUSED;
  } catch (const SsoClient::CommunicationException &error) {
    std::cerr << "unreachable: " << error.what() << '\n'; // try again later
    return UNREACHABLE;
  } catch (const SsoClient::InvalidSignatureException &error) {
    std::cerr << "not trusted: " << error.what() << '\n'; // are these the certificates that the service signs with?
    return FAILED;
  } catch (const SsoClient::SsoException &error) {
    std::cerr << "failed: " << error.what() << '\n'; // another fault of the service, or a token that is not valid
    return FAILED;
  } catch (const std::exception &error) {
    // A file that cannot be read, an address that is not valid, no password. The library's exceptions all derive from
    // Tarvel::Exception, which is a std::exception.
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }
}
