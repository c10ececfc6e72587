// SPDX-License-Identifier: Apache-2.0

#include "token/signature_refusal.h"

namespace SsoClient {

std::string SignatureRefusalText(std::string_view error) {
  if (error.empty()) {
    return "Failed to verify signature: token might have been tampered with.";
  }
  return std::string("Signature verification error. ").append(error);
}

} // namespace SsoClient
