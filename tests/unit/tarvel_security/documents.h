// SPDX-License-Identifier: Apache-2.0
/// @file
/// Parsing, canonicalising and verifying documents in the tests of this folder.

#pragma once

#include "support/data_file.h"

#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/signature.h>

#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace Testing {

inline Tarvel::Ref<Tarvel::Xml::Document> ParseDocument(std::string_view text) {
  const Tarvel::Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader(std::string(text));
  const Tarvel::Ref<Tarvel::Object> result =
      Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*reader);
  return Tarvel::Ref<Tarvel::Xml::Document>(&dynamic_cast<Tarvel::Xml::Document &>(*result));
}

inline std::string CanonicalForm(const Tarvel::Xml::Node &node, std::string_view algorithmUri,
                                 const std::vector<std::string> &inclusivePrefixes = {}) {
  const Tarvel::Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  Tarvel::Xml::Security::CreateCanonicalizer(algorithmUri, inclusivePrefixes)->Canonicalize(node, *writer);
  return writer->GetText();
}

/// The canonical form of a whole document.
inline std::string CanonicalDocument(std::string_view text, std::string_view algorithmUri) {
  return CanonicalForm(*ParseDocument(text)->GetDocumentNode(), algorithmUri);
}

/// The first element of that local name, in document order; the document must have one.
inline const Tarvel::Xml::ElementNode &FindElement(const Tarvel::Xml::Document &document, std::string_view localName) {
  const Tarvel::Xml::Node *top = document.GetDocumentNode();
  for (const Tarvel::Xml::Node *node = top; node;) {
    const Tarvel::Xml::ElementNode *element = Tarvel::Xml::AsElement(node);
    if (element && element->GetLocalName() == localName) {
      return *element;
    }
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    while (node && !node->GetNextSibling()) {
      node = node->GetParent();
    }
    node = node ? node->GetNextSibling() : nullptr;
  }
  throw std::logic_error("no element " + std::string(localName));
}

/// `text` with the first occurrence of `from` replaced by `to`. `from` must occur in it.
inline std::string Replaced(std::string text, std::string_view from, std::string_view to) {
  const std::size_t at = text.find(from);
  if (at == std::string::npos) {
    throw std::logic_error("nothing to replace: " + std::string(from));
  }
  return text.replace(at, from.size(), to);
}

inline Tarvel::Crypto::CertificateList Trusted(const std::vector<std::string> &names) {
  Tarvel::Crypto::CertificateList certificates;
  for (const std::string &name : names) {
    certificates.push_back(Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/" + name + ".crt")));
  }
  return certificates;
}

/// The signature of a document whose document element is signed.
inline Tarvel::Ref<Tarvel::Xml::Security::Signature> SignatureOf(const Tarvel::Xml::Document &document) {
  Tarvel::Ref<Tarvel::Xml::Security::Signature> signature;
  Tarvel::Xml::Security::CreateSignatureFromDom(*document.GetDocumentElement(), FindElement(document, "Signature"),
                                                signature);
  return signature;
}

inline bool VerifyText(std::string_view text, const std::vector<std::string> &trusted = {"sts-rsa"}) {
  std::set<std::string> uris;
  return SignatureOf(*ParseDocument(text))
      ->Verify(*Tarvel::Xml::Security::CreateTrustSetKeyResolver(Trusted(trusted)), uris);
}

} // namespace Testing
