// SPDX-License-Identifier: Apache-2.0

#include "transport/connection_spec_impl.h"

#include <ssoclient/connection_spec.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/message_formatter.h>

#include <new>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Exception;
using Tarvel::MessageFormatter;
using Tarvel::Ref;
using Tarvel::Http::ConnectionSpec;
using Tarvel::Ssl::SSLContext;
using Tarvel::Ssl::SSLStream;
using Tarvel::System::ScheduledItem;
using Tarvel::System::Stream;
using Tarvel::System::TcpClientSocket;

/// What is needed to make a TLS stream over a connected socket.
struct TlsLayer {
  std::string targetHost;
  std::string endpoint; // the key under which the TLS session is kept
  Ref<SSLContext> context;
  std::string parameter;
};

void StartHandshake(const TlsLayer &layer, const Ref<Stream> &socket,
                    const ConnectionSpec::ConnectCompletion &completion) {
  if (!layer.context) {
    throw Tarvel::InvalidArgumentException("an SSL connection needs an SSLContext.");
  }
  const Ref<SSLStream> stream = layer.context->CreateStream(socket, layer.endpoint);
  stream->AsyncHandshake(layer.targetHost, layer.parameter,
                         [completion, stream](const Exception *failure) { completion(stream, failure); });
}

[[noreturn]] void ThrowForeignFailure(const std::string &endpoint, const char *text) {
  throw Tarvel::InvalidStateException("The connection to " + endpoint + " failed: " + text);
}

/// Like `StartHandshake`, but throws only `Tarvel::Exception` and `std::bad_alloc`: exceptions of other classes are
/// replaced.
void StartHandshakeOrThrowOurs(const TlsLayer &layer, const Ref<Stream> &socket,
                               const ConnectionSpec::ConnectCompletion &completion) {
  try {
    StartHandshake(layer, socket, completion);
  } catch (const Exception &) {
    throw;
  } catch (const std::bad_alloc &) {
    throw;
  } catch (const std::exception &exception) {
    ThrowForeignFailure(layer.endpoint, exception.what());
  } catch (...) {
    ThrowForeignFailure(layer.endpoint, "an object that is not an exception was thrown");
  }
}

/// Runs on an I/O thread. If it threw an exception, the completion would never be called.
void OnSocketConnected(const TlsLayer &layer, const Ref<Stream> &socket, const Exception *failure,
                       const ConnectionSpec::ConnectCompletion &completion) {
  if (failure) {
    completion(socket, failure);
    return;
  }
  try {
    StartHandshakeOrThrowOurs(layer, socket, completion);
  } catch (const Exception &exception) {
    completion(socket, &exception);
  } catch (const std::bad_alloc &) {
    const Tarvel::OutOfMemoryException noMemory;
    completion(socket, &noMemory);
  }
}

} // namespace

SsoCustomConnectionSpecImpl::SsoCustomConnectionSpecImpl(const std::string &host, std::int32_t port,
                                                         bool useDomainControllerName)
    : m_host(host), m_port(port), m_useDomainControllerName(useDomainControllerName) {}

std::string SsoCustomConnectionSpecImpl::ToString() const {
  return MessageFormatter::ASPrint("<cs p:%1, SsoCustomConnectionSpec:%2>", this, GetEndpointString());
}

std::string SsoCustomConnectionSpecImpl::GetHost() const {
  return m_host;
}

std::string SsoCustomConnectionSpecImpl::GetEndpointString() const {
  return MessageFormatter::ASPrint("%1:%2", m_host, m_port);
}

bool SsoCustomConnectionSpecImpl::IsReuseOnAuthErrorSupported() const {
  return false;
}

Ref<ScheduledItem> SsoCustomConnectionSpecImpl::AsyncConnect(ConnectCompletion completion) const {
  const Ref<TcpClientSocket> socket = Tarvel::System::CreateTcpClientSocket();
  // Made first, so that nothing can throw after the connection has been started.
  Ref<ScheduledItem> canceller = Tarvel::System::CreateStreamCanceller(socket);
  socket->AsyncConnect(
      GetConnectionTargetHost(), m_port,
      [socket, completion = std::move(completion)](const Exception *failure) { completion(socket, failure); });
  return canceller;
}

std::string SsoCustomConnectionSpecImpl::GetConnectionTargetHost() const {
  if (m_useDomainControllerName) {
    if (std::string name = GetOstrelDCName(); !name.empty()) {
      return name;
    }
  }
  return m_host;
}

SsoCustomSslConnectionSpecImpl::SsoCustomSslConnectionSpecImpl(const Ref<SSLContext> &context,
                                                               const std::string &parameter,
                                                               const Ref<SsoCustomConnectionSpecImpl> &inner)
    : m_context(context), m_parameter(parameter), m_inner(inner) {}

std::string SsoCustomSslConnectionSpecImpl::ToString() const {
  return m_inner->ToString();
}

std::string SsoCustomSslConnectionSpecImpl::GetHost() const {
  return m_inner->GetHost();
}

std::string SsoCustomSslConnectionSpecImpl::GetEndpointString() const {
  return m_inner->GetEndpointString();
}

bool SsoCustomSslConnectionSpecImpl::IsReuseOnAuthErrorSupported() const {
  return m_inner->IsReuseOnAuthErrorSupported();
}

Ref<ScheduledItem> SsoCustomSslConnectionSpecImpl::AsyncConnect(ConnectCompletion completion) const {
  TlsLayer layer{m_inner->GetConnectionTargetHost(), GetEndpointString(), m_context, m_parameter};
  return m_inner->AsyncConnect([layer = std::move(layer), completion = std::move(completion)](
                                   const Ref<Stream> &socket, const Exception *failure) {
    OnSocketConnected(layer, socket, failure, completion);
  });
}

Ref<ConnectionSpec> CreateSsoConnectionSpec(const std::string &host, int port, bool useDomainControllerName) {
  return Tarvel::MakeRef<SsoCustomConnectionSpecImpl>(host, port, useDomainControllerName);
}

void CreateSsoConnectionSpec(const std::string &host, int port, bool useDomainControllerName,
                             Ref<ConnectionSpec> &out) {
  out = CreateSsoConnectionSpec(host, port, useDomainControllerName);
}

Ref<ConnectionSpec> CreateSsoSSLConnectionSpec(const std::string &host, int port, const Ref<SSLContext> &context,
                                               const std::string &parameter, bool useDomainControllerName) {
  const auto inner = Tarvel::MakeRef<SsoCustomConnectionSpecImpl>(host, port, useDomainControllerName);
  return Tarvel::MakeRef<SsoCustomSslConnectionSpecImpl>(context, parameter, inner);
}

void CreateSsoSSLConnectionSpec(const std::string &host, int port, const Ref<SSLContext> &context,
                                const std::string &parameter, bool useDomainControllerName, Ref<ConnectionSpec> &out) {
  out = CreateSsoSSLConnectionSpec(host, port, context, parameter, useDomainControllerName);
}

std::string GetOstrelDCName() {
  return {};
}

} // namespace SsoClient
