// SPDX-License-Identifier: Apache-2.0

#include "refusal_position.h"

#include "readers.h"

#include <algorithm>

namespace Testing {

namespace {

/// Whether a document that is cut at the place of `refusal` may be refused elsewhere. `before` is its reading.
bool IsJudgedBefore(const Reading &refusal, const Reading &before) {
  // The first four octets are checked before all others.
  if (refusal.message == "the document is UTF-16 or UTF-32, or begins with a null byte; only UTF-8 is accepted") {
    return true;
  }
  // What is left of the target is a reserved name.
  return refusal.message == "the target of a processing instruction has a colon" &&
         (before.message == "an XML declaration is not at the beginning of the document" ||
          before.message.ends_with("' is reserved and cannot be the target of a processing instruction"));
}

} // namespace

std::string DescribeWrongPosition(std::string_view document, const Reading &refusal) {
  if (refusal.line < 1 || refusal.column < 1) {
    return "no line or no column";
  }
  const std::size_t offset = OffsetOf(document, refusal.line, refusal.column);
  const std::size_t lineBegin = OffsetOf(document, refusal.line, 1);
  if (offset > std::min(document.find('\n', lineBegin), document.size())) {
    return "no such place";
  }
  const std::string_view beginning = document.substr(0, offset);
  const Reading before = ReadWithPlatform(beginning);
  if (before.isAccepted || OffsetOf(beginning, before.line, before.column) == offset ||
      IsJudgedBefore(refusal, before)) {
    return "";
  }
  return "refused at octet " + std::to_string(offset) + " (" + refusal.message +
         "), and without what begins there at " + std::to_string(OffsetOf(beginning, before.line, before.column)) +
         " (" + before.message + ")";
}

} // namespace Testing
