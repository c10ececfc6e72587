// SPDX-License-Identifier: Apache-2.0
/// @file
/// TLS: what to trust, which certificate to present, and streams over TLS.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/system/stream.h>

#include <cstddef>
#include <functional>
#include <string>

namespace Tarvel::Ssl {

/// A failed handshake or a broken TLS connection. The message contains the host, and the reason in the words of the TLS
/// library.
class TARVEL_API SSLException : public System::NetworkException {
  TARVEL_EXCEPTION_BODY(SSLException, System::NetworkException);
};

/// A TLS layer over a connected stream.
class TARVEL_API SSLStream : public System::Stream {
public:
  /// Called once, on an I/O thread, with null or with the failure, which is valid during the call: an `SSLException`,
  /// also when the stream below failed; an `InvalidStateException` for a second handshake, and when OpenSSL has cleaned
  /// itself up because the process ends; an `OutOfMemoryException`, which says nothing about the server. Like every
  /// completion of a stream, it must not block, nor wait for another operation: start the next one from it.
  using HandshakeHandler = std::function<void(const Exception *)>;

  /// Starts the client handshake. `host` is sent as the server name (unless it is an address). The server's certificate
  /// must be for this host, and chain to what the context trusts.
  /// @param parameter empty, or the SHA-256 thumbprint that the server's certificate must have (64 hexadecimal digits,
  ///        colons optional); it then replaces the checks of chain and name. With any other text the handshake fails.
  virtual void AsyncHandshake(const std::string &host, const std::string &parameter, HandshakeHandler handler) = 0;

  /// After the handshake: whether an earlier session was resumed.
  virtual bool WasResumed() const noexcept = 0;

  /// True: before the handshake nothing is written, and after it everything is encrypted.
  bool IsSecure() const noexcept override { return true; }

protected:
  ~SSLStream() override;
};

/// Settings and remembered sessions for TLS connections: TLS 1.2 or later, only cipher suites with forward secrecy,
/// keys of at least 112 bits of security, peer and host name always verified. No configuration of OpenSSL changes that,
/// and `Crypto::UseSystemConfiguration` can only make it stricter. Set a context up on one thread, then use it on any
/// thread; do not change it while it is in use. A child process made by `fork` may use the contexts of its parent, but
/// has none of their sessions.
///
/// Each function also throws `InvalidStateException` when OpenSSL has cleaned itself up, and `OutOfMemoryException`.
class TARVEL_API SSLContext : public Object {
public:
  /// Adds the system's trust store. @throws Crypto::CryptoException
  virtual void TrustSystemStore() = 0;
  /// Adds the certificates of a PEM file. @throws IOException, Crypto::CryptoException
  virtual void TrustFile(const std::string &path) = 0;
  /// Adds certificates, which are not null. Each is trusted by itself, whether or not it is a root.
  /// @throws Crypto::CryptoException
  virtual void TrustCertificates(const Crypto::CertificateList &certificates) = 0;

  /// Sets the certificate to present when the server requests one, its key, and the certificates between it and the
  /// root.
  /// @throws Crypto::KeyMismatchException, Crypto::CryptoException
  virtual void SetClientCertificate(const Ref<const Crypto::Certificate> &certificate,
                                    const Ref<const Crypto::PrivateKey> &key,
                                    const Crypto::CertificateList &intermediates) = 0;

  /// A TLS stream over `stream`, which is connected. `endpoint` ("host:port") is the key under which the session is
  /// remembered for resumption, when the TLS stream is closed or released.
  virtual Ref<SSLStream> CreateStream(const Ref<System::Stream> &stream, const std::string &endpoint) = 0;

protected:
  ~SSLContext() override;
};

/// A context that trusts nothing yet.
/// @throws Crypto::CryptoException, InvalidStateException when OpenSSL has cleaned itself up, OutOfMemoryException
TARVEL_API Ref<SSLContext> CreateSSLContext();

} // namespace Tarvel::Ssl
