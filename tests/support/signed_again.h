// SPDX-License-Identifier: Apache-2.0
/// @file
/// Tokens that are changed and then signed again, so that they can be refused only for their content.

#pragma once

#include <string>

namespace Testing {

/// `xml`, an assertion with a signature, signed again by xmlsec1 with the key of tests/data/tokens/sts-rsa.key.
/// @throws std::runtime_error if xmlsec1 cannot sign it.
std::string SignedAgain(std::string xml);

} // namespace Testing
