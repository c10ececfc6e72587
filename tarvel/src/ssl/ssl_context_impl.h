// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one implementation of `SSLContext`, with an `SSL_CTX` of OpenSSL.

#pragma once

#include "ssl/session_cache.h"
#include "ssl/ssl_handles.h"

#include <tarvel/ssl/ssl_context.h>

#include <memory>
#include <string>

namespace Tarvel::Ssl {

class HandshakeRecord;

class SSLContextImpl final : public SSLContext {
public:
  /// Throws the same exceptions as `CreateSSLContext`.
  SSLContextImpl();

  void TrustSystemStore() override;
  void TrustFile(const std::string &path) override;
  void TrustCertificates(const Crypto::CertificateList &certificates) override;
  void SetClientCertificate(const Ref<const Crypto::Certificate> &certificate, const Ref<const Crypto::PrivateKey> &key,
                            const Crypto::CertificateList &intermediates) override;
  Ref<SSLStream> CreateStream(const Ref<System::Stream> &stream, const std::string &endpoint) override;

  /// The same as `CreateStream`, with a record of the handshake; null for none.
  Ref<SSLStream> CreateRecordedStream(const Ref<System::Stream> &stream, const std::string &endpoint,
                                      const std::shared_ptr<HandshakeRecord> &record);

  /// A connection with this context's settings.
  /// @throws SSLException; the message is the reason. @throws OutOfMemoryException
  ConnectionHandle CreateConnection() const;

  SessionCache &GetSessions() noexcept { return m_sessions; }

private:
  ~SSLContextImpl() override;

  ContextHandle m_native;
  SessionCache m_sessions;
};

} // namespace Tarvel::Ssl
