// SPDX-License-Identifier: Apache-2.0

#include "token/name_id_parser.h"

#include "model/namespaces.h"
#include "xml/strict_checks.h"

namespace SsoClient {

using Tarvel::Xml::ElementNode;

void ParseNameIDType(NodeFilterIterator &iterator, NameIDType &nameId) {
  const ElementNode &element = *IteratorToElement(iterator);
  RequireElementAttributesNames(element, {"Format"}, {});
  nameId.Format = GetTextAttribute(element, "Format");
  RequireTextualContent(iterator, nameId.value);
  iterator.MoveToSibling();
}

void ParseSamlIssuerElement(NodeFilterIterator &iterator, NameIDType &issuer) {
  RequireElementQName(IteratorToElement(iterator), "Issuer", Namespaces::SAML);
  ParseNameIDType(iterator, issuer);
}

void ParseSubjectNameIdElement(NodeFilterIterator &iterator, NameIDType &nameId) {
  RequireElementQName(IteratorToElement(iterator), "NameID", Namespaces::SAML);
  ParseNameIDType(iterator, nameId);
}

} // namespace SsoClient
