// SPDX-License-Identifier: Apache-2.0

#include "xml/security/key_info_certificates.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/signature.h>

#include <algorithm>
#include <cstddef>
#include <string>

namespace Tarvel::Xml::Security {

namespace {

constexpr std::size_t MAX_KEY_INFO_CERTIFICATES = 16; // further ones are not examined
constexpr std::size_t MAX_STRANGER_BYTES = 64 * 1024; // larger ones are slow to decode, and not real certificates

/// The text that `describe` returns; empty if it cannot be made.
template <typename Describe>
std::string TextOrNothing(const Describe &describe) {
  try {
    return describe();
  } catch (const Crypto::CryptoException &) {
    return {};
  }
}

} // namespace

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

std::vector<std::uint8_t> DecodeCertificateText(std::string_view text) {
  try {
    return StringUtil::Base64Decode(text);
  } catch (const Base64FormatException &) {
    return {};
  }
}

SignatureReport::NamedCertificate DescribeCertificate(const Crypto::Certificate &certificate) {
  return {TextOrNothing([&certificate] { return certificate.GetSubject(); }),
          TextOrNothing([&certificate] { return certificate.GetSha256Thumbprint(); }), false};
}

SignatureReport::NamedCertificate DescribeStranger(const std::vector<std::uint8_t> &der) {
  if (der.size() > MAX_STRANGER_BYTES) {
    return {};
  }
  try {
    return DescribeCertificate(*Crypto::CreateCertificateFromDer(der.data(), der.size()));
  } catch (const Crypto::CryptoException &) {
    return {};
  }
}

Crypto::CertificateList DistinctCertificates(const Crypto::CertificateList &certificates) {
  Crypto::CertificateList distinct;
  distinct.reserve(certificates.size());
  for (const Ref<const Crypto::Certificate> &certificate : certificates) {
    const bool isKnown = std::any_of(distinct.begin(), distinct.end(), [&certificate](const auto &known) {
      return !certificate || known->GetDer() == certificate->GetDer();
    });
    if (certificate && !isKnown) {
      distinct.push_back(certificate);
    }
  }
  return distinct;
}

} // namespace Tarvel::Xml::Security
