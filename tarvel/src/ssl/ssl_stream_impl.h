// SPDX-License-Identifier: Apache-2.0
/// @file
/// The only implementation of `SSLStream`: it moves bytes between the TLS connection in memory and the stream below.

#pragma once

#include "core/fork_gate.h"
#include "crypto/openssl_clean_up.h"
#include "ssl/completions.h"
#include "ssl/ssl_context_impl.h"
#include "ssl/tls_connection.h"

#include <tarvel/ssl/ssl_context.h>

#include <atomic>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Tarvel::Ssl {

class SSLStreamImpl final : public SSLStream {
public:
  /// @param record as in `TlsConnection`.
  SSLStreamImpl(const Ref<SSLContextImpl> &context, const Ref<System::Stream> &stream, const std::string &endpoint,
                const std::shared_ptr<HandshakeRecord> &record);

  void AsyncHandshake(const std::string &host, const std::string &parameter, HandshakeHandler handler) override;
  bool WasResumed() const noexcept override { return m_wasResumed; }
  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override;
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override;
  void Close() noexcept override;

private:
  /// Many connections may wait for their servers, so they wait with a small buffer. If a read fills it, the next read
  /// uses the large one, which is long enough for the largest TLS record with its header (RFC 8446, section 5.2).
  static constexpr std::size_t WAITING_INPUT_BYTES = 4096;
  static constexpr std::size_t INPUT_BYTES = 5 + TlsConnection::RECORD_BYTES + 256;

  using Failure = Completions::Failure;
  using Progress = TlsConnection::Progress;

  enum class Stage {
    FRESH,
    HANDSHAKING,
    ESTABLISHED,
    FAILED ///< failed or closed; m_failure is the reason
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

  ~SSLStreamImpl() override;

  /// Why an operation of the stream below failed; nullopt when it succeeded.
  using LowerFailure = std::optional<std::string>;

  /// Whether this is a child's copy of its parent's stream. Only the parent uses the connection and calls the handlers.
  bool IsOfParent() const noexcept { return m_generation != GetForkGeneration(); }

  void PostPump();
  /// Runs `step` under the lock, then calls the handlers. After OpenSSL has cleaned itself up, fails the pending
  /// operations instead of running `step`. An exception from `step` ends the stream.
  template <typename Step>
  void Advance(const Step &step) noexcept;
  /// Calls `Advance` on an I/O thread. A stream below that is not the platform's may call back on another thread.
  template <typename Step>
  void AdvanceOnIoThread(Step step) noexcept;
  /// Called when OpenSSL cleans itself up. Closes the stream below, so that a read that waits for a silent server ends.
  static void OnOpenSslEnd(void *stream) noexcept;

  // All functions below are called under the lock. Steps that return a bool return whether they wait for bytes from
  // the stream below.
  void Pump(Completions &done);
  bool StepHandshake(Completions &done);
  void StepWrite(Completions &done);
  bool StepRead(Completions &done);
  void StartLowerRead();
  void StartLowerWrite();
  void OnLowerRead(std::size_t count, const LowerFailure &failure, Completions &done);
  void OnLowerWritten(const LowerFailure &failure, Completions &done);

  void BeginHandshake(Completions &done);
  void SendClosingNotice() noexcept;
  void CompletePendingSoon() noexcept;

  /// Called after a step that is not DONE. Returns whether OpenSSL waits for bytes. If not, the stream has failed.
  bool WaitsForBytes(Progress progress, Completions &done);
  /// `Fail` and `FailWith` end the stream: pending and later operations fail.
  void Fail(const std::string &reason, Completions &done) noexcept;
  void FailWith(Failure failure, Completions &done) noexcept;
  /// Ends the stream, too, but a later step completes the pending operations.
  void MarkFailed(Failure failure) noexcept;
  /// Like `MarkFailed`, after OpenSSL has cleaned itself up.
  void MarkEnded() noexcept;
  Failure MakeFailure(const std::string &reason) const;
  Failure MakeFailureOrNoMemory(const char *reason) const noexcept;
  void FailPending(const Failure &failure, Completions &done) noexcept;

  const unsigned m_generation = GetForkGeneration();
  const Ref<System::Stream> m_lower;
  const Failure m_noMemory = std::make_shared<OutOfMemoryException>();
  const Failure m_processEnds = std::make_shared<InvalidStateException>(Crypto::OpenSslGuard::ENDED);
  std::atomic<bool> m_wasResumed{false};

  ForkSafeMutex m_mutex; // guards all members below; never held while a handler runs
  Stage m_stage = Stage::FRESH;
  Failure m_failure;
  std::string m_host; // of the handshake; before it, the endpoint
  std::string m_parameter;
  TlsConnection m_tls;

  HandshakeHandler m_handshake;
  std::optional<PendingRead> m_read;
  std::optional<PendingWrite> m_write;

  bool m_lowerReads = false;
  bool m_lowerWrites = false;
  bool m_lowerEnded = false;
  LowerFailure m_lowerWriteFailure; // after which nothing can be written
  std::vector<char> m_lowerInput;
  std::size_t m_inputBytes = WAITING_INPUT_BYTES; // for the next read of the stream below
  std::vector<char> m_lowerOutput;

  Crypto::OpenSslCleanUpNotice m_endNotice{OnOpenSslEnd, this}; // last: all other members must exist when it calls
};

} // namespace Tarvel::Ssl
