// SPDX-License-Identifier: Apache-2.0
/// @file
/// The digest of a canonical form, computed without keeping the canonical form in memory.

#pragma once

#include "crypto/digest.h"
#include "xml/security/canonical_form.h"

#include <tarvel/xml/node.h>

#include <array>
#include <cstdint>

namespace Tarvel::Xml::Security {

/// Only the first `Crypto::DigestBytes(algorithm)` bytes are used.
using DigestValue = std::array<std::uint8_t, Crypto::MAX_DIGEST_BYTES>;

/// @throws what `WriteCanonicalForm` and `Crypto::Digest` throw.
DigestValue DigestCanonicalForm(const Node &apex, const CanonicalizationMethod &method, const Node *omitted,
                                Crypto::DigestAlgorithm algorithm);

} // namespace Tarvel::Xml::Security
