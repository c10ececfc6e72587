// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecurityTokenService`, the client of one token service.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/negotiation_handler.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/service_options.h>
#include <ssoclient/token_spec.h>
#include <tarvel/core/exception.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <functional>
#include <memory>
#include <string>

namespace SsoClient {

/// Acquires, renews and validates tokens. Immutable: any number of threads may use one service at once. It is always
/// owned by the shared pointer that `CreateSecurityTokenService` returned.
///
/// The operations without "Async" run on the caller's thread. They wait up to four minutes for each message, and throw
/// - `InvalidCredentialsException` when the service refuses the caller's credentials,
/// - `CommunicationException` when the service cannot be reached, or returns an HTTP status that is neither success (2xx) nor
///   500, with which faults are sent,
/// - `InvalidSignatureException` when the token is not signed with the key of one of the trusted certificates,
/// - `SsoException` for every other fault, for a response that does not have the expected form, and for a token that is
///   malformed, expired or not valid yet,
/// - `Tarvel::InvalidArgumentException` for a lifetime that is not positive, for a text that XML cannot carry, for a
///   confirmation other than the default when a token is acquired by certificate, for renewing a bearer token, and for a
///   `TokenSpec` that asks for something that the dialect never states,
/// - `Tarvel::InvalidStateException` when a holder-of-key identity is needed and none is configured, and when the process uses
///   the network for the first time and has no thread or descriptor left for it (a later call tries again),
/// - `Tarvel::Xml::Security::XmlSecurityException` for an identity whose key cannot sign with RSA-SHA256 (an EC key),
/// - `Tarvel::Xml::Security::XmlSecurityException` or `Tarvel::Xml::XMLParseException` for an assertion in the response
///   that cannot be made a document of its own,
/// - `Tarvel::OutOfMemoryException` when OpenSSL runs out of memory, and `Tarvel::InvalidStateException` when it has cleaned
///   itself up because the process ends. If either happens while a request is sent or a response is received, it is reported as
///   `CommunicationException`.
///
/// All of these are `Tarvel::Exception`. Nothing is retried. A returned token is null only when the response contains an empty
/// text instead of a token.
///
/// The operations with "Async" return at once: they compose and send nothing on the caller's thread. They run the
/// operation without "Async" on a thread of the platform's pool. They cannot be cancelled. They copy or share all
/// arguments, so the caller may release them, and the service, at once. A null token or handler is reported to the
/// completion as `Tarvel::InvalidArgumentException`. Each throws `Tarvel::InvalidStateException` when the pool has no
/// thread and cannot start one; it then does not call the completion. `AsFuture` turns them into futures.
///
/// A completion must not wait for another asynchronous operation. The pool has at most 256 threads; when the completions on
/// all of them wait, the operations that they wait for never start. Start the next operation from the completion and
/// return, or call the operation without "Async", which a completion may do.
///
/// A child process made by `fork` may use the services of its parent, even while the parent has operations under way.
/// These operations continue in the parent only, and none of their completions runs in the child.
class SSOCLIENT_API SecurityTokenService {
public:
  /// Called once when an asynchronous operation ends, on a thread of the pool, possibly before the call that started the
  /// operation has returned. On success `token` is the token (null as described above) and `failure` is null. On failure
  /// `token` is null, and `failure` is valid during the call only (`Copy` returns one to keep).
  ///
  /// **It is not called at all when the operation ends with an exception that is not a `Tarvel::Exception`**: `std::bad_alloc`,
  /// or an exception class of a negotiation handler. The pool logs such an exception, and also anything that the
  /// completion throws.
  using TokenCompletion =
      std::function<void(const std::shared_ptr<const SamlToken> &token, const Tarvel::Exception *failure)>;

  /// The same for a verdict: `valid` is empty exactly when there is a failure.
  using ValidityCompletion = std::function<void(const boost::optional<bool> &valid, const Tarvel::Exception *failure)>;

  /// Acquires a token by user name and password. The password is secret; every copy of it is overwritten.
  virtual std::shared_ptr<const SamlToken> AcquireToken(const std::string &username, const std::string &password,
                                                        const TokenSpec &spec) const = 0;

  /// Acquires a token by GSS (SPNEGO) negotiation. `handler` is called on the caller's thread and drives the
  /// negotiation, which takes as many legs as the two sides need. To limit their number, throw from the handler.
  /// @throws CommunicationException when the service does not return an identifier of the negotiation.
  /// @throws Tarvel::InvalidArgumentException when the handler returns null. What the handler throws reaches the caller.
  virtual std::shared_ptr<const SamlToken> AcquireTokenByGSS(const TokenSpec &spec,
                                                             NegotiationHandler &handler) const = 0;

  /// Acquires a token by the configured holder-of-key identity only. The confirmation of `spec` must be the default.
  virtual std::shared_ptr<const SamlToken> AcquireTokenByCertificate(const TokenSpec &spec) const = 0;

  /// Exchanges `token` for another one, delegated if `spec` asks for it. Needs a holder-of-key identity.
  virtual std::shared_ptr<const SamlToken> AcquireTokenByToken(const SamlToken &token, const TokenSpec &spec) const = 0;

  /// Asks the service whether `token` is valid.
  virtual bool ValidateSubject(const SamlToken &token) const = 0;

  /// Renews a renewable holder-of-key token: the new token is valid for `lifetimeSec` seconds from now. Needs the
  /// holder-of-key identity of the token.
  virtual std::shared_ptr<const SamlToken> RenewToken(const SamlToken &token, std::int64_t lifetimeSec) const = 0;

  /// Runs `AcquireToken` on a thread of the pool. `completion` is called there once, with the token and null, or with
  /// null and the failure. It is not called for an exception that is not a `Tarvel::Exception`, and must not wait for
  /// another asynchronous operation. The copy of the password is overwritten when the operation ends.
  virtual void AcquireTokenAsync(const std::string &username, const std::string &password, const TokenSpec &spec,
                                 const TokenCompletion &completion) const = 0;

  /// Runs `AcquireTokenByGSS` on a thread of the pool, and calls `handler` there. `completion` is called there once,
  /// with the token and null, or with null and the failure. It is not called for an exception that is not a
  /// `Tarvel::Exception`, not even for one of the handler, and must not wait for another asynchronous operation.
  /// `handler` is shared until the operation ends.
  virtual void AcquireTokenByGssAsync(const TokenSpec &spec, const std::shared_ptr<NegotiationHandler> &handler,
                                      const TokenCompletion &completion) const = 0;

  /// Runs `AcquireTokenByCertificate` on a thread of the pool. `completion` is called there once, with the token and
  /// null, or with null and the failure. It is not called for an exception that is not a `Tarvel::Exception`, and must
  /// not wait for another asynchronous operation.
  virtual void AcquireTokenByCertificateAsync(const TokenSpec &spec, const TokenCompletion &completion) const = 0;

  /// Runs `AcquireTokenByToken` on a thread of the pool. `completion` is called there once, with the new token and
  /// null, or with null and the failure. It is not called for an exception that is not a `Tarvel::Exception`, and must
  /// not wait for another asynchronous operation. `token` is shared until the operation ends.
  virtual void AcquireTokenByTokenAsync(const std::shared_ptr<const SamlToken> &token, const TokenSpec &spec,
                                        const TokenCompletion &completion) const = 0;

  /// Runs `ValidateSubject` on a thread of the pool. `completion` is called there once, with the verdict and null, or
  /// with an empty verdict and the failure; an invalid token is a verdict, not a failure. It is not called for an
  /// exception that is not a `Tarvel::Exception`, and must not wait for another asynchronous operation. `token` is
  /// shared until the operation ends.
  virtual void ValidateSubjectAsync(const std::shared_ptr<const SamlToken> &token,
                                    const ValidityCompletion &completion) const = 0;

  /// Runs `RenewToken` on a thread of the pool. `completion` is called there once, with the new token and null, or with
  /// null and the failure. It is not called for an exception that is not a `Tarvel::Exception`, and must not wait for
  /// another asynchronous operation. `token` is shared until the operation ends.
  virtual void RenewTokenAsync(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                               const TokenCompletion &completion) const = 0;

protected:
  SecurityTokenService() = default;
  SecurityTokenService(const SecurityTokenService &) = default;
  SecurityTokenService &operator=(const SecurityTokenService &) = default;
  ~SecurityTokenService() = default;
};

/// A client of the service that `config` describes. Nothing is connected or sent yet. `config` is copied; the service takes its
/// own reference to the SSL context, which lasts as long as the service and its operations.
/// @throws Tarvel::InvalidArgumentException for an HTTPS address without an SSL context, and for an identity without key or
///         certificate.
/// @throws Tarvel::Http::MalformedURLException for a malformed address.
SSOCLIENT_API std::shared_ptr<SecurityTokenService>
CreateSecurityTokenService(const SecurityTokenServiceConfig &config);

/// The same with options, which are copied.
/// @throws Tarvel::InvalidArgumentException also when `CheckServiceDialect` refuses the dialect, or when
///         `TokenVerifier` refuses the `verifyOptions`.
SSOCLIENT_API std::shared_ptr<SecurityTokenService> CreateSecurityTokenService(const SecurityTokenServiceConfig &config,
                                                                               const ServiceOptions &options);

/// The same with an observer only; null for none.
SSOCLIENT_API std::shared_ptr<SecurityTokenService>
CreateSecurityTokenService(const SecurityTokenServiceConfig &config,
                           const std::shared_ptr<OperationObserver> &observer);

} // namespace SsoClient
