// SPDX-License-Identifier: Apache-2.0
/// @file
/// Changes to tokens.

#pragma once

#include "integration/signature_oracle/random_source.h"

#include <string>

namespace Reports {

/// Makes one to four changes to `xml`, most of which keep it well-formed: elements are removed, doubled, copied, moved,
/// renamed or replaced by elements of `other`; attributes are removed, added or changed; texts are changed; comments,
/// instructions and single octets are inserted or changed.
std::string ChangeToken(std::string xml, const std::string &other, Testing::RandomSource &random);

} // namespace Reports
