// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SaxSession`, one run of libxml2's SAX2 parser over one document.

#pragma once

#include "xml/source_checks.h"

#include <tarvel/xml/parser.h>

#include <libxml/parser.h>

#include <cstddef>
#include <cstdint>
#include <exception>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel {
namespace Xml {

/// Hands the events of a document to a handler, and keeps the limits that libxml2 has not.
class SaxSession {
public:
  /// @param source has passed `CheckSource`, is followed by a null byte, and outlives the session.
  SaxSession(std::string_view source, XMLHandler &handler);

  /// @throws XMLParseException when the document is not well-formed or over a limit.
  /// @throws whatever the handler throws.
  void Run();

private:
  struct Context;
  struct Callbacks;

  void StartElement(const xmlChar *const *namespaces, std::size_t namespaceCount, const xmlChar *const *attributes,
                    std::size_t attributeCount);
  void EndElement();
  void ReadStartTag(std::size_t begin, std::size_t end, const xmlChar *const *namespaces, std::size_t namespaceCount,
                    const xmlChar *const *attributes, std::size_t attributeCount);
  static void RequireMemory(int errorCode);
  void TakeError(const xmlError &error);

  /// Where the parser stands.
  std::size_t GetOffset() const noexcept;

  /// Line and column of `offset`, which is never less than in the call before.
  SourcePosition AdvanceTo(std::size_t offset) noexcept;

  [[noreturn]] void Refuse(const std::string &detail, std::size_t offset) const;
  void Stop() noexcept;

  std::string_view m_source;
  XMLHandler &m_handler;
  xmlParserCtxtPtr m_parser = nullptr;

  std::exception_ptr m_failure;
  std::string_view m_name; // of the start tag that was read last
  std::vector<AttributeEvent> m_attributes;
  std::vector<std::size_t> m_declarations; // of each open element
  std::size_t m_declarationsInScope = 0;
  std::size_t m_unboundPrefixBytes = 0; // length of libxml2's messages about them
  std::size_t m_lineBegin;
  std::size_t m_lineCounted; // line breaks before this offset are counted
  std::uint32_t m_line = 1;
};

} // namespace Xml
} // namespace Tarvel
