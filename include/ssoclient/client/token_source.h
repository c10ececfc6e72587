// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenSource`, which keeps one token fresh.

#pragma once

#include <ssoclient/client/awaitable.h>
#include <ssoclient/client/call_options.h>
#include <ssoclient/client/credential.h>
#include <ssoclient/client/outcome.h>
#include <ssoclient/client/token_client.h>
#include <ssoclient/export.h>
#include <ssoclient/token_spec.h>

#include <boost/optional.hpp>

#include <chrono>
#include <functional>
#include <future>
#include <memory>
#include <string>

namespace SsoClient {

/// Returns the credential for the next acquisition. Asked each time, so that a changed password or a renewed ticket is seen. Called on a
/// thread of the platform's pool, where it may block; one call at a time for each source. What it throws is a failed attempt.
using CredentialProvider = std::function<Credential()>;

/// A file in which programs of one user share a token.
struct TokenCacheOptions {
  /// The file. It is created with mode 0600. It is opened without following a link, and refused unless it is a regular file
  /// that the user owns and nobody else can read or write. Its folder must exist.
  std::string path;
  /// Whose token it is: the user name, or the Kerberos principal. Empty for the client's holder-of-key identity, which is named by the
  /// thumbprint of its certificate. Never a secret.
  std::string owner;
};

/// Options of a source.
struct TokenSourceOptions {
  /// After which part of its lifetime a token is refreshed, between 0.1 and 0.99. Each time, up to `jitter` of the lifetime is subtracted at random, so
  /// that many processes do not refresh at once.
  double refreshAt = 0.8;
  double jitter = 0.1;
  /// A token is not returned in so many last seconds of its validity, nor in the last tenth of it if that is shorter.
  std::chrono::seconds expiryMargin{30};
  /// After a failed attempt, how long no further one is made; doubled after each further failure, with jitter.
  std::chrono::milliseconds firstBackOff{1'000};
  std::chrono::milliseconds longestBackOff{60'000};
  /// How long one attempt may take.
  std::chrono::milliseconds attemptTimeout{240'000};
  /// Where callbacks of `GetAsync` and `OnChange` run; empty for the library's own threads.
  Executor executor;
  /// The file cache; none by default.
  boost::optional<TokenCacheOptions> cache;
};

/// Options of one `Get`.
struct GetOptions {
  /// When the call ends with `DeadlineExceededException` if it has no token before. The request goes on for later calls.
  boost::optional<CallOptions::Clock::time_point> deadline;
  /// What ends the call with `CancelledException`. The request goes on for later calls.
  CancelToken cancelToken;
  /// Where the callback runs, in place of the source's executor; empty for the source's.
  Executor executor;
};

/// Keeps a function registered with `TokenSource::OnChange`; destroying it removes the function. It does not wait for a call that
/// is under way. Movable.
class SSOCLIENT_API ChangeRegistration {
public:
  /// Registers nothing.
  ChangeRegistration() noexcept = default;
  /// Not for callers.
  explicit ChangeRegistration(std::shared_ptr<void> entry) noexcept : m_entry(std::move(entry)) {}

private:
  std::shared_ptr<void> m_entry;
};

/// What a source is made of. Not for callers.
class TokenSourceCore;

class SSOCLIENT_API TokenSource {
public:
  /// @param client shared as long as the source exists and requests are under way
  TokenSource(std::shared_ptr<const TokenClient> client, CredentialProvider provider, const TokenSpec &spec,
              const TokenSourceOptions &options = {});
  TokenSource(const TokenSource &) = delete;
  TokenSource &operator=(const TokenSource &) = delete;
  /// Cancels what is under way and waits for nothing; each callback still runs, with `CancelledException`, on its executor.
  ~TokenSource();

  std::shared_ptr<const SamlToken> Get(const GetOptions &options = {}) const;
  void GetAsync(const GetOptions &options, TokenCallback callback) const;
  std::future<std::shared_ptr<const SamlToken>> GetFuture(const GetOptions &options = {}) const;
#ifdef SSOCLIENT_HAS_COROUTINES
  Awaitable<std::shared_ptr<const SamlToken>> GetAwaitable(const GetOptions &options = {}) const;
#endif

  /// The service refused the token with this identifier: it is not returned again, not from the cache either, and not renewed: the next call acquires.
  void Invalidate(const std::string &tokenId) const;

  /// Calls `function` with each new token, on the source's executor.
  ChangeRegistration OnChange(std::function<void(const std::shared_ptr<const SamlToken> &token)> function) const;

private:
  std::shared_ptr<TokenSourceCore> m_core;
};

} // namespace SsoClient
