// SPDX-License-Identifier: Apache-2.0
/// @file
/// The connection specifications of the client: plain TCP, and TLS over it.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/http/connection_spec.h>
#include <tarvel/ssl/ssl_context.h>
#include <tarvel/system/scheduled_item.h>
#include <tarvel/system/stream.h>

#include <cstdint>
#include <functional>
#include <string>

namespace SsoClient {

class SsoCustomConnectionSpecImpl final : public Tarvel::Http::CustomConnectionSpec {
public:
  SsoCustomConnectionSpecImpl(const std::string &host, std::int32_t port, bool useDomainControllerName);

  std::string ToString() const override;
  std::string GetHost() const override;
  std::string GetEndpointString() const override;
  bool IsReuseOnAuthErrorSupported() const override;
  Tarvel::Ref<Tarvel::System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override;

  /// The host to connect to: the name of the domain controller if it is asked for and known, otherwise the given host.
  std::string GetConnectionTargetHost() const;

private:
  ~SsoCustomConnectionSpecImpl() override = default;

  const std::string m_host;
  const std::int32_t m_port;
  const bool m_useDomainControllerName;
};

class SsoCustomSslConnectionSpecImpl final : public Tarvel::Http::CustomConnectionSpec {
public:
  SsoCustomSslConnectionSpecImpl(const Tarvel::Ref<Tarvel::Ssl::SSLContext> &context, const std::string &parameter,
                                 const Tarvel::Ref<SsoCustomConnectionSpecImpl> &inner);

  std::string ToString() const override;
  std::string GetHost() const override;
  std::string GetEndpointString() const override;
  bool IsReuseOnAuthErrorSupported() const override;
  /// The item also cancels the handshake. If the socket was connected, the completion gets a `Tarvel::Ssl::SSLStream`,
  /// even if the handshake failed.
  Tarvel::Ref<Tarvel::System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const override;

private:
  ~SsoCustomSslConnectionSpecImpl() override = default;

  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context;
  const std::string m_parameter;
  const Tarvel::Ref<SsoCustomConnectionSpecImpl> m_inner;
};

} // namespace SsoClient
