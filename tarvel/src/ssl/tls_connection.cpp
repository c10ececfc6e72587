// SPDX-License-Identifier: Apache-2.0

#include "ssl/tls_connection.h"

#include "crypto/openssl_guard.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <openssl/buffer.h>
#include <openssl/err.h>

#include <algorithm>
#include <cerrno>
#include <utility>

namespace Tarvel::Ssl {

namespace {

/// At most this many sessions of one connection are kept. A server issues several, so that several connections can
/// resume at the same time.
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

/// Why OpenSSL has refused the certificate that it checked last.
std::string DescribeRefusal(X509_STORE_CTX *verification) {
  return std::string("the server's certificate was not accepted: ") +
         X509_verify_cert_error_string(X509_STORE_CTX_get_error(verification)) + " (certificate \"" +
         DescribeSubject(X509_STORE_CTX_get_current_cert(verification)) + "\")";
}

/// If `buffer` is empty, frees the memory that it has from earlier bytes.
void ReleaseIfEmpty(BIO *buffer) noexcept {
  BUF_MEM *memory = nullptr;
  BIO_get_mem_ptr(buffer, &memory);
  if (BIO_ctrl_pending(buffer) > 0 || memory->max == 0) {
    return;
  }
  if (BUF_MEM *const empty = BUF_MEM_new()) {
    BIO_set_mem_buf(buffer, empty, BIO_CLOSE);
    BIO_set_mem_eof_return(buffer, -1);
  }
}

/// The connection whose server is being verified.
TlsConnection *Find(X509_STORE_CTX *verification) noexcept {
  const auto *const native =
      static_cast<SSL *>(X509_STORE_CTX_get_ex_data(verification, SSL_get_ex_data_X509_STORE_CTX_idx()));
  return static_cast<TlsConnection *>(SSL_get_app_data(native));
}

} // namespace

TlsConnection::TlsConnection(const Ref<SSLContextImpl> &context, const std::string &endpoint,
                             const std::shared_ptr<HandshakeRecord> &record)
    : m_context(context), m_endpoint(endpoint), m_record(record) {}

void TlsConnection::Begin(const std::string &host, const std::string &parameter) {
  const Crypto::OpenSslErrorScope errors;
  m_identity.emplace(host, parameter);
  BIO *received = nullptr;
  BIO *toSend = nullptr;
  ConnectionHandle connection = MakeConnection(*m_identity, received, toSend);
  m_sessionKey = m_endpoint + '\n' + m_identity->ToKey();
  if (!m_record) { // a resumed session would not show the server's certificates
    if (const SessionHandle session = m_context->GetSessions().Take(m_sessionKey)) {
      SSL_set_session(connection.get(), session.get()); // if OpenSSL cannot use it, the handshake is a full one
    }
  }
  m_received = received;
  m_toSend = toSend;
  m_connection = std::move(connection);
}

ConnectionHandle TlsConnection::MakeConnection(const ServerIdentity &identity, BIO *&received, BIO *&toSend) {
  ConnectionHandle connection = m_context->CreateConnection();
  Crypto::BioHandle input(BIO_new(BIO_s_mem()));
  Crypto::BioHandle output(BIO_new(BIO_s_mem()));
  if (!input || !output) {
    throw OutOfMemoryException();
  }
  received = input.get();
  toSend = output.get();
  SSL_set_bio(connection.get(), input.release(), output.release());
  SSL_set_connect_state(connection.get());
  SSL_set_msg_callback(connection.get(), OnMessage);
  SSL_set_msg_callback_arg(connection.get(), this);
  if (SSL_set_app_data(connection.get(), this) != 1) {
    throw OutOfMemoryException();
  }
  identity.Apply(connection.get());
  return connection;
}

void TlsConnection::PrepareSteps() noexcept {
  ERR_clear_error();
  m_lacksMemory = false;
}

TlsConnection::Progress TlsConnection::Handshake() {
  const Crypto::OpenSslErrorScope errors;
  const int result = SSL_do_handshake(m_connection.get());
  if (m_record) {
    m_record->NoteProtocol(m_connection.get());
  }
  if (result != 1) {
    return Examine(result, errors);
  }
  m_reason = RefuseServer();
  return m_reason.empty() ? Progress::DONE : Progress::FAILED;
}

bool TlsConnection::WasResumed() const noexcept {
  return SSL_session_reused(m_connection.get()) == 1;
}

// Up to TLS 1.2 a session can be resumed many times, and the server need not issue a new one.
void TlsConnection::KeepResumedSession() {
  if (WasResumed() && m_newSessions.empty() && SSL_version(m_connection.get()) == TLS1_2_VERSION) {
    KeepSession(SessionHandle(SSL_get1_session(m_connection.get())));
  }
}

TlsConnection::Progress TlsConnection::Decrypt(char *buffer, std::size_t length, std::size_t &count) {
  const Crypto::OpenSslErrorScope errors;
  const int result = SSL_read_ex(m_connection.get(), buffer, length, &count);
  if (result != 1 && SSL_get_error(m_connection.get(), result) != SSL_ERROR_ZERO_RETURN) {
    return Examine(result, errors);
  }
  return Progress::DONE;
}

TlsConnection::Progress TlsConnection::Encrypt(const char *bytes, std::size_t length, std::size_t &count) {
  const Crypto::OpenSslErrorScope errors;
  const int result = SSL_write_ex(m_connection.get(), bytes, std::min(length, RECORD_BYTES), &count);
  if (result == 1) {
    return Progress::DONE;
  }
  // A buffer in memory accepts every byte, so OpenSSL has no reason to wait.
  errors.RequireMemory();
  m_reason = errors.Describe("the bytes cannot be encrypted");
  return Progress::FAILED;
}

TlsConnection::Progress TlsConnection::Examine(int result, const Crypto::OpenSslErrorScope &errors) {
  const int error = SSL_get_error(m_connection.get(), result);
  if (error == SSL_ERROR_WANT_READ) {
    return Progress::NEEDS_BYTES;
  }
  m_newSessions.clear(); // must not be resumed after a fatal alert (RFC 8446, section 6.2)
  if (m_lacksMemory) {
    throw OutOfMemoryException();
  }
  errors.RequireMemory();
  if (m_record) {
    m_record->NoteError(errors.PeekNewest());
  }
  if (error == SSL_ERROR_ZERO_RETURN) {
    m_reason = "the server ended the connection";
  } else {
    m_reason = m_verifyFailure.empty() ? errors.TakeText() : m_verifyFailure;
  }
  return Progress::FAILED;
}

// Checks again what a full handshake has verified, because a resumed handshake verifies nothing.
std::string TlsConnection::RefuseServer() const {
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

// Reads the errno that `malloc` has set, before OpenSSL resets it to send an alert.
void TlsConnection::OnMessage(int, int, int, const void *, std::size_t, SSL *, void *connection) noexcept {
  if (errno == ENOMEM) {
    static_cast<TlsConnection *>(connection)->m_lacksMemory = true;
  }
}

int TlsConnection::OnVerifyServer(X509_STORE_CTX *verification, void *) noexcept {
  TlsConnection *const self = Find(verification);
  // If memory ran out while the certificate was read, verification refuses it, but for another reason.
  const bool lacksMemory = errno == ENOMEM;
  try {
    try {
      self->m_verifyFailure = self->VerifyServer(verification);
      self->m_lacksMemory = lacksMemory && !self->m_verifyFailure.empty();
      return self->m_verifyFailure.empty() ? 1 : 0;
    } catch (const Crypto::CryptoException &exception) {
      self->m_verifyFailure = exception.what();
      X509_STORE_CTX_set_error(verification, X509_V_ERR_UNSPECIFIED);
    }
  } catch (...) {
    self->m_lacksMemory = true;
    X509_STORE_CTX_set_error(verification, X509_V_ERR_OUT_OF_MEM);
  }
  return 0;
}

/// Why the server's certificate is not accepted; empty when it is.
std::string TlsConnection::VerifyServer(X509_STORE_CTX *verification) const {
  if (m_record) {
    m_record->NoteChain(verification);
  }
  return m_identity->HasThumbprint() ? VerifyThumbprint(verification) : VerifyChain(verification);
}

std::string TlsConnection::VerifyThumbprint(X509_STORE_CTX *verification) const {
  std::string refusal = m_identity->RefuseByThumbprint(X509_STORE_CTX_get0_cert(verification));
  X509_STORE_CTX_set_error(verification, refusal.empty() ? X509_V_OK : X509_V_ERR_APPLICATION_VERIFICATION);
  if (m_record && !refusal.empty()) {
    m_record->NoteOtherThumbprint(refusal);
  }
  return refusal;
}

std::string TlsConnection::VerifyChain(X509_STORE_CTX *verification) const {
  const Crypto::OpenSslErrorScope errors;
  if (m_record) {
    X509_STORE_CTX_set_verify_cb(verification, OnVerificationStep);
  }
  const bool isVerified = X509_verify_cert(verification) == 1;
  if (!isVerified) {
    errors.RequireMemory();
    if (X509_STORE_CTX_get_error(verification) == X509_V_ERR_OUT_OF_MEM) {
      throw OutOfMemoryException();
    }
  }
  if (m_record) {
    m_record->NoteAnchor(verification);
    if (m_record->HasRefusals()) { // the verification has continued after them
      X509_STORE_CTX_set_error(verification, m_record->GetFirstCode());
      return m_record->GetFirstText();
    }
  }
  return isVerified ? std::string() : DescribeRefusal(verification);
}

int TlsConnection::OnVerificationStep(int isAccepted, X509_STORE_CTX *verification) noexcept {
  if (isAccepted == 1) {
    return 1;
  }
  TlsConnection *const self = Find(verification);
  try {
    self->m_record->NoteRefusal(verification, DescribeRefusal(verification));
    return 1;
  } catch (...) {
    self->m_lacksMemory = true; // ends the verification, and with it the handshake
    X509_STORE_CTX_set_error(verification, X509_V_ERR_OUT_OF_MEM);
    return 0;
  }
}

int TlsConnection::OnNewSession(SSL *connection, SSL_SESSION *session) noexcept {
  auto *const self = static_cast<TlsConnection *>(SSL_get_app_data(connection));
  try {
    self->KeepSession(SessionHandle(session));
  } catch (...) {
    // Without memory the session is not kept; its handle has freed it. Nothing is logged, because the stream's lock is
    // held.
  }
  return 1;
}

void TlsConnection::KeepSession(SessionHandle session) {
  if (m_newSessions.size() == MAX_NEW_SESSIONS) {
    m_newSessions.erase(m_newSessions.begin());
  }
  m_newSessions.push_back(std::move(session));
}

void TlsConnection::AddClosingNotice() {
  const Crypto::OpenSslErrorScope errors;
  SSL_shutdown(m_connection.get());
}

void TlsConnection::PutInput(const char *bytes, std::size_t count) {
  if (BIO_write(m_received, bytes, static_cast<int>(count)) != static_cast<int>(count)) {
    throw OutOfMemoryException();
  }
  if (m_record) {
    m_record->NoteInput(bytes, count);
  }
}

std::size_t TlsConnection::GetOutputSize() const noexcept {
  return BIO_ctrl_pending(m_toSend);
}

void TlsConnection::TakeOutput(std::vector<char> &output, std::size_t maximum) {
  output.resize(std::min(GetOutputSize(), maximum));
  const int count = BIO_read(m_toSend, output.data(), static_cast<int>(output.size()));
  output.resize(static_cast<std::size_t>(std::max(count, 0)));
}

void TlsConnection::DropOutput() noexcept {
  BIO_reset(m_toSend);
}

void TlsConnection::ReleaseEmptyBuffers() noexcept {
  SSL_free_buffers(m_connection.get()); // SSL_MODE_RELEASE_BUFFERS would release only the buffer for received records
  ReleaseIfEmpty(m_received);
  ReleaseIfEmpty(m_toSend);
}

void TlsConnection::KeepResumable() noexcept {
  SSL_set_shutdown(m_connection.get(), SSL_SENT_SHUTDOWN | SSL_RECEIVED_SHUTDOWN);
}

void TlsConnection::End(bool remembersSessions) noexcept {
  m_connection.reset();
  try {
    for (SessionHandle &session : std::exchange(m_newSessions, {})) {
      if (remembersSessions) {
        m_context->GetSessions().Put(m_sessionKey, std::move(session));
      }
    }
  } catch (...) {
    // Without memory the sessions are not remembered; their handles have freed them.
  }
}

void TlsConnection::Abandon() noexcept {
  Crypto::OpenSslGuard::Abandon(m_connection.release());
  for (SessionHandle &session : m_newSessions) {
    Crypto::OpenSslGuard::Abandon(session.release());
  }
}

} // namespace Tarvel::Ssl
