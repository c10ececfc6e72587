// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SecurityTokenService`, the client of one token service.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/negotiation_handler.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/security_token_service_config.h>
#include <ssoclient/token_spec.h>
#include <tarvel/core/exception.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <functional>
#include <memory>
#include <string>

namespace SsoClient {

/// Acquires, renews and validates tokens. Immutable: any number of threads may use one service at once. Always held by
/// the shared pointer that `CreateSecurityTokenService` made. A child process made by `fork` may use the services of its
/// parent, also when the parent has operations under way: these go on in the parent alone, and none of their completions
/// runs in the child.
///
/// The operations without "Async" run on the caller's thread, which waits up to four minutes for each message, and raise
/// - `InvalidCredentialsException` when the service refuses the caller's credentials,
/// - `CommunicationException` when the service cannot be reached, or answers with another status than success or a fault,
/// - `InvalidSignatureException` when none of the trusted certificates' keys signed the token,
/// - `SsoException` for every other fault, for a response that is not of the expected form, and for a token that is
///   malformed, expired or not valid yet,
/// - `Tarvel::InvalidArgumentException` for a lifetime that is not positive, for a text that XML cannot carry, for a
///   confirmation other than the default where a token is acquired by certificate, and for a bearer token to renew,
///   `Tarvel::InvalidStateException` where a holder-of-key identity is needed and none is configured,
/// - `Tarvel::InvalidStateException` where the process uses the network for the first time and has no thread or descriptor
///   left to wait for it; a later call tries again,
/// - `Tarvel::Xml::Security::XmlSecurityException` for an identity whose key cannot sign with RSA-SHA256 (an EC key),
/// - `Tarvel::Xml::Security::XmlSecurityException` or `Tarvel::Xml::XMLParseException` for an assertion in the response
///   that cannot be taken out of it as a document of its own,
/// - `Tarvel::OutOfMemoryException`, and `Tarvel::InvalidStateException` when OpenSSL has cleaned itself up because the process
///   ends, where a token or a request was in hand; on the way to the service and back, both are `CommunicationException`.
/// All of them are `Tarvel::Exception`. Nothing is tried again. A token that is returned is null only when the response
/// holds an empty text in its place.
class SSOCLIENT_API SecurityTokenService {
public:
  /// Called once, at an operation's end: with the token (null as above) and null, or with null and the exception, which
  /// is good during the call only (`Clone` keeps it).
  using TokenCompletion =
      std::function<void(const std::shared_ptr<const SamlToken> &token, const Tarvel::Exception *failure)>;

  /// The same for a verdict, which is there exactly when there is no exception.
  using ValidityCompletion = std::function<void(const boost::optional<bool> &valid, const Tarvel::Exception *failure)>;

  /// Acquires a token by user name and password. The password is secret; every copy made here is overwritten.
  virtual std::shared_ptr<const SamlToken> AcquireToken(const std::string &username, const std::string &password,
                                                        const TokenSpec &spec) const = 0;

  /// Acquires a token by GSS (SPNEGO) negotiation, which `handler` drives, on this thread, for as many legs as the two
  /// sides need: whoever wants a limit sets it in the handler.
  /// @throws CommunicationException when the service names no negotiation context.
  /// @throws Tarvel::InvalidArgumentException when the handler returns null. What the handler throws passes through.
  virtual std::shared_ptr<const SamlToken> AcquireTokenByGSS(const TokenSpec &spec,
                                                             NegotiationHandler &handler) const = 0;

  /// Acquires a token by the configured holder-of-key identity alone; the spec's confirmation must be the default.
  virtual std::shared_ptr<const SamlToken> AcquireTokenByCertificate(const TokenSpec &spec) const = 0;

  /// Exchanges `token` for another one, with delegation if the spec asks for it. Needs a holder-of-key identity.
  virtual std::shared_ptr<const SamlToken> AcquireTokenByToken(const SamlToken &token, const TokenSpec &spec) const = 0;

  /// Whether the service holds the token to be valid.
  virtual bool ValidateSubject(const SamlToken &token) const = 0;

  /// A new token in place of a renewable holder-of-key token, for `lifetimeSec` seconds from now. Needs the token's
  /// holder-of-key identity.
  virtual std::shared_ptr<const SamlToken> RenewToken(const SamlToken &token, std::int64_t lifetimeSec) const = 0;

  // The same operations on a thread of the platform's pool. They return at once, with nothing composed or sent yet, and
  // cannot be cancelled; the caller may release everything that it passed, the service included. The completion is called
  // exactly once, on a pool's thread, maybe before the call has returned. What it throws is logged by the pool, and so is,
  // without a completion, any exception that is not a `Tarvel::Exception` (memory that ran out, a handler's own class).
  // A null token or handler is reported as `Tarvel::InvalidArgumentException`.
  //
  // A completion must not wait for another asynchronous operation: the pool has at most 256 threads, and when a completion
  // waits on each of them, what they wait for never starts. Start the next operation from the completion instead, and
  // return; or call the operation without "Async" there, which is fine.
  //
  // Each of them throws `Tarvel::InvalidStateException` when the pool has no thread and none can be started, and then calls
  // no completion.

  /// `AcquireToken` on a thread of the pool. `completion` is not called for an exception that is not a
  /// `Tarvel::Exception`, and must not wait for another asynchronous operation.
  virtual void AcquireTokenAsync(const std::string &username, const std::string &password, const TokenSpec &spec,
                                 const TokenCompletion &completion) const = 0;

  /// `AcquireTokenByGSS` on a thread of the pool, on which the handler is called. `completion` is not called for an
  /// exception, also of the handler, that is not a `Tarvel::Exception`; it must not wait for another such operation.
  virtual void AcquireTokenByGssAsync(const TokenSpec &spec, const std::shared_ptr<NegotiationHandler> &handler,
                                      const TokenCompletion &completion) const = 0;

  /// `AcquireTokenByCertificate` on a thread of the pool. `completion` is not called for an exception that is not a
  /// `Tarvel::Exception`, and must not wait for another asynchronous operation.
  virtual void AcquireTokenByCertificateAsync(const TokenSpec &spec, const TokenCompletion &completion) const = 0;

  /// `AcquireTokenByToken` on a thread of the pool. `completion` is not called for an exception that is not a
  /// `Tarvel::Exception`, and must not wait for another asynchronous operation.
  virtual void AcquireTokenByTokenAsync(const std::shared_ptr<const SamlToken> &token, const TokenSpec &spec,
                                        const TokenCompletion &completion) const = 0;

  /// `ValidateSubject` on a thread of the pool. `completion` is not called for an exception that is not a
  /// `Tarvel::Exception`, and must not wait for another asynchronous operation.
  virtual void ValidateSubjectAsync(const std::shared_ptr<const SamlToken> &token,
                                    const ValidityCompletion &completion) const = 0;

  /// `RenewToken` on a thread of the pool. `completion` is not called for an exception that is not a
  /// `Tarvel::Exception`, and must not wait for another asynchronous operation.
  virtual void RenewTokenAsync(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                               const TokenCompletion &completion) const = 0;

protected:
  SecurityTokenService() = default;
  SecurityTokenService(const SecurityTokenService &) = default;
  SecurityTokenService &operator=(const SecurityTokenService &) = default;
  ~SecurityTokenService() = default;
};

/// A client of the service that `config` describes. Nothing is connected or sent yet. `config` is copied from; its SSL
/// context must outlive the service.
/// @throws Tarvel::InvalidArgumentException for an HTTPS address without an SSL context, and for an identity without key or
///         certificate.
/// @throws Tarvel::Http::MalformedURLException for a malformed address.
SSOCLIENT_API std::shared_ptr<SecurityTokenService>
CreateSecurityTokenService(const SecurityTokenServiceConfig &config);

} // namespace SsoClient
