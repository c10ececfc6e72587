// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ClientCore`, what a `TokenClient` and its operations share.

#pragma once

#include "client/time_source.h"
#include "operation/token_steps.h"
#include "transport/transport.h"

#include <ssoclient/client/call_options.h>
#include <ssoclient/client/token_client.h>
#include <ssoclient/security_token_service_config.h>
#include <tarvel/core/fork_safe_mutex.h>

#include <exception>
#include <list>
#include <memory>
#include <string>

namespace SsoClient {

class ClientOperation;

/// The operations of a client that are under way.
using OperationList = std::list<std::shared_ptr<ClientOperation>>;

/// Has the collaborators of a client and the list of its operations. The client and its operations share it. Safe on
/// any thread.
class ClientCore {
public:
  /// The objects that tests replace.
  struct Collaborators {
    std::shared_ptr<const RequestBuilder> requestBuilder;
    std::shared_ptr<const Transport> transport;
    std::shared_ptr<const ResponseHandler> responseHandler;
    const TimeSource *time = &GetSystemTimeSource(); ///< not owned
  };

  /// @throws Tarvel::InvalidArgumentException for options that are not valid.
  ClientCore(const SecurityTokenServiceConfig &config, const ClientOptions &options, Collaborators collaborators);
  ClientCore(const ClientCore &) = delete;
  ClientCore &operator=(const ClientCore &) = delete;
  ~ClientCore();

  /// The steps of an operation: the client's own, unless the call has a dialect or verify options.
  /// @throws Tarvel::InvalidArgumentException for a dialect or for verify options that are not valid.
  std::shared_ptr<const TokenSteps> GetSteps(const CallOptions &options) const;

  const Transport &GetTransport() const noexcept { return *m_transport; }
  const TimeSource &GetTime() const noexcept { return *m_time; }
  const ClientOptions &GetOptions() const noexcept { return m_options; }

  const std::string &GetServiceUrl() const noexcept { return m_serviceUrl; }
  /// "" without an identity, otherwise the SHA-256 thumbprint of its certificate.
  std::string GetIdentityThumbprint() const;
  /// What the options determine about the tokens that the service issues and the client accepts, as one line of text.
  std::string DescribeOptions() const;
  /// The token in `xml`, verified with the client's options.
  /// @throws what `TokenVerifier::Verify` throws.
  std::shared_ptr<const SamlToken> Verify(const std::string &xml) const;

  /// Lists `operation` until `Remove`. @return false, and lists nothing, when the client has been destroyed.
  bool Add(const std::shared_ptr<ClientOperation> &operation);
  /// Does nothing when the operation is not listed.
  void Remove(ClientOperation &operation) noexcept;

  /// The client is being destroyed: cancels its operations. Those that start later are cancelled, too.
  void Close() noexcept;

private:
  /// In a child of `fork`, the operations of the parent are kept for ever, because what they share must not be touched.
  void ForgetParent() noexcept;

  const std::string m_serviceUrl;
  const boost::optional<HolderOfKeyConfig> m_identity;
  const Tarvel::Crypto::CertificateList m_signingCertificates;
  const ClientOptions m_options;
  const std::shared_ptr<const Transport> m_transport;
  const TimeSource *const m_time;
  const std::shared_ptr<const RequestBuilder> m_requestBuilder;
  const std::shared_ptr<const ResponseHandler> m_responseHandler;
  const std::shared_ptr<const ReturnedTokens> m_returnedTokens;
  const std::shared_ptr<const TokenSteps> m_steps;

  Tarvel::ForkSafeMutex m_mutex; // guards what follows
  unsigned m_generation;
  bool m_isClosed = false;
  OperationList m_operations;
};

} // namespace SsoClient
