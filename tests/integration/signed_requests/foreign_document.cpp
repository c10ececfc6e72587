// SPDX-License-Identifier: Apache-2.0

#include "integration/signed_requests/foreign_document.h"

#include <libxml/parser.h>
#include <libxml/valid.h>
#include <xmlsec/crypto.h>
#include <xmlsec/errors.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmlsec.h>

#include <memory>
#include <mutex>
#include <stdexcept>

namespace Testing {

namespace {

const xmlChar *Xml(const char *text) {
  return reinterpret_cast<const xmlChar *>(text);
}

std::string Take(xmlChar *text) {
  const std::string result = text ? reinterpret_cast<const char *>(text) : "";
  xmlFree(text);
  return result;
}

std::string NameOf(const xmlChar *name) {
  return reinterpret_cast<const char *>(name);
}

void SayNothing(const char *, int, const char *, const char *, const char *, int, const char *) {}

void StartEngineOnce() {
  static std::once_flag once;
  std::call_once(once, [] {
    if (xmlSecInit() < 0 || xmlSecCryptoAppInit(nullptr) < 0 || xmlSecCryptoInit() < 0) {
      throw std::runtime_error("xmlsec1 does not start");
    }
    xmlSecErrorsSetCallback(SayNothing); // otherwise it would print a report for each of hundreds of refused messages
  });
}

void RegisterIdentifiers(xmlDocPtr document) {
  for (const xmlNodePtr element : Elements(xmlDocGetRootElement(document))) {
    for (xmlAttrPtr attribute = element->properties; attribute; attribute = attribute->next) {
      const std::string name = NameOf(attribute->name);
      if (name != "Id" && name != "ID") {
        continue;
      }
      const std::string value = Take(xmlNodeListGetString(document, attribute->children, 1));
      if (!xmlAddID(nullptr, document, Xml(value.c_str()), attribute)) {
        throw std::runtime_error("the identifier " + value + " cannot be registered");
      }
    }
  }
}

using SignatureContext = std::unique_ptr<xmlSecDSigCtx, decltype(&xmlSecDSigCtxDestroy)>;

xmlSecKeyPtr LoadKey(const std::string &bytes, xmlSecKeyDataFormat format) {
  return xmlSecCryptoAppKeyLoadMemory(reinterpret_cast<const xmlSecByte *>(bytes.data()),
                                      static_cast<xmlSecSize>(bytes.size()), format, nullptr, nullptr, nullptr);
}

} // namespace

ForeignDocument::ForeignDocument(const std::string &xml)
    : m_document(xmlReadMemory(xml.data(), static_cast<int>(xml.size()), nullptr, nullptr,
                               XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING)) {
  if (!m_document) {
    throw std::runtime_error("libxml2 does not parse " + xml);
  }
  try {
    RegisterIdentifiers(m_document);
  } catch (...) {
    xmlFreeDoc(m_document);
    throw;
  }
}

ForeignDocument::~ForeignDocument() {
  xmlFreeDoc(m_document);
}

std::string ForeignDocument::Serialise() const {
  xmlChar *text = nullptr;
  int size = 0;
  xmlDocDumpMemory(m_document, &text, &size);
  return Take(text);
}

std::vector<xmlNodePtr> Elements(xmlNodePtr root) {
  std::vector<xmlNodePtr> found;
  for (xmlNodePtr node = root; node;) {
    if (node->type == XML_ELEMENT_NODE) {
      found.push_back(node);
    }
    if (node->children && node->type == XML_ELEMENT_NODE) {
      node = node->children;
      continue;
    }
    while (node != root && !node->next) {
      node = node->parent;
    }
    node = node == root ? nullptr : node->next;
  }
  return found;
}

std::vector<xmlNodePtr> FindAll(xmlNodePtr root, const std::string &localName) {
  std::vector<xmlNodePtr> found;
  for (const xmlNodePtr element : Elements(root)) {
    if (NameOf(element->name) == localName) {
      found.push_back(element);
    }
  }
  return found;
}

xmlNodePtr Find(xmlNodePtr root, const std::string &localName) {
  const auto found = FindAll(root, localName);
  if (found.empty()) {
    throw std::runtime_error("no element " + localName);
  }
  return found.front();
}

xmlNodePtr Child(xmlNodePtr parent, const std::string &localName) {
  for (xmlNodePtr child = xmlFirstElementChild(parent); child; child = xmlNextElementSibling(child)) {
    if (NameOf(child->name) == localName) {
      return child;
    }
  }
  throw std::runtime_error("no child element " + localName);
}

std::string TextOf(xmlNodePtr node) {
  return Take(xmlNodeGetContent(node));
}

std::string AttributeOf(xmlNodePtr element, const std::string &localName) {
  return Take(xmlGetProp(element, Xml(localName.c_str())));
}

bool IsValidSignature(xmlNodePtr signature, const std::string &certificate) {
  StartEngineOnce();
  const SignatureContext context(xmlSecDSigCtxCreate(nullptr), &xmlSecDSigCtxDestroy);
  const bool isPem = certificate.rfind("-----BEGIN", 0) == 0;
  context->signKey = LoadKey(certificate, isPem ? xmlSecKeyDataFormatCertPem : xmlSecKeyDataFormatCertDer);
  if (!context->signKey) {
    throw std::runtime_error("xmlsec1 does not read the certificate");
  }
  return xmlSecDSigCtxVerify(context.get(), signature) >= 0 && context->status == xmlSecDSigStatusSucceeded;
}

std::string SignTemplate(const std::string &xml, const std::string &privateKeyPem) {
  StartEngineOnce();
  const ForeignDocument document(xml);
  const SignatureContext context(xmlSecDSigCtxCreate(nullptr), &xmlSecDSigCtxDestroy);
  context->signKey = LoadKey(privateKeyPem, xmlSecKeyDataFormatPem);
  if (!context->signKey || xmlSecDSigCtxSign(context.get(), Find(document.Root(), "Signature")) < 0 ||
      context->status != xmlSecDSigStatusSucceeded) {
    throw std::runtime_error("xmlsec1 does not sign " + xml);
  }
  return document.Serialise();
}

} // namespace Testing
