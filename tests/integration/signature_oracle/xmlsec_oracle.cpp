// SPDX-License-Identifier: Apache-2.0

#include "xmlsec_oracle.h"

#include <libxml/parser.h>
#include <xmlsec/errors.h>
#include <xmlsec/openssl/app.h>
#include <xmlsec/openssl/crypto.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmlsec.h>
#include <xmlsec/xmltree.h>

#include <mutex>
#include <stdexcept>

namespace Testing {

namespace {

void SayNothing(const char *, int, const char *, const char *, const char *, int, const char *) {}

void RequireXmlSec() {
  static std::once_flag once;
  std::call_once(once, [] {
    if (xmlSecInit() < 0 || xmlSecOpenSSLAppInit(nullptr) < 0 || xmlSecOpenSSLInit() < 0) {
      throw std::runtime_error("xmlsec1 does not start");
    }
    xmlSecErrorsSetCallback(SayNothing); // thousands of refusals are expected
  });
}

struct ContextDeleter {
  void operator()(xmlSecDSigCtx *context) const noexcept { xmlSecDSigCtxDestroy(context); }
};
using ContextHandle = std::unique_ptr<xmlSecDSigCtx, ContextDeleter>;

ContextHandle NewContext(const xmlSecKey &key) {
  RequireXmlSec();
  ContextHandle context(xmlSecDSigCtxCreate(nullptr));
  context->signKey = xmlSecKeyDuplicate(const_cast<xmlSecKey *>(&key));
  return context;
}

/// The signature element, in a document whose identifiers are known to libxml2.
xmlNode *PrepareSignature(xmlDoc &document) {
  const xmlChar *identifiers[] = {XmlText("ID"), XmlText("Id"), nullptr};
  xmlSecAddIDs(&document, xmlDocGetRootElement(&document), identifiers);
  return ElementOfLibxml2(document, "Signature");
}

} // namespace

XmlSecKeyHandle LoadXmlSecKey(const std::string &path) {
  RequireXmlSec();
  XmlSecKeyHandle key(xmlSecOpenSSLAppKeyLoad(path.c_str(), xmlSecKeyDataFormatPem, nullptr, nullptr, nullptr));
  if (!key) {
    throw std::runtime_error("xmlsec1 does not read " + path);
  }
  return key;
}

bool SignWithXmlSec(xmlDoc &document, const xmlSecKey &key) {
  const ContextHandle context = NewContext(key);
  xmlNode *const signature = PrepareSignature(document);
  return signature && xmlSecDSigCtxSign(context.get(), signature) >= 0;
}

bool VerifiesWithXmlSec(xmlDoc &document, const xmlSecKey &key) {
  const ContextHandle context = NewContext(key);
  xmlNode *const signature = PrepareSignature(document);
  return signature && xmlSecDSigCtxVerify(context.get(), signature) >= 0 &&
         context->status == xmlSecDSigStatusSucceeded;
}

std::string Serialise(xmlDoc &document) {
  xmlChar *text = nullptr;
  int length = 0;
  xmlDocDumpMemoryEnc(&document, &text, &length, "UTF-8");
  const std::string copy(reinterpret_cast<const char *>(text), static_cast<std::size_t>(length));
  xmlFree(text);
  return copy;
}

} // namespace Testing
