// SPDX-License-Identifier: Apache-2.0
/// @file
/// One TLS connection of OpenSSL: the protocol between two buffers in memory, and the decision whether the server is
/// accepted.

#pragma once

#include "crypto/openssl_errors.h"
#include "ssl/handshake_record.h"
#include "ssl/server_identity.h"
#include "ssl/ssl_context_impl.h"
#include "ssl/ssl_handles.h"

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace Tarvel::Ssl {

/// Used under its stream's lock, and only on the I/O threads, except that any thread may end it. Until `Begin` has
/// returned there is no connection, and only `IsBegun`, `PrepareSteps`, `End` and `Abandon` may be called.
class TlsConnection {
public:
  /// The outcome of a step of the protocol. After FAILED, `TakeReason` returns the reason.
  enum class Progress { DONE, NEEDS_BYTES, FAILED };

  /// The most content of one record (RFC 8446, section 5.1), and so the most that one `Encrypt` encrypts.
  static constexpr std::size_t RECORD_BYTES = 16384;

  /// @param endpoint a part of the key under which sessions are remembered.
  /// @param record notes what the handshake shows; null for none. With a record, the verification continues after the
  ///        first reason to refuse a certificate; the server is still refused.
  TlsConnection(const Ref<SSLContextImpl> &context, const std::string &endpoint,
                const std::shared_ptr<HandshakeRecord> &record);
  TlsConnection(const TlsConnection &) = delete;
  TlsConnection &operator=(const TlsConnection &) = delete;
  ~TlsConnection() = default;

  /// Makes the connection. If it throws, there is no connection.
  /// @param host as in `SSLStream::AsyncHandshake`.
  /// @param parameter as in `SSLStream::AsyncHandshake`.
  /// @throws SSLException; the message is the reason. @throws OutOfMemoryException
  void Begin(const std::string &host, const std::string &parameter);

  bool IsBegun() const noexcept { return m_connection != nullptr; }

  /// Clears what earlier steps left in the thread's error queue. Must be called before a series of steps.
  void PrepareSteps() noexcept;

  /// Continues the handshake. DONE means that the server was accepted.
  /// @throws OutOfMemoryException; Crypto::CryptoException when the server's certificate cannot be examined
  Progress Handshake();

  /// After the handshake: whether an earlier session was resumed.
  bool WasResumed() const noexcept;

  /// Remembers the resumed session again, if it may be resumed again. @throws std::bad_alloc
  void KeepResumedSession();

  /// Decrypts at most `length` bytes. DONE with a `count` of 0 means the server's closing notice.
  /// @throws OutOfMemoryException
  Progress Decrypt(char *buffer, std::size_t length, std::size_t &count);

  /// Encrypts at most one record. DONE or FAILED. @throws OutOfMemoryException
  Progress Encrypt(const char *bytes, std::size_t length, std::size_t &count);

  std::string TakeReason() noexcept { return std::move(m_reason); }

  /// Puts TLS's closing notice into the output.
  void AddClosingNotice();

  /// Adds encrypted bytes that the stream below has received. @throws OutOfMemoryException
  void PutInput(const char *bytes, std::size_t count);

  /// How many encrypted bytes are ready for the stream below.
  std::size_t GetOutputSize() const noexcept;

  /// Moves at most `maximum` bytes that are ready to `output`, and replaces the content of `output`.
  void TakeOutput(std::vector<char> &output, std::size_t maximum);

  void DropOutput() noexcept;

  /// Frees the empty buffers of this connection, and those of OpenSSL for its records. Called before a wait for the
  /// server, which may be long.
  void ReleaseEmptyBuffers() noexcept;

  /// Keeps the session of an established connection resumable when the connection ends now. Otherwise OpenSSL would
  /// treat the session as broken. OpenSSL itself records the errors that do make the session invalid.
  void KeepResumable() noexcept;

  /// Frees the connection.
  /// @param remembersSessions whether its sessions are put into the context's cache. If not, they are freed.
  void End(bool remembersSessions) noexcept;

  /// Forgets everything without freeing it. Called after OpenSSL has cleaned itself up.
  void Abandon() noexcept;

  /// Called by OpenSSL. Returns whether the server's certificate is accepted (1) or not (0).
  static int OnVerifyServer(X509_STORE_CTX *verification, void *) noexcept;
  /// Called by OpenSSL with a new session. Returns 1: this function has taken over the reference.
  static int OnNewSession(SSL *connection, SSL_SESSION *session) noexcept;

private:
  /// Called by OpenSSL for each message and each record's header; for outgoing records, before they are sent.
  /// Notes a lack of memory.
  static void OnMessage(int, int, int, const void *, std::size_t, SSL *, void *connection) noexcept;

  ConnectionHandle MakeConnection(const ServerIdentity &identity, BIO *&received, BIO *&toSend);
  /// Finds out why a call of OpenSSL, which returned `result`, did not succeed.
  Progress Examine(int result, const Crypto::OpenSslErrorScope &errors);
  /// Why the server is refused; empty when it is accepted.
  std::string RefuseServer() const;
  std::string VerifyServer(X509_STORE_CTX *verification) const;
  std::string VerifyThumbprint(X509_STORE_CTX *verification) const;
  std::string VerifyChain(X509_STORE_CTX *verification) const;
  /// If there is a record, OpenSSL calls it for each certificate and each reason to refuse one.
  static int OnVerificationStep(int isAccepted, X509_STORE_CTX *verification) noexcept;
  void KeepSession(SessionHandle session);

  const Ref<SSLContextImpl> m_context;
  const std::string m_endpoint;
  const std::shared_ptr<HandshakeRecord> m_record; // null for none
  std::optional<ServerIdentity> m_identity;
  std::string m_sessionKey;
  std::string m_reason;
  std::string m_verifyFailure;
  bool m_lacksMemory = false; // whether a callback of OpenSSL has noticed a lack of memory

  ConnectionHandle m_connection;
  // Oldest first. Kept out of the cache until the connection is freed: OpenSSL modifies these sessions without locking.
  std::vector<SessionHandle> m_newSessions;
  BIO *m_received = nullptr; // owned by m_connection: encrypted bytes from the stream below
  BIO *m_toSend = nullptr;   // owned by m_connection: encrypted bytes for the stream below
};

} // namespace Tarvel::Ssl
