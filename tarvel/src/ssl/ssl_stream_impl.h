// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one implementation of `SSLStream`: OpenSSL's protocol between two buffers in memory, and what moves the bytes
/// between these and the stream below.

#pragma once

#include "core/fork_gate.h"
#include "crypto/openssl_end.h"
#include "crypto/openssl_errors.h"
#include "ssl/server_identity.h"
#include "ssl/ssl_context_impl.h"
#include "ssl/ssl_handles.h"

#include <tarvel/ssl/ssl_context.h>

#include <atomic>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Tarvel::Ssl {

class SSLStreamImpl final : public SSLStream {
public:
  SSLStreamImpl(const Ref<SSLContextImpl> &context, const Ref<System::Stream> &stream, const std::string &endpoint);

  void AsyncHandshake(const std::string &host, const std::string &parameter, HandshakeHandler handler) override;
  bool WasResumed() const noexcept override { return m_wasResumed; }
  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override;
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override;
  void Close() noexcept override;

  /// For OpenSSL: asks whether the server's certificate is good (1) or not (0).
  static int OnVerifyServer(X509_STORE_CTX *verification, void *) noexcept;
  /// For OpenSSL: shows each message, before it is sent.
  static void OnMessage(int, int, int, const void *, std::size_t, SSL *, void *stream) noexcept;
  /// For OpenSSL: offers a session for keeping; 1 when its reference was taken over.
  static int OnNewSession(SSL *connection, SSL_SESSION *session) noexcept;

private:
  using Failure = std::shared_ptr<const Exception>;

  enum class Stage {
    FRESH,
    SHAKING,
    ESTABLISHED,
    FAILED ///< or closed: m_failure says why
  };

  struct PendingRead {
    char *buffer;
    std::size_t length;
    TransferHandler handler;
  };
  struct PendingWrite {
    const char *bytes;
    std::size_t length;
    std::size_t encrypted;
    TransferHandler handler;
  };

  /// Handlers whose operations have ended, to be called once the lock is released.
  class Completions;

  ~SSLStreamImpl() override;

  /// What went wrong below; none when nothing did.
  using LowerFailure = std::optional<std::string>;

  /// Whether this is the copy of a parent's stream: the connection is the parent's to use, and so are its handlers.
  bool IsOfParent() const noexcept { return m_generation != GetForkGeneration(); }

  void PostPump();
  /// Takes `step` under the lock, or fails what is pending once OpenSSL is gone; then calls the handlers. What `step` throws
  /// ends the stream.
  template <typename Step>
  void Advance(const Step &step) noexcept;
  /// The same on an I/O thread, on which a stream below that is not the platform's need not call back.
  template <typename Step>
  void AdvanceOnIoThread(Step step) noexcept;
  /// For the end of OpenSSL. Nobody would wake a read that waits for a server that is silent.
  static void OnOpenSslEnd(void *stream) noexcept;

  // All that follows is called under the lock. The steps say whether they wait for bytes from below.
  void Pump(Completions &done);
  bool StepHandshake(Completions &done);
  void StepWrite(Completions &done);
  bool StepRead(Completions &done);
  void StartLowerRead();
  void StartLowerWrite();
  void OnLowerRead(std::size_t count, const LowerFailure &failure, Completions &done);
  void OnLowerWritten(const LowerFailure &failure, Completions &done);

  void BeginHandshake(Completions &done);
  void FinishHandshake(Completions &done);
  std::string RefuseServer() const;
  std::string VerifyServer(X509_STORE_CTX *verification) const;
  void KeepSession(SessionHandle session);
  void SendClosingNotice() noexcept;
  void CompletePendingSoon() noexcept;
  /// Frees the connection and has its sessions remembered. The stream has failed, or nobody holds it any more.
  void EndConnection() noexcept;

  /// Whether OpenSSL, whose call gave `result`, waits for bytes. If not, the stream has failed.
  bool WaitsForBytes(int result, const Crypto::OpenSslErrorScope &errors, Completions &done);
  /// Each of these ends the stream for good: what is pending, and what comes, fails.
  void Fail(const std::string &reason, Completions &done) noexcept;
  void FailWith(Failure failure, Completions &done) noexcept;
  /// The same, but what is pending is left to a later step.
  void MarkFailed(Failure failure) noexcept;
  /// The same once OpenSSL is gone.
  void MarkEnded() noexcept;
  Failure MakeFailure(const std::string &reason) const;
  Failure MakeFailureOrNoMemory(const char *reason) const noexcept;
  void FailPending(const Failure &failure, Completions &done) noexcept;

  const unsigned m_generation = GetForkGeneration();
  const Ref<SSLContextImpl> m_context;
  const Ref<System::Stream> m_lower;
  const std::string m_endpoint;
  const Failure m_noMemory = std::make_shared<OutOfMemoryException>();
  const Failure m_processEnds = std::make_shared<InvalidStateException>(Crypto::OpenSslGuard::ENDED);
  std::atomic<bool> m_wasResumed{false};

  ForkSafeMutex m_mutex; // guards all that follows; never held while a handler runs
  Stage m_stage = Stage::FRESH;
  Failure m_failure;
  std::string m_host; // as given; the endpoint until then
  std::string m_parameter;
  std::optional<ServerIdentity> m_identity;
  std::string m_sessionKey;
  std::string m_verifyFailure;
  bool m_lacksMemory = false; // as far as it has been noticed within OpenSSL

  ConnectionHandle m_connection; // used on the I/O threads alone, but for its end
  // The oldest first. Not to be seen by others yet: the connection copies and changes its sessions, and takes no lock.
  std::vector<SessionHandle> m_newSessions;
  BIO *m_received = nullptr; // owned by m_connection: from below, still encrypted
  BIO *m_toSend = nullptr;   // owned by m_connection: for below, encrypted

  HandshakeHandler m_handshake;
  std::optional<PendingRead> m_read;
  std::optional<PendingWrite> m_write;

  bool m_lowerReads = false;
  bool m_lowerWrites = false;
  bool m_lowerEnded = false;
  LowerFailure m_lowerWriteFailure; // since which nothing can be written
  std::vector<char> m_lowerInput;
  std::vector<char> m_lowerOutput;

  Crypto::OpenSslEndNotice m_endNotice{OnOpenSslEnd, this}; // the last: all else must be there when it comes
};

} // namespace Tarvel::Ssl
