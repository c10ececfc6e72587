// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SamlTokenImpl`, the one implementation of `SamlToken`.

#pragma once

#include "token/assertion_model.h"

#include <ssoclient/saml_token.h>
#include <tarvel/xml/security/key_info_resolver.h>
#include <tarvel/xml/security/signature.h>

namespace SsoClient {

/// A token that is complete: its constructors parse, check and verify, or throw as `CreateSamlToken` says. It is made by
/// `std::make_shared<SamlTokenImpl>`, so that its destructor is found although the interface has no virtual one.
class SamlTokenImpl final : public SamlToken {
public:
  /// From text, which `ToXml` gives back as it is.
  SamlTokenImpl(const std::string &xml, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                std::int64_t clockToleranceSec);

  /// From an element, whose canonical form `ToXml` gives.
  SamlTokenImpl(const Tarvel::Xml::ElementNode &element, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                std::int64_t clockToleranceSec);

  const std::string &GetId() const override { return m_id; }
  const Tarvel::System::DateTime &GetStartDate() const override { return m_startDate; }
  const Tarvel::System::DateTime &GetEndDate() const override { return m_endDate; }
  const PrincipalId &GetSubject() const override { return m_subject; }
  bool IsRenewable() const override { return m_renewable; }
  bool IsDelegable() const override { return m_delegable; }
  bool IsSolution() const override { return m_solution; }
  ConfirmationType GetConfirmationMethod() const override { return m_confirmationMethod; }
  void GetFullName(std::pair<std::string, std::string> &fullName) const override { fullName = m_fullName; }
  void GetGroups(std::vector<PrincipalId> &groups) const override { groups = m_groups; }
  void GetDelegationChain(std::vector<Delegate> &delegationChain) const override {
    delegationChain = m_delegationChain;
  }
  void GetAudience(std::set<std::string> &audience) const override { audience = m_audience; }
  void GetAdvice(std::vector<Advice> &advice) const override { advice = m_advice; }
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override {
    return m_confirmationCertificate.get();
  }
  const std::string &ToXml() const override { return m_xml; }

  /// @throws InvalidSignatureException unless `signature` verifies with a key that `resolver` names.
  static void ValidateSignature(const Tarvel::Xml::Security::Signature &signature,
                                const Tarvel::Xml::Security::KeyInfoResolver &resolver);

private:
  void InitializeFromDom(const Tarvel::Xml::ElementNode *element,
                         const Tarvel::Xml::Security::KeyInfoResolver &resolver, std::int64_t clockToleranceSec);
  void PopulateSubject(SubjectType &subject);
  void PopulateConditions(ConditionsType &conditions);
  void PopulateTokenAttribute(const AttributeType &attribute);

  std::string m_xml;
  std::string m_id;
  Tarvel::System::DateTime m_startDate;
  Tarvel::System::DateTime m_endDate;
  PrincipalId m_subject;
  bool m_renewable = false;
  bool m_delegable = false;
  bool m_solution = false;
  std::pair<std::string, std::string> m_fullName;
  std::vector<PrincipalId> m_groups;
  std::vector<Delegate> m_delegationChain;
  std::set<std::string> m_audience;
  std::vector<Advice> m_advice;
  ConfirmationType m_confirmationMethod = BEARER;
  Tarvel::Ref<const Tarvel::Crypto::Certificate> m_confirmationCertificate;
};

} // namespace SsoClient
