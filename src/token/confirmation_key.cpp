// SPDX-License-Identifier: Apache-2.0

#include "token/confirmation_key.h"

#include "token/saml_token_impl.h"

#include <tarvel/crypto/certificate.h>

namespace SsoClient {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Crypto::VerifyingKey;

Ref<const VerifyingKey> GetConfirmationKey(const SamlToken &token) {
  if (token.GetConfirmationMethod() != SamlToken::HOLDER_OF_KEY) {
    return {};
  }
  if (const Certificate *const certificate = token.GetConfirmationCertificate()) {
    return Tarvel::Crypto::CreateVerifyingKey(Ref<const Certificate>(certificate));
  }
  const auto *const implementation = dynamic_cast<const SamlTokenImpl *>(&token);
  if (!implementation || implementation->GetConfirmationKeyValue().empty()) {
    return {};
  }
  return Tarvel::Crypto::CreateVerifyingKey(implementation->GetConfirmationKeyValue());
}

} // namespace SsoClient
