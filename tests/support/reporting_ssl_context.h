// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ReportingSslContext`, for tests of how long an SSL context exists.

#pragma once

#include <tarvel/ssl/ssl_context.h>

#include <memory>
#include <string>
#include <utility>

namespace Testing {

/// Does nothing but set `isDestroyed` when it is destroyed.
class ReportingSslContext final : public Tarvel::Ssl::SSLContext {
public:
  explicit ReportingSslContext(std::shared_ptr<bool> isDestroyed) : m_isDestroyed(std::move(isDestroyed)) {}

  void TrustSystemStore() override {}
  void TrustFile(const std::string &) override {}
  void TrustCertificates(const Tarvel::Crypto::CertificateList &) override {}
  void SetClientCertificate(const Tarvel::Ref<const Tarvel::Crypto::Certificate> &,
                            const Tarvel::Ref<const Tarvel::Crypto::PrivateKey> &,
                            const Tarvel::Crypto::CertificateList &) override {}
  Tarvel::Ref<Tarvel::Ssl::SSLStream> CreateStream(const Tarvel::Ref<Tarvel::System::Stream> &,
                                                   const std::string &) override {
    return nullptr;
  }

private:
  ~ReportingSslContext() override { *m_isDestroyed = true; }

  const std::shared_ptr<bool> m_isDestroyed;
};

} // namespace Testing
