// SPDX-License-Identifier: Apache-2.0
// Signatures read from a tree, and their verification.

#include "crypto/public_key.h"
#include "xml/security/canonical_digest.h"
#include "xml/security/reference_target.h"
#include "xml/security/signature_profile.h"
#include "xml/security/signature_syntax.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/signature.h>

#include <openssl/crypto.h>

#include <vector>

namespace Tarvel::Xml::Security {

namespace {

constexpr unsigned MIN_RSA_BITS = 2048;

bool CanVerify(const Crypto::Certificate &certificate, Crypto::SignatureScheme scheme) {
  unsigned bits = 0;
  switch (Crypto::GetKeyKind(certificate, bits)) {
  case Crypto::KeyKind::RSA:
    return scheme != Crypto::SignatureScheme::ECDSA && bits >= MIN_RSA_BITS &&
           Crypto::HasAcceptableExponent(certificate);
  case Crypto::KeyKind::EC_P256:
  case Crypto::KeyKind::EC_P384:
  case Crypto::KeyKind::EC_P521:
    return scheme == Crypto::SignatureScheme::ECDSA;
  case Crypto::KeyKind::OTHER:
    return false;
  }
  return false;
}

bool IsWithin(const Node *node, const Node &apex) {
  while (node && node != &apex) {
    node = node->GetParent();
  }
  return node != nullptr;
}

class ParsedSignature final : public Signature {
public:
  ParsedSignature(const ElementNode &root, const ElementNode &element)
      : m_root(&root), m_element(&element), m_syntax(ReadSignatureSyntax(element)) {
    m_references.reserve(m_syntax.references.size());
    for (const ReferenceSyntax &reference : m_syntax.references) {
      m_references.push_back({std::string(reference.uri)});
    }
  }

  const std::vector<Reference> &GetReferences() const noexcept override { return m_references; }
  bool Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const override;
  void AddReference(std::string_view, std::string_view, std::string_view) override { RefuseChange(); }
  void SetKeyInfo(const Ref<ElementNode> &) override { RefuseChange(); }
  void Sign(const Crypto::PrivateKey &) override { RefuseChange(); }
  Ref<ElementNode> GetElement() const override { RefuseChange(); }
  SignatureReport Explain(const KeyInfoResolver &resolver) const override;

private:
  [[noreturn]] static void RefuseChange() {
    throw InvalidStateException("A signature that was taken from a document can only be verified");
  }

  bool IsGenuine(const KeyInfoResolver &resolver) const;
  Crypto::CertificateList UsableKeys(const KeyInfoResolver &resolver, Crypto::SignatureScheme scheme) const;
  std::vector<const Node *> Targets() const;
  void RequireTargetContainsSignature(const Node &target, const ReferencePlan &plan,
                                      const ReferenceSyntax &reference) const;
  bool DigestMatches(const Node &target, const ReferencePlan &plan, const ReferenceSyntax &reference) const;
  bool SignatureMatches(const SignaturePlan &plan, const Crypto::CertificateList &keys) const;

  const Ref<const ElementNode> m_root;
  const Ref<const ElementNode> m_element;
  const SignatureSyntax m_syntax;
  std::vector<Reference> m_references;
};

bool ParsedSignature::Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const {
  try {
    if (!IsGenuine(resolver)) {
      return false;
    }
  } catch (const Crypto::CryptoException &exception) {
    throw XmlSecurityException(exception.what());
  }
  for (const Reference &reference : m_references) {
    signedUris.insert(reference.uri);
  }
  return true;
}

bool ParsedSignature::IsGenuine(const KeyInfoResolver &resolver) const {
  const SignaturePlan plan = RequireProfile(m_syntax);
  const Crypto::CertificateList keys = UsableKeys(resolver, plan.algorithm.scheme);
  const std::vector<const Node *> targets = Targets();
  for (std::size_t index = 0; index < targets.size(); ++index) {
    RequireTargetContainsSignature(*targets[index], plan.references[index], m_syntax.references[index]);
  }
  // The digests may cost as much as hashing the document ten times. The signature is checked first, so that only a
  // signer can cause that work.
  if (!SignatureMatches(plan, keys)) {
    return false;
  }
  for (std::size_t index = 0; index < targets.size(); ++index) {
    if (!DigestMatches(*targets[index], plan.references[index], m_syntax.references[index])) {
      return false;
    }
  }
  return true;
}

Crypto::CertificateList ParsedSignature::UsableKeys(const KeyInfoResolver &resolver,
                                                    Crypto::SignatureScheme scheme) const {
  Crypto::CertificateList keys = resolver.Resolve(m_syntax.keyInfo);
  std::erase_if(keys, [scheme](const Ref<const Crypto::Certificate> &candidate) {
    return !candidate || !CanVerify(*candidate, scheme);
  });
  if (keys.empty()) {
    throw XmlSecurityException("No trusted key can be used with the signature algorithm \"" +
                               StringUtil::Shorten(m_syntax.signatureMethod.uri) + "\"");
  }
  return keys;
}

std::vector<const Node *> ParsedSignature::Targets() const {
  std::vector<std::string_view> uris;
  uris.reserve(m_syntax.references.size());
  for (const ReferenceSyntax &reference : m_syntax.references) {
    uris.push_back(reference.uri);
  }
  return ResolveReferences(*m_root, uris);
}

void ParsedSignature::RequireTargetContainsSignature(const Node &target, const ReferencePlan &plan,
                                                     const ReferenceSyntax &reference) const {
  const Node *const signature = m_element.get();
  if (plan.omitsSignature && (signature == &target || !IsWithin(signature, target))) {
    throw XmlSecurityException("The reference URI \"" + StringUtil::Shorten(reference.uri) +
                               "\" has the enveloped-signature transform, but does not envelop the signature");
  }
  // If the signature is the document element, nothing remains without it, and the digest of nothing matches every such
  // document.
  if (plan.omitsSignature && target.GetKind() == NodeKind::DOCUMENT && signature->GetParent() == &target) {
    throw XmlSecurityException("The reference URI \"" + StringUtil::Shorten(reference.uri) +
                               "\" covers nothing but the signature, which the enveloped-signature transform removes");
  }
}

bool ParsedSignature::DigestMatches(const Node &target, const ReferencePlan &plan,
                                    const ReferenceSyntax &reference) const {
  const Node *const omitted = plan.omitsSignature ? m_element.get() : nullptr;
  const DigestValue digest = DigestCanonicalForm(target, plan.method, omitted, plan.digest);
  return reference.digestValue.size() == Crypto::DigestBytes(plan.digest) &&
         CRYPTO_memcmp(reference.digestValue.data(), digest.data(), reference.digestValue.size()) == 0;
}

bool ParsedSignature::SignatureMatches(const SignaturePlan &plan, const Crypto::CertificateList &keys) const {
  const DigestValue digest =
      DigestCanonicalForm(*m_syntax.signedInfo, plan.signedInfoMethod, nullptr, plan.algorithm.digest);
  for (const Ref<const Crypto::Certificate> &key : keys) {
    if (Crypto::VerifyDigest(*key, plan.algorithm.scheme, plan.algorithm.digest, digest.data(),
                             m_syntax.signatureValue.data(), m_syntax.signatureValue.size())) {
      return true;
    }
  }
  return false;
}

SignatureReport ParsedSignature::Explain(const KeyInfoResolver &) const {
  return {};
}

} // namespace

Signature::~Signature() = default;

void CreateSignatureFromDom(const ElementNode &root, const ElementNode &signature, Ref<Signature> &out) {
  out = MakeRef<ParsedSignature>(root, signature);
}

} // namespace Tarvel::Xml::Security
