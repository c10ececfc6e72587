// SPDX-License-Identifier: Apache-2.0
/// @file
/// `AsyncGet`: the token of a `TokenSource` for programs that use Boost.Asio. What `async_client.h` states about
/// handlers is true here, too.

#pragma once

#include <ssoclient/asio/detail/start_operation.h>
#include <ssoclient/client/token_source.h>

#include <memory>
#include <utility>

namespace SsoClient::Asio {

/// Gets a fresh token, like `TokenSource::GetAsync`. The handler's signature is `void(std::exception_ptr,
/// std::shared_ptr<const SamlToken>)`; the token is null when there is an exception.
/// @param source must exist until the operation starts, which `use_awaitable` and other lazy tokens do later
/// @param options its executor is not used
/// @return what the completion token returns, for example a `std::future<std::shared_ptr<const SamlToken>>`
/// @throws std::bad_alloc
template <typename CompletionToken>
auto AsyncGet(const TokenSource &source, GetOptions options, CompletionToken &&token) {
  return Detail::Initiate<std::shared_ptr<const SamlToken>>(
      std::move(options), token,
      [&source](const GetOptions &call, TokenCallback callback) { source.GetAsync(call, std::move(callback)); });
}

} // namespace SsoClient::Asio
