// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SamlTokenImpl`, the implementation of `SamlToken`.

#pragma once

#include "token/token_facts.h"
#include "xml/node_filter_iterator.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/token_details.h>
#include <ssoclient/verify_options.h>
#include <tarvel/xml/security/key_info_resolver.h>
#include <tarvel/xml/security/signature.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace SsoClient {

/// A complete token: its constructors parse, check and verify, or throw what `CreateSamlToken` throws. Make it by
/// `std::make_shared<SamlTokenImpl>`. The shared pointer then calls the destructor of this class, although the
/// interface has no virtual destructor.
class SamlTokenImpl final : public SamlToken {
public:
  /// From a text, which `ToXml` returns unchanged.
  SamlTokenImpl(const std::string &xml, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                const VerifyOptions &options);

  /// From an element. `ToXml` returns its canonical form.
  SamlTokenImpl(const Tarvel::Xml::ElementNode &element, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                const VerifyOptions &options);

  using SamlToken::GetAdvice;
  using SamlToken::GetAudience;
  using SamlToken::GetDelegationChain;
  using SamlToken::GetFullName;
  using SamlToken::GetGroups;

  const std::string &GetId() const override { return m_facts.id; }
  const Tarvel::System::DateTime &GetStartDate() const override { return m_facts.startDate; }
  const Tarvel::System::DateTime &GetEndDate() const override { return m_facts.endDate; }
  const PrincipalId &GetSubject() const override { return m_facts.subject; }
  bool IsRenewable() const override { return m_facts.renewable; }
  bool IsDelegable() const override { return m_facts.delegable; }
  bool IsSolution() const override { return m_facts.solution; }
  ConfirmationType GetConfirmationMethod() const override { return m_facts.confirmationMethod; }
  void GetFullName(std::pair<std::string, std::string> &fullName) const override { fullName = m_facts.fullName; }
  void GetGroups(std::vector<PrincipalId> &groups) const override { groups = m_facts.groups; }
  void GetDelegationChain(std::vector<Delegate> &delegationChain) const override {
    delegationChain = m_facts.delegationChain;
  }
  void GetAudience(std::set<std::string> &audience) const override { audience = m_facts.audience; }
  void GetAdvice(std::vector<Advice> &advice) const override { advice = m_facts.advice; }
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override {
    return m_facts.confirmationCertificate.get();
  }
  const std::string &ToXml() const override { return m_xml; }

  /// The subject's identifier exactly as written.
  NameId GetNameId() const;

  /// The index, in document order, of the confirmation that the verification chose.
  std::size_t GetUsedConfirmation() const noexcept { return m_usedConfirmation; }

  /// The key value of the used confirmation, if it has no certificate: SubjectPublicKeyInfo in DER. Otherwise empty.
  const std::vector<std::uint8_t> &GetConfirmationKeyValue() const noexcept { return m_confirmationKeyValue; }

  /// @throws InvalidSignatureException unless `signature` verifies with one of the keys of `resolver`.
  static void ValidateSignature(const Tarvel::Xml::Security::Signature &signature,
                                const Tarvel::Xml::Security::KeyInfoResolver &resolver);

private:
  void InitializeStrict(NodeFilterIterator &iterator, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                        const VerifyOptions &options);
  void InitializeSaml2(NodeFilterIterator &iterator, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                       const VerifyOptions &options);
  void InitializeFromDom(const Tarvel::Xml::ElementNode *element,
                         const Tarvel::Xml::Security::KeyInfoResolver &resolver, const VerifyOptions &options);

  std::string m_xml;
  TokenFacts m_facts;
  boost::optional<NameId> m_nameId; // empty in the profile STRICT: `m_facts.subject` has it
  std::size_t m_usedConfirmation = 0;
  std::vector<std::uint8_t> m_confirmationKeyValue;
};

} // namespace SsoClient
