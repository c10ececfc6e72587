// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RequestBuilderImpl`, which composes the request of each operation.

#pragma once

#include "compose/soap_envelope.h"
#include "compose/xml_builder.h"
#include "exchange/request_builder.h"

#include <ssoclient/holder_of_key_config.h>
#include <ssoclient/service_dialect.h>

#include <boost/optional.hpp>

namespace SsoClient {

/// Checks the arguments, chooses header, body and signature, and serialises the envelope. Its state does not change, so any
/// number of threads may use one builder.
class RequestBuilderImpl final : public RequestBuilder {
public:
  /// @param holderOfKeyConfig the identity that signs, if there is one; copied
  /// @throws Tarvel::InvalidArgumentException for an identity without key or certificate.
  explicit RequestBuilderImpl(const boost::optional<HolderOfKeyConfig> &holderOfKeyConfig);

  /// @param dialect what the service expects in requests; copied
  /// @param serviceAddress the address of the service, for WS-Addressing
  RequestBuilderImpl(const boost::optional<HolderOfKeyConfig> &holderOfKeyConfig, const ServiceDialect &dialect,
                     const std::string &serviceAddress);

  /// The request is signed when there is an identity and the spec asks for a holder-of-key token that is not delegated.
  /// For a delegated token it is not signed, although its body asks for holder-of-key.
  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive, for a text that XML cannot represent,
  ///         and for a spec that asks for what the dialect never states.
  void BuildUserPassTokenRequest(const std::string &username, const std::string &password, const TokenSpec &spec,
                                 Request &request) const override;

  /// The request is signed in the same cases as that of `BuildUserPassTokenRequest`, and the same exceptions are
  /// thrown.
  void BuildInitialSPNegoRequest(const TokenSpec &spec, const std::vector<std::uint8_t> &leg,
                                 Request &request) const override;

  /// The request is never signed.
  void BuildContinuedSPNegoRequest(const std::string &contextId, const std::vector<std::uint8_t> &leg,
                                   Request &request) const override;

  /// The request is signed with the identity's key.
  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive, a confirmation other than the default,
  ///         and a spec that asks for what the dialect never states.
  /// @throws Tarvel::InvalidStateException without an identity.
  void BuildCertificateTokenRequest(const TokenSpec &spec, Request &request) const override;

  /// The request is signed with the identity's key. The `ds:KeyInfo` of the signature refers to the presented token by
  /// its identifier.
  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive, and for a spec that asks for what the
  ///         dialect never states.
  /// @throws Tarvel::InvalidStateException without an identity.
  void BuildExchangeTokenRequest(const SamlToken &token, const TokenSpec &spec, Request &request) const override;

  /// The request is never signed.
  void BuildValidateSubjectRequest(const SamlToken &token, Request &request) const override;

  /// The request is signed with the identity's key.
  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive, or a token that is not holder-of-key.
  /// @throws Tarvel::InvalidStateException without an identity.
  void BuildRenewRequest(const SamlToken &token, std::int64_t lifetimeSec, Request &request) const override;

  /// @throws Tarvel::InvalidStateException without an identity. The message contains `actionName`.
  void ValidateHokIsConfigured(const std::string &actionName) const;

  /// Holder-of-key when there is an identity and `confirmation` is the default, otherwise bearer.
  SamlToken::ConfirmationType GetEffectiveConfirmationType(TokenSpec::Confirmation confirmation) const;

private:
  /// @throws Tarvel::InvalidArgumentException for a spec that no request can state.
  void ValidateSpec(const TokenSpec &spec) const;
  // The certificate of the identity; null if there is none.
  const Tarvel::Crypto::Certificate *GetCertificate() const;
  /// Sets the body of the request. An earlier body is wiped, because it may be secret, too.
  void SetBody(Request &request, std::string body) const;
  // The header elements of WS-Addressing; empty if the dialect has none.
  HeaderBuilders GetAddressing(const std::string &action) const;
  std::string BuildTokenRequest(TokenSpec::Confirmation confirmation, const XMLBuilderPtr &header,
                                const XMLBuilderPtr &body, const std::string &action) const;
  std::string BuildUnSignedRequest(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                   const std::string &action) const;
  // Callers of these two must make sure that there is an identity.
  std::string BuildCertRefSignedRequest(const XMLBuilderPtr &header, const XMLBuilderPtr &body,
                                        const std::string &action) const;
  std::string BuildSamlRefSignedRequest(const std::string &tokenId, const XMLBuilderPtr &header,
                                        const XMLBuilderPtr &body, const std::string &action) const;

  boost::optional<HolderOfKeyConfig> m_holderOfKeyConfig;
  ServiceDialect m_dialect;
  std::string m_serviceAddress;
};

/// @throws Tarvel::InvalidArgumentException unless `lifetimeSec` is greater than zero.
void ValidateLifetime(std::int64_t lifetimeSec);

/// @throws Tarvel::InvalidArgumentException unless the token is holder-of-key. The message contains `actionName`.
void ValidateTokenIsHok(const SamlToken &token, const std::string &actionName);

/// `CONFIRMATION_NONE` when the spec has a delegate, otherwise the confirmation of the spec.
TokenSpec::Confirmation ConfOverrideWithDelegate(TokenSpec spec);

} // namespace SsoClient
