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
#include <utility>

namespace SsoClient {

/// Returns the credential for the next acquisition. A source calls it for each acquisition, so that a changed password
/// or a renewed ticket is used. It is called on a thread of the platform's pool, where it may block, one call at a time
/// for each source. What it throws ends the attempt, in its own class.
using CredentialProvider = std::function<Credential()>;

/// A file in which programs of one user share a token. Each of them verifies the token when it reads it, and asks the service only
/// when the file has no fresh token for the same service, owner, properties of the token and options of the client. The
/// programs lock the file, so that only one of them asks at a time.
///
/// The token is in the file as the service issued it: any program that can read the file can use a bearer token.
struct TokenCacheOptions {
  /// The file. It is made with mode 0600, and opened without following a link. It is refused unless it is a regular
  /// file that the user owns and no other user can read or write. Its folder must exist. Not empty.
  std::string path;
  /// Whose token it is: the name of the user, or the Kerberos principal. It is written into the file, so it must not be a
  /// secret. Empty for the client's holder-of-key identity, which is named by the thumbprint of its certificate.
  std::string owner;
};

/// Options of a source. The constructor of `TokenSource` checks them.
struct TokenSourceOptions {
  /// After which part of its lifetime a token is due to be refreshed, from 0.1 to 0.99. The lifetime is the time from
  /// the token's issue to the end that the token states. It may be shorter than what was requested.
  double refreshAt = 0.8;
  /// How much is at most subtracted from `refreshAt`, at random for each token, so that many programs do not refresh at
  /// once; from 0 to the half of `refreshAt`.
  double jitter = 0.1;
  /// A token is not returned in the last part of its validity. This part is `expiryMargin`, or a tenth of the token's
  /// lifetime if that is shorter. At most a year. Even if the clock is set back by as much, no expired token is
  /// returned.
  std::chrono::seconds expiryMargin{30};
  /// How long no attempt is made after a failed one; more than 0. The time doubles with each further failure in a row,
  /// and up to the half of it is subtracted at random.
  std::chrono::milliseconds firstBackOff{1'000};
  /// The longest such time, before the subtraction; from `firstBackOff` to a year.
  std::chrono::milliseconds longestBackOff{60'000};
  /// How long one attempt may take, with renewal, acquisition, credential provider and file cache; more than 0 and at most a
  /// year. The attempt then ends with `DeadlineExceededException`.
  std::chrono::milliseconds attemptTimeout{240'000};
  /// Where callbacks of `GetAsync`, coroutines and functions of `OnChange` run; empty for the library's own threads.
  Executor executor;
  /// The file cache; no file by default.
  boost::optional<TokenCacheOptions> cache;
};

/// Options of one call that gets the token.
struct GetOptions {
  /// When the call ends with `DeadlineExceededException` if it has received no token before. The request continues for
  /// other calls. A deadline that has passed at the start ends the call even if there is a token.
  boost::optional<CallOptions::Clock::time_point> deadline;
  /// What ends the call with `CancelledException`. The request continues for other calls. A token that is cancelled at the
  /// start ends the call even if the source has a token, and even if the deadline has passed, too.
  CancelToken cancelToken;
  /// Where the callback runs, in place of the source's executor; empty for the source's. `Get` does not use it.
  Executor executor;
};

/// Keeps a function registered with `TokenSource::OnChange`; destroying this object removes the function. This does not
/// wait for a call that is under way, and is allowed within that call. Movable.
class SSOCLIENT_API ChangeRegistration {
public:
  /// Registers nothing.
  ChangeRegistration() noexcept = default;
  /// Not for callers: `TokenSource::OnChange` makes registrations.
  explicit ChangeRegistration(std::shared_ptr<void> entry) noexcept : m_entry(std::move(entry)) {}

private:
  std::shared_ptr<void> m_entry; // the function, which is registered as long as this exists
};

/// What a source is made of. Not for callers.
class TokenSourceCore;

/// Keeps one token fresh, for any number of threads.
///
/// - While the token is fresh, a call returns it at once, without a lock and without allocating memory.
/// - When a part of its lifetime has passed (`refreshAt`), the token is due: calls still return it, and one request in
///   the background gets the next one. If a call has asked since the token was issued, the request starts by itself;
///   otherwise the next call starts it. A source that is not used sends nothing.
/// - If there is no token that can be returned, a call waits for the request. All calls share one request.
/// - A holder-of-key token that may be renewed is renewed. If that fails, or for other tokens, a new one is acquired
///   with a credential of the provider.
/// - After a failed attempt, no other is made for some time (`firstBackOff`). Calls then return the token while it can
///   be returned, and after that end at once with the failure of the last attempt.
/// - A token is never returned in the last part of its validity (`expiryMargin`). It also ends when the time of its
///   validity has passed on the steady clock, so setting back the system's clock does not prolong it. A new token that
///   does not end later than the present one replaces it only if the present one cannot be returned.
///
/// A child process made by `fork` may use the sources of its parent. The callbacks of the parent do not run there.
class SSOCLIENT_API TokenSource {
public:
  /// Sends nothing: the first call that asks does.
  /// @param client not null; shared as long as the source exists or a request is under way
  /// @param provider not empty
  /// @param spec the properties of the token; the lifetime must be positive
  /// @throws Tarvel::InvalidArgumentException when an argument or an option is not valid, or when a file cache has no owner and the
  ///         client has no holder-of-key identity; std::bad_alloc
  TokenSource(std::shared_ptr<const TokenClient> client, CredentialProvider provider, const TokenSpec &spec,
              const TokenSourceOptions &options = {});
  TokenSource(const TokenSource &) = delete;
  TokenSource &operator=(const TokenSource &) = delete;
  /// Cancels what is under way, and does not wait. Each call that waits ends with `CancelledException`, on its
  /// executor. No further call of the provider begins. One that is under way, or is just beginning on another thread,
  /// continues, and its credential is released; so the provider must own what it uses.
  ~TokenSource();

  /// The token, never null. Waits if there is no token that can be returned. Safe on any thread.
  /// @throws CancelledException, DeadlineExceededException as `options` state; CancelledException when the source is
  ///         destroyed
  /// @throws SsoException when the service issues a token that has expired, is about to expire or was invalidated
  /// @throws what ended the attempt, in its own class: an exception of `TokenClient::Acquire` or of the provider;
  ///         Tarvel::IOException when the file cache is refused or cannot be read or made; DeadlineExceededException after
  ///         `attemptTimeout`
  /// @throws Tarvel::InvalidStateException when no thread can be started; std::bad_alloc
  std::shared_ptr<const SamlToken> Get(const GetOptions &options = {}) const;

  /// The same without waiting: `callback` is called once with the outcome, on the executor of the call or else of the source.
  /// What it throws is logged.
  /// @throws Tarvel::InvalidArgumentException for an empty callback; Tarvel::InvalidStateException when a deadline
  ///         needs a thread that cannot be started; std::bad_alloc. The callback is then not called.
  void GetAsync(const GetOptions &options, TokenCallback callback) const;

  /// The same as a future, which is set on the thread that ends the call. The executor is not used.
  /// @throws what `GetAsync` throws
  std::future<std::shared_ptr<const SamlToken>> GetFuture(const GetOptions &options = {}) const;

#ifdef SSOCLIENT_HAS_COROUTINES
  /// The same as an awaitable. It keeps what it needs of the source, so the source may be destroyed (this cancels). The
  /// coroutine continues on the executor of the call or else of the source.
  /// @throws std::bad_alloc
  Awaitable<std::shared_ptr<const SamlToken>> GetAwaitable(const GetOptions &options = {}) const {
    return Awaitable<std::shared_ptr<const SamlToken>>(
        [core = m_core, options](const CancelToken &cancelToken, TokenCallback callback) {
          Start(core, options, cancelToken, std::move(callback));
        });
  }
#endif

  /// Reports that a relying party refused the token with this identifier. If it is the present token, it is not
  /// renewed, and the next call acquires another one. The refused token is not accepted again, neither from the service
  /// nor from the file cache. It is soon removed from the file cache. The source remembers the last 16 identifiers
  /// only. Does not wait. Safe on any thread.
  /// @throws std::bad_alloc
  void Invalidate(const std::string &tokenId) const;

  /// Calls `function` with each new token, on the source's executor, in the order of the tokens. The functions of a
  /// source are called one at a time. What `function` throws is logged.
  /// @return what keeps the function registered
  /// @throws Tarvel::InvalidArgumentException for an empty function; std::bad_alloc
  ChangeRegistration OnChange(std::function<void(const std::shared_ptr<const SamlToken> &token)> function) const;

private:
  static void Start(const std::shared_ptr<TokenSourceCore> &core, const GetOptions &options,
                    const CancelToken &cancelToken, TokenCallback callback);

  std::shared_ptr<TokenSourceCore> m_core;
};

} // namespace SsoClient
