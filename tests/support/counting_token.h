// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CountingToken`, a token full of secrets that counts how often it is described.

#pragma once

#include <ssoclient/saml_token.h>

#include <atomic>
#include <string>

namespace Testing {

/// Each text that must not be logged begins with "secret".
class CountingToken final : public SsoClient::SamlToken {
public:
  int CountCalls() const { return m_calls; }

  const std::string &GetId() const override { return Counted(m_id); }
  const Tarvel::System::DateTime &GetStartDate() const override { return Counted(m_date); }
  const Tarvel::System::DateTime &GetEndDate() const override { return Counted(m_date); }
  const SsoClient::PrincipalId &GetSubject() const override { return Counted(m_subject); }
  bool IsRenewable() const override { return Counted(m_flag); }
  bool IsDelegable() const override { return Counted(m_flag); }
  bool IsSolution() const override { return Counted(m_flag); }
  ConfirmationType GetConfirmationMethod() const override { return Counted(m_confirmation); }
  void GetFullName(std::pair<std::string, std::string> &fullName) const override {
    fullName = {Counted(m_id), "secret last name"};
  }
  void GetGroups(std::vector<SsoClient::PrincipalId> &groups) const override { groups = {Counted(m_subject)}; }
  void GetDelegationChain(std::vector<SsoClient::Delegate> &chain) const override {
    chain = {{Counted(m_subject), m_date}};
  }
  void GetAudience(std::set<std::string> &audience) const override { audience = {Counted(m_id)}; }
  void GetAdvice(std::vector<SsoClient::Advice> &advice) const override { advice = {{Counted(m_id), {}}}; }
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override {
    ++m_calls;
    return nullptr;
  }
  const std::string &ToXml() const override { return Counted(m_xml); }

private:
  template <typename T>
  const T &Counted(const T &value) const {
    ++m_calls;
    return value;
  }

  mutable std::atomic<int> m_calls{0};
  const std::string m_id = "secret id";
  const std::string m_xml = "secret XML";
  const SsoClient::PrincipalId m_subject{"bob", "corp.example"};
  const Tarvel::System::DateTime m_date{"2026-01-02T03:04:05.006Z"};
  const bool m_flag = true;
  const ConfirmationType m_confirmation = HOLDER_OF_KEY;
};

/// The description of a `CountingToken` that a log line may have.
constexpr const char *COUNTING_TOKEN_DESCRIPTION =
    "SamlToken [subject={Name: bob; Domain:corp.example}, groups=[{Name: bob; Domain:corp.example}], "
    "delegationChain=[{Name: bob; Domain:corp.example} at 2026-01-02T03:04:05.006Z], "
    "startTime=2026-01-02T03:04:05.006Z, expirationTime=2026-01-02T03:04:05.006Z, renewable=true, delegable=true, "
    "isSolution=true,confirmationType=1]";

} // namespace Testing
