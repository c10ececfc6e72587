// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/security/key_info_resolver.h>

#include "xml/security/key_info_certificates.h"

#include <tarvel/core/string_util.h>

#include <algorithm>
#include <string>
#include <utility>

namespace Tarvel::Xml::Security {

namespace {

/// `text` without white space; empty if more than `most` characters remain, so that a long text takes little memory.
std::string WithoutWhiteSpace(std::string_view text, std::size_t most) {
  std::string compact;
  for (const char character : text) {
    if (character == '\n' || character == '\r' || character == ' ' || character == '\t') {
      continue;
    }
    if (compact.size() == most) {
      return std::string();
    }
    compact += character;
  }
  return compact;
}

class TrustSetKeyResolver final : public KeyInfoResolver {
public:
  explicit TrustSetKeyResolver(const CertificateList &trusted) : m_trusted(DistinctCertificates(trusted)) {
    if (m_trusted.size() < 2) {
      return; // there is nothing to choose from
    }
    m_base64.reserve(m_trusted.size());
    for (const Ref<const Crypto::Certificate> &certificate : m_trusted) {
      m_base64.push_back(StringUtil::Base64Encode(certificate->GetDer()));
      m_longestBase64 = std::max(m_longestBase64, m_base64.back().size());
    }
  }

  CertificateList Resolve(const ElementNode *keyInfo) const override {
    CertificateList named;
    if (keyInfo && !m_base64.empty()) {
      for (const std::string_view text : CertificateTexts(*keyInfo)) {
        AddMatch(text, named);
      }
    }
    return named.empty() ? m_trusted : named;
  }

private:
  void AddMatch(std::string_view text, CertificateList &named) const {
    const std::string base64 = WithoutWhiteSpace(text, m_longestBase64); // once for all trusted certificates
    for (std::size_t index = 0; index < m_base64.size(); ++index) {
      if (base64 == m_base64[index] && std::find(named.begin(), named.end(), m_trusted[index]) == named.end()) {
        named.push_back(m_trusted[index]);
      }
    }
  }

  const CertificateList m_trusted;
  // The Base64 form of each trusted certificate; empty if there are fewer than two certificates. Different bytes have
  // different forms, and equal bytes the same, so comparing texts is enough.
  std::vector<std::string> m_base64;
  std::size_t m_longestBase64 = 0;
};

} // namespace

KeyInfoResolver::~KeyInfoResolver() = default;

Ref<KeyInfoResolver> CreateTrustSetKeyResolver(const KeyInfoResolver::CertificateList &trusted) {
  return MakeRef<TrustSetKeyResolver>(trusted);
}

} // namespace Tarvel::Xml::Security
