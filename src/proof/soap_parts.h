// SPDX-License-Identifier: Apache-2.0
/// @file
/// The parts of a SOAP 1.1 or 1.2 message: envelope, header, body, the security headers by role, identifiers.
///
/// Both sides of a proof find the parts with these functions, so what is signed is what is read. The functions only search:
/// what they did not find, or found twice, is in the result, and each side has its own text for it. All of them take
/// linear time, and no memory that depends on the message.

#pragma once

#include <ssoclient/proof/message_part.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>

#include <cstdint>
#include <string_view>

namespace SsoClient {

/// The version of a SOAP envelope.
enum class SoapVersion : std::uint8_t { SOAP11, SOAP12 };

/// The namespace of the envelope in that version.
std::string_view GetSoapNamespace(SoapVersion version) noexcept;

/// Why a document is not an envelope with one body, after at most one header.
enum class EnvelopeFault : std::uint8_t {
  NONE,
  NOT_AN_ENVELOPE,   ///< there is no document element, or its local name is not "Envelope"
  OTHER_VERSION,     ///< an element "Envelope" of another namespace
  OTHER_CONTENT,     ///< an element that is neither the header nor the body, or text that is not white space
  SECOND_HEADER,     ///< a second header
  HEADER_AFTER_BODY, ///< the header is after the body
  SECOND_BODY,       ///< a second body
  NO_BODY            ///< there is no body
};

/// An envelope. Header and body are in the namespace of the envelope.
struct SoapEnvelope {
  EnvelopeFault fault = EnvelopeFault::NONE;         ///< the first fault in document order
  const Tarvel::Xml::Node *place = nullptr;          ///< of the fault: the node that should not be there, or the
                                                     ///< envelope; null if there is no document element
  SoapVersion version = SoapVersion::SOAP11;         ///< valid unless the fault is one of the first two
  const Tarvel::Xml::ElementNode *element = nullptr; ///< the document element; may be null
  const Tarvel::Xml::ElementNode *header = nullptr;  ///< the first header; null if there is none
  const Tarvel::Xml::ElementNode *body = nullptr;    ///< the first body; null if there is none
};

/// Reads `element`, a document element, as an envelope. Null is not an envelope.
SoapEnvelope ReadEnvelope(const Tarvel::Xml::ElementNode *element) noexcept;

/// The elements that a search has found, in document order. At most one is right for every search here.
struct FoundElements {
  const Tarvel::Xml::ElementNode *first = nullptr;  ///< null if there is none
  const Tarvel::Xml::ElementNode *second = nullptr; ///< null if there is at most one
};

/// The child elements of `parent` with that qualified name. A null parent has no children.
FoundElements FindChildren(const Tarvel::Xml::ElementNode *parent, std::string_view namespaceUri,
                           std::string_view localName) noexcept;

/// The header blocks of `envelope` with the name of `part`.
FoundElements FindHeaderBlocks(const SoapEnvelope &envelope, const MessagePart &part) noexcept;

/// The `wsse:Security` headers of `envelope` for `role`.
FoundElements FindSecurityHeaders(const SoapEnvelope &envelope, std::string_view role) noexcept;

/// The actor (SOAP 1.1, section 4.2.2) or role (SOAP 1.2 part 1, section 5.2.2) of a header block, without white space at
/// either end. Empty for the last receiver: without the attribute, with an empty one, and for "ultimateReceiver" in SOAP 1.2.
std::string_view GetRole(const Tarvel::Xml::ElementNode &block, SoapVersion version) noexcept;

/// The same for the value of the attribute, which a caller may have as an option.
std::string_view NormaliseRole(std::string_view role, SoapVersion version) noexcept;

/// The attribute by which references identify `element`: the first of `wsu:Id`, `Id`, `ID` and `xml:id` that it has and
/// whose value a reference can contain. Null if there is none.
const Tarvel::Xml::Attribute *FindIdentifier(const Tarvel::Xml::ElementNode &element) noexcept;

/// Whether references can refer to `element` by the value of `attribute`, which is one of its attributes. These are the four
/// names that the platform's signatures resolve.
bool IsIdentifier(const Tarvel::Xml::Attribute &attribute, const Tarvel::Xml::ElementNode &element) noexcept;

} // namespace SsoClient
