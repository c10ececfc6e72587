// SPDX-License-Identifier: Apache-2.0

#include "xmlsec_verifier.h"

#include <libxml/parser.h>
#include <xmlsec/crypto.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmlsec.h>
#include <xmlsec/xmltree.h>

#include <stdexcept>

namespace Bench {

namespace {

const xmlChar *const ID_ATTRIBUTE = BAD_CAST "ID";

struct DocumentDeleter {
  void operator()(xmlDoc *document) const { xmlFreeDoc(document); }
};

struct SignatureContextDeleter {
  void operator()(xmlSecDSigCtx *context) const { xmlSecDSigCtxDestroy(context); }
};

} // namespace

struct XmlsecVerifier::State {
  xmlSecKey *key = nullptr;
};

XmlsecVerifier::XmlsecVerifier(const std::string &certificatePath) : m_state(new State) {
  if (xmlSecInit() < 0 || xmlSecCryptoAppInit(nullptr) < 0 || xmlSecCryptoInit() < 0) {
    throw std::runtime_error("xmlsec1 does not start");
  }
  m_state->key = xmlSecCryptoAppKeyLoad(certificatePath.c_str(), xmlSecKeyDataFormatCertPem, nullptr, nullptr, nullptr);
  if (!m_state->key) {
    throw std::runtime_error("xmlsec1 cannot load " + certificatePath);
  }
}

XmlsecVerifier::~XmlsecVerifier() {
  xmlSecKeyDestroy(m_state->key);
  xmlSecCryptoShutdown();
  xmlSecCryptoAppShutdown();
  xmlSecShutdown();
}

bool XmlsecVerifier::Verify(const std::string &xml) const {
  const std::unique_ptr<xmlDoc, DocumentDeleter> document(
      xmlReadMemory(xml.data(), static_cast<int>(xml.size()), nullptr, nullptr, XML_PARSE_NONET));
  if (!document) {
    return false;
  }
  xmlNode *const root = xmlDocGetRootElement(document.get());
  xmlAttr *const id = xmlHasProp(root, ID_ATTRIBUTE);
  if (!id || !xmlAddID(nullptr, document.get(), id->children->content, id)) {
    return false;
  }
  xmlNode *const signature = xmlSecFindNode(root, xmlSecNodeSignature, xmlSecDSigNs);
  const std::unique_ptr<xmlSecDSigCtx, SignatureContextDeleter> context(xmlSecDSigCtxCreate(nullptr));
  if (!signature || !context) {
    return false;
  }
  context->signKey = xmlSecKeyDuplicate(m_state->key); // the context frees it, and ignores KeyInfo because it has a key
  return xmlSecDSigCtxVerify(context.get(), signature) == 0 && context->status == xmlSecDSigStatusSucceeded;
}

} // namespace Bench
