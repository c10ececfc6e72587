// SPDX-License-Identifier: Apache-2.0

#include "token/trusted_keys.h"

#include "token/report_recorder.h"

namespace SsoClient {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;

std::string SubjectOf(const Certificate &certificate) {
  try {
    return certificate.GetSubject();
  } catch (const Tarvel::Crypto::CryptoException &) {
    return std::string();
  }
}

TokenReport::TrustedKey DescribeTrustedKey(const Ref<const Certificate> &certificate) {
  TokenReport::TrustedKey key;
  key.certificate = certificate;
  key.subject = ReportText(SubjectOf(*certificate));
  key.thumbprint = certificate->GetSha256Thumbprint();
  return key;
}

std::vector<TokenReport::TrustedKey> DescribeTrustedKeys(const Tarvel::Xml::Security::KeyInfoResolver &resolver) {
  std::vector<TokenReport::TrustedKey> keys;
  for (const Ref<const Certificate> &certificate : resolver.Resolve(nullptr)) {
    keys.push_back(DescribeTrustedKey(certificate));
  }
  return keys;
}

} // namespace SsoClient
