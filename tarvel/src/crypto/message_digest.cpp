// SPDX-License-Identifier: Apache-2.0

#include <tarvel/crypto/message_digest.h>

#include "crypto/digest.h"

namespace Tarvel::Crypto {

std::vector<std::uint8_t> ComputeDigest(HashAlgorithm algorithm, std::string_view bytes) {
  std::vector<std::uint8_t> value(DigestBytes(algorithm));
  Digest digest(algorithm);
  digest.Update(bytes);
  digest.Finish(value.data());
  return value;
}

} // namespace Tarvel::Crypto
