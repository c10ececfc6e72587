// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RequestBuilderImpl`, which composes the request of each operation.

#pragma once

#include "compose/xml_builder.h"
#include "exchange/request_builder.h"

#include <ssoclient/holder_of_key_config.h>

#include <boost/optional.hpp>

namespace SsoClient {

/// Checks the arguments, chooses header, body and signature, and serialises the envelope. The only state is the identity
/// that it was made with, so one builder serves any number of threads.
class RequestBuilderImpl final : public RequestBuilder {
public:
  /// @param holderOfKeyConfig the identity to sign with, if there is one; copied
  /// @throws Tarvel::InvalidArgumentException for an identity without key or certificate.
  explicit RequestBuilderImpl(const boost::optional<HolderOfKeyConfig> &holderOfKeyConfig);

  /// Signed when the spec asks for a holder-of-key token and there is an identity, unless the token is delegated: such a
  /// request goes unsigned though its body asks for holder-of-key.
  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive, and for a text that XML cannot carry.
  void BuildUserPassTokenRequest(const std::string &username, const std::string &password, const TokenSpec &spec,
                                 Request &request) const override;

  /// Signed, and @throws, as by user name and password.
  void BuildInitialSPNegoRequest(const TokenSpec &spec, const std::vector<std::uint8_t> &leg,
                                 Request &request) const override;

  /// Never signed.
  void BuildContinuedSPNegoRequest(const std::string &contextId, const std::vector<std::uint8_t> &leg,
                                   Request &request) const override;

  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive, or a confirmation other than the
  ///         default. @throws Tarvel::InvalidStateException without an identity.
  void BuildCertificateTokenRequest(const TokenSpec &spec, Request &request) const override;

  /// Signed with the identity's key, which the presented token is named for.
  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive.
  /// @throws Tarvel::InvalidStateException without an identity.
  void BuildExchangeTokenRequest(const SamlToken &token, const TokenSpec &spec, Request &request) const override;

  /// Never signed.
  void BuildValidateSubjectRequest(const SamlToken &token, Request &request) const override;

  /// @throws Tarvel::InvalidArgumentException for a lifetime that is not positive, or a token that is not holder-of-key.
  /// @throws Tarvel::InvalidStateException without an identity.
  void BuildRenewRequest(const SamlToken &token, std::int64_t lifetimeSec, Request &request) const override;

  /// @throws Tarvel::InvalidStateException without an identity; the message names the action.
  void ValidateHokIsConfigured(const std::string &actionName) const;

  /// Holder-of-key when there is an identity and `confirmation` is the default, bearer in every other case.
  SamlToken::ConfirmationType GetEffectiveConfirmationType(TokenSpec::Confirmation confirmation) const;

private:
  std::string BuildTokenRequest(TokenSpec::Confirmation confirmation, const XMLBuilderPtr &header,
                                const XMLBuilderPtr &body) const;
  std::string BuildUnSignedRequest(const XMLBuilderPtr &header, const XMLBuilderPtr &body) const;
  // The callers of these two have made sure that there is an identity.
  std::string BuildCertRefSignedRequest(const XMLBuilderPtr &header, const XMLBuilderPtr &body) const;
  std::string BuildSamlRefSignedRequest(const std::string &tokenId, const XMLBuilderPtr &header,
                                        const XMLBuilderPtr &body) const;

  boost::optional<HolderOfKeyConfig> m_holderOfKeyConfig;
};

/// @throws Tarvel::InvalidArgumentException unless `lifetimeSec` is greater than zero.
void ValidateLifetime(std::int64_t lifetimeSec);

/// @throws Tarvel::InvalidArgumentException unless the token is holder-of-key; the message names the action.
void ValidateTokenIsHok(const SamlToken &token, const std::string &actionName);

/// `CONFIRMATION_NONE` for a token that is to be delegated, else what the spec says.
TokenSpec::Confirmation ConfOverrideWithDelegate(TokenSpec spec);

} // namespace SsoClient
