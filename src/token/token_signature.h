// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseTokenSignature`, which finds a token's signature and makes sure that it covers the token.

#pragma once

#include "xml/node_filter_iterator.h"

#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

namespace SsoClient {

/// Reads the signature that the cursor stands on, a child of `assertion`, and moves the cursor to the next node. Nothing is
/// verified yet, but what it signs includes all of `assertion`.
/// @throws ParseException when there is no element, it is no signature, or its references leave the assertion out.
void ParseTokenSignature(NodeFilterIterator &iterator, const Tarvel::Xml::ElementNode &assertion,
                         Tarvel::Ref<Tarvel::Xml::Security::Signature> &signature);

} // namespace SsoClient
