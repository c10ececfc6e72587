// SPDX-License-Identifier: Apache-2.0
/// @file
/// The XML parser, and the handler that builds a tree.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace Tarvel::Xml {

/// A document that is not well-formed (XML 1.0, Namespaces in XML 1.0), or that has something this library refuses: a
/// document type declaration, an XML version other than 1.0, an encoding other than UTF-8 or its subset US-ASCII, or more
/// than the limits below. The message ends in " at line L, column C".
class TARVEL_API XMLParseException : public Exception {
public:
  /// An exception with the message `detail`, followed by the position.
  XMLParseException(const std::string &detail, std::uint32_t line, std::uint32_t column);
  XMLParseException(const XMLParseException &) noexcept = default;
  XMLParseException &operator=(const XMLParseException &) noexcept = default;
  ~XMLParseException() override;
  XMLParseException *Clone() const override;
  [[noreturn]] void Throw() const override;

  std::uint32_t GetLine() const noexcept { return m_line; }     ///< from 1
  std::uint32_t GetColumn() const noexcept { return m_column; } ///< from 1, in bytes

private:
  std::uint32_t m_line;
  std::uint32_t m_column;
};

constexpr std::size_t MAX_DOCUMENT_BYTES = 16u * 1024 * 1024; ///< a longer document is refused
constexpr unsigned MAX_ELEMENT_DEPTH = 256;                   ///< the document element has depth 1
constexpr unsigned MAX_ATTRIBUTES = 256;                      ///< of one element, namespace declarations included
constexpr unsigned MAX_NAMESPACES_IN_SCOPE = 256;             ///< declarations in scope at one element
constexpr std::size_t MAX_NODES = 1024 * 1024;                ///< of one document: nodes and attributes
constexpr std::size_t MAX_NAME_BYTES = 4096;                  ///< of an element, attribute or target, prefix included

/// Receives a document as it is parsed. The library has one handler, the document handler.
class XMLHandler;

/// A parser bound to one handler. One thread at a time may use it.
class TARVEL_API XMLParser : public Object {
public:
  /// Reads `reader` to its end and returns what the handler made of the document.
  /// @throws XMLParseException when the document is refused; the handler then has no result.
  /// @throws IOException when the reader fails. @throws std::bad_alloc when memory runs out, which says nothing about
  ///         the document.
  virtual Ref<Object> Parse(Reader &reader) = 0;

protected:
  ~XMLParser() override;
};

/// A handler that builds a `Document`.
TARVEL_API Ref<XMLHandler> CreateXMLDocumentHandler();

/// A parser that reports to `handler`.
TARVEL_API Ref<XMLParser> CreateXMLParser(const Ref<XMLHandler> &handler);

/// One attribute of a start tag; the views are valid during the call.
struct AttributeEvent {
  std::string_view name;        ///< as written, prefix included; "xmlns" and "xmlns:p" for declarations
  std::string_view value;       ///< normalised: references and white space replaced (XML 1.0, section 3.3.3)
  std::size_t prefixLength = 0; ///< of the name's prefix, 0 without one

  /// The prefix; empty without one.
  std::string_view GetPrefix() const noexcept { return name.substr(0, prefixLength); }
  /// The name without the prefix.
  std::string_view GetLocalName() const noexcept { return prefixLength ? name.substr(prefixLength + 1) : name; }
  /// Whether it is `xmlns` or `xmlns:p`.
  bool IsNamespaceDeclaration() const noexcept { return (prefixLength ? GetPrefix() : name) == "xmlns"; }
};

/// Receives the events of a document. An exception that a function throws ends the parse and reaches the caller of `Parse`.
class TARVEL_API XMLHandler : public Object {
public:
  /// A document begins. `source` is its text. It is valid and does not move as long as `owner` exists, so that views of it
  /// need not be copied.
  virtual void StartDocument(std::string_view source, const Ref<Object> &owner) = 0;
  /// A start tag. `attributes` has `count` elements in the order of the tag; line and column are where the tag begins, from 1.
  virtual void StartElement(std::string_view name, const AttributeEvent *attributes, std::size_t count,
                            std::uint32_t line, std::uint32_t column) = 0;
  /// The end tag of the element that was started last and has not ended.
  virtual void EndElement() = 0;
  /// Character data up to the next other event, CDATA sections included; never empty.
  virtual void Characters(std::string_view text) = 0;
  /// A comment: the text between `<!--` and `-->`.
  virtual void Comment(std::string_view text) = 0;
  /// A processing instruction; `data` may be empty.
  virtual void ProcessingInstruction(std::string_view target, std::string_view data) = 0;
  /// The result; called once, after the end of a well-formed document.
  virtual Ref<Object> TakeResult() = 0;

protected:
  ~XMLHandler() override;
};

} // namespace Tarvel::Xml
