// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/tls_proof.h>

#include "token/confirmation_key.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/verifying_key.h>

namespace SsoClient {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Crypto::VerifyingKey;

void VerifyTlsProof(const SamlToken &token, const Certificate &peerCertificate) {
  if (token.GetConfirmationMethod() != SamlToken::HOLDER_OF_KEY) {
    throw Tarvel::InvalidArgumentException("a bearer token has no key that its sender could prove");
  }
  const Ref<const VerifyingKey> key = GetConfirmationKey(token);
  const Ref<const VerifyingKey> peerKey = Tarvel::Crypto::CreateVerifyingKey(Ref<const Certificate>(&peerCertificate));
  if (!key || !Tarvel::Crypto::IsSameKey(*key, *peerKey)) {
    throw InvalidProofException("The key of the TLS certificate is not the key of the token");
  }
}

} // namespace SsoClient
