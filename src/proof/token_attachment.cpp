// SPDX-License-Identifier: Apache-2.0

#include "proof/token_attachment.h"

#include "compose/bound_prefix.h"
#include "compose/message_signing.h"
#include "compose/ws_security.h"
#include "compose/xml_builder.h"
#include "model/namespaces.h"
#include "xml/qualified_name.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>
#include <tarvel/system/date_time.h>

namespace SsoClient {

namespace {

using Tarvel::MessageFormatter;
using Tarvel::Ref;
using Tarvel::StringUtil;
using Tarvel::Xml::ElementNode;

/// Searches return const elements. Those of a message that gets a token may be changed.
ElementNode *MayChange(const ElementNode *element) noexcept {
  return const_cast<ElementNode *>(element);
}

const char *TextOf(EnvelopeFault fault) noexcept {
  switch (fault) {
  case EnvelopeFault::NOT_AN_ENVELOPE:
    return "The message is not a SOAP envelope";
  case EnvelopeFault::OTHER_VERSION:
    return "The envelope is neither of SOAP 1.1 nor of SOAP 1.2";
  case EnvelopeFault::OTHER_CONTENT:
    return "The envelope has content outside of its header and its body";
  case EnvelopeFault::SECOND_HEADER:
    return "The envelope has two headers";
  case EnvelopeFault::HEADER_AFTER_BODY:
    return "The envelope has its header after its body";
  case EnvelopeFault::SECOND_BODY:
    return "The envelope has two bodies";
  case EnvelopeFault::NO_BODY:
    return "The envelope has no body";
  case EnvelopeFault::NONE:
    break;
  }
  return "";
}

SoapEnvelope RequireEnvelope(const Tarvel::Xml::Document &message) {
  SoapEnvelope envelope = ReadEnvelope(message.GetDocumentElement());
  if (envelope.fault != EnvelopeFault::NONE) {
    throw InvalidMessageException(TextOf(envelope.fault));
  }
  return envelope;
}

const SecurityHeaderOptions &RequireOptions(const SecurityHeaderOptions &options) {
  if (options.lifetimeSec <= 0) {
    throw Tarvel::InvalidArgumentException(
        MessageFormatter::ASPrint("the lifetime of a message must be positive, not %1 seconds", options.lifetimeSec));
  }
  return options;
}

XMLCompositePtr TimestampBuilder(std::int64_t lifetimeSec) {
  const Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();
  return WssuTimestampBuilder(now, now.PlusSeconds(lifetimeSec));
}

} // namespace

TokenAttachment::TokenAttachment(Tarvel::Xml::Document &message, const SamlToken &token,
                                 const SecurityHeaderOptions &options)
    : m_options(RequireOptions(options)), m_token(token), m_parts(RequireEnvelope(message)),
      m_envelope(MayChange(m_parts.element)), m_header(MayChange(m_parts.header)), m_body(MayChange(m_parts.body)),
      m_signatures(*m_envelope, m_token.GetIdentifiers()) {
  FindSecurityHeader();
  RequireUncoveredHeader();
}

void TokenAttachment::FindSecurityHeader() {
  const std::string role = m_options.role.value_or("");
  const FoundElements headers = FindSecurityHeaders(m_parts, role);
  if (headers.second) {
    const std::string_view normalised = NormaliseRole(role, m_parts.version);
    throw InvalidMessageException(
        "The message has two security headers for " +
        (normalised.empty() ? "the last receiver" : "the role '" + StringUtil::Shorten(normalised) + "'"));
  }
  const FoundElements timestamps = FindChildren(headers.first, Namespaces::WSU, "Timestamp");
  if (timestamps.second) {
    throw InvalidMessageException("The security header has two timestamps");
  }
  m_security = MayChange(headers.first);
  m_timestamp = MayChange(timestamps.first);
}

void TokenAttachment::RequireUncoveredHeader() const {
  std::vector<const ElementNode *> changed{m_envelope};
  for (const ElementNode *const element : {m_header, m_security}) {
    if (element) {
      changed.push_back(element);
    }
  }
  m_signatures.RequireUncovered(changed);
}

ElementNode &TokenAttachment::FindPart(const MessagePart &part) const {
  const FoundElements found = FindHeaderBlocks(m_parts, part);
  if (!found.first || found.second) {
    throw InvalidMessageException(
        MessageFormatter::ASPrint("The message has %1 '%2'", found.second ? "two header blocks" : "no header block",
                                  StringUtil::Shorten(QNameView(part.namespaceUri, part.localName).ToString())));
  }
  return *MayChange(found.first);
}

ElementNode &TokenAttachment::Add(ElementNode &parent, const Ref<ElementNode> &child) {
  m_changes.Prepend(parent, child);
  return *child;
}

void TokenAttachment::Prepare() {
  if (!m_header) {
    Ref<ElementNode> header;
    Tarvel::Xml::CreateElementNode(m_envelope->GetPrefix(), "Header", header);
    m_header = &Add(*m_envelope, header);
  }
  if (!m_security) {
    AddSecurityHeader();
  }
  m_token.PrepareFor(*m_security);
  if (!m_timestamp) {
    TimestampBuilder(m_options.lifetimeSec)->build(m_newTimestamp);
    m_timestamp = &Add(*m_security, m_newTimestamp);
  }
  Add(*m_security, m_token.Get());
}

void TokenAttachment::AddSecurityHeader() {
  Ref<ElementNode> security;
  ElementBuilder("wsse", "Security", {{"xmlns:wsse", std::string(Namespaces::WSSE)}})->build(security);
  m_security = &Add(*m_header, security);
  const bool isSoap11 = m_parts.version == SoapVersion::SOAP11;
  const std::string_view role = NormaliseRole(m_options.role ? *m_options.role : std::string_view(), m_parts.version);
  if (!m_options.mustUnderstand && role.empty()) {
    return;
  }
  const std::string_view preferred = m_envelope->GetPrefix().empty() ? "soapenv" : m_envelope->GetPrefix();
  const std::string prefix = BindPrefix(*m_security, preferred, GetSoapNamespace(m_parts.version));
  if (!role.empty()) {
    m_security->DefineAttribute(prefix + (isSoap11 ? ":actor" : ":role"), role);
  }
  if (m_options.mustUnderstand) {
    m_security->DefineAttribute(prefix + ":mustUnderstand", isSoap11 ? "1" : "true");
  }
}

std::string TokenAttachment::Identify(ElementNode &element) {
  if (const Tarvel::Xml::Attribute *const identifier = FindIdentifier(element)) {
    return std::string(identifier->GetValue());
  }
  if (FindBoundPrefix(element, "wsu", Namespaces::WSU).empty()) {
    m_signatures.RequireIndependence(element, ChooseFreePrefix(element, "wsu"));
  }
  m_changes.ExpectAttributes(element);
  return CreateWssuId(&element);
}

// WS-Security, section 5: new elements are before those that the header has, and a token is before the signature that
// uses it. The signature can be made only when the token and the timestamp are in the tree, so these two are moved to
// their places.
void TokenAttachment::Finish(const Ref<ElementNode> &signature) {
  for (const Ref<ElementNode> &element : {signature, m_token.Get(), m_newTimestamp}) {
    if (element) {
      m_security->RemoveChild(element.get());
      Add(*m_security, element);
    }
  }
  m_changes.Keep();
}

} // namespace SsoClient
