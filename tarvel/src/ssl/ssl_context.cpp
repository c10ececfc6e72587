// SPDX-License-Identifier: Apache-2.0

#include <tarvel/ssl/ssl_context.h>

#include "crypto/certificate_impl.h"
#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_guard.h"
#include "crypto/private_key_impl.h"
#include "ssl/ssl_context_impl.h"
#include "ssl/ssl_stream_impl.h"
#include "ssl/tls_connection.h"
#include "ssl/tls_policy.h"

#include <openssl/x509v3.h>

#include <filesystem>
#include <system_error>

namespace Tarvel::Ssl {

namespace {

bool Exists(const char *path) {
  std::error_code ignored; // a path that cannot be examined counts as missing
  return std::filesystem::exists(path, ignored);
}

void RequireSuccess(long result, const Crypto::OpenSslErrorScope &errors, const char *failure) {
  if (result != 1) {
    errors.Throw(failure);
  }
}

/// The OpenSSL object of `certificate`, ready for use by many connections at once. OpenSSL decodes the extensions under
/// a lock when it first uses them. They are decoded here, so that no connection waits for that lock.
X509 *Prepare(const Crypto::Certificate &certificate) {
  X509 *const native = Crypto::AsImpl(certificate).GetNative();
  X509_check_purpose(native, -1, 0); // bad extensions are ignored here; verification reports them
  return native;
}

} // namespace

TARVEL_DEFINE_EXCEPTION(SSLException)

SSLStream::~SSLStream() = default;

SSLContext::~SSLContext() = default;

SSLContextImpl::SSLContextImpl() {
  Crypto::OpenSslGuard::Prepare();
  const Crypto::OpenSslGuard use;
  use.Require();
  const Crypto::OpenSslErrorScope errors;
  m_native.reset(SSL_CTX_new_ex(Crypto::GetLibraryContext(), nullptr, TLS_client_method()));
  if (!m_native) {
    errors.Throw("Cannot make an SSL context");
  }
  SSL_CTX *const native = m_native.get();
  ApplyTlsPolicy(native);
  // Only the intermediates that were given are sent; OpenSSL adds none from the trust store.
  SSL_CTX_set_mode(native, SSL_MODE_AUTO_RETRY | SSL_MODE_NO_AUTO_CHAIN);
  SSL_CTX_set_verify(native, SSL_VERIFY_PEER, nullptr);
  SSL_CTX_set_cert_verify_callback(native, TlsConnection::OnVerifyServer, nullptr);
  // Every certificate that the host adds is a trust anchor, even if it is not a root.
  X509_VERIFY_PARAM_set_flags(SSL_CTX_get0_param(native), X509_V_FLAG_PARTIAL_CHAIN);
  SSL_CTX_set_session_cache_mode(native, SSL_SESS_CACHE_CLIENT | SSL_SESS_CACHE_NO_INTERNAL);
  SSL_CTX_sess_set_new_cb(native, TlsConnection::OnNewSession);
}

SSLContextImpl::~SSLContextImpl() {
  const Crypto::OpenSslGuard use;
  if (!use) {
    m_sessions.Abandon();
    Crypto::OpenSslGuard::Abandon(m_native.release());
    return;
  }
  m_sessions.Clear();
  m_native.reset();
}

// Does not let OpenSSL choose its default paths, because environment variables can change that choice.
void SSLContextImpl::TrustSystemStore() {
  const Crypto::OpenSslGuard use;
  use.Require();
  const Crypto::OpenSslErrorScope errors;
  const char *const file = X509_get_default_cert_file();
  const char *const directory = X509_get_default_cert_dir();
  const bool hasFile = Exists(file);
  const bool hasDirectory = Exists(directory);
  if (!hasFile && !hasDirectory) {
    errors.Throw(std::string("There is no system trust store at ") + file + " or " + directory);
  }
  m_sessions.Clear();
  X509_STORE *const store = SSL_CTX_get_cert_store(m_native.get());
  if (hasFile) {
    RequireSuccess(X509_STORE_load_file_ex(store, file, Crypto::GetLibraryContext(), nullptr), errors,
                   "Cannot read the system trust store");
  }
  if (hasDirectory) {
    RequireSuccess(X509_STORE_load_path(store, directory), errors, "Cannot read the system trust store");
  }
}

void SSLContextImpl::TrustFile(const std::string &path) {
  TrustCertificates(Crypto::LoadCertificates(path));
}

void SSLContextImpl::TrustCertificates(const Crypto::CertificateList &certificates) {
  const Crypto::OpenSslGuard use;
  use.Require();
  const Crypto::OpenSslErrorScope errors;
  m_sessions.Clear();
  X509_STORE *const store = SSL_CTX_get_cert_store(m_native.get());
  for (const Ref<const Crypto::Certificate> &certificate : certificates) {
    RequireSuccess(X509_STORE_add_cert(store, Prepare(*certificate)), errors, "Cannot trust a certificate");
  }
}

void SSLContextImpl::SetClientCertificate(const Ref<const Crypto::Certificate> &certificate,
                                          const Ref<const Crypto::PrivateKey> &key,
                                          const Crypto::CertificateList &intermediates) {
  Crypto::RequireKeyMatchesCertificate(*key, *certificate);
  const Crypto::OpenSslGuard use;
  use.Require();
  const Crypto::OpenSslErrorScope errors;
  m_sessions.Clear();
  SSL_CTX *const native = m_native.get();
  RequireSuccess(SSL_CTX_use_certificate(native, Prepare(*certificate)), errors, "Cannot use the client certificate");
  RequireSuccess(SSL_CTX_use_PrivateKey(native, Crypto::AsImpl(*key).GetNative()), errors,
                 "Cannot use the client certificate's key");
  SSL_CTX_clear_chain_certs(native);
  for (const Ref<const Crypto::Certificate> &intermediate : intermediates) {
    RequireSuccess(SSL_CTX_add1_chain_cert(native, Prepare(*intermediate)), errors,
                   "Cannot use a certificate above the client's");
  }
}

Ref<SSLStream> SSLContextImpl::CreateStream(const Ref<System::Stream> &stream, const std::string &endpoint) {
  return CreateRecordedStream(stream, endpoint, nullptr);
}

Ref<SSLStream> SSLContextImpl::CreateRecordedStream(const Ref<System::Stream> &stream, const std::string &endpoint,
                                                    const std::shared_ptr<HandshakeRecord> &record) {
  const Crypto::OpenSslGuard use;
  use.Require();
  return MakeRef<SSLStreamImpl>(Ref<SSLContextImpl>(this), stream, endpoint, record);
}

ConnectionHandle SSLContextImpl::CreateConnection() const {
  const Crypto::OpenSslErrorScope errors;
  ConnectionHandle connection(SSL_new(m_native.get()));
  if (!connection) {
    throw SSLException(errors.Describe("no TLS connection can be made"));
  }
  return connection;
}

Ref<SSLContext> CreateSSLContext() {
  return MakeRef<SSLContextImpl>();
}

} // namespace Tarvel::Ssl
