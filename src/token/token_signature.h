// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseTokenSignature`, which reads the signature of a token and checks that it covers the token.

#pragma once

#include "xml/node_filter_iterator.h"

#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

namespace SsoClient {

/// Reads the signature at the cursor, a child of `assertion`, and moves the cursor to the next node. The signature is not
/// verified yet, but one of its references is to `assertion` or to the whole document.
/// @throws ParseException when there is no element, when it is not a signature, and when there is no such reference.
void ParseTokenSignature(NodeFilterIterator &iterator, const Tarvel::Xml::ElementNode &assertion,
                         Tarvel::Ref<Tarvel::Xml::Security::Signature> &signature);

} // namespace SsoClient
