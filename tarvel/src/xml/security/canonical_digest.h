// SPDX-License-Identifier: Apache-2.0
/// @file
/// The digest of a canonical form, without the canonical form ever standing in memory.

#pragma once

#include "crypto/digest.h"
#include "xml/security/canonical_form.h"

#include <tarvel/xml/node.h>

#include <array>
#include <cstdint>

namespace Tarvel::Xml::Security {

/// The first `Crypto::DigestBytes(algorithm)` bytes count.
using DigestValue = std::array<std::uint8_t, Crypto::MAX_DIGEST_BYTES>;

/// @throws as `WriteCanonicalForm` and `Crypto::Digest`.
DigestValue DigestCanonicalForm(const Node &apex, const CanonicalMethod &method, const Node *omitted,
                                Crypto::DigestAlgorithm algorithm);

} // namespace Tarvel::Xml::Security
