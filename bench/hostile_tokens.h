// SPDX-License-Identifier: Apache-2.0
/// @file
/// Genuine tokens with hostile content inserted.

#pragma once

#include "shape_list.h"

namespace Bench {

/// What these shapes change is covered by a digest, but the signature over the digests stays genuine. So the verifier
/// digests every token of the right form.
void AddSignedContent(ShapeList &shapes);

/// `ds:KeyInfo` may contain anything, and no digest covers it.
void AddSignatureContent(ShapeList &shapes);

/// Tokens with as many nodes as the limit allows, which take the most memory.
void AddMostNodesOfToken(ShapeList &shapes);

} // namespace Bench
