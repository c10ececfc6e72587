// SPDX-License-Identifier: Apache-2.0
// Blank signatures, and signing them.

#include "crypto/public_key.h"
#include "xml/security/canonical_digest.h"
#include "xml/security/reference_target.h"
#include "xml/security/signature_profile.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/signature.h>

#include <utility>

namespace Tarvel::Xml::Security {

namespace {

[[noreturn]] void RefuseAlgorithm(const std::string &kind, std::string_view uri) {
  throw XmlSecurityException("Signing with the " + kind + " algorithm \"" + StringUtil::Shorten(uri) +
                             "\" is not supported");
}

void RequireExclusive(std::string_view canonicalizationUri) {
  if (canonicalizationUri != CanonicalizationUri::EXCLUSIVE) {
    RefuseAlgorithm("canonicalization", canonicalizationUri);
  }
}

SignatureAlgorithm RequireSigningAlgorithm(std::string_view uri) {
  const std::optional<SignatureAlgorithm> algorithm = FindSignatureAlgorithm(uri);
  if (!algorithm || algorithm->scheme == Crypto::SignatureScheme::RSA_PSS) {
    RefuseAlgorithm("signature", uri);
  }
  return *algorithm;
}

class BlankSignature final : public Signature {
public:
  BlankSignature(const Ref<ElementNode> &root, std::string_view signatureUri, std::string_view prefix)
      : m_root(root), m_algorithm(RequireSigningAlgorithm(signatureUri)), m_signatureUri(signatureUri),
        m_prefix(prefix) {}

  const std::vector<Reference> &GetReferences() const noexcept override { return m_references; }
  bool Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const override;
  bool Verify(const Crypto::VerifyingKey &key, Coverage &coverage) const override;
  void AddReference(std::string_view uri, std::string_view digestUri, std::string_view transformUri) override;
  void SetKeyInfo(const Ref<ElementNode> &content) override;
  void Sign(const Crypto::PrivateKey &key) override;
  Ref<ElementNode> GetElement() const override;
  SignatureReport Explain(const KeyInfoResolver &resolver) const override;

private:
  struct DigestMethod {
    std::string uri;
    Crypto::DigestAlgorithm algorithm;
  };

  void RequireUnsigned() const;
  void RequireSigned() const;
  Ref<Signature> Parsed() const;
  std::vector<std::uint8_t> SignatureValue(const ElementNode &signedInfo, const Crypto::PrivateKey &key) const;
  void AppendMethod(ElementNode &parent, std::string_view localName, std::string_view uri) const;
  void AppendText(ElementNode &parent, std::string_view localName, const std::string &text) const;
  void AppendReference(ElementNode &signedInfo, std::size_t index, const Node &target) const;
  const ElementNode &AppendSignedInfo(ElementNode &signature) const;

  const Ref<ElementNode> m_root;
  const SignatureAlgorithm m_algorithm;
  const std::string m_signatureUri;
  const std::string m_prefix;
  std::vector<Reference> m_references;
  std::vector<DigestMethod> m_digestMethods; // of the references, in their order
  Ref<ElementNode> m_keyInfoContent;
  Ref<ElementNode> m_element; // null until it is signed
};

bool BlankSignature::Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const {
  return Parsed()->Verify(resolver, signedUris);
}

bool BlankSignature::Verify(const Crypto::VerifyingKey &key, Coverage &coverage) const {
  return Parsed()->Verify(key, coverage);
}

SignatureReport BlankSignature::Explain(const KeyInfoResolver &resolver) const {
  return Parsed()->Explain(resolver);
}

/// The signature that was made, read from its element.
Ref<Signature> BlankSignature::Parsed() const {
  RequireSigned();
  Ref<Signature> parsed;
  CreateSignatureFromDom(*m_root, *m_element, parsed);
  return parsed;
}

void BlankSignature::AddReference(std::string_view uri, std::string_view digestUri, std::string_view transformUri) {
  RequireUnsigned();
  RequireExclusive(transformUri);
  const std::optional<Crypto::DigestAlgorithm> digest = FindDigestAlgorithm(digestUri);
  if (!digest) {
    RefuseAlgorithm("digest", digestUri);
  }
  m_digestMethods.push_back({std::string(digestUri), *digest});
  m_references.push_back({std::string(uri)});
}

void BlankSignature::SetKeyInfo(const Ref<ElementNode> &content) {
  RequireUnsigned();
  m_keyInfoContent = content;
}

void BlankSignature::Sign(const Crypto::PrivateKey &key) {
  RequireUnsigned();
  if (m_references.empty()) {
    throw XmlSecurityException("A signature without a reference signs nothing");
  }
  Ref<ElementNode> element;
  CreateElementNode(m_prefix, "Signature", element);
  element->DefineAttribute(m_prefix.empty() ? "xmlns" : "xmlns:" + m_prefix, SignatureUri::NAMESPACE);
  std::vector<std::uint8_t> value;
  try {
    value = SignatureValue(AppendSignedInfo(*element), key);
  } catch (const Crypto::CryptoException &exception) {
    throw XmlSecurityException(exception.what());
  }
  AppendText(*element, "SignatureValue", StringUtil::Base64Encode(value));
  if (m_keyInfoContent) {
    element->AppendElement(m_prefix, "KeyInfo")->AppendChild(m_keyInfoContent.get());
  }
  m_element = std::move(element);
}

void BlankSignature::RequireUnsigned() const {
  if (m_element) {
    throw InvalidStateException("The signature has been signed already");
  }
}

void BlankSignature::RequireSigned() const {
  if (!m_element) {
    throw InvalidStateException("The signature has not been signed yet");
  }
}

Ref<ElementNode> BlankSignature::GetElement() const {
  RequireSigned();
  return m_element;
}

const ElementNode &BlankSignature::AppendSignedInfo(ElementNode &signature) const {
  std::vector<ReferenceUri> uris;
  for (const Reference &reference : m_references) {
    uris.push_back({reference.uri});
  }
  const std::vector<const Node *> targets = ResolveReferences(*m_root, uris);
  ElementNode &signedInfo = *signature.AppendElement(m_prefix, "SignedInfo");
  AppendMethod(signedInfo, "CanonicalizationMethod", CanonicalizationUri::EXCLUSIVE);
  AppendMethod(signedInfo, "SignatureMethod", m_signatureUri);
  for (std::size_t index = 0; index < m_references.size(); ++index) {
    AppendReference(signedInfo, index, *targets[index]);
  }
  return signedInfo;
}

void BlankSignature::AppendReference(ElementNode &signedInfo, std::size_t index, const Node &target) const {
  const DigestMethod &digestMethod = m_digestMethods[index];
  ElementNode &reference = *signedInfo.AppendElement(m_prefix, "Reference");
  reference.DefineAttribute("URI", m_references[index].uri);
  AppendMethod(*reference.AppendElement(m_prefix, "Transforms"), "Transform", CanonicalizationUri::EXCLUSIVE);
  AppendMethod(reference, "DigestMethod", digestMethod.uri);
  CanonicalizationMethod method;
  method.isExclusive = true;
  const DigestValue digest = DigestCanonicalForm(target, method, nullptr, digestMethod.algorithm);
  AppendText(reference, "DigestValue",
             StringUtil::Base64Encode(digest.data(), Crypto::DigestBytes(digestMethod.algorithm)));
}

std::vector<std::uint8_t> BlankSignature::SignatureValue(const ElementNode &signedInfo,
                                                         const Crypto::PrivateKey &key) const {
  CanonicalizationMethod method;
  method.isExclusive = true;
  const DigestValue digest = DigestCanonicalForm(signedInfo, method, nullptr, m_algorithm.digest);
  return Crypto::SignDigest(key, m_algorithm.scheme, m_algorithm.digest, digest.data());
}

void BlankSignature::AppendMethod(ElementNode &parent, std::string_view localName, std::string_view uri) const {
  parent.AppendElement(m_prefix, localName)->DefineAttribute("Algorithm", uri);
}

void BlankSignature::AppendText(ElementNode &parent, std::string_view localName, const std::string &text) const {
  parent.AppendElement(m_prefix, localName)->AppendText(text);
}

} // namespace

void CreateBlankSignature(const Ref<ElementNode> &root, std::string_view canonicalizationUri,
                          std::string_view signatureUri, std::string_view prefix, Ref<Signature> &out) {
  if (!root) {
    throw InvalidArgumentException("a signature needs an element to resolve its references in");
  }
  RequireExclusive(canonicalizationUri);
  out = MakeRef<BlankSignature>(root, signatureUri, prefix);
}

} // namespace Tarvel::Xml::Security
