// SPDX-License-Identifier: Apache-2.0
/// @file
/// Verifiers that differ in everything that a caller can choose.

#pragma once

#include "support/judged_token.h"

#include <vector>

namespace Reports {

/// The certificate of a file in tests/data/tokens, such as "sts-rsa".
Tarvel::Ref<const Tarvel::Crypto::Certificate> Certificate(const std::string &name);

/// A verifier for each combination of trusted certificates and options.
const std::vector<Testing::JudgedVerifier> &AllVerifiers();

/// A verifier that trusts all keys of the token service, and has the default options.
const Testing::JudgedVerifier &UsualVerifier();

} // namespace Reports
