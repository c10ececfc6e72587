// SPDX-License-Identifier: Apache-2.0
/// @file
/// Two services on loopback that are coroutines: callers use `front`, which uses `files` for them.
///
/// Usage: coroutine_server https://sts.corp.example/STS/trust authority.pem sts.pem front.pem front.key 8080

#include <ssoclient/client/awaitable.h>

#include <iostream>

#ifndef SSOCLIENT_HAS_COROUTINES

int main() {
  std::cerr << "failed: this compiler has no coroutines\n";
  return 1;
}

#else

#include "files.h"
#include "front.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/ssl/ssl_context.h>

#include <boost/asio/co_spawn.hpp>
#include <boost/asio/detached.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/signal_set.hpp>

#include <csignal>
#include <cstdlib>
#include <exception>
#include <optional>
#include <string>
#include <utility>

namespace {

namespace asio = boost::asio;
using asio::ip::tcp;

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2 };

tcp::acceptor Listen(asio::io_context &context, unsigned short port) {
  return {context, tcp::endpoint(asio::ip::address_v4::loopback(), port)};
}

void Run(const SsoClient::SecurityTokenServiceConfig &config, unsigned short port) {
  const Example::Files files(config.signingCertificates);
  std::optional<Example::Front> front; // like `files`, destroyed after the coroutines that use it
  asio::io_context context(1);
  tcp::acceptor atFiles = Listen(context, 0);
  tcp::acceptor atFront = Listen(context, port);
  front.emplace(config, atFiles.local_endpoint().port());
  std::cout << "ready: http://127.0.0.1:" << atFront.local_endpoint().port() << "/\n" << std::flush;

  const auto serve = [&context](tcp::acceptor acceptor, const auto &service) {
    const auto answer = [&service](std::string body, Example::TimePoint deadline) {
      return service.Answer(std::move(body), deadline);
    };
    asio::co_spawn(context, Example::Serve(std::move(acceptor), answer), asio::detached);
  };
  serve(std::move(atFiles), files);
  serve(std::move(atFront), *front);
  asio::signal_set signals(context, SIGINT, SIGTERM);
  signals.async_wait([&context](const boost::system::error_code &, int) { context.stop(); });
  context.run();
} // Destroying the context destroys the coroutines, which cancels their operations.

} // namespace

int main(int argc, char **argv) {
  if (argc != 7) {
    std::cerr << "usage: coroutine_server URL AUTHORITY-FILE SIGNER-FILE CERTIFICATE-FILE KEY-FILE PORT\n";
    return USAGE;
  }
  try {
    const auto tls = Tarvel::Ssl::CreateSSLContext();
    tls->TrustFile(argv[2]);
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = argv[1];
    config.signingCertificates = Tarvel::Crypto::LoadCertificates(argv[3]);
    config.sslContext = tls.get(); // the client takes its own reference
    config.holderOfKeyConfig.emplace();
    config.holderOfKeyConfig->certificate = Tarvel::Crypto::LoadCertificates(argv[4]).front();
    config.holderOfKeyConfig->privateKey = Tarvel::Crypto::LoadPrivateKey(argv[5]);
    Run(config, static_cast<unsigned short>(std::atoi(argv[6])));
    return DONE;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // a file, the address or the port is wrong
    return FAILED;
  }
}

#endif
