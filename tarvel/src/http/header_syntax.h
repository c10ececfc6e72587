// SPDX-License-Identifier: Apache-2.0
/// @file
/// What is allowed in the header of an HTTP message (RFC 9110, section 5).

#pragma once

#include "core/ascii_case.h"

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace Tarvel::Http {

/// Name and value of each header, in the order in which they are sent. Names may repeat.
using HeaderFields = std::vector<std::pair<std::string, std::string>>;

bool IsControlCharacter(char c) noexcept;

/// Whether `text` may be a method or a header's name: one or more letters, digits and !#$%&'*+-.^_`|~
bool IsToken(std::string_view text) noexcept;

/// Whether `text` contains no control characters, so that it cannot end a line.
bool IsFieldValue(std::string_view text) noexcept;

/// `text` without the blanks and tabs around it.
std::string_view TrimBlanks(std::string_view text) noexcept;

} // namespace Tarvel::Http
