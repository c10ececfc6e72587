// SPDX-License-Identifier: Apache-2.0
/// @file
/// A client's TLS connection to the scripted server, driven step by step.

#pragma once

#include "support/completion.h"
#include "support/data_file.h"
#include "support/scripted_server.h"

#include <tarvel/ssl/ssl_context.h>

#include <stdexcept>
#include <string>

namespace Testing {

inline std::string TlsPath(const std::string &name) {
  return DataPath("tls/" + name);
}

inline Tarvel::Ref<const Tarvel::Crypto::Certificate> TlsCertificate(const std::string &name) {
  return Tarvel::Crypto::LoadCertificates(TlsPath(name + ".crt")).front();
}

/// A context that trusts the authority of tests/data/tls.
inline Tarvel::Ref<Tarvel::Ssl::SSLContext> CreateTrustingContext() {
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(TlsPath("authority.crt"));
  return context;
}

/// Each step waits until it has ended, and returns the message of its failure or an empty text.
class TlsClient {
public:
  /// Connects to the server, without a handshake.
  TlsClient(const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context, int port) {
    const Tarvel::Ref<Tarvel::System::TcpClientSocket> socket = Tarvel::System::CreateTcpClientSocket();
    Completion connected;
    socket->AsyncConnect("127.0.0.1", port, connected.ForEnd());
    if (const std::string failure = connected.GetMessage(); !failure.empty()) {
      throw std::runtime_error(failure);
    }
    m_stream = context->CreateStream(socket, "127.0.0.1:" + std::to_string(port));
  }
  TlsClient(const TlsClient &) = delete;
  TlsClient &operator=(const TlsClient &) = delete;

  std::string Handshake(const std::string &host = "localhost", const std::string &parameter = "") {
    m_handshake = Completion();
    m_stream->AsyncHandshake(host, parameter, m_handshake.ForEnd());
    return m_handshake.GetMessage();
  }
  bool FailedInHandshake() const { return m_handshake.FailedWith<Tarvel::Ssl::SSLException>(); }

  std::string Write(const std::string &bytes) {
    Completion written;
    m_stream->AsyncWrite(bytes.data(), bytes.size(), written.ForTransfer());
    return written.GetMessage();
  }

  /// The bytes that were read, empty at the end of the connection; or the message of the failure.
  std::string Read() {
    std::string bytes(65536, '\0');
    Completion read;
    m_stream->AsyncReadSome(bytes.data(), bytes.size(), read.ForTransfer());
    const std::string failure = read.GetMessage();
    m_hasFailed = !failure.empty();
    if (m_hasFailed) {
      return failure;
    }
    bytes.resize(read.GetCount());
    return bytes;
  }
  /// Whether the last read failed.
  bool HasFailed() const noexcept { return m_hasFailed; }

  const Tarvel::Ref<Tarvel::Ssl::SSLStream> &GetStream() const noexcept { return m_stream; }

private:
  Tarvel::Ref<Tarvel::Ssl::SSLStream> m_stream;
  Completion m_handshake;
  bool m_hasFailed = false;
};

} // namespace Testing
