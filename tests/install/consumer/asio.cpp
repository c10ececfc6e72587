// SPDX-License-Identifier: Apache-2.0
// Waits for an operation that is cancelled from the start, in an event loop of Asio.
#include <ssoclient/asio/async_client.h>
#include <ssoclient/client/exceptions.h>

#include <boost/asio/bind_executor.hpp>
#include <boost/asio/io_context.hpp>

#include <exception>
#include <iostream>
#include <memory>

int main() {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = "http://127.0.0.1:9/sts";
  const SsoClient::TokenClient client(config);
  const SsoClient::CancelSource source;
  source.Cancel();
  SsoClient::CallOptions options;
  options.cancelToken = source.GetToken();
  boost::asio::io_context context;
  std::exception_ptr failure;
  SsoClient::Asio::AsyncAcquire(
      client, SsoClient::PasswordCredential{}, SsoClient::TokenSpec(), options,
      boost::asio::bind_executor(
          context, [&failure](const std::exception_ptr &thrown, const std::shared_ptr<const SsoClient::SamlToken> &) {
            failure = thrown;
          }));
  context.run();
  try {
    std::rethrow_exception(failure);
  } catch (const SsoClient::CancelledException &cancelled) {
    std::cout << cancelled.what() << "\n";
  }
}
