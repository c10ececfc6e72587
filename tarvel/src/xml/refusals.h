// SPDX-License-Identifier: Apache-2.0
/// @file
/// The reasons for refusing a document, each with its text, which does not change between versions.

#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace Tarvel::Xml {

enum class Refusal : std::uint8_t {
  // Limits
  DOCUMENT_TOO_LONG,
  TOO_DEEP,
  TOO_MANY_ATTRIBUTES,
  TOO_MANY_DECLARATIONS,
  TOO_MANY_NODES,
  NAME_TOO_LONG,
  // Encoding and characters
  OTHER_UNICODE_ENCODING,
  BEGINS_WITH_NULL,
  TWO_BYTE_ORDER_MARKS,
  OTHER_ENCODING_DECLARED,
  NOT_UTF8,
  NOT_US_ASCII,
  NULL_BYTE,
  FORBIDDEN_CHARACTER,
  // The XML declaration
  OTHER_VERSION,
  MALFORMED_DECLARATION,
  NEITHER_YES_NOR_NO,
  ENDS_IN_DECLARATION,
  LATE_DECLARATION,
  // The document as a whole
  EMPTY_DOCUMENT,
  NO_ELEMENT,
  DOCUMENT_TYPE,
  TEXT_BEFORE_ELEMENT,
  CONTENT_AFTER_ELEMENT,
  CDATA_OUTSIDE_ELEMENT,
  ELEMENT_NOT_CLOSED,
  // Tags
  NO_NAME_AFTER_LESS_THAN,
  UNKNOWN_MARKUP,
  NOT_QUALIFIED_NAME,
  NOT_AN_ATTRIBUTE,
  NO_SPACE_BEFORE_ATTRIBUTE,
  ATTRIBUTE_WITHOUT_VALUE,
  VALUE_NOT_QUOTED,
  LESS_THAN_IN_VALUE,
  SLASH_IN_START_TAG,
  ATTRIBUTE_TWICE,
  NO_NAME_IN_END_TAG,
  MORE_IN_END_TAG,
  END_TAG_WITHOUT_START_TAG,
  OTHER_END_TAG,
  ENDS_IN_START_TAG,
  ENDS_IN_VALUE,
  ENDS_IN_END_TAG,
  // Text and references
  CDATA_END_IN_TEXT,
  NO_REFERENCE,
  NO_DIGITS_IN_REFERENCE,
  NO_SEMICOLON,
  UNKNOWN_ENTITY,
  FORBIDDEN_REFERENCE,
  ENDS_IN_REFERENCE,
  ENDS_IN_CDATA,
  // Comments and processing instructions
  TWO_HYPHENS_IN_COMMENT,
  ENDS_IN_COMMENT,
  NO_TARGET,
  RESERVED_TARGET,
  COLON_IN_TARGET,
  NO_SPACE_AFTER_TARGET,
  ENDS_IN_INSTRUCTION,
  // Namespaces
  XMLNS_ELEMENT,
  XMLNS_DECLARED,
  XML_BOUND_TO_OTHER,
  XML_NAMESPACE_BOUND,
  XMLNS_NAMESPACE_BOUND,
  PREFIX_UNDECLARED,
  NOT_A_URI_REFERENCE,
  SAME_NAMESPACE_AND_NAME
};

/// The texts in the order of `Refusal`; %1 and %2 are replaced by what was found.
constexpr std::string_view REFUSAL_TEXTS[] = {
    "the document is longer than 16777216 bytes",
    "elements are nested deeper than 256",
    "an element has more than 256 attributes",
    "more than 256 namespace declarations are in scope",
    "the document has more than 1048576 nodes and attributes",
    "a name is longer than 4096 bytes",

    "the document is UTF-16 or UTF-32, only UTF-8 is accepted",
    "the document is UTF-16 or UTF-32, or begins with a null byte; only UTF-8 is accepted",
    "the document begins with two byte order marks",
    "the encoding '%1' is declared, only UTF-8 is accepted",
    "the document is not UTF-8",
    "the document is declared as US-ASCII and is not",
    "the document holds a null byte",
    "the document holds a character that XML 1.0 cannot carry (%1)",

    "the XML version '%1' is not 1.0",
    "the XML declaration is malformed",
    "'standalone' is '%1', not 'yes' or 'no'",
    "the document ends in the XML declaration",
    "an XML declaration is not at the beginning of the document",

    "the document is empty",
    "the document has no element",
    "a document type declaration is not accepted",
    "text comes before the document element",
    "something other than comments and processing instructions follows the document element",
    "a CDATA section is outside the document element",
    "the element '%1' of line %2 is not closed where the document ends",

    "'<' is not followed by a name",
    "'<!' is not followed by a comment or a CDATA section",
    "a name has a colon that is not between a prefix and a local name",
    "a start tag holds something other than attributes",
    "white space is missing before an attribute",
    "the attribute '%1' has no value",
    "the value of the attribute '%1' is not in quotation marks",
    "the value of the attribute '%1' holds '<'",
    "'/' in a start tag is not followed by '>'",
    "the attribute '%1' occurs twice",
    "'</' is not followed by a name",
    "an end tag holds more than a name",
    "an end tag has no start tag",
    "the element '%1' of line %2 has another end tag",
    "the document ends in a start tag",
    "the document ends in the value of the attribute '%1'",
    "the document ends in an end tag",

    "text holds ']]>'",
    "'&' does not begin a reference",
    "a character reference has no digits",
    "a reference does not end in ';'",
    "the entity '%1' is not defined",
    "a reference is to a character that XML 1.0 cannot carry (%1)",
    "the document ends in a reference",
    "the document ends in a CDATA section",

    "a comment holds '--'",
    "the document ends in a comment",
    "'<?' is not followed by a name",
    "the name '%1' is reserved and cannot be the target of a processing instruction",
    "the target of a processing instruction has a colon",
    "white space is missing after the target of a processing instruction",
    "the document ends in a processing instruction",

    "an element has the prefix 'xmlns'",
    "the prefix 'xmlns' is declared",
    "the prefix 'xml' is bound to another namespace than its own",
    "the namespace of the prefix 'xml' is bound to another prefix or is the default",
    "the namespace of the prefix 'xmlns' is declared",
    "the prefix '%1' is bound to the empty namespace name",
    "the namespace name '%1' is not a URI reference",
    "the attributes '%1' and '%2' have the same local name in the same namespace",
};

constexpr std::size_t REFUSAL_COUNT = static_cast<std::size_t>(Refusal::SAME_NAMESPACE_AND_NAME) + 1;
static_assert(sizeof REFUSAL_TEXTS / sizeof *REFUSAL_TEXTS == REFUSAL_COUNT, "one text for each reason");

/// Line and column from 1; the column in bytes. A byte order mark takes no column.
struct SourcePosition {
  std::uint32_t line;
  std::uint32_t column;
};

/// The line and column of the byte at `offset` in `source`.
SourcePosition GetPosition(std::string_view source, std::size_t offset) noexcept;

/// Length of the UTF-8 byte order mark that `source` begins with, or 0.
std::size_t GetByteOrderMarkLength(std::string_view source) noexcept;

/// @throws XMLParseException always: the text of `refusal` and the position of `offset` in `source`. What was found is cut
///         to a readable length.
[[noreturn]] void Refuse(Refusal refusal, std::string_view source, std::size_t offset, std::string_view found = {},
                         std::string_view alsoFound = {});

} // namespace Tarvel::Xml
