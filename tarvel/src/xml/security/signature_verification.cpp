// SPDX-License-Identifier: Apache-2.0
// Signatures read from a tree, and their verification.

#include "xml/security/signature_explanation.h"
#include "xml/security/signature_rules.h"

#include <tarvel/core/exception.h>
#include <tarvel/xml/security/signature.h>

#include <algorithm>
#include <vector>

namespace Tarvel::Xml::Security {

namespace {

using KeyList = std::vector<const Crypto::PreparedKey *>; // never null

Signature::Coverage CoverageOf(const SignaturePlan &plan, const std::vector<const Node *> &targets,
                               const DigestValue &signedInfo) {
  Signature::Coverage coverage;
  coverage.targets.reserve(targets.size());
  for (std::size_t index = 0; index < targets.size(); ++index) {
    coverage.targets.push_back({targets[index], plan.references[index].omitsSignature});
  }
  const std::size_t length = Crypto::DigestBytes(plan.algorithm->digest);
  coverage.signedInfoDigest.assign(signedInfo.begin(), signedInfo.begin() + length);
  return coverage;
}

class ParsedSignature final : public Signature {
public:
  ParsedSignature(const ElementNode &root, const ElementNode &element)
      : m_signature{Ref<const ElementNode>(&root), Ref<const ElementNode>(&element), ReadSignatureSyntax(element)} {
    m_references.reserve(m_signature.syntax.references.size());
    for (const ReferenceSyntax &reference : m_signature.syntax.references) {
      m_references.push_back({std::string(reference.uri)});
    }
  }

  const std::vector<Reference> &GetReferences() const noexcept override { return m_references; }
  bool Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const override;
  bool Verify(const Crypto::VerifyingKey &key, Coverage &coverage) const override;
  void AddReference(std::string_view, std::string_view, std::string_view) override { RefuseChange(); }
  void SetKeyInfo(const Ref<ElementNode> &) override { RefuseChange(); }
  void Sign(const Crypto::PrivateKey &) override { RefuseChange(); }
  Ref<ElementNode> GetElement() const override { RefuseChange(); }
  SignatureReport Explain(const KeyInfoResolver &resolver) const override {
    return ExplainSignature(m_signature, resolver);
  }

private:
  [[noreturn]] static void RefuseChange() {
    throw InvalidStateException("A signature that was taken from a document can only be verified");
  }

  template <typename SelectKeys>
  bool IsGenuine(const SelectKeys &selectKeys, Coverage *coverage) const;
  bool AreDigestsWanted(const SignaturePlan &plan, const std::vector<const Node *> &targets) const;

  const SignatureInTree m_signature;
  std::vector<Reference> m_references;
};

bool ParsedSignature::Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const {
  Crypto::CertificateList usable; // keeps the keys alive
  const auto selectKeys = [&](Crypto::SignatureScheme scheme) {
    const SignatureSyntax &syntax = m_signature.syntax;
    usable = RequireUsableKeys(syntax, scheme, resolver.Resolve(syntax.keyInfo), ThrowingSink());
    KeyList keys;
    keys.reserve(usable.size());
    for (const Ref<const Crypto::Certificate> &certificate : usable) {
      keys.push_back(&Crypto::GetPreparedKey(*certificate));
    }
    return keys;
  };
  if (!IsGenuine(selectKeys, nullptr)) {
    return false;
  }
  for (const Reference &reference : m_references) {
    signedUris.insert(reference.uri);
  }
  return true;
}

bool ParsedSignature::Verify(const Crypto::VerifyingKey &key, Coverage &coverage) const {
  const Crypto::PreparedKey &prepared = Crypto::GetPreparedKey(key);
  const auto selectKeys = [&](Crypto::SignatureScheme scheme) {
    RequireUsableKey(m_signature.syntax, scheme, prepared, ThrowingSink());
    return KeyList{&prepared};
  };
  return IsGenuine(selectKeys, &coverage);
}

/// @param selectKeys returns the keys that can be used with a scheme, or throws
/// @param coverage may be null
template <typename SelectKeys>
bool ParsedSignature::IsGenuine(const SelectKeys &selectKeys, Coverage *coverage) const try {
  RefusalSink &sink = ThrowingSink();
  const SignatureSyntax &syntax = m_signature.syntax;
  const SignaturePlan plan = RequireProfile(syntax, sink);
  const SignatureAlgorithm algorithm = plan.algorithm.value();
  const KeyList keys = selectKeys(algorithm.scheme);
  const std::vector<const Node *> targets = ResolveTargets(m_signature, plan, sink);
  for (std::size_t index = 0; index < targets.size(); ++index) {
    RequireTargetContainsSignature(m_signature, syntax.references[index], plan.references[index], *targets[index],
                                   sink);
  }
  // The digests may cost as much as hashing the document ten times. The signature is checked first, so that only a
  // signer can cause that work.
  const DigestValue signedInfo = DigestSignedInfo(m_signature, plan.signedInfoMethod.value(), algorithm);
  const bool isMade = std::any_of(keys.begin(), keys.end(), [&](const Crypto::PreparedKey *key) {
    return IsMadeBy(*key, syntax, algorithm, signedInfo);
  });
  if (!isMade || !AreDigestsWanted(plan, targets)) {
    return false;
  }
  if (coverage) {
    *coverage = CoverageOf(plan, targets, signedInfo);
  }
  return true;
} catch (const Crypto::CryptoException &exception) {
  throw XmlSecurityException(exception.what());
}

bool ParsedSignature::AreDigestsWanted(const SignaturePlan &plan, const std::vector<const Node *> &targets) const {
  for (std::size_t index = 0; index < targets.size(); ++index) {
    const ReferencePlan &reference = plan.references[index];
    if (!IsWanted(DigestTarget(m_signature, reference, *targets[index]), m_signature.syntax.references[index],
                  reference)) {
      return false;
    }
  }
  return true;
}

} // namespace

Signature::~Signature() = default;

void CreateSignatureFromDom(const ElementNode &root, const ElementNode &signature, Ref<Signature> &out) {
  out = MakeRef<ParsedSignature>(root, signature);
}

} // namespace Tarvel::Xml::Security
