// SPDX-License-Identifier: Apache-2.0

#include "ssl/ssl_stream_impl.h"

#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "system/io_engine.h"

#include <tarvel/core/exception.h>

#include <boost/asio/post.hpp>

#include <mutex>
#include <utility>

namespace Tarvel::Ssl {

namespace {

constexpr const char *OF_PARENT = "The connection belongs to the process that this one was forked from";

/// Calls `handler` with `arguments` and an `InvalidStateException` for `reason`, on an I/O thread.
template <typename Handler, typename... Arguments>
void PostRefusal(Handler handler, const char *reason, Arguments... arguments) {
  const Computation computing;
  boost::asio::post(System::GetIoContext(),
                    [handler = std::move(handler), failure = InvalidStateException(reason), arguments...] {
                      CallGuarded(handler, arguments..., static_cast<const Exception *>(&failure));
                    });
}

} // namespace

SSLStreamImpl::SSLStreamImpl(const Ref<SSLContextImpl> &context, const Ref<System::Stream> &stream,
                             const std::string &endpoint, const std::shared_ptr<HandshakeRecord> &record)
    : m_lower(stream), m_host(endpoint), m_tls(context, endpoint, record) {}

SSLStreamImpl::~SSLStreamImpl() {
  m_endNotice.Withdraw();
  const Crypto::OpenSslGuard use;
  if (!use) {
    m_tls.Abandon();
    return;
  }
  const Crypto::OpenSslErrorScope errors;
  if (m_stage == Stage::ESTABLISHED) {
    m_tls.KeepResumable();
  }
  m_tls.End(!IsOfParent());
}

void SSLStreamImpl::AsyncHandshake(const std::string &host, const std::string &parameter, HandshakeHandler handler) {
  if (IsOfParent()) {
    PostRefusal(std::move(handler), OF_PARENT);
    return;
  }
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_stage != Stage::FRESH) {
    auto failure =
        m_failure ? m_failure : std::make_shared<InvalidStateException>("The TLS handshake was started before");
    boost::asio::post(System::GetIoContext(), [handler = std::move(handler), failure = std::move(failure)] {
      CallGuarded(handler, failure.get());
    });
    return;
  }
  std::string ownHost = host;
  std::string ownParameter = parameter;
  PostPump(); // the last call that may fail; the step that it posts waits for the lock
  m_stage = Stage::HANDSHAKING;
  m_host = std::move(ownHost);
  m_parameter = std::move(ownParameter);
  m_handshake = std::move(handler);
}

void SSLStreamImpl::AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) {
  if (IsOfParent()) {
    PostRefusal(std::move(handler), OF_PARENT, std::size_t{0});
    return;
  }
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_read || length == 0) {
    PostRefusal(std::move(handler), "Another read is pending, or the read is one of no bytes", std::size_t{0});
    return;
  }
  PostPump();
  m_read = PendingRead{buffer, length, std::move(handler)};
}

void SSLStreamImpl::AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) {
  if (IsOfParent()) {
    PostRefusal(std::move(handler), OF_PARENT, std::size_t{0});
    return;
  }
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_write) {
    PostRefusal(std::move(handler), "Another write is pending", std::size_t{0});
    return;
  }
  PostPump();
  m_write = PendingWrite{bytes, length, 0, std::move(handler)};
}

void SSLStreamImpl::Close() noexcept {
  if (IsOfParent()) {
    m_lower->Close();
    return;
  }
  {
    const Crypto::OpenSslGuard use;
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (!use) {
      MarkEnded();
    } else {
      SendClosingNotice();
      if (m_stage != Stage::FAILED) {
        MarkFailed(MakeFailureOrNoMemory("closed by this side"));
      }
      m_tls.End(true);
    }
    CompletePendingSoon();
  }
  m_lower->Close();
}

/// Sends TLS's closing notice, unless a write is under way below. The notice is lost if the stream below does not
/// accept it at once.
void SSLStreamImpl::SendClosingNotice() noexcept {
  if (m_stage != Stage::ESTABLISHED || m_lowerWrites) {
    return;
  }
  try {
    m_tls.AddClosingNotice();
    StartLowerWrite();
  } catch (...) {
    // Without memory the connection ends without the notice.
  }
}

/// Posts a step that completes the pending operations after the stream has failed. If there is no memory to post it, an
/// earlier step or the end of an operation below completes them: while an operation is pending here, one of these is
/// pending, too.
void SSLStreamImpl::CompletePendingSoon() noexcept {
  if (!m_handshake && !m_read && !m_write) {
    return;
  }
  try {
    PostPump();
  } catch (...) {
    // An earlier step or the operation below completes them.
  }
}

SSLStreamImpl::Failure SSLStreamImpl::MakeFailure(const std::string &reason) const {
  const bool isEstablished = m_stage == Stage::ESTABLISHED;
  return std::make_shared<SSLException>((isEstablished ? "The TLS connection to " : "The TLS handshake with ") +
                                        m_host + (isEstablished ? " broke: " : " failed: ") +
                                        (reason.empty() ? "OpenSSL gave no reason" : reason));
}

SSLStreamImpl::Failure SSLStreamImpl::MakeFailureOrNoMemory(const char *reason) const noexcept {
  try {
    return MakeFailure(reason);
  } catch (...) {
    return m_noMemory;
  }
}

void SSLStreamImpl::Fail(const std::string &reason, Completions &done) noexcept {
  FailWith(MakeFailureOrNoMemory(reason.c_str()), done);
}

void SSLStreamImpl::FailWith(Failure failure, Completions &done) noexcept {
  MarkFailed(std::move(failure));
  FailPending(m_failure, done);
}

void SSLStreamImpl::MarkFailed(Failure failure) noexcept {
  if (m_stage == Stage::ESTABLISHED) {
    m_tls.KeepResumable();
  }
  m_failure = std::move(failure);
  m_stage = Stage::FAILED;
}

void SSLStreamImpl::MarkEnded() noexcept {
  if (m_stage != Stage::FAILED) {
    m_failure = m_processEnds;
    m_stage = Stage::FAILED;
  }
}

void SSLStreamImpl::FailPending(const Failure &failure, Completions &done) noexcept {
  if (m_handshake) {
    done.AddHandshake(std::exchange(m_handshake, nullptr), failure);
  }
  if (m_read) {
    done.AddRead(std::move(m_read->handler), 0, failure);
    m_read.reset();
  }
  if (m_write) {
    done.AddWrite(std::move(m_write->handler), 0, failure);
    m_write.reset();
  }
}

} // namespace Tarvel::Ssl
