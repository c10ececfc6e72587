// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GeneratedAssertion`, a random assertion that the schema of SAML 2.0 allows, and what must be read in it.

#pragma once

#include "integration/signature_oracle/random_source.h"

#include <string>

namespace Testing {

struct GeneratedAssertion {
  std::string xml;     ///< with a signature template
  std::string details; ///< what `DescribeDetails` must return
  std::string refusal; ///< why it must be refused; empty if it must be accepted
};

/// The dates in the assertion are before and after 2026-01-02T03:04:05Z, the time of `FixedEnvironment`.
GeneratedAssertion GenerateAssertion(RandomSource &random);

} // namespace Testing
