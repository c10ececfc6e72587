// SPDX-License-Identifier: Apache-2.0
/// @file
/// Making tokens.

#pragma once

#include "signature_engine.h"
#include "token_facts.h"
#include "xml_tree.h"

#include <string>

namespace DevSts {

/// A new assertion that says `facts`, not signed. Its root has a new identifier.
Document BuildToken(const TokenFacts &facts);

/// The assertion's identifier.
std::string TokenId(const xmlDoc &token);

/// Signs the assertion as a whole. @throws std::runtime_error
void SignToken(xmlDoc &token, const SignatureKey &signer);

} // namespace DevSts
