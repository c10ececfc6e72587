// SPDX-License-Identifier: Apache-2.0

#include "ssl/ssl_stream_impl.h"

#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "system/io_engine.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <boost/asio/dispatch.hpp>
#include <boost/asio/post.hpp>

#include <openssl/err.h>

#include <algorithm>
#include <cerrno>
#include <mutex>
#include <new>
#include <utility>

namespace Tarvel::Ssl {

using Service::LogUncaughtException;

namespace {

/// One record of TLS, whole (RFC 8446, section 5.2).
constexpr std::size_t INPUT_BYTES = 5 + 16384 + 256;
/// A record's content. More is encrypted only once the stream below has taken what there is, so that a large message is
/// not held a second time.
constexpr std::size_t RECORD_BYTES = 16384;
constexpr std::size_t MAX_OUTPUT_BYTES = 4 * RECORD_BYTES;
/// Of one connection. A server that hands out more wants them used by as many connections at once.
constexpr std::size_t MAX_NEW_SESSIONS = 8;

std::string DescribeSubject(X509 *certificate) {
  const Crypto::BioHandle text(BIO_new(BIO_s_mem()));
  if (!certificate || !text ||
      X509_NAME_print_ex(text.get(), X509_get_subject_name(certificate), 0, XN_FLAG_RFC2253) < 0) {
    return "unknown";
  }
  char *data = nullptr;
  const long length = BIO_get_mem_data(text.get(), &data);
  return StringUtil::Shorten({data, static_cast<std::size_t>(length)});
}

template <typename Handler, typename... Args>
void CallGuarded(const Handler &handler, const Args &...args) noexcept {
  const HostCall call;
  try {
    handler(args...);
  } catch (...) {
    LogUncaughtException("a completion handler");
  }
}

constexpr const char *OF_PARENT = "The connection belongs to the process that this one was forked from";

/// What went wrong below; none when nothing did.
std::optional<std::string> DescribeLowerFailure(const Exception *exception) noexcept {
  if (!exception) {
    return std::nullopt;
  }
  try {
    return exception->what();
  } catch (...) {
    return "no memory"; // which is short enough to need none
  }
}

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

/// Each handler is called once, with its result, by `Run`.
class SSLStreamImpl::Completions {
public:
  void AddHandshake(HandshakeHandler handler, Failure failure) {
    m_handshake = std::move(handler);
    m_handshakeFailure = std::move(failure);
  }
  void AddRead(TransferHandler handler, std::size_t count, Failure failure) {
    m_read = {std::move(handler), count, std::move(failure)};
  }
  void AddWrite(TransferHandler handler, std::size_t count, Failure failure) {
    m_write = {std::move(handler), count, std::move(failure)};
  }

  void Run() const noexcept {
    const unsigned generation = GetForkGeneration();
    if (m_handshake) {
      CallGuarded(m_handshake, m_handshakeFailure.get());
    }
    for (const Transfer *transfer : {&m_write, &m_read}) {
      // A handler may have forked: in the child none of the others is called.
      if (transfer->handler && generation == GetForkGeneration()) {
        CallGuarded(transfer->handler, transfer->count, transfer->failure.get());
      }
    }
  }

private:
  struct Transfer {
    TransferHandler handler;
    std::size_t count = 0;
    Failure failure;
  };

  HandshakeHandler m_handshake;
  Failure m_handshakeFailure;
  Transfer m_read;
  Transfer m_write;
};

SSLStreamImpl::SSLStreamImpl(const Ref<SSLContextImpl> &context, const Ref<System::Stream> &stream,
                             const std::string &endpoint)
    : m_context(context), m_lower(stream), m_endpoint(endpoint), m_host(endpoint) {}

SSLStreamImpl::~SSLStreamImpl() {
  m_endNotice.Withdraw();
  const Crypto::OpenSslGuard use;
  if (!use) {
    Crypto::OpenSslGuard::Abandon(m_connection.release());
    for (SessionHandle &session : m_newSessions) {
      Crypto::OpenSslGuard::Abandon(session.release());
    }
    return;
  }
  const Crypto::OpenSslErrorScope errors;
  if (m_stage == Stage::ESTABLISHED) {
    // Else OpenSSL takes the connection for a broken one and its session for no longer resumable.
    SSL_set_shutdown(m_connection.get(), SSL_SENT_SHUTDOWN | SSL_RECEIVED_SHUTDOWN);
  }
  EndConnection();
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
  PostPump(); // the last that may fail; what it posts waits for the lock
  m_stage = Stage::SHAKING;
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
      EndConnection();
    }
    CompletePendingSoon();
  }
  m_lower->Close();
}

/// The notice leaves only if the stream below takes it at once.
void SSLStreamImpl::SendClosingNotice() noexcept {
  if (m_stage != Stage::ESTABLISHED || m_lowerWrites) {
    return;
  }
  try {
    const Crypto::OpenSslErrorScope errors;
    SSL_shutdown(m_connection.get());
    StartLowerWrite();
  } catch (...) {
    // Without memory the connection ends without it.
  }
}

/// What is pending, when the stream has failed. Without memory for it, the end of the operation below does it: as long as
/// something is pending, either this has been posted or there is such an operation.
void SSLStreamImpl::CompletePendingSoon() noexcept {
  if (!m_handshake && !m_read && !m_write) {
    return;
  }
  try {
    PostPump();
  } catch (...) {
    // As said.
  }
}

// Always on an I/O thread: OpenSSL reports through the thread's error queue, and there it holds nothing of the host's.
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
    Advance([](Completions &) { throw OutOfMemoryException(); }); // here, for there is no memory to go elsewhere
  }
}

// Another thread may be dropping the last reference, so this must not take one. As long as something is pending, an operation
// below holds a reference, or a step that has been posted does.
void SSLStreamImpl::OnOpenSslEnd(void *stream) noexcept {
  auto &self = *static_cast<SSLStreamImpl *>(stream);
  {
    const std::lock_guard<ForkSafeMutex> lock(self.m_mutex);
    self.MarkEnded();
  }
  self.m_lower->Close();
}

void SSLStreamImpl::Pump(Completions &done) {
  ERR_clear_error();
  m_lacksMemory = false;
  if (m_stage == Stage::FRESH) {
    FailPending(std::make_shared<InvalidStateException>("The TLS handshake has not been started"), done);
    return;
  }
  bool waits = false;
  if (m_stage == Stage::SHAKING) {
    waits = StepHandshake(done);
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
    StartLowerRead();
  }
}

bool SSLStreamImpl::StepHandshake(Completions &done) {
  if (!m_connection) {
    BeginHandshake(done);
    if (m_stage == Stage::FAILED) {
      return false;
    }
  }
  const Crypto::OpenSslErrorScope errors;
  const int result = SSL_do_handshake(m_connection.get());
  if (result == 1) {
    FinishHandshake(done);
    return false;
  }
  return WaitsForBytes(result, errors, done);
}

void SSLStreamImpl::BeginHandshake(Completions &done) {
  const Crypto::OpenSslErrorScope errors;
  try {
    m_identity.emplace(m_host, m_parameter);
    ConnectionHandle connection = m_context->CreateConnection();
    Crypto::BioHandle received(BIO_new(BIO_s_mem()));
    Crypto::BioHandle toSend(BIO_new(BIO_s_mem()));
    if (!received || !toSend) {
      throw OutOfMemoryException();
    }
    m_received = received.get();
    m_toSend = toSend.get();
    SSL_set_bio(connection.get(), received.release(), toSend.release());
    SSL_set_connect_state(connection.get());
    SSL_set_msg_callback(connection.get(), OnMessage);
    SSL_set_msg_callback_arg(connection.get(), this);
    if (SSL_set_app_data(connection.get(), this) != 1) {
      throw OutOfMemoryException();
    }
    m_identity->Apply(connection.get());
    m_sessionKey = m_endpoint + '\n' + m_identity->ToKey();
    if (const SessionHandle session = m_context->GetSessions().Take(m_sessionKey)) {
      SSL_set_session(connection.get(), session.get()); // if it does not fit, the handshake is a full one
    }
    m_lowerInput.resize(INPUT_BYTES);
    m_connection = std::move(connection);
  } catch (const OutOfMemoryException &) {
    FailWith(m_noMemory, done);
  } catch (const Exception &exception) {
    Fail(exception.what(), done);
  }
}

void SSLStreamImpl::FinishHandshake(Completions &done) {
  m_wasResumed = SSL_session_reused(m_connection.get()) == 1;
  if (const std::string refusal = RefuseServer(); !refusal.empty()) {
    Fail(refusal, done);
    return;
  }
  m_stage = Stage::ESTABLISHED;
  // Up to TLS 1.2 a session can be resumed again and again, and the server need not give a new one.
  if (m_wasResumed && m_newSessions.empty() && SSL_version(m_connection.get()) == TLS1_2_VERSION) {
    KeepSession(SessionHandle(SSL_get1_session(m_connection.get())));
  }
  done.AddHandshake(std::exchange(m_handshake, nullptr), nullptr);
}

// What was verified in the handshake is looked at again here, because a resumed handshake verifies nothing.
std::string SSLStreamImpl::RefuseServer() const {
  const Crypto::CertificateHandle certificate(SSL_get1_peer_certificate(m_connection.get()));
  if (m_identity->HasThumbprint()) {
    return m_identity->RefuseByThumbprint(certificate.get());
  }
  const long verdict = SSL_get_verify_result(m_connection.get());
  if (!certificate || verdict != X509_V_OK) {
    return std::string("the server's certificate was not accepted: ") + X509_verify_cert_error_string(verdict);
  }
  return {};
}

// Before OpenSSL sends an alert, it resets the errno in which `malloc` has left the reason for it.
void SSLStreamImpl::OnMessage(int, int, int, const void *, std::size_t, SSL *, void *stream) noexcept {
  if (errno == ENOMEM) {
    static_cast<SSLStreamImpl *>(stream)->m_lacksMemory = true;
  }
}

int SSLStreamImpl::OnVerifyServer(X509_STORE_CTX *verification, void *) noexcept {
  const auto *const connection =
      static_cast<SSL *>(X509_STORE_CTX_get_ex_data(verification, SSL_get_ex_data_X509_STORE_CTX_idx()));
  auto *const stream = static_cast<SSLStreamImpl *>(SSL_get_app_data(connection));
  // A certificate that was read without enough memory for all of it is refused for something else.
  const bool lacksMemory = errno == ENOMEM;
  try {
    try {
      stream->m_verifyFailure = stream->VerifyServer(verification);
      stream->m_lacksMemory = lacksMemory && !stream->m_verifyFailure.empty();
      return stream->m_verifyFailure.empty() ? 1 : 0;
    } catch (const Crypto::CryptoException &exception) {
      stream->m_verifyFailure = exception.what();
      X509_STORE_CTX_set_error(verification, X509_V_ERR_UNSPECIFIED);
    }
  } catch (...) {
    stream->m_lacksMemory = true;
    X509_STORE_CTX_set_error(verification, X509_V_ERR_OUT_OF_MEM);
  }
  return 0;
}

/// Why the server's certificate is not accepted; empty when it is.
std::string SSLStreamImpl::VerifyServer(X509_STORE_CTX *verification) const {
  if (m_identity->HasThumbprint()) {
    std::string refusal = m_identity->RefuseByThumbprint(X509_STORE_CTX_get0_cert(verification));
    X509_STORE_CTX_set_error(verification, refusal.empty() ? X509_V_OK : X509_V_ERR_APPLICATION_VERIFICATION);
    return refusal;
  }
  const Crypto::OpenSslErrorScope errors;
  if (X509_verify_cert(verification) == 1) {
    return {};
  }
  errors.RequireMemory();
  if (X509_STORE_CTX_get_error(verification) == X509_V_ERR_OUT_OF_MEM) {
    throw OutOfMemoryException();
  }
  return std::string("the server's certificate was not accepted: ") +
         X509_verify_cert_error_string(X509_STORE_CTX_get_error(verification)) + " (certificate \"" +
         DescribeSubject(X509_STORE_CTX_get_current_cert(verification)) + "\")";
}

int SSLStreamImpl::OnNewSession(SSL *connection, SSL_SESSION *session) noexcept {
  auto *const stream = static_cast<SSLStreamImpl *>(SSL_get_app_data(connection));
  try {
    stream->KeepSession(SessionHandle(session));
  } catch (...) {
    // Without memory for it, it is not kept: freed by its handle. Nobody is called while the lock is held, nor a log sink.
  }
  return 1;
}

void SSLStreamImpl::KeepSession(SessionHandle session) {
  if (m_newSessions.size() == MAX_NEW_SESSIONS) {
    m_newSessions.erase(m_newSessions.begin());
  }
  m_newSessions.push_back(std::move(session));
}

void SSLStreamImpl::EndConnection() noexcept {
  m_connection.reset();
  try {
    for (SessionHandle &session : std::exchange(m_newSessions, {})) {
      if (IsOfParent()) {
        continue; // freed by its handle: resumed in both processes, it would betray that they are related
      }
      m_context->GetSessions().Put(m_sessionKey, std::move(session));
    }
  } catch (...) {
    // As above.
  }
}

void SSLStreamImpl::StepWrite(Completions &done) {
  if (m_lowerWriteFailure) {
    done.AddWrite(std::move(m_write->handler), 0, MakeFailure(*m_lowerWriteFailure));
    m_write.reset();
    return;
  }
  const Crypto::OpenSslErrorScope errors;
  while (m_write->encrypted < m_write->length && BIO_ctrl_pending(m_toSend) < MAX_OUTPUT_BYTES) {
    std::size_t count = 0;
    const int result = SSL_write_ex(m_connection.get(), m_write->bytes + m_write->encrypted,
                                    std::min(m_write->length - m_write->encrypted, RECORD_BYTES), &count);
    if (result != 1) {
      // Memory takes every byte, so OpenSSL has no reason to wait.
      errors.RequireMemory();
      Fail(errors.Describe("the bytes cannot be encrypted"), done);
      return;
    }
    m_write->encrypted += count;
  }
  if (m_write->encrypted == m_write->length && BIO_ctrl_pending(m_toSend) == 0 && !m_lowerWrites) {
    done.AddWrite(std::move(m_write->handler), m_write->length, nullptr);
    m_write.reset();
  }
}

bool SSLStreamImpl::StepRead(Completions &done) {
  const Crypto::OpenSslErrorScope errors;
  std::size_t count = 0;
  const int result = SSL_read_ex(m_connection.get(), m_read->buffer, m_read->length, &count);
  if (result != 1 && SSL_get_error(m_connection.get(), result) != SSL_ERROR_ZERO_RETURN) {
    return WaitsForBytes(result, errors, done);
  }
  done.AddRead(std::move(m_read->handler), count, nullptr);
  m_read.reset();
  return false;
}

bool SSLStreamImpl::WaitsForBytes(int result, const Crypto::OpenSslErrorScope &errors, Completions &done) {
  const int error = SSL_get_error(m_connection.get(), result);
  if (error == SSL_ERROR_WANT_READ) {
    if (!m_lowerEnded) {
      return true;
    }
    // Without this, whoever can cut the connection could shorten a message unnoticed (RFC 8446, section 6.1).
    Fail(m_lowerWriteFailure.value_or("the server ended the connection without TLS's closing notice"), done);
    return false;
  }
  m_newSessions.clear(); // not to be resumed after a fatal alert (RFC 8446, section 6.2)
  if (m_lacksMemory) {
    throw OutOfMemoryException();
  }
  errors.RequireMemory();
  if (error == SSL_ERROR_ZERO_RETURN) {
    Fail("the server ended the connection", done);
    return false;
  }
  Fail(m_verifyFailure.empty() ? errors.TakeText() : m_verifyFailure, done);
  return false;
}

void SSLStreamImpl::StartLowerRead() {
  if (m_lowerReads || m_stage == Stage::FAILED) {
    return;
  }
  m_lower->AsyncReadSome(m_lowerInput.data(), m_lowerInput.size(),
                         [self = Ref(this)](std::size_t count, const Exception *exception) {
                           self->AdvanceOnIoThread([self, count, failure = DescribeLowerFailure(exception)](
                                                       Completions &done) { self->OnLowerRead(count, failure, done); });
                         });
  m_lowerReads = true; // its end waits for the lock
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
  if (count > 0 && BIO_write(m_received, m_lowerInput.data(), static_cast<int>(count)) != static_cast<int>(count)) {
    throw OutOfMemoryException();
  }
  Pump(done);
}

void SSLStreamImpl::StartLowerWrite() {
  if (m_lowerWrites || !m_connection) {
    return;
  }
  if (m_lowerWriteFailure) {
    BIO_reset(m_toSend); // what OpenSSL answers to what it reads has nowhere to go
    return;
  }
  const std::size_t pending = std::min(BIO_ctrl_pending(m_toSend), 2 * MAX_OUTPUT_BYTES);
  if (pending == 0) {
    return;
  }
  m_lowerOutput.resize(pending);
  const int count = BIO_read(m_toSend, m_lowerOutput.data(), static_cast<int>(pending));
  m_lower->AsyncWrite(m_lowerOutput.data(), static_cast<std::size_t>(count),
                      [self = Ref(this)](std::size_t, const Exception *exception) {
                        self->AdvanceOnIoThread([self, failure = DescribeLowerFailure(exception)](Completions &done) {
                          self->OnLowerWritten(failure, done);
                        });
                      });
  m_lowerWrites = true;
}

// A failure ends writing alone: a server that refuses a request may have sent an answer, or an alert, and said why.
void SSLStreamImpl::OnLowerWritten(const LowerFailure &failure, Completions &done) {
  m_lowerWrites = false;
  if (m_stage == Stage::FAILED) {
    FailPending(m_failure, done);
    return;
  }
  m_lowerWriteFailure = failure;
  Pump(done);
}

SSLStreamImpl::Failure SSLStreamImpl::MakeFailure(const std::string &reason) const {
  const bool isEstablished = m_stage == Stage::ESTABLISHED;
  return std::make_shared<SSLException>((isEstablished ? "The TLS connection to " : "The TLS handshake with ") +
                                        m_host + (isEstablished ? " broke: " : " failed: ") +
                                        (reason.empty() ? "OpenSSL gives no reason" : reason));
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
    // Else OpenSSL takes the session for no longer resumable; what spoils a session, OpenSSL has noted by itself.
    SSL_set_shutdown(m_connection.get(), SSL_SENT_SHUTDOWN | SSL_RECEIVED_SHUTDOWN);
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
