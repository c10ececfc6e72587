// SPDX-License-Identifier: Apache-2.0

#include "pss_oracle.h"

#include <openssl/bio.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>

#include <algorithm>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <vector>

namespace Testing {

namespace {

constexpr const char *HELPER_ALGORITHM = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256";

struct ContextDeleter {
  void operator()(EVP_MD_CTX *context) const noexcept { EVP_MD_CTX_free(context); }
};
using ContextHandle = std::unique_ptr<EVP_MD_CTX, ContextDeleter>;

std::string AttributeOf(xmlNode *node, const char *name) {
  xmlChar *const value = node ? xmlGetNoNsProp(node, XmlText(name)) : nullptr;
  const std::string copy = value ? reinterpret_cast<const char *>(value) : "";
  xmlFree(value);
  return copy;
}

/// The text of an element without white space.
std::string TextOf(xmlNode *node) {
  xmlChar *const content = xmlNodeGetContent(node);
  std::string text = content ? reinterpret_cast<const char *>(content) : "";
  xmlFree(content);
  text.erase(std::remove_if(text.begin(), text.end(), [](char c) { return c == ' ' || c == '\n' || c == '\r'; }),
             text.end());
  return text;
}

/// The canonical form of `SignedInfo` by the method that it states; nothing when that method is not known.
std::optional<std::string> CanonicalSignedInfo(xmlDoc &document) {
  xmlNode *const method = ElementOfLibxml2(document, "CanonicalizationMethod");
  const std::string uri = AttributeOf(method, "Algorithm");
  OracleMethod oracle;
  oracle.isExclusive = uri.rfind("http://www.w3.org/2001/10/xml-exc-c14n#", 0) == 0;
  oracle.withComments = uri.size() > 13 && uri.substr(uri.size() - 13) == "#WithComments";
  const std::string bare = oracle.withComments ? uri.substr(0, uri.size() - (oracle.isExclusive ? 12 : 13)) : uri;
  if (bare != "http://www.w3.org/2001/10/xml-exc-c14n#" && bare != "http://www.w3.org/TR/2001/REC-xml-c14n-20010315") {
    return std::nullopt;
  }
  for (xmlNode *child = method->children; child; child = child->next) {
    std::istringstream prefixes(AttributeOf(child, "PrefixList"));
    for (std::string prefix; prefixes >> prefix;) {
      oracle.inclusivePrefixes.push_back(prefix);
    }
  }
  return CanonicalFormOfLibxml2(document, ElementOfLibxml2(document, "SignedInfo"), nullptr, oracle);
}

std::vector<xmlNode *> DigestValues(xmlDoc &document) {
  std::vector<xmlNode *> values;
  xmlNode *const signedInfo = ElementOfLibxml2(document, "SignedInfo");
  for (xmlNode *reference = signedInfo ? signedInfo->children : nullptr; reference; reference = reference->next) {
    for (xmlNode *child = reference->children; child && reference->type == XML_ELEMENT_NODE; child = child->next) {
      if (child->type == XML_ELEMENT_NODE &&
          std::string("DigestValue") == reinterpret_cast<const char *>(child->name)) {
        values.push_back(child);
      }
    }
  }
  return values;
}

void SetPssPadding(EVP_PKEY_CTX *context) {
  EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_PSS_PADDING);
  EVP_PKEY_CTX_set_rsa_pss_saltlen(context, RSA_PSS_SALTLEN_DIGEST);
}

const unsigned char *Bytes(const std::string &text) {
  return reinterpret_cast<const unsigned char *>(text.data());
}

} // namespace

PssOracle::PssOracle(const std::string &digest, std::string signatureUri, const std::string &rsaKeyPath,
                     const std::string &helperKeyPath)
    : m_digest(EVP_get_digestbyname(digest.c_str())), m_signatureUri(std::move(signatureUri)),
      m_helperKey(LoadXmlSecKey(helperKeyPath)) {
  BIO *const file = BIO_new_file(rsaKeyPath.c_str(), "r");
  m_key.reset(file ? PEM_read_bio_PrivateKey(file, nullptr, nullptr, nullptr) : nullptr);
  BIO_free(file);
  if (!m_key) {
    throw std::runtime_error("OpenSSL does not read " + rsaKeyPath);
  }
}

/// A copy into which the xmlsec1 library has written the right digests; null when it cannot.
XmlDocHandle PssOracle::WithFreshDigests(const xmlDoc &document) const {
  XmlDocHandle copy(xmlCopyDoc(const_cast<xmlDoc *>(&document), 1));
  xmlNode *const method = ElementOfLibxml2(*copy, "SignatureMethod");
  if (!method) {
    return nullptr;
  }
  xmlSetProp(method, XmlText("Algorithm"), XmlText(HELPER_ALGORITHM));
  return SignWithXmlSec(*copy, *m_helperKey) ? std::move(copy) : nullptr;
}

bool PssOracle::Sign(xmlDoc &document) const {
  const XmlDocHandle fresh = WithFreshDigests(document);
  if (!fresh) {
    return false;
  }
  const std::vector<xmlNode *> values = DigestValues(document);
  const std::vector<xmlNode *> freshValues = DigestValues(*fresh);
  for (std::size_t index = 0; index < values.size(); ++index) {
    xmlNodeSetContent(values[index], XmlText(TextOf(freshValues[index]).c_str()));
  }
  const std::string canonical = CanonicalSignedInfo(document).value();
  const ContextHandle context(EVP_MD_CTX_new());
  EVP_PKEY_CTX *keyContext = nullptr;
  EVP_DigestSignInit(context.get(), &keyContext, m_digest, nullptr, m_key.get());
  SetPssPadding(keyContext);
  std::size_t length = static_cast<std::size_t>(EVP_PKEY_get_size(m_key.get()));
  std::vector<unsigned char> value(length);
  if (EVP_DigestSign(context.get(), value.data(), &length, Bytes(canonical), canonical.size()) != 1) {
    return false;
  }
  std::vector<unsigned char> text(4 * (length / 3 + 1) + 1);
  EVP_EncodeBlock(text.data(), value.data(), static_cast<int>(length));
  xmlNodeSetContent(ElementOfLibxml2(document, "SignatureValue"), text.data());
  return true;
}

bool PssOracle::Verifies(const xmlDoc &document) const {
  const XmlDocHandle copy(xmlCopyDoc(const_cast<xmlDoc *>(&document), 1));
  const XmlDocHandle fresh = WithFreshDigests(document);
  if (!fresh || AttributeOf(ElementOfLibxml2(*copy, "SignatureMethod"), "Algorithm") != m_signatureUri) {
    return false;
  }
  const std::vector<xmlNode *> values = DigestValues(*copy);
  const std::vector<xmlNode *> freshValues = DigestValues(*fresh);
  for (std::size_t index = 0; index < values.size(); ++index) {
    if (TextOf(values[index]) != TextOf(freshValues[index])) {
      return false;
    }
  }
  const std::optional<std::string> canonical = CanonicalSignedInfo(*copy);
  const std::string text = TextOf(ElementOfLibxml2(*copy, "SignatureValue"));
  std::vector<unsigned char> value(text.size() + 4);
  const int length = EVP_DecodeBlock(value.data(), Bytes(text), static_cast<int>(text.size()));
  if (!canonical || length < EVP_PKEY_get_size(m_key.get())) {
    return false;
  }
  const ContextHandle context(EVP_MD_CTX_new());
  EVP_PKEY_CTX *keyContext = nullptr;
  EVP_DigestVerifyInit(context.get(), &keyContext, m_digest, nullptr, m_key.get());
  SetPssPadding(keyContext);
  // The decoder counts padding as bytes; the size of the key gives the real number.
  return EVP_DigestVerify(context.get(), value.data(), static_cast<std::size_t>(EVP_PKEY_get_size(m_key.get())),
                          Bytes(*canonical), canonical->size()) == 1;
}

} // namespace Testing
