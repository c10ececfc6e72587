// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TokenAttachment`, which adds a token to the WS-Security header of a message.

#pragma once

#include "proof/existing_signatures.h"
#include "proof/soap_parts.h"
#include "proof/token_element.h"
#include "proof/tree_changes.h"

#include <ssoclient/proof/sign_message.h>
#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>

#include <string>
#include <vector>

namespace SsoClient {

/// A message that gets a token. What it changes is undone when it is destroyed before `Finish` has returned.
class TokenAttachment {
public:
  /// Reads the message and the token. Changes nothing.
  /// @param options must exist as long as this object
  /// @throws InvalidMessageException when the token cannot be added to the message.
  /// @throws Tarvel::InvalidArgumentException when it cannot be added to any message, or the options are not valid.
  TokenAttachment(Tarvel::Xml::Document &message, const SamlToken &token, const SecurityHeaderOptions &options);

  /// The header block with the name of `part`.
  /// @throws InvalidMessageException when there is none, or more than one.
  Tarvel::Xml::ElementNode &FindPart(const MessagePart &part) const;

  /// Adds the SOAP header, the security header and its timestamp, where the message does not have them, and the token.
  void Prepare();

  Tarvel::Xml::ElementNode &GetEnvelope() const noexcept { return *m_envelope; }
  Tarvel::Xml::ElementNode &GetBody() const noexcept { return *m_body; }
  /// The timestamp, after `Prepare`.
  Tarvel::Xml::ElementNode &GetTimestamp() const noexcept { return *m_timestamp; }

  /// The identifier of an element of the message. If it has none, it gets a `wsu:Id`.
  /// @throws InvalidMessageException when a signature in the element would not stay valid.
  std::string Identify(Tarvel::Xml::ElementNode &element);

  /// Adds the signature, unless it is null, and puts the new elements in their order. All changes stay.
  void Finish(const Tarvel::Ref<Tarvel::Xml::ElementNode> &signature);

private:
  void FindSecurityHeader();
  void RequireUncoveredHeader() const;
  Tarvel::Xml::ElementNode &Add(Tarvel::Xml::ElementNode &parent, const Tarvel::Ref<Tarvel::Xml::ElementNode> &child);
  void AddSecurityHeader();

  const SecurityHeaderOptions &m_options;
  const TokenElement m_token;
  const SoapEnvelope m_parts;
  Tarvel::Xml::ElementNode *const m_envelope;           // never null
  Tarvel::Xml::ElementNode *m_header;                   // null until there is one
  Tarvel::Xml::ElementNode *const m_body;               // never null
  Tarvel::Xml::ElementNode *m_security = nullptr;       // null until there is one
  Tarvel::Xml::ElementNode *m_timestamp = nullptr;      // null until there is one
  Tarvel::Ref<Tarvel::Xml::ElementNode> m_newTimestamp; // null if the message had one
  const ExistingSignatures m_signatures;
  TreeChanges m_changes;
};

} // namespace SsoClient
