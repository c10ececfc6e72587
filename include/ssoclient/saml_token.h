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

/// A parsed, checked and verified token. Immutable: any number of threads may read it. Always held by a shared pointer
/// to const that `CreateSamlToken` or an operation of the service made; the interface itself cannot be deleted through.
/// What is returned by reference or pointer belongs to the token and is good as long as the token.
class SSOCLIENT_API SamlToken {
public:
  /// How the bearer of the token proves to be its subject.
  enum ConfirmationType : std::int32_t {
    BEARER = 0,       ///< urn:oasis:names:tc:SAML:2.0:cm:bearer
    HOLDER_OF_KEY = 1 ///< urn:oasis:names:tc:SAML:2.0:cm:holder-of-key
  };

  /// The assertion's identifier.
  virtual const std::string &GetId() const = 0;

  /// The validity window: from the start on, and before the end.
  virtual const Tarvel::System::DateTime &GetStartDate() const = 0;
  virtual const Tarvel::System::DateTime &GetEndDate() const = 0;

  virtual const PrincipalId &GetSubject() const = 0;

  virtual bool IsRenewable() const = 0;
  virtual bool IsDelegable() const = 0;

  /// Whether the token says that its subject is a solution rather than a person.
  virtual bool IsSolution() const = 0;

  virtual ConfirmationType GetConfirmationMethod() const = 0;

  /// Replaces `fullName` by the first name and the last name; each is empty when the token does not tell it.
  virtual void GetFullName(std::pair<std::string, std::string> &fullName) const = 0;

  /// Replaces `groups` by the groups that the subject belongs to.
  virtual void GetGroups(std::vector<PrincipalId> &groups) const = 0;

  /// Replaces `delegationChain` by the principals that the token was delegated to, the first one first.
  virtual void GetDelegationChain(std::vector<Delegate> &delegationChain) const = 0;

  /// Replaces `audience` by the audiences that the token is restricted to; empty means no restriction.
  virtual void GetAudience(std::set<std::string> &audience) const = 0;

  /// Replaces `advice` by the advice that the token carries.
  virtual void GetAdvice(std::vector<Advice> &advice) const = 0;

  /// The certificate whose key the bearer of a holder-of-key token must prove to hold; null for a bearer token.
  virtual const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const = 0;

  /// The token's XML, fit to be sent to the service again. A bearer token's is a secret: whoever has it can use it.
  virtual const std::string &ToXml() const = 0;

protected:
  SamlToken() = default;
  SamlToken(const SamlToken &) = default;
  SamlToken &operator=(const SamlToken &) = default;
  ~SamlToken() = default;
};

} // namespace SsoClient
