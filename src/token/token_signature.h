// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseTokenSignature`, which reads the signature of a token and checks that it covers the token.

#pragma once

#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

#include <string_view>

namespace SsoClient {

/// The message for a signature that does not cover the token.
constexpr std::string_view TOKEN_NOT_COVERED = "Token's signature must cover the entire token";

/// Reads the signature at the cursor, a child of `assertion`, and moves the cursor to the next node. The signature is not
/// verified yet, but one of its references must be to `assertion` or to the whole document.
///
/// `sink` receives a missing element, an element that is not a signature, and a signature without such a reference. If
/// the sink does not throw and another node is at the cursor, the first `ds:Signature` after it is read. If there is
/// none, the cursor does not move. `signature` stays null if no signature can be read.
void ParseTokenSignature(NodeFilterIterator &iterator, const Tarvel::Xml::ElementNode &assertion,
                         Tarvel::Ref<Tarvel::Xml::Security::Signature> &signature,
                         DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
