// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenStandIn`, a token whose text, identifier and confirmation a test chooses.

#pragma once

#include <ssoclient/saml_token.h>

#include <string>
#include <utility>

namespace Testing {

class TokenStandIn final : public SsoClient::SamlToken {
public:
  TokenStandIn(std::string id, std::string xml, ConfirmationType confirmation)
      : m_id(std::move(id)), m_xml(std::move(xml)), m_confirmation(confirmation) {}

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
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override { return nullptr; }
  const std::string &ToXml() const override { return m_xml; }

private:
  std::string m_id;
  std::string m_xml;
  ConfirmationType m_confirmation;
  Tarvel::System::DateTime m_date;
  SsoClient::PrincipalId m_subject;
};

} // namespace Testing
