// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reading back a token that this service has issued.

#pragma once

#include "refusal.h"
#include "signature_engine.h"
#include "token_facts.h"
#include "xml_tree.h"

namespace DevSts {

/// Verifies the signature by `signer` over the whole assertion, and returns the assertion's facts. Its dates are not
/// checked. `identifiers` are those of the assertion's document.
/// @throws Refusal (`code`) when this service did not issue it, or when it was changed
TokenFacts ReadIssuedToken(const xmlNode &assertion, const Identifiers &identifiers, const SignatureKey &signer,
                           const FaultCode &code);

} // namespace DevSts
