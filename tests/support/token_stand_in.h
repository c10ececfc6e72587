// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenStandIn`, a token whose text, identifier, confirmation and certificate a test chooses.

#pragma once

#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>

#include <string>
#include <utility>

namespace Testing {

class TokenStandIn final : public SsoClient::SamlToken {
public:
  TokenStandIn(std::string id, std::string xml, ConfirmationType confirmation,
               Tarvel::Ref<const Tarvel::Crypto::Certificate> certificate = {})
      : m_id(std::move(id)), m_xml(std::move(xml)), m_confirmation(confirmation),
        m_certificate(std::move(certificate)) {}

  const std::string &GetId() const override { return m_id; }
  const Tarvel::System::DateTime &GetStartDate() const override { return m_date; }
  const Tarvel::System::DateTime &GetEndDate() const override { return m_date; }
  const SsoClient::PrincipalId &GetSubject() const override { return m_subject; }
  bool IsRenewable() const override { return false; }
  bool IsDelegable() const override { return false; }
  bool IsSolution() const override { return false; }
  ConfirmationType GetConfirmationMethod() const override { return m_confirmation; }
  void GetFullName(std::pair<std::string, std::string> &fullName) const override { fullName = {}; }
  void GetGroups(std::vector<SsoClient::PrincipalId> &groups) const override { groups.clear(); }
  void GetDelegationChain(std::vector<SsoClient::Delegate> &chain) const override { chain.clear(); }
  void GetAudience(std::set<std::string> &audience) const override { audience.clear(); }
  void GetAdvice(std::vector<SsoClient::Advice> &advice) const override { advice.clear(); }
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override { return m_certificate.get(); }
  const std::string &ToXml() const override { return m_xml; }

private:
  std::string m_id;
  std::string m_xml;
  ConfirmationType m_confirmation;
  Tarvel::Ref<const Tarvel::Crypto::Certificate> m_certificate;
  Tarvel::System::DateTime m_date;
  SsoClient::PrincipalId m_subject;
};

} // namespace Testing
