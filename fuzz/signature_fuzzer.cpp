// SPDX-License-Identifier: Apache-2.0
/// @file
/// Signatures: reading and verifying the first `Signature` element of any document ends in an answer or in a documented
/// exception, the same each time; the report on it agrees and throws nothing; and the content that a genuine signature
/// covers is content that a trusted key signed.

#include "document_order.h"
#include "support/data_file.h"
#include "xml/security/canonical_form.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/io/reader.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/key_info_resolver.h>
#include <tarvel/xml/security/signature.h>

#include <cstdint>
#include <cstdlib>
#include <set>
#include <string>
#include <string_view>

namespace {

using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

const ElementNode *FindSignature(const Document &document) {
  for (const Node *node = document.GetDocumentNode(); node; node = Fuzz::NextInDocumentOrder(node)) {
    const ElementNode *element = Tarvel::Xml::AsElement(node);
    if (element && element->GetLocalName() == "Signature") {
      return element;
    }
  }
  return nullptr;
}

Ref<Document> Parse(const std::string &text) {
  const Ref<Tarvel::Object> result =
      Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())->Parse(*Tarvel::CreateStringReader(text));
  return Ref<Document>(&dynamic_cast<Document &>(*result));
}

constexpr std::string_view WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";

bool HasIdentifier(const ElementNode &element, std::string_view identifier) {
  for (const auto *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    const std::string_view name = attribute->GetName();
    std::string_view uri;
    if (attribute->GetValue() == identifier &&
        (name == "ID" || name == "Id" || name == "xml:id" ||
         (attribute->GetLocalName() == "Id" && element.LookupNamespace(attribute->GetPrefix(), uri) && uri == WSU))) {
      return true;
    }
  }
  return false;
}

/// The target of a reference with that URI: the whole document, or the only element that has that identifier.
const Node *FindTarget(const Document &document, std::string_view uri) {
  if (uri.empty()) {
    return document.GetDocumentNode();
  }
  const Node *target = nullptr;
  for (const Node *node = document.GetDocumentNode(); node; node = Fuzz::NextInDocumentOrder(node)) {
    const ElementNode *element = Tarvel::Xml::AsElement(node);
    if (element && HasIdentifier(*element, uri.substr(1))) {
      Require(!target);
      target = node;
    }
  }
  return target;
}

/// The exclusive canonical forms of what a signature claims to cover, without the signature. It does not matter which
/// canonical form the signature itself uses: documents that differ in this form differ in every other.
std::set<std::string> CoveredForms(const Document &document, const ElementNode &signature,
                                   const std::set<std::string> &uris) {
  Tarvel::Xml::Security::CanonicalizationMethod method;
  Require(
      Tarvel::Xml::Security::FindCanonicalizationMethod(Tarvel::Xml::Security::CanonicalizationUri::EXCLUSIVE, method));
  std::set<std::string> forms;
  for (const std::string &uri : uris) {
    const Node *const target = FindTarget(document, uri);
    Require(target);
    const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
    Tarvel::Xml::Security::WriteCanonicalForm(*target, method, &signature, *writer);
    forms.insert(writer->TakeText());
  }
  return forms;
}

struct Verdict {
  std::string text; ///< "genuine", "wrong", or the message of the refusal
  std::set<std::string> uris;
};

/// Whether the report agrees with the verdict of the verification.
bool Agrees(const Tarvel::Xml::Security::SignatureReport &report, const std::string &verdict) {
  if (report.refusals.empty()) {
    return verdict == "genuine";
  }
  const std::string &message = report.refusals.front().message;
  return verdict == (message.empty() ? "wrong" : message);
}

Verdict Judge(const Tarvel::Xml::Security::Signature &signature) {
  static const auto resolver = Tarvel::Xml::Security::CreateTrustSetKeyResolver(
      {Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt")).front(),
       Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-ec256.crt")).front()});
  Verdict verdict;
  try {
    const bool isGenuine = signature.Verify(*resolver, verdict.uris);
    Require(verdict.uris.empty() != isGenuine);
    verdict.text = isGenuine ? "genuine" : "wrong";
  } catch (const Tarvel::Xml::Security::XmlSecurityException &exception) {
    Require(verdict.uris.empty());
    verdict.text = exception.what();
  }
  Require(Agrees(signature.Explain(*resolver), verdict.text));
  return verdict;
}

Ref<Tarvel::Xml::Security::Signature> ReadSignature(const Document &document, const ElementNode &element) {
  Ref<Tarvel::Xml::Security::Signature> signature;
  Tarvel::Xml::Security::CreateSignatureFromDom(*document.GetDocumentElement(), element, signature);
  return signature;
}

/// The forms that the signatures of genuine seeds cover: of those that one of the two keys signed.
std::set<std::string> ReadGenuineForms() {
  std::set<std::string> all;
  for (const char *const name : {"c14n-inclusive-prefixes", "c14n-mixed", "ecdsa-p256-sha256", "reference-empty-uri",
                                 "reference-two", "rsa-pss-sha512", "rsa-sha256"}) {
    const Ref<Document> document = Parse(Testing::ReadDataFile("tokens/" + std::string(name) + ".xml"));
    const ElementNode &element = *FindSignature(*document);
    const Verdict verdict = Judge(*ReadSignature(*document, element));
    Require(verdict.text == "genuine");
    all.merge(CoveredForms(*document, element, verdict.uris));
  }
  return all;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const std::set<std::string> genuineForms = ReadGenuineForms();
  try {
    const Ref<Document> document = Parse(std::string(reinterpret_cast<const char *>(data), size));
    const ElementNode *element = FindSignature(*document);
    if (!element) {
      return 0;
    }
    const Ref<Tarvel::Xml::Security::Signature> signature = ReadSignature(*document, *element);
    const Verdict verdict = Judge(*signature);
    Require(verdict.text == Judge(*signature).text);
    if (verdict.text == "genuine") {
      for (const std::string &form : CoveredForms(*document, *element, verdict.uris)) {
        Require(genuineForms.count(form) == 1);
      }
    }
  } catch (const Tarvel::Xml::XMLParseException &) {
  } catch (const Tarvel::Xml::Security::SignatureSyntaxException &) {
  }
  return 0;
}
