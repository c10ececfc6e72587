// SPDX-License-Identifier: Apache-2.0

#include "own_token.h"

#include "exit_code.h"
#include "token_view.h"

#include <tarvel/core/checked_cast.h>
#include <tarvel/core/string_util.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/parser.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace SsoClient::Tool {
namespace {

namespace Crypto = Tarvel::Crypto;
namespace Xml = Tarvel::Xml;

constexpr std::string_view DS = "http://www.w3.org/2000/09/xmldsig#";

const Xml::ElementNode *ChildOf(const Xml::ElementNode *parent, std::string_view localName) {
  return parent ? parent->FindChildElement(Xml::QName(std::string(DS), std::string(localName))) : nullptr;
}

std::string TextOf(const Xml::ElementNode &element) {
  std::string text;
  for (const Xml::Node *child = element.GetFirstChild(); child; child = child->GetNextSibling()) {
    if (child->GetKind() == Xml::NodeKind::TEXT) {
      text += static_cast<const Xml::TextNode *>(child)->GetValue();
    }
  }
  return text;
}

/// Adds the certificate in `element`, if it can be read.
void AddCertificate(const Xml::ElementNode &element, Crypto::CertificateList &certificates) {
  try {
    const std::vector<std::uint8_t> der = Tarvel::StringUtil::Base64Decode(TextOf(element));
    certificates.push_back(Crypto::CreateCertificateFromDer(der.data(), der.size()));
  } catch (const Tarvel::Exception &) { // NOLINT(bugprone-empty-catch): it is of no use for the signature
  }
}

Crypto::CertificateList CertificatesIn(const Xml::ElementNode &assertion) {
  Crypto::CertificateList certificates;
  const Xml::ElementNode *const x509Data = ChildOf(ChildOf(ChildOf(&assertion, "Signature"), "KeyInfo"), "X509Data");
  for (const Xml::Node *child = x509Data ? x509Data->GetFirstChild() : nullptr; child;
       child = child->GetNextSibling()) {
    if (child->GetKind() != Xml::NodeKind::ELEMENT) {
      continue;
    }
    const auto &element = static_cast<const Xml::ElementNode &>(*child);
    if (element.HasQName(DS, "X509Certificate")) {
      AddCertificate(element, certificates);
    }
  }
  return certificates;
}

} // namespace

void AddOwnTokenOptions(CLI::App &app, TrustOptions &options) {
  AddTrustOption(app, options,
                 "File of certificates with one of which the token must be signed, PEM or DER; may be repeated; by "
                 "default, the certificate in the token's signature");
  AddTokenFormOptions(app, options);
}

Crypto::CertificateList CertificatesOfSignature(const std::string &xml) {
  try {
    const Tarvel::Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader(xml);
    const auto parsed = Xml::CreateXMLParser(Xml::CreateXMLDocumentHandler())->Parse(*reader);
    return CertificatesIn(*Tarvel::CheckedCast<Xml::Document>(parsed)->GetDocumentElement());
  } catch (const Xml::XMLParseException &) {
    return {};
  }
}

std::shared_ptr<const SamlToken> ReadOwnToken(const std::string &file, const TrustOptions &options,
                                              const OutputOptions &output) {
  const std::string xml = ReadTokenText(file);
  if (!options.files.empty()) {
    return VerifyToken(xml, LoadTrusted(options, output), VerifyOptionsOf(options));
  }
  const Crypto::CertificateList own = CertificatesOfSignature(xml);
  if (own.empty()) {
    InspectToken(xml); // throws when `xml` is not well-formed or has no assertion
    throw UsageException("the token's signature has no certificate to verify it with; give --trust");
  }
  return VerifyToken(xml, own, VerifyOptionsOf(options));
}

} // namespace SsoClient::Tool
