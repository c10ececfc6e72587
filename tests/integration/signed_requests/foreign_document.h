// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ForeignDocument`, a message as libxml2 reads it and xmlsec1 verifies it.

#pragma once

#include <libxml/tree.h>

#include <string>
#include <vector>

namespace Testing {

/// A parsed document. References in it can resolve to its identifiers ("Id", "ID" and "wsu:Id").
class ForeignDocument {
public:
  /// @throws std::runtime_error when libxml2 does not parse the text, or an identifier occurs twice.
  explicit ForeignDocument(const std::string &xml);
  ForeignDocument(const ForeignDocument &) = delete;
  ForeignDocument &operator=(const ForeignDocument &) = delete;
  ~ForeignDocument();

  xmlDocPtr Get() const { return m_document; }
  xmlNodePtr Root() const { return xmlDocGetRootElement(m_document); }

  /// The document as text again.
  std::string Serialise() const;

private:
  xmlDocPtr m_document;
};

/// The elements of that local name below `root`, `root` included, in document order.
std::vector<xmlNodePtr> FindAll(xmlNodePtr root, const std::string &localName);

/// The first of them. @throws std::runtime_error when there is none.
xmlNodePtr Find(xmlNodePtr root, const std::string &localName);

/// The child element of that local name. @throws std::runtime_error when there is none.
xmlNodePtr Child(xmlNodePtr parent, const std::string &localName);

/// Every element below `root`, `root` included, in document order.
std::vector<xmlNodePtr> Elements(xmlNodePtr root);

std::string TextOf(xmlNodePtr node);
std::string AttributeOf(xmlNodePtr element, const std::string &localName);

/// Whether the signature element is valid for xmlsec1 with the key of `certificate` (PEM or DER). A signature that
/// cannot be checked, for example because a reference does not resolve, is not valid.
bool IsValidSignature(xmlNodePtr signature, const std::string &certificate);

/// Fills in and signs the empty signature template in `xml` with the private key (PEM), and returns the signed
/// document.
/// @throws std::runtime_error when xmlsec1 cannot sign.
std::string SignTemplate(const std::string &xml, const std::string &privateKeyPem);

} // namespace Testing
