// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SamlToken`, the read-only view of a verified SAML 2.0 token.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/delegate.h>
#include <ssoclient/export.h>
#include <ssoclient/principal_id.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>

#include <cstdint>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// A parsed, checked and verified token. Immutable: any number of threads may read it. It is always owned by the shared
/// pointer to const that `CreateSamlToken` or an operation of the service returned; a pointer to this interface cannot
/// be deleted. What is returned by reference or pointer belongs to the token and is valid as long as the token.
class SSOCLIENT_API SamlToken {
public:
  /// How the sender of the token proves that it is the subject.
  enum ConfirmationType : std::int32_t {
    BEARER = 0,       ///< urn:oasis:names:tc:SAML:2.0:cm:bearer
    HOLDER_OF_KEY = 1 ///< urn:oasis:names:tc:SAML:2.0:cm:holder-of-key
  };

  /// The assertion's identifier.
  virtual const std::string &GetId() const = 0;

  /// The first moment at which the token is valid.
  virtual const Tarvel::System::DateTime &GetStartDate() const = 0;

  /// The first moment at which the token is no longer valid.
  virtual const Tarvel::System::DateTime &GetEndDate() const = 0;

  /// The principal that the token is about.
  virtual const PrincipalId &GetSubject() const = 0;

  /// Whether the token may be renewed.
  virtual bool IsRenewable() const = 0;

  /// Whether the token may be delegated.
  virtual bool IsDelegable() const = 0;

  /// Whether the token states that its subject is a solution and not a person.
  virtual bool IsSolution() const = 0;

  /// Whether the token is a bearer or a holder-of-key token.
  virtual ConfirmationType GetConfirmationMethod() const = 0;

  /// Sets `fullName` to the first name and the last name. Each is empty when the token does not contain it.
  virtual void GetFullName(std::pair<std::string, std::string> &fullName) const = 0;

  /// The same, returned.
  std::pair<std::string, std::string> GetFullName() const;

  /// Sets `groups` to the groups to which the subject belongs.
  virtual void GetGroups(std::vector<PrincipalId> &groups) const = 0;

  /// The same, returned.
  std::vector<PrincipalId> GetGroups() const;

  /// Sets `delegationChain` to the principals to which the token was delegated, in the order of the delegations.
  virtual void GetDelegationChain(std::vector<Delegate> &delegationChain) const = 0;

  /// The same, returned.
  std::vector<Delegate> GetDelegationChain() const;

  /// Sets `audience` to the audiences to which the token is restricted. Empty means no restriction. With several
  /// restrictions (only in the profile SAML2), these are the audiences that all of the restrictions have. If they have
  /// none in common, the only entry is a text that lists the restrictions and is not the address of any service.
  virtual void GetAudience(std::set<std::string> &audience) const = 0;

  /// The same, returned.
  std::set<std::string> GetAudience() const;

  /// Sets `advice` to the advice in the token.
  virtual void GetAdvice(std::vector<Advice> &advice) const = 0;

  /// The same, returned.
  std::vector<Advice> GetAdvice() const;

  /// The certificate of a holder-of-key token: its sender must prove possession of the private key. Null for a bearer
  /// token, and for a holder-of-key token that states a key without a certificate. Only the profile SAML2 accepts such a
  /// token; `GetTokenDetails` has its key.
  virtual const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const = 0;

  /// The token's XML, which can be sent to a service. The XML of a bearer token is secret: anyone who has it can use
  /// the token.
  virtual const std::string &ToXml() const = 0;

protected:
  SamlToken() = default;
  SamlToken(const SamlToken &) = default;
  SamlToken &operator=(const SamlToken &) = default;
  ~SamlToken() = default;
};

} // namespace SsoClient
