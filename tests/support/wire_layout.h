// SPDX-License-Identifier: Apache-2.0
/// @file
/// The readable form of a message in golden files; the message itself is one line.

#pragma once

#include <cstddef>
#include <string>

namespace Testing {

/// The position after the ">" of the tag that begins at `start`. Attribute values may contain a ">".
inline std::size_t EndOfTag(const std::string &xml, std::size_t start) {
  char quote = '\0';
  for (std::size_t i = start; i < xml.size(); ++i) {
    if (quote) {
      quote = xml[i] == quote ? '\0' : quote;
    } else if (xml[i] == '"' || xml[i] == '\'') {
      quote = xml[i];
    } else if (xml[i] == '>') {
      return i + 1;
    }
  }
  return xml.size();
}

/// `wire` with one element on each line, indented by depth; an element with only text, and an empty one, take one line.
inline std::string ToReadable(const std::string &wire) {
  std::string readable;
  std::size_t depth = 0;
  bool startedLast = false; // the last tag was a start tag, so an end tag belongs to the same line
  for (std::size_t i = 0; i < wire.size();) {
    if (wire[i] != '<') {
      const std::size_t end = wire.find('<', i);
      readable.append(wire, i, end - i);
      i = end == std::string::npos ? wire.size() : end;
      continue;
    }
    const std::size_t end = EndOfTag(wire, i);
    const bool endTag = wire[i + 1] == '/';
    depth -= endTag ? 1 : 0;
    if (!endTag || !startedLast) {
      readable += (readable.empty() ? "" : "\n") + std::string(2 * depth, ' ');
    }
    readable.append(wire, i, end - i);
    const bool opens = !endTag && wire[end - 2] != '/';
    depth += opens ? 1 : 0;
    startedLast = opens;
    i = end;
  }
  return readable + "\n";
}

/// The reverse of `ToReadable`: removes the line ends and the indentation after them.
inline std::string ToWire(const std::string &readable) {
  std::string wire;
  bool atLineStart = true;
  for (const char c : readable) {
    if (c == '\n') {
      atLineStart = true;
    } else if (c != ' ' || !atLineStart) {
      atLineStart = false;
      wire += c;
    }
  }
  return wire;
}

} // namespace Testing
