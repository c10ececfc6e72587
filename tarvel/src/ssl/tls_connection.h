// SPDX-License-Identifier: Apache-2.0
/// @file
/// One TLS connection as OpenSSL sees it: the protocol between two buffers in memory, and the verdict on the server.

#pragma once

#include "crypto/openssl_errors.h"
#include "ssl/server_identity.h"
#include "ssl/ssl_context_impl.h"
#include "ssl/ssl_handles.h"

#include <cstddef>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace Tarvel::Ssl {

/// Used under its stream's lock; on the I/O threads alone, except for its end. Until `Begin` has returned there is no
/// connection, and only `IsBegun`, `PrepareSteps`, `End` and `Abandon` may be called.
class TlsConnection {
public:
  /// What a step of the protocol came to. The reason for FAILED is `TakeReason`.
  enum class Progress { DONE, NEEDS_BYTES, FAILED };

  /// A record's content (RFC 8446, section 5.1): what one `Encrypt` takes at most.
  static constexpr std::size_t RECORD_BYTES = 16384;

  /// @param endpoint a part of the key under which sessions are remembered.
  TlsConnection(const Ref<SSLContextImpl> &context, const std::string &endpoint);
  TlsConnection(const TlsConnection &) = delete;
  TlsConnection &operator=(const TlsConnection &) = delete;
  ~TlsConnection() = default;

  /// Makes the connection. There is none when it throws.
  /// @param host as in `SSLStream::AsyncHandshake`. @param parameter as there.
  /// @throws SSLException; the message is the reason. @throws OutOfMemoryException
  void Begin(const std::string &host, const std::string &parameter);

  bool IsBegun() const noexcept { return m_connection != nullptr; }

  /// Forgets what earlier steps left in the thread's error queue. To be called before the steps of one turn.
  void PrepareSteps() noexcept;

  /// Goes on with the handshake. DONE means that the server was accepted.
  /// @throws OutOfMemoryException; Crypto::CryptoException when the server's certificate cannot be examined
  Progress Handshake();

  /// After the handshake: whether an earlier session was resumed.
  bool WasResumed() const noexcept;

  /// Remembers the resumed session once more, if it may be resumed again. @throws std::bad_alloc
  void KeepResumedSession();

  /// Decrypts at most `length` bytes. DONE with a `count` of 0 means the server's closing notice.
  /// @throws OutOfMemoryException
  Progress Decrypt(char *buffer, std::size_t length, std::size_t &count);

  /// Encrypts at most one record. DONE or FAILED. @throws OutOfMemoryException
  Progress Encrypt(const char *bytes, std::size_t length, std::size_t &count);

  std::string TakeReason() noexcept { return std::move(m_reason); }

  /// Puts TLS's closing notice into the output.
  void AddClosingNotice();

  /// Takes encrypted bytes from the stream below. @throws OutOfMemoryException
  void PutInput(const char *bytes, std::size_t count);

  /// How many encrypted bytes are ready for the stream below.
  std::size_t GetOutputSize() const noexcept;

  /// Moves at most `maximum` of these bytes to `output`, in place of what it held.
  void TakeOutput(std::vector<char> &output, std::size_t maximum);

  void DropOutput() noexcept;

  /// Keeps OpenSSL from taking an established connection that ends now for a broken one, whose session is not
  /// resumable. Errors that do make the session invalid are recorded by OpenSSL itself.
  void KeepResumable() noexcept;

  /// Frees the connection.
  /// @param remembersSessions whether its sessions go into the context's cache. If not, they are freed.
  void End(bool remembersSessions) noexcept;

  /// Leaves everything unfreed, once OpenSSL has cleaned itself up.
  void Abandon() noexcept;

  /// For OpenSSL: whether the server's certificate is accepted (1) or not (0).
  static int OnVerifyServer(X509_STORE_CTX *verification, void *) noexcept;
  /// For OpenSSL: offers a session for keeping; 1 when its reference was taken over.
  static int OnNewSession(SSL *connection, SSL_SESSION *session) noexcept;

private:
  /// For OpenSSL: shows each message, before it is sent.
  static void OnMessage(int, int, int, const void *, std::size_t, SSL *, void *connection) noexcept;

  ConnectionHandle MakeConnection(const ServerIdentity &identity, BIO *&received, BIO *&toSend);
  /// Why OpenSSL's call, which returned `result`, did not end with success.
  Progress Examine(int result, const Crypto::OpenSslErrorScope &errors);
  /// Why the server is refused; empty when it is accepted.
  std::string RefuseServer() const;
  std::string VerifyServer(X509_STORE_CTX *verification) const;
  void KeepSession(SessionHandle session);

  const Ref<SSLContextImpl> m_context;
  const std::string m_endpoint;
  std::optional<ServerIdentity> m_identity;
  std::string m_sessionKey;
  std::string m_reason;
  std::string m_verifyFailure;
  bool m_lacksMemory = false; // as far as it has been noticed within OpenSSL

  ConnectionHandle m_connection;
  // Oldest first. Kept out of the cache until the connection is freed: OpenSSL modifies these sessions without locking.
  std::vector<SessionHandle> m_newSessions;
  BIO *m_received = nullptr; // owned by m_connection: from below, still encrypted
  BIO *m_toSend = nullptr;   // owned by m_connection: for below, encrypted
};

} // namespace Tarvel::Ssl
