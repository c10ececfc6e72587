// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/client/token_source.h>

#include "client/client_issuer.h"
#include "client/token_source_core.h"
#include "client/token_source_options.h"

#include <tarvel/core/exception.h>
#include <tarvel/system/thread_pool.h>

#include <utility>

namespace SsoClient {

namespace {

/// The cache file that `options` describe; null if they have no cache.
std::shared_ptr<const TokenCacheFile> OpenCache(const std::shared_ptr<const ClientIssuer> &issuer,
                                                const TokenSpec &spec, const TokenSourceOptions &options) {
  if (!options.cache) {
    return nullptr;
  }
  const ClientCore &client = issuer->GetCore();
  const std::string thumbprint = client.GetIdentityThumbprint();
  if (options.cache->owner.empty() && thumbprint.empty()) {
    throw Tarvel::InvalidArgumentException(
        "TokenCacheOptions::owner must not be empty if the client has no holder-of-key identity");
  }
  const std::string owner = options.cache->owner.empty() ? "certificate:" + thumbprint : options.cache->owner;
  // The token of a named user may also be bound to the identity. A client with another identity cannot use such a
  // token.
  const std::string properties = client.DescribeOptions() + " identity=" + thumbprint;
  return std::make_shared<const TokenCacheFile>(
      options.cache->path, CacheBinding{client.GetServiceUrl(), owner, spec, properties},
      [issuer](const std::string &xml) { return issuer->GetCore().Verify(xml); });
}

std::shared_ptr<TokenSourceCore> CreateCore(std::shared_ptr<const TokenClient> client, CredentialProvider provider,
                                            const TokenSpec &spec, const TokenSourceOptions &options) {
  CheckTokenSource(client != nullptr, provider, spec, options);
  const auto issuer = std::make_shared<const ClientIssuer>(std::move(client));
  return std::make_shared<TokenSourceCore>(TokenSourceSetup{
      GetSystemTimeSource(), issuer, std::move(provider), spec, options, OpenCache(issuer, spec, options),
      [](std::function<void()> function) { Tarvel::System::GetThreadPool()->QueueWorkItem(std::move(function)); },
      DrawRandom});
}

} // namespace

TokenSource::TokenSource(std::shared_ptr<const TokenClient> client, CredentialProvider provider, const TokenSpec &spec,
                         const TokenSourceOptions &options)
    : m_core(CreateCore(std::move(client), std::move(provider), spec, options)) {}

TokenSource::~TokenSource() {
  m_core->Close();
}

std::shared_ptr<const SamlToken> TokenSource::Get(const GetOptions &options) const {
  return m_core->Get(options);
}

void TokenSource::GetAsync(const GetOptions &options, TokenCallback callback) const {
  if (!callback) {
    throw Tarvel::InvalidArgumentException("the callback of TokenSource::GetAsync is empty");
  }
  m_core->GetAsync(options, CancelToken(), std::move(callback));
}

std::future<std::shared_ptr<const SamlToken>> TokenSource::GetFuture(const GetOptions &options) const {
  return m_core->GetFuture(options);
}

void TokenSource::Invalidate(const std::string &tokenId) const {
  m_core->Invalidate(tokenId);
}

ChangeRegistration
TokenSource::OnChange(std::function<void(const std::shared_ptr<const SamlToken> &token)> function) const {
  if (!function) {
    throw Tarvel::InvalidArgumentException("the function of TokenSource::OnChange is empty");
  }
  return ChangeRegistration(m_core->OnChange(std::move(function)));
}

void TokenSource::Start(const std::shared_ptr<TokenSourceCore> &core, const GetOptions &options,
                        const CancelToken &cancelToken, TokenCallback callback) {
  core->GetAsync(options, cancelToken, std::move(callback));
}

} // namespace SsoClient
