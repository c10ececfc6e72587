// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading back a token that this service has issued.

#pragma once

#include "refusal.h"
#include "signature_engine.h"
#include "token_facts.h"
#include "xml_tree.h"

namespace DevSts {

/// The facts of the assertion, once its signature by `signer` over the whole of it is verified. Its dates are not judged.
/// `identifiers` are those of the assertion's document.
/// @throws Refusal (`code`) when it is not one of ours, whole and unchanged
TokenFacts ReadIssuedToken(const xmlNode &assertion, const Identifiers &identifiers, const SignatureKey &signer,
                           const FaultCode &code);

} // namespace DevSts
