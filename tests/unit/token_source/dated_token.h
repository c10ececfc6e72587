// SPDX-License-Identifier: Apache-2.0
/// @file
/// `DatedToken`, a token with the identifier, dates and kind that a test chooses.

#pragma once

#include <ssoclient/saml_token.h>

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <utility>

namespace Testing {

class DatedToken final : public SsoClient::SamlToken {
public:
  enum class Kind { BEARER, RENEWABLE };

  /// @param start in microseconds since 1970, UTC, like `end`
  DatedToken(std::string id, std::int64_t start, std::int64_t end, Kind kind = Kind::BEARER)
      : m_id(std::move(id)), m_xml("<" + m_id + ">"), m_start(Tarvel::System::DateTimeFromUtc(start, false)),
        m_end(Tarvel::System::DateTimeFromUtc(end, false)), m_kind(kind) {
    ++Alive();
  }
  DatedToken(const DatedToken &) = delete;
  DatedToken &operator=(const DatedToken &) = delete;
  ~DatedToken() { --Alive(); }

  /// How many tokens exist.
  static std::atomic<int> &Alive() {
    static std::atomic<int> alive{0};
    return alive;
  }

  const std::string &GetId() const override { return m_id; }
  const Tarvel::System::DateTime &GetStartDate() const override { return m_start; }
  const Tarvel::System::DateTime &GetEndDate() const override { return m_end; }
  const SsoClient::PrincipalId &GetSubject() const override { return m_subject; }
  bool IsRenewable() const override { return m_kind == Kind::RENEWABLE; }
  bool IsDelegable() const override { return false; }
  bool IsSolution() const override { return false; }
  ConfirmationType GetConfirmationMethod() const override { return m_kind == Kind::RENEWABLE ? HOLDER_OF_KEY : BEARER; }
  void GetFullName(std::pair<std::string, std::string> &fullName) const override { fullName = {}; }
  void GetGroups(std::vector<SsoClient::PrincipalId> &groups) const override { groups.clear(); }
  void GetDelegationChain(std::vector<SsoClient::Delegate> &chain) const override { chain.clear(); }
  void GetAudience(std::set<std::string> &audience) const override { audience.clear(); }
  void GetAdvice(std::vector<SsoClient::Advice> &advice) const override { advice.clear(); }
  const Tarvel::Crypto::Certificate *GetConfirmationCertificate() const override { return nullptr; }
  const std::string &ToXml() const override { return m_xml; }

private:
  const std::string m_id;
  const std::string m_xml;
  const Tarvel::System::DateTime m_start;
  const Tarvel::System::DateTime m_end;
  const Kind m_kind;
  const SsoClient::PrincipalId m_subject;
};

} // namespace Testing
