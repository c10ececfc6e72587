// SPDX-License-Identifier: Apache-2.0
/// @file
/// Values that differ from token to token, read from a token's XML.

#pragma once

#include <string>

namespace ToolTest {

/// The value of the first attribute `name` in `xml`. @throws std::runtime_error when it has no such attribute.
std::string AttributeIn(const std::string &xml, const std::string &name);

/// `text` with each `mark` replaced by `value`.
std::string Fill(std::string text, const std::string &mark, const std::string &value);

/// `text` with @ID@, @NOT_BEFORE@ and @NOT_ON_OR_AFTER@ replaced by the values of the token `xml`. The validity is in
/// the element Conditions; the confirmation of a bearer token has another NotOnOrAfter.
std::string FillFrom(const std::string &xml, std::string text);

/// `text` without the distances after its two times of validity, such as " (in 7 h 59 min)".
/// @throws std::runtime_error when one of the two is missing.
std::string WithoutDistances(const std::string &text);

} // namespace ToolTest
