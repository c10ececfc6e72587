// SPDX-License-Identifier: Apache-2.0
/// @file
/// A service that accepts each signed message only once, even if it runs on several machines: all of them share a Redis server.
///
/// Usage: redis_replay_guard sts.pem unix:/run/redis/redis.sock message.xml…

#include "redis_replay_guard.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/principal_id.h>
#include <ssoclient/proof/message_verifier.h>
#include <ssoclient/token_verifier.h>

#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>

#include <csignal>
#include <exception>
#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>

namespace {

enum ExitCode { ACCEPTED = 0, REFUSED = 1, USAGE = 2, FAILED = 3 };

constexpr std::chrono::seconds REDIS_TIMEOUT(10); // less for a service with many callers

std::string ReadFile(const std::string &path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error("cannot read " + path);
  }
  return {std::istreambuf_iterator<char>(file), {}};
}

/// Whether the message is accepted; prints the answer.
bool Accept(const SsoClient::MessageVerifier &verifier, const std::string &message) {
  try {
    const SsoClient::VerifiedMessage verified = verifier.Verify(message);
    std::cout << "accepted from " << verified.token->GetSubject().name << '\n';
    return true;
  } catch (const SsoClient::RepeatedMessageException &error) {
    std::cout << "repeated: " << error.what() << '\n';
  } catch (const SsoClient::ReplayGuardException &error) {
    std::cout << "try again later: " << error.what() << '\n'; // says nothing about the message
  } catch (const Tarvel::Exception &error) {
    std::cout << "refused: " << error.what() << '\n';
  }
  return false;
}

int Run(int argc, char **argv) {
  SsoClient::MessageVerifierOptions options;
  options.replayGuard = std::make_shared<RedisReplayGuard>(argv[2], REDIS_TIMEOUT);
  const SsoClient::TokenVerifier tokens(Tarvel::Crypto::LoadCertificates(argv[1]));
  const SsoClient::MessageVerifier verifier(tokens, options);
  ExitCode code = ACCEPTED;
  for (int i = 3; i < argc; ++i) {
    code = Accept(verifier, ReadFile(argv[i])) ? code : REFUSED;
  }
  return code;
}

} // namespace

int main(int argc, char **argv) {
  if (argc < 4) {
    std::cerr << "usage: redis_replay_guard SIGNER-CERTIFICATE REDIS-ADDRESS MESSAGE-FILE...\n";
    return USAGE;
  }
  std::signal(SIGPIPE, SIG_IGN); // a server that ends must not end this program
  try {
    return Run(argc, argv);
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }
}
