// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/proof_kind.h>

namespace SsoClient {

const char *GetProofName(ProofKind proof) noexcept {
  switch (proof) {
  case ProofKind::BEARER:
    return "bearer";
  case ProofKind::MESSAGE_SIGNATURE:
    return "message-signature";
  case ProofKind::TLS_CERTIFICATE:
    return "tls-certificate";
  }
  return "unknown";
}

} // namespace SsoClient
