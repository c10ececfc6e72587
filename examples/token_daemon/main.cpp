// SPDX-License-Identifier: Apache-2.0
/// @file
/// A daemon that calls a service with a fresh token at fixed intervals, until SIGTERM or SIGINT.
///
/// Usage: token_daemon https://sts.corp.example/STS/trust authority.pem sts.pem alice@corp.example password.txt

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>

#include <tarvel/core/secret_text.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <chrono>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <exception>
#include <iostream>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>

#include <fcntl.h>
#include <unistd.h>

namespace {

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

struct Arguments {
  std::string user;
  std::string passwordFile;
  std::int64_t lifetimeSec = 60;
  std::int64_t intervalMs = 1000;
};

/// Writes a line as a whole, because the daemon and its token source print on different threads.
void Print(const std::string &line) {
  std::cout << line + '\n' << std::flush;
}

/// Reads the first line of the file, octet by octet, so that no buffer keeps a copy.
Tarvel::SecretText ReadPassword(const std::string &path) {
  const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (file < 0) {
    throw std::runtime_error("cannot read " + path);
  }
  Tarvel::SecretText password;
  char octet = 0;
  while (read(file, &octet, 1) == 1 && octet != '\n') {
    password.Append(std::string_view(&octet, 1));
  }
  close(file);
  return password;
}

/// Calls the service that needs the token. In this example it is the token service itself, which checks the token. A
/// real daemon sends the token in its own request, and reads in the answer whether it was accepted.
bool Call(const SsoClient::TokenClient &client, const std::shared_ptr<const SsoClient::SamlToken> &token) {
  return client.Validate(token, SsoClient::CallOptions::WithTimeout(std::chrono::seconds(5)));
}

void Serve(const SsoClient::TokenClient &client, const SsoClient::TokenSource &source) {
  try {
    SsoClient::GetOptions options;
    options.deadline = SsoClient::CallOptions::Clock::now() + std::chrono::seconds(5);
    const auto token = source.Get(options); // returns at once while the token is fresh
    if (Call(client, token)) {
      Print("served with " + token->GetId());
    } else {
      Print("refused with " + token->GetId());
      source.Invalidate(token->GetId()); // the next call gets another token
    }
  } catch (const std::exception &error) {
    // There was no token, or no answer. The source does not ask more often than its back-off allows.
    Print(std::string("not served: ") + error.what());
  }
}

/// Waits for a signal or for the end of the interval. Returns whether a signal arrived.
bool WaitForEnd(const sigset_t &signals, std::int64_t milliseconds) {
  const timespec interval{milliseconds / 1000, milliseconds % 1000 * 1000000};
  return sigtimedwait(&signals, nullptr, &interval) > 0;
}

void Run(const SsoClient::SecurityTokenServiceConfig &config, const Arguments &arguments, const sigset_t &signals) {
  const auto client = std::make_shared<const SsoClient::TokenClient>(config);
  // Called for each acquisition: the daemon keeps no password, and a changed password is used at once.
  const auto provider = [arguments]() -> SsoClient::Credential {
    return SsoClient::PasswordCredential{arguments.user, ReadPassword(arguments.passwordFile)};
  };
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = arguments.lifetimeSec;
  SsoClient::TokenSourceOptions options;
  options.longestBackOff = std::chrono::seconds(5); // a restarted service is asked again within this time
  const SsoClient::TokenSource source(client, provider, spec, options);
  const auto registration = source.OnChange([](const std::shared_ptr<const SsoClient::SamlToken> &token) {
    Print("new token " + token->GetId() + ", valid until " + token->GetEndDate().ToString());
  });
  do {
    Serve(*client, source);
  } while (!WaitForEnd(signals, arguments.intervalMs));
}

} // namespace

int main(int argc, char **argv) {
  if (argc < 6 || argc > 8) {
    std::cerr << "usage: token_daemon URL AUTHORITY-FILE SIGNER-FILE USER PASSWORD-FILE [LIFETIME [INTERVAL]]\n";
    return USAGE;
  }
  try {
    // Before the first thread starts: all threads inherit the mask, and only `WaitForEnd` receives the signals.
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    sigaddset(&signals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);

    const Tarvel::Ref<Tarvel::Ssl::SSLContext> tls = Tarvel::Ssl::CreateSSLContext();
    tls->TrustFile(argv[2]);
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = argv[1];
    config.signingCertificates = Tarvel::Crypto::LoadCertificates(argv[3]);
    config.sslContext = tls.get(); // the client takes its own reference

    Arguments arguments{argv[4], argv[5]};
    arguments.lifetimeSec = argc > 6 ? std::atoll(argv[6]) : arguments.lifetimeSec;
    arguments.intervalMs = argc > 7 ? std::atoll(argv[7]) : arguments.intervalMs;
    Run(config, arguments, signals);
    return DONE;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // a file or an argument is wrong
    return FAILED;
  }
}
