// SPDX-License-Identifier: Apache-2.0
/// @file
/// Acquires a token that is bound to the key of the certificate, signs an order with that key, and posts it to the service.
///
/// Usage: soap_client https://sts.corp.example/STS/trust authority.pem sts.pem client.pem client.key
///        https://orders.corp.example/ 8080 [sent.xml]

#include <ssoclient/client/token_client.h>
#include <ssoclient/proof/sign_message.h>

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

constexpr const char *ORDER =
    R"(<soap:Envelope xmlns:soap="http://schemas.xmlsoap.org/soap/envelope/"><soap:Body>)"
    R"(<Order xmlns="urn:example:orders"><Article>tea</Article><Quantity>3</Quantity></Order>)"
    R"(</soap:Body></soap:Envelope>)";

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

/// A program that sends many messages keeps the token, for example in a `SsoClient::TokenSource`.
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

/// Posts the message to a service on loopback.
http::response<http::string_body> Post(unsigned short port, const std::string &message) {
  http::request<http::string_body> request(http::verb::post, "/orders", 11);
  request.set(http::field::host, "localhost");
  request.set(http::field::content_type, "text/xml; charset=utf-8");
  request.set("SOAPAction", "\"urn:example:orders:Order\"");
  request.body() = message;
  request.keep_alive(false);
  request.prepare_payload();

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
        << "usage: soap_client URL AUTHORITY-FILE SIGNER-FILE CERTIFICATE-FILE KEY-FILE AUDIENCE PORT [SENT-FILE]\n";
    return USAGE;
  }
  try {
    const auto tls = Tarvel::Ssl::CreateSSLContext();
    tls->TrustFile(argv[2]);
    const SsoClient::SecurityTokenServiceConfig config = MakeConfig(argv, tls.get());
    const auto token = Acquire(config, argv[6]);
    const std::string message = SsoClient::SignMessage(ORDER, *token, *config.holderOfKeyConfig->privateKey);
    if (argc == 9) {
      std::ofstream(argv[8]) << message; // to see it, and to try what happens when it is sent again
    }
    const auto response = Post(static_cast<unsigned short>(std::atoi(argv[7])), message);
    std::cout << response.body() << '\n';
    return response.result() == http::status::ok ? DONE : REFUSED;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // there is no token, or no answer
    return FAILED;
  }
}
