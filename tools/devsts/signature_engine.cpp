// SPDX-License-Identifier: Apache-2.0

#include "signature_engine.h"

#include "refusal.h"

#include <libxml/parser.h>
#include <libxml/xmlerror.h>
#include <xmlsec/base64.h>
#include <xmlsec/errors.h>
#include <xmlsec/openssl/app.h>
#include <xmlsec/openssl/crypto.h>
#include <xmlsec/openssl/evp.h>
#include <xmlsec/templates.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmlsec.h>

#include <stdexcept>

namespace DevSts {

namespace {

// Longer than any certificate, so that Base64 text has no line breaks. Not every version of libxmlsec1 accepts 0.
constexpr int LINE_SIZE = 1 << 20;

struct ContextDeleter {
  void operator()(xmlSecDSigCtx *context) const noexcept { xmlSecDSigCtxDestroy(context); }
};
using Context = std::unique_ptr<xmlSecDSigCtx, ContextDeleter>;

// The messages of the libraries are dropped, because the service itself logs each refusal, in one line.
void DropError(const char *, int, const char *, const char *, const char *, int, const char *) {}
void DropXmlError(void *, const char *, ...) {} // NOLINT(cert-dcl50-cpp): libxml2's own signature

Context NewContext(const SignatureKey &key) {
  Context context(xmlSecDSigCtxCreate(nullptr));
  if (!context) {
    throw std::bad_alloc();
  }
  context->signKey = xmlSecKeyDuplicate(key.get());
  if (!context->signKey) {
    throw std::bad_alloc();
  }
  context->enabledReferenceUris = xmlSecTransformUriTypeSameDocument;
  return context;
}

/// Checks the element's algorithm. @throws Refusal unless it is the expected one, without parameters
void RequireAlgorithm(const xmlNode &method, std::string_view expected) {
  const std::string algorithm = AttributeOf(method, "Algorithm").value_or("");
  if (algorithm != expected || !ChildElements(method).empty()) {
    throw Refusal(Code::UNSUPPORTED_ALGORITHM, "unsupported algorithm or parameters: '" + algorithm + "'");
  }
}

/// The children of `parent`. @throws Refusal unless they are exactly these, in this order
std::vector<xmlNode *> RequireChildren(const xmlNode &parent, std::initializer_list<const char *> names) {
  std::vector<xmlNode *> children = ChildElements(parent);
  bool matches = children.size() == names.size();
  for (std::size_t i = 0; matches && i < children.size(); ++i) {
    matches = IsElement(*children[i], Ns::DS, names.begin()[i]);
  }
  if (!matches) {
    throw Refusal(Code::INVALID_SECURITY,
                  "unexpected content of ds:" + std::string(reinterpret_cast<const char *>(parent.name)));
  }
  return children;
}

// libxmlsec1 puts the identifier into an XPointer, so it must not contain a quotation mark.
bool IsPlainIdentifier(std::string_view id) {
  constexpr std::string_view PLAIN = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_.-";
  return !id.empty() && id.find_first_not_of(PLAIN) == std::string_view::npos;
}

SignatureReference ReadReference(const xmlNode &reference) {
  const std::vector<xmlNode *> parts = RequireChildren(reference, {"Transforms", "DigestMethod", "DigestValue"});
  const std::string uri = AttributeOf(reference, "URI").value_or("");
  SignatureReference result;
  result.id = uri.substr(uri.empty() ? 0 : 1);
  if (uri.rfind('#', 0) != 0 || !IsPlainIdentifier(result.id)) {
    throw Refusal(Code::INVALID_SECURITY, "a signature may refer only to elements of the message");
  }
  std::vector<xmlNode *> transforms = ChildElements(*parts[0]);
  result.isEnveloped = transforms.size() == 2;
  if (result.isEnveloped) {
    RequireAlgorithm(*transforms.front(), ENVELOPED_SIGNATURE);
    transforms.erase(transforms.begin());
  }
  if (transforms.size() != 1) {
    throw Refusal(Code::UNSUPPORTED_ALGORITHM, "unsupported number of transforms");
  }
  RequireAlgorithm(*transforms.front(), EXCLUSIVE_C14N);
  RequireAlgorithm(*parts[1], SHA256);
  return result;
}

} // namespace

SignatureEngine::SignatureEngine() {
  xmlInitParser();
  xmlThrDefSetGenericErrorFunc(nullptr, DropXmlError);
  xmlSetGenericErrorFunc(nullptr, DropXmlError);
  if (xmlSecInit() < 0 || xmlSecOpenSSLAppInit(nullptr) < 0 || xmlSecOpenSSLInit() < 0) {
    throw std::runtime_error("libxmlsec1 does not start");
  }
  xmlSecErrorsSetCallback(DropError);
  xmlSecBase64SetDefaultLineSize(LINE_SIZE);
}

SignatureEngine::~SignatureEngine() {
  xmlSecOpenSSLShutdown();
  xmlSecOpenSSLAppShutdown();
  xmlSecShutdown();
  xmlCleanupParser();
}

SignatureKey LoadSigningKey(const Identity &identity) {
  SignatureKey key(
      xmlSecOpenSSLAppKeyLoad(identity.keyFile.c_str(), xmlSecKeyDataFormatPem, nullptr, nullptr, nullptr));
  if (!key || xmlSecOpenSSLAppKeyCertLoad(key.get(), identity.certificateFile.c_str(), xmlSecKeyDataFormatPem) < 0) {
    throw std::runtime_error(identity.keyFile.string() + ": libxmlsec1 cannot read it");
  }
  return key;
}

SignatureKey PublicKeyOf(const X509 &certificate) {
  EVP_PKEY *const publicKey = X509_get0_pubkey(&certificate);
  SignatureKey key(xmlSecKeyCreate());
  if (!publicKey || !key) {
    throw std::runtime_error("a certificate without a usable key");
  }
  EVP_PKEY_up_ref(publicKey);
  xmlSecKeyData *const data = xmlSecOpenSSLEvpKeyAdopt(publicKey);
  if (!data) {
    EVP_PKEY_free(publicKey);
    throw std::runtime_error("a key of unknown kind");
  }
  if (xmlSecKeySetValue(key.get(), data) < 0) {
    xmlSecKeyDataDestroy(data);
    throw std::runtime_error("a key that libxmlsec1 does not accept");
  }
  return key;
}

std::vector<SignatureReference> ReadReferences(const xmlNode &signature) {
  const xmlNode &signedInfo = *RequireChildren(signature, {"SignedInfo", "SignatureValue", "KeyInfo"})[0];
  const std::vector<xmlNode *> parts = ChildElements(signedInfo);
  if (parts.size() < 3 || !IsElement(*parts[0], Ns::DS, "CanonicalizationMethod") ||
      !IsElement(*parts[1], Ns::DS, "SignatureMethod")) {
    throw Refusal(Code::INVALID_SECURITY, "unexpected content of ds:SignedInfo");
  }
  RequireAlgorithm(*parts[0], EXCLUSIVE_C14N);
  RequireAlgorithm(*parts[1], RSA_SHA256);
  std::vector<SignatureReference> references;
  for (std::size_t i = 2; i < parts.size(); ++i) {
    if (!IsElement(*parts[i], Ns::DS, "Reference")) {
      throw Refusal(Code::INVALID_SECURITY, "unexpected content of ds:SignedInfo");
    }
    references.push_back(ReadReference(*parts[i]));
  }
  return references;
}

std::optional<std::vector<unsigned char>> VerifiedSignedInfo(xmlNode &signature, const SignatureKey &key) {
  const Context context = NewContext(key);
  context->flags |= XMLSEC_DSIG_FLAGS_STORE_SIGNATURE;
  if (xmlSecDSigCtxVerify(context.get(), &signature) < 0 || context->status != xmlSecDSigStatusSucceeded) {
    return std::nullopt;
  }
  xmlSecBuffer *const octets = xmlSecDSigCtxGetPreSignBuffer(context.get());
  if (!octets) {
    throw std::runtime_error("libxmlsec1 does not keep what it verifies");
  }
  const unsigned char *const begin = xmlSecBufferGetData(octets);
  return std::vector<unsigned char>(begin, begin + xmlSecBufferGetSize(octets));
}

bool VerifiesWith(xmlNode &signature, const SignatureKey &key) {
  return VerifiedSignedInfo(signature, key).has_value();
}

void SignEnveloped(xmlNode &element, const std::string &id, xmlNode &sibling, const SignatureKey &key) {
  xmlNode *const signature = xmlSecTmplSignatureCreateNsPref(element.doc, xmlSecTransformExclC14NId,
                                                             xmlSecOpenSSLTransformRsaSha256Id, nullptr, XmlText("ds"));
  if (!signature) {
    throw std::bad_alloc();
  }
  xmlAddNextSibling(&sibling, signature);
  const std::string uri = "#" + id;
  xmlNode *const reference = xmlSecTmplSignatureAddReference(signature, xmlSecOpenSSLTransformSha256Id, nullptr,
                                                             XmlText(uri.c_str()), nullptr);
  xmlNode *const keyInfo = xmlSecTmplSignatureEnsureKeyInfo(signature, nullptr);
  if (!reference || !xmlSecTmplReferenceAddTransform(reference, xmlSecTransformEnvelopedId) ||
      !xmlSecTmplReferenceAddTransform(reference, xmlSecTransformExclC14NId) || !keyInfo) {
    throw std::bad_alloc();
  }
  xmlNode *const x509Data = xmlSecTmplKeyInfoAddX509Data(keyInfo);
  if (!x509Data || !xmlSecTmplX509DataAddCertificate(x509Data)) {
    throw std::bad_alloc();
  }
  const Context context = NewContext(key);
  if (xmlSecDSigCtxSign(context.get(), signature) < 0) {
    throw std::runtime_error("libxmlsec1 cannot sign the token");
  }
}

} // namespace DevSts
