// SPDX-License-Identifier: Apache-2.0

#include <tarvel/xml/security/key_info_resolver.h>

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/signature.h>

#include <algorithm>
#include <string>
#include <utility>

namespace Tarvel {
namespace Xml {
namespace Security {

namespace {

constexpr std::size_t MAX_KEY_INFO_CERTIFICATES = 16; // further ones are not compared

/// A trusted certificate and the Base64 form of its encoding. The form is unique, so comparing texts compares bytes.
struct TrustedCertificate {
  Ref<const Crypto::Certificate> certificate;
  std::string base64;
};

/// Whether `text` is `base64` with white space between its characters.
bool IsSpacedForm(std::string_view text, std::string_view base64) {
  std::size_t matched = 0;
  for (const char character : text) {
    if (matched < base64.size() && character == base64[matched]) {
      ++matched;
    } else if (character != '\n' && character != '\r' && character != ' ' && character != '\t') {
      return false;
    }
  }
  return matched == base64.size();
}

/// The certificate texts of a `ds:KeyInfo`, as far as they are looked at.
std::vector<std::string_view> CertificateTexts(const ElementNode &keyInfo) {
  std::vector<std::string_view> texts;
  for (const Node *data = keyInfo.GetFirstChild(); data; data = data->GetNextSibling()) {
    const ElementNode *x509Data = AsElement(data);
    if (!x509Data || !x509Data->HasQName(SignatureUri::NAMESPACE, "X509Data")) {
      continue;
    }
    for (const Node *child = x509Data->GetFirstChild(); child; child = child->GetNextSibling()) {
      const ElementNode *element = AsElement(child);
      if (!element || !element->HasQName(SignatureUri::NAMESPACE, "X509Certificate")) {
        continue;
      }
      const TextNode *text = AsText(element->GetFirstChild());
      if (text && !text->GetNextSibling()) {
        texts.push_back(text->GetValue());
      }
      if (texts.size() == MAX_KEY_INFO_CERTIFICATES) {
        return texts;
      }
    }
  }
  return texts;
}

class TrustSetKeyResolver final : public KeyInfoResolver {
public:
  explicit TrustSetKeyResolver(const CertificateList &trusted) {
    for (const Ref<const Crypto::Certificate> &certificate : trusted) {
      if (!certificate) {
        continue;
      }
      std::string base64 = StringUtil::Base64Encode(certificate->GetDer());
      const bool isKnown = std::any_of(m_trusted.begin(), m_trusted.end(),
                                       [&base64](const TrustedCertificate &known) { return known.base64 == base64; });
      if (!isKnown) {
        m_all.push_back(certificate);
        m_trusted.push_back({certificate, std::move(base64)});
      }
    }
  }

  CertificateList Resolve(const ElementNode *keyInfo) const override {
    CertificateList named;
    if (keyInfo && m_all.size() > 1) {
      for (const std::string_view text : CertificateTexts(*keyInfo)) {
        AddMatch(text, named);
      }
    }
    return named.empty() ? m_all : named;
  }

private:
  void AddMatch(std::string_view text, CertificateList &named) const {
    for (const TrustedCertificate &trusted : m_trusted) {
      if (IsSpacedForm(text, trusted.base64) &&
          std::find(named.begin(), named.end(), trusted.certificate) == named.end()) {
        named.push_back(trusted.certificate);
      }
    }
  }

  CertificateList m_all;
  std::vector<TrustedCertificate> m_trusted;
};

} // namespace

KeyInfoResolver::~KeyInfoResolver() = default;

Ref<KeyInfoResolver> CreateTrustSetKeyResolver(const KeyInfoResolver::CertificateList &trusted) {
  return MakeRef<TrustSetKeyResolver>(trusted);
}

} // namespace Security
} // namespace Xml
} // namespace Tarvel
