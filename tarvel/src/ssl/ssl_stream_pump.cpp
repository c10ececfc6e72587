// SPDX-License-Identifier: Apache-2.0

#include "ssl/ssl_stream_impl.h"

#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "system/io_engine.h"

#include <tarvel/core/exception.h>

#include <boost/asio/dispatch.hpp>
#include <boost/asio/post.hpp>

#include <algorithm>
#include <mutex>
#include <new>
#include <utility>

namespace Tarvel::Ssl {

namespace {

/// Nothing is encrypted while this many bytes wait for the stream below, so that a large message is not in memory a
/// second time.
constexpr std::size_t MAX_OUTPUT_BYTES = 4 * TlsConnection::RECORD_BYTES;

/// Why an operation of the stream below failed; nullopt when it succeeded.
std::optional<std::string> DescribeLowerFailure(const Exception *exception) noexcept {
  if (!exception) {
    return std::nullopt;
  }
  try {
    return exception->what();
  } catch (...) {
    return "no memory"; // short enough to need no allocation
  }
}

} // namespace

// Always runs on an I/O thread: OpenSSL has an error queue for each thread, and those of the host's threads may have
// entries.
void SSLStreamImpl::PostPump() {
  boost::asio::post(System::GetIoContext(),
                    [self = Ref(this)] { self->Advance([&self](Completions &done) { self->Pump(done); }); });
}

template <typename Step>
void SSLStreamImpl::Advance(const Step &step) noexcept {
  Completions done;
  {
    const Crypto::OpenSslGuard use;
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (!use) {
      MarkEnded();
      FailPending(m_failure, done);
    } else {
      try {
        step(done);
      } catch (const OutOfMemoryException &) {
        FailWith(m_noMemory, done);
      } catch (const std::bad_alloc &) {
        FailWith(m_noMemory, done);
      } catch (const std::exception &exception) {
        Fail(exception.what(), done);
      } catch (...) {
        Fail("an object that is not an exception was thrown", done); // by a stream below that is not the platform's
      }
    }
  }
  done.Run();
}

template <typename Step>
void SSLStreamImpl::AdvanceOnIoThread(Step step) noexcept {
  try {
    const Computation computing;
    boost::asio::dispatch(System::GetIoContext(), [self = Ref(this), step = std::move(step)] { self->Advance(step); });
  } catch (...) {
    // On this thread, because there is no memory to post to an I/O thread.
    Advance([](Completions &) { throw OutOfMemoryException(); });
  }
}

// Another thread may be releasing the last reference, so this function must not take one. While an operation is
// pending, an operation below or a posted step has a reference, and completes the pending operation.
void SSLStreamImpl::OnOpenSslEnd(void *stream) noexcept {
  auto &self = *static_cast<SSLStreamImpl *>(stream);
  {
    const std::lock_guard<ForkSafeMutex> lock(self.m_mutex);
    self.MarkEnded();
  }
  self.m_lower->Close();
}

void SSLStreamImpl::Pump(Completions &done) {
  m_tls.PrepareSteps();
  if (m_stage == Stage::FRESH) {
    FailPending(std::make_shared<InvalidStateException>("The TLS handshake has not been started"), done);
    return;
  }
  bool waits = false;
  if (m_stage == Stage::HANDSHAKING) {
    waits = StepHandshake(done);
    if (m_stage == Stage::ESTABLISHED && !m_write) {
      return; // the step that `StepHandshake` has posted sends the rest of the handshake
    }
  }
  if (m_stage == Stage::ESTABLISHED && m_write) {
    StepWrite(done);
  }
  if (m_stage == Stage::ESTABLISHED && m_read) {
    waits = StepRead(done);
  }
  if (m_stage == Stage::FAILED) {
    FailPending(m_failure, done);
  }
  StartLowerWrite();
  if (waits) {
    m_tls.ReleaseEmptyBuffers();
    StartLowerRead();
  }
}

bool SSLStreamImpl::StepHandshake(Completions &done) {
  if (!m_tls.IsBegun()) {
    BeginHandshake(done);
    if (m_stage == Stage::FAILED) {
      return false;
    }
  }
  const Progress progress = m_tls.Handshake();
  if (progress != Progress::DONE) {
    return WaitsForBytes(progress, done);
  }
  // The handler probably writes. The next step runs after the handler, and sends the handshake's last message together
  // with what it writes.
  PostPump();
  m_wasResumed = m_tls.WasResumed();
  m_stage = Stage::ESTABLISHED;
  m_tls.KeepResumedSession();
  done.AddHandshake(std::exchange(m_handshake, nullptr), nullptr);
  return false;
}

void SSLStreamImpl::BeginHandshake(Completions &done) {
  try {
    m_tls.Begin(m_host, m_parameter);
  } catch (const OutOfMemoryException &) {
    FailWith(m_noMemory, done);
  } catch (const Exception &exception) {
    Fail(exception.what(), done);
  }
}

void SSLStreamImpl::StepWrite(Completions &done) {
  if (m_lowerWriteFailure) {
    done.AddWrite(std::move(m_write->handler), 0, MakeFailure(*m_lowerWriteFailure));
    m_write.reset();
    return;
  }
  while (m_write->encrypted < m_write->length && m_tls.GetOutputSize() < MAX_OUTPUT_BYTES) {
    std::size_t count = 0;
    if (m_tls.Encrypt(m_write->bytes + m_write->encrypted, m_write->length - m_write->encrypted, count) !=
        Progress::DONE) {
      Fail(m_tls.TakeReason(), done);
      return;
    }
    m_write->encrypted += count;
  }
  if (m_write->encrypted == m_write->length && m_tls.GetOutputSize() == 0 && !m_lowerWrites) {
    done.AddWrite(std::move(m_write->handler), m_write->length, nullptr);
    m_write.reset();
  }
}

bool SSLStreamImpl::StepRead(Completions &done) {
  std::size_t count = 0;
  const Progress progress = m_tls.Decrypt(m_read->buffer, m_read->length, count);
  if (progress != Progress::DONE) {
    return WaitsForBytes(progress, done);
  }
  done.AddRead(std::move(m_read->handler), count, nullptr);
  m_read.reset();
  return false;
}

bool SSLStreamImpl::WaitsForBytes(Progress progress, Completions &done) {
  if (progress == Progress::FAILED) {
    Fail(m_tls.TakeReason(), done);
    return false;
  }
  if (m_lowerEnded) {
    // Otherwise an attacker that cuts the connection could shorten a message unnoticed (RFC 8446, section 6.1).
    Fail(m_lowerWriteFailure.value_or("the server ended the connection without TLS's closing notice"), done);
    return false;
  }
  return true;
}

void SSLStreamImpl::StartLowerRead() {
  if (m_lowerReads || m_stage == Stage::FAILED) {
    return;
  }
  if (m_lowerInput.size() != m_inputBytes) {
    m_lowerInput = std::vector<char>(m_inputBytes);
  }
  m_lower->AsyncReadSome(m_lowerInput.data(), m_lowerInput.size(),
                         [self = Ref(this)](std::size_t count, const Exception *exception) {
                           self->AdvanceOnIoThread([self, count, failure = DescribeLowerFailure(exception)](
                                                       Completions &done) { self->OnLowerRead(count, failure, done); });
                         });
  m_lowerReads = true; // not too late: `OnLowerRead` waits for the lock
}

void SSLStreamImpl::OnLowerRead(std::size_t count, const LowerFailure &failure, Completions &done) {
  m_lowerReads = false;
  if (m_stage == Stage::FAILED) {
    FailPending(m_failure, done);
    return;
  }
  if (failure) {
    Fail(*failure, done);
    return;
  }
  m_lowerEnded = count == 0;
  m_inputBytes = count < WAITING_INPUT_BYTES ? WAITING_INPUT_BYTES : INPUT_BYTES;
  if (count > 0) {
    m_tls.PutInput(m_lowerInput.data(), count);
  }
  Pump(done);
}

void SSLStreamImpl::StartLowerWrite() {
  if (m_lowerWrites || !m_tls.IsBegun()) {
    return;
  }
  if (m_lowerWriteFailure) {
    m_tls.DropOutput(); // nothing can be sent any more, not even OpenSSL's answers
    return;
  }
  if (m_tls.GetOutputSize() == 0) {
    return;
  }
  m_tls.TakeOutput(m_lowerOutput, 2 * MAX_OUTPUT_BYTES);
  m_lower->AsyncWrite(m_lowerOutput.data(), m_lowerOutput.size(),
                      [self = Ref(this)](std::size_t, const Exception *exception) {
                        self->AdvanceOnIoThread([self, failure = DescribeLowerFailure(exception)](Completions &done) {
                          self->OnLowerWritten(failure, done);
                        });
                      });
  m_lowerWrites = true;
}

// A failure ends only writing: a server that refuses a request may have sent an answer or an alert that gives the
// reason.
void SSLStreamImpl::OnLowerWritten(const LowerFailure &failure, Completions &done) {
  m_lowerWrites = false;
  std::vector<char>().swap(m_lowerOutput); // not needed while the server computes its answer
  if (m_stage == Stage::FAILED) {
    FailPending(m_failure, done);
    return;
  }
  m_lowerWriteFailure = failure;
  Pump(done);
}

} // namespace Tarvel::Ssl
