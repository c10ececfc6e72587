// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires a token by user name and password, and writes spans and metrics about it as OTLP/JSON, for an OpenTelemetry
/// collector: to a file, or to standard output. The token itself is not written.
///
/// Usage: telemetry https://sts.corp.example/STS/trust authority.pem sts.pem alice@corp.example [FILE] <password.txt

#include "telemetry_observer.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>

#include <tarvel/core/secret_text.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <exception>
#include <fstream>
#include <iostream>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>

#include <unistd.h>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

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

void Acquire(const Arguments &arguments, const std::shared_ptr<SsoClient::OperationObserver> &observer) {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
  tls->TrustFile(arguments.authority);

  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = arguments.url;
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(arguments.signers);
  config.sslContext = tls.get(); // the service takes its own reference
  const auto service = SsoClient::CreateSecurityTokenService(config, observer);

  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 8 * 60 * 60;
  const Tarvel::SecretText password = ReadPassword(); // not from the command line, which every process can read
  const auto token = service->AcquireToken(arguments.user, password.Get(), spec);
  std::cerr << "acquired " << token->GetId() << '\n';
}

/// Acquires, and writes what happened, also after a failure.
ExitCode AcquireAndReport(const Arguments &arguments, std::ostream &output) {
  const auto observer = std::make_shared<Telemetry::TelemetryObserver>(output, "telemetry-example", arguments.url);
  ExitCode code = DONE;
  try {
    Acquire(arguments, observer);
  } catch (const SsoClient::SsoException &error) {
    std::cerr << "failed: " << error.what() << '\n';
    code = FAILED;
  }
  observer->WriteMetrics();
  if (!output) {
    std::cerr << "failed: the telemetry cannot be written\n";
    return FAILED;
  }
  return code;
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 5 && argc != 6) {
    std::cerr << "usage: telemetry URL AUTHORITY-FILE SIGNER-FILE USER [FILE] <PASSWORD-FILE\n";
    return USAGE;
  }
  try {
    const Arguments arguments{argv[1], argv[2], argv[3], argv[4]};
    if (argc == 5) {
      return AcquireAndReport(arguments, std::cout);
    }
    std::ofstream file(argv[5], std::ios::app); // appends: collectors follow a file that grows
    return AcquireAndReport(arguments, file);
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // such as a file that cannot be read
    return FAILED;
  }
}
