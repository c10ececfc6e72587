// SPDX-License-Identifier: Apache-2.0
/// @file
/// Whether a refusal is reported where it must be.

#pragma once

#include "reading.h"

#include <string>
#include <string_view>

namespace Testing {

/// The fault in the position of our refusal of `document`; empty when the position is right. A right position is within
/// a line of the document or at the end of one, and a well-formed document may begin with the text before it: when the
/// document is cut off there, it is accepted, or refused because of its end.
std::string DescribeWrongPosition(std::string_view document, const Reading &refusal);

} // namespace Testing
