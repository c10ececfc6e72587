// SPDX-License-Identifier: Apache-2.0
/// @file
/// Changes to messages.

#pragma once

#include "integration/signature_oracle/random_source.h"

#include <string>

namespace Messages {

/// Changes `xml` once or a few times. A third of the messages have one of their parts wrapped: it is moved or copied to
/// another place, possibly into another element, and a forged part of that name, with or without its identifier, takes its
/// place. The others are changed like tokens: pieces of them, or of `other`, are removed, doubled, moved, copied or
/// renamed, attributes and texts are changed, and comments and single octets are inserted.
std::string ChangeMessage(const std::string &xml, const std::string &other, Testing::RandomSource &random);

} // namespace Messages
