// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Reading`, the result of reading a document, in a form in which readers are compared.

#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace Testing {

/// Events as text. Each begins with an octet that an accepted document cannot contain, so that events cannot be
/// confused. Text that is reported in pieces is one event.
class EventText {
public:
  void StartElement(std::string_view name) { Add('\x01', name); }
  void Attribute(std::string_view name, std::string_view value);
  void EndElement() { Add('\x04', ""); }
  void Characters(std::string_view text);
  void Comment(std::string_view text) { Add('\x06', text); }
  void ProcessingInstruction(std::string_view target, std::string_view data);

  const std::string &Get() const { return m_text; }

private:
  void Add(char kind, std::string_view text);

  std::string m_text;
  bool m_isInText = false;
};

struct Reading {
  bool isAccepted = false;
  bool hasDocumentType = false;  ///< peers only: they stop there, and what is after it is not judged
  bool hasUnboundPrefix = false; ///< peers only
  EventText events; ///< attributes and declarations in the order of the document; not from peers that separate them
  EventText declarationsFirst;      ///< the declarations of an element before its attributes; without that of "xml"
  std::vector<std::size_t> offsets; ///< where the elements begin; ours and expat's without namespaces
  int code = 0;                     ///< peers only: the number of the first error
  std::string message;              ///< of the refusal; ours without the position
  std::size_t offset = NO_OFFSET;   ///< where expat refuses
  std::uint32_t line = 0;           ///< of the refusal
  std::uint32_t column = 0;         ///< ours only

  static constexpr std::size_t NO_OFFSET = static_cast<std::size_t>(-1);
};

/// The offset in `document` of line and column as we count them: lines end with LF, columns are octets from 1, and a
/// byte order mark has none. More than the document's size when there is no such line.
std::size_t OffsetOf(std::string_view document, std::uint32_t line, std::uint32_t column);

/// Whether a name as written is "xmlns" or begins with "xmlns:".
bool IsDeclaration(std::string_view name);

} // namespace Testing
