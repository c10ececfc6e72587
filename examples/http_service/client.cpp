// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires a token that is bound to the key of the certificate, and sends a note in a request that is signed with that key.
///
/// Usage: http_client https://sts.corp.example/STS/trust authority.pem sts.pem client.pem client.key
///        https://notes.corp.example 8080 [sent.txt]

#include <ssoclient/client/token_client.h>
#include <ssoclient/proof/sign_http_request.h>

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/ssl/ssl_context.h>

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/use_future.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/core/tcp_stream.hpp>
#include <boost/beast/http.hpp>

#include <chrono>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <future>
#include <iostream>
#include <memory>
#include <string>

namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;

enum ExitCode { DONE = 0, FAILED = 1, USAGE = 2, REFUSED = 3 };

constexpr auto ALLOWED = std::chrono::seconds(10);

using Request = http::request<http::string_body>;

SsoClient::SecurityTokenServiceConfig MakeConfig(char **argv, Tarvel::Ssl::SSLContext *tls) {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = argv[1];
  config.sslContext = tls;
  config.signingCertificates = Tarvel::Crypto::LoadCertificates(argv[3]);
  config.holderOfKeyConfig.emplace(); // the identity: the token will be bound to its key
  config.holderOfKeyConfig->certificate = Tarvel::Crypto::LoadCertificates(argv[4]).front();
  config.holderOfKeyConfig->privateKey = Tarvel::Crypto::LoadPrivateKey(argv[5]);
  return config;
}

/// A program that sends many requests keeps the token, for example in a `SsoClient::TokenSource`.
std::shared_ptr<const SsoClient::SamlToken> Acquire(const SsoClient::SecurityTokenServiceConfig &config,
                                                    const std::string &audience) {
  const SsoClient::TokenClient client(config);
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 5 * 60;
  spec.audienceRestriction = {audience}; // no other service accepts the token
  return client.Acquire(SsoClient::CertificateCredential{}, spec, SsoClient::CallOptions::WithTimeout(ALLOWED));
}

template <class Result>
Result Finish(asio::io_context &context, std::future<Result> step) {
  context.restart();
  context.run();
  return step.get();
}

/// A request with a note, and with the token and the signature in its header.
Request MakeRequest(const std::string &origin, const SsoClient::SamlToken &token,
                    const Tarvel::Crypto::PrivateKey &key) {
  SsoClient::HttpRequest toSign;
  toSign.method = "PUT";
  toSign.targetUri = origin + "/notes/1";
  toSign.headers = {{"Content-Type", "text/plain"}};
  toSign.body = "buy tea";
  SsoClient::HttpSigningOptions options; // signs method, target, token and the digest of the body
  options.coveredHeaders = {"content-type"};

  Request request(http::verb::put, "/notes/1", 11);
  request.set(http::field::host, origin.substr(origin.find("//") + 2));
  request.set(http::field::content_type, "text/plain");
  for (const auto &[name, value] : SsoClient::SignHttpRequest(toSign, token, key, options)) {
    request.set(name, value);
  }
  request.body() = *toSign.body;
  request.keep_alive(false);
  request.prepare_payload();
  return request;
}

/// Sends the request to a service on loopback.
http::response<http::string_body> Send(unsigned short port, const Request &request) {
  asio::io_context context;
  boost::beast::tcp_stream stream(context);
  boost::beast::flat_buffer buffer;
  http::response<http::string_body> response;
  stream.expires_after(ALLOWED);
  const asio::ip::tcp::endpoint service(asio::ip::address_v4::loopback(), port);
  Finish(context, stream.async_connect(service, asio::use_future));
  Finish(context, http::async_write(stream, request, asio::use_future));
  Finish(context, http::async_read(stream, buffer, response, asio::use_future));
  return response;
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 8 && argc != 9) {
    std::cerr
        << "usage: http_client URL AUTHORITY-FILE SIGNER-FILE CERTIFICATE-FILE KEY-FILE ORIGIN PORT [SENT-FILE]\n";
    return USAGE;
  }
  try {
    const auto tls = Tarvel::Ssl::CreateSSLContext();
    tls->TrustFile(argv[2]);
    const SsoClient::SecurityTokenServiceConfig config = MakeConfig(argv, tls.get());
    const auto token = Acquire(config, argv[6]);
    const Request request = MakeRequest(argv[6], *token, *config.holderOfKeyConfig->privateKey);
    if (argc == 9) {
      std::ofstream(argv[8]) << request; // to see it, and to try what happens when it is sent again
    }
    const auto response = Send(static_cast<unsigned short>(std::atoi(argv[7])), request);
    std::cout << response.body();
    return response.result() == http::status::ok ? DONE : REFUSED;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // there is no token, or no answer
    return FAILED;
  }
}
