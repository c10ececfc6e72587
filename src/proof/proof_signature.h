// SPDX-License-Identifier: Apache-2.0
/// @file
/// The signature with which the sender of a message proves possession of the token's key.

#pragma once

#include "xml/deviation_sink.h"

#include <ssoclient/saml_token.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

#include <boost/optional.hpp>

namespace SsoClient {

/// The one signature of the security header whose key information refers to the token; null if there is none. Signatures by
/// other keys are ignored. Signatures that refer to another token, to several things, or to the token for a second time are
/// refused, and so is a header with very many signatures.
/// @param key the token's key; may be null
const Tarvel::Xml::ElementNode *FindProofSignature(const Tarvel::Xml::ElementNode &security, const SamlToken &token,
                                                   const Tarvel::Crypto::VerifyingKey *key, DeviationSink &sink);

/// Verifies the signature with the token's key. Returns what it covers; empty if it is refused.
/// @throws Tarvel::OutOfMemoryException and Tarvel::InvalidStateException, which say nothing about the
///         message.
boost::optional<Tarvel::Xml::Security::Signature::Coverage>
VerifyProofSignature(const Tarvel::Xml::ElementNode &signature, const Tarvel::Crypto::VerifyingKey &key,
                     DeviationSink &sink);

} // namespace SsoClient
