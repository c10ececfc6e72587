// SPDX-License-Identifier: Apache-2.0

#include "xml/security/signature_explanation.h"

#include "xml/security/key_info_certificates.h"

#include <tarvel/core/string_util.h>
#include <tarvel/xml/security/exceptions.h>

#include <algorithm>
#include <cstddef>
#include <optional>
#include <string>
#include <utility>

namespace Tarvel::Xml::Security {

namespace {

using Key = SignatureReport::Key;
using Refusal = SignatureReport::Refusal;

constexpr std::size_t MAX_LISTED_TRANSFORMS = 10; // of one reference

std::string TextOf(const std::vector<std::uint8_t> &digest) {
  return StringUtil::Shorten(StringUtil::Base64Encode(digest));
}

/// All keys that the resolver trusts. A verification does not ask for them, so a failure is not a refusal.
Crypto::CertificateList AllTrusted(const KeyInfoResolver &resolver) {
  try {
    return resolver.Resolve(nullptr);
  } catch (const XmlSecurityException &) {
    return {};
  } catch (const Crypto::CryptoException &) {
    return {};
  }
}

/// Runs the rules of a verification in their order. After a refusal, it continues with everything that can still be
/// checked.
class Explanation final : private RefusalSink {
public:
  Explanation(const SignatureInTree &signature, const KeyInfoResolver &resolver)
      : m_signature(signature), m_syntax(signature.syntax), m_resolver(resolver) {}

  SignatureReport Make();

private:
  Refusal &Add(SignatureRule rule, const std::string &message, const ElementNode *element) override;
  template <typename Action>
  bool Try(SignatureRule rule, const ElementNode *element, const Action &action);

  void CheckKeys();
  void ListKeys(const Crypto::CertificateList &selected);
  void ListNamedCertificates();
  Key *FindKey(const std::vector<std::uint8_t> &der);
  void CheckReferences();
  void ListReference(const ReferenceSyntax &syntax, const Node *target);
  void CheckValue();
  void TryKeys(const DigestValue &signedInfo);
  void TryKey(Key &key, const DigestValue &signedInfo);
  void TryUnselected(Key &key, const DigestValue &signedInfo);
  void NameUnselectedMaker();
  void CheckDigests();
  bool CheckDigest(std::size_t index);

  const SignatureInTree &m_signature;
  const SignatureSyntax &m_syntax;
  const KeyInfoResolver &m_resolver;
  SignaturePlan m_plan;
  std::vector<Key *> m_candidates;        // the keys that a verification tries, in its order
  std::vector<const Node *> m_digestible; // the target of each reference; null if its digest cannot be computed
  SignatureReport m_report;
};

SignatureReport Explanation::Make() {
  m_report.canonicalizationMethod = m_syntax.canonicalizationMethod.uri;
  m_report.signatureMethod = m_syntax.signatureMethod.uri;
  m_plan = RequireProfile(m_syntax, *this);
  CheckKeys();
  CheckReferences();
  CheckValue();
  CheckDigests();
  return std::move(m_report);
}

Refusal &Explanation::Add(SignatureRule rule, const std::string &message, const ElementNode *element) {
  return m_report.refusals.emplace_back(Refusal{rule, message, element, {}, {}});
}

/// Runs `action`; what a verification would throw becomes a refusal. @return whether nothing was thrown.
template <typename Action>
bool Explanation::Try(SignatureRule rule, const ElementNode *element, const Action &action) {
  try {
    action();
    return true;
  } catch (const XmlSecurityException &exception) {
    Add(rule, exception.what(), element);
  } catch (const Crypto::CryptoException &exception) {
    Add(rule, exception.what(), element);
  }
  return false;
}

void Explanation::CheckKeys() {
  Crypto::CertificateList selected;
  Crypto::CertificateList usable;
  const bool isResolved =
      Try(SignatureRule::KEYS, m_syntax.keyInfo, [&] { selected = m_resolver.Resolve(m_syntax.keyInfo); });
  if (isResolved && m_plan.algorithm) {
    usable = RequireUsableKeys(m_syntax, m_plan.algorithm->scheme, selected, *this);
  }
  ListKeys(DistinctCertificates(selected));
  for (const Ref<const Crypto::Certificate> &certificate : usable) {
    m_candidates.push_back(FindKey(certificate->GetDer()));
  }
  ListNamedCertificates();
}

void Explanation::ListKeys(const Crypto::CertificateList &selected) {
  Crypto::CertificateList all = AllTrusted(m_resolver);
  all.insert(all.end(), selected.begin(), selected.end());
  all = DistinctCertificates(all);
  for (const Ref<const Crypto::Certificate> &certificate : all) {
    const bool isUsableHere = m_plan.algorithm && IsUsable(*certificate, m_plan.algorithm->scheme);
    m_report.keys.push_back({certificate, false, isUsableHere, false});
  }
  if (selected.size() < all.size()) {
    for (const Ref<const Crypto::Certificate> &certificate : selected) {
      FindKey(certificate->GetDer())->isNamed = true;
    }
  }
}

/// The trusted key with that certificate, or null.
Key *Explanation::FindKey(const std::vector<std::uint8_t> &der) {
  const auto found = std::find_if(m_report.keys.begin(), m_report.keys.end(),
                                  [&der](const Key &key) { return key.certificate->GetDer() == der; });
  return found == m_report.keys.end() ? nullptr : &*found;
}

void Explanation::ListNamedCertificates() {
  if (!m_syntax.keyInfo) {
    return;
  }
  for (const std::string_view text : CertificateTexts(*m_syntax.keyInfo)) {
    const std::vector<std::uint8_t> der = DecodeCertificateText(text);
    if (Key *const key = FindKey(der)) {
      key->isNamed = true;
      m_report.namedCertificates.push_back(DescribeCertificate(*key->certificate));
      m_report.namedCertificates.back().isTrusted = true;
    } else {
      m_report.namedCertificates.push_back(DescribeStranger(der));
    }
  }
}

void Explanation::CheckReferences() {
  const std::vector<const Node *> targets = ResolveTargets(m_signature, m_plan, *this);
  m_report.references.reserve(targets.size());
  m_digestible.reserve(targets.size());
  for (std::size_t index = 0; index < targets.size(); ++index) {
    const ReferenceSyntax &syntax = m_syntax.references[index];
    const ReferencePlan &plan = m_plan.references[index];
    ListReference(syntax, targets[index]);
    const bool isAccepted =
        targets[index] && RequireTargetContainsSignature(m_signature, syntax, plan, *targets[index], *this);
    m_digestible.push_back(isAccepted && plan.isComputable ? targets[index] : nullptr);
  }
}

void Explanation::ListReference(const ReferenceSyntax &syntax, const Node *target) {
  SignatureReport::Reference &reference = m_report.references.emplace_back();
  reference.uri = syntax.uri;
  reference.target = target;
  for (const AlgorithmSyntax &transform : syntax.transforms) {
    if (reference.transforms.size() == MAX_LISTED_TRANSFORMS) {
      break;
    }
    reference.transforms.emplace_back(transform.uri);
  }
  reference.digestMethod = syntax.digestMethod.uri;
  reference.digestWanted = syntax.digestValue;
}

void Explanation::CheckValue() {
  if (!m_plan.algorithm || !m_plan.signedInfoMethod) {
    return;
  }
  DigestValue signedInfo{};
  if (Try(SignatureRule::VALUE, m_syntax.signedInfo,
          [&] { signedInfo = DigestSignedInfo(m_signature, *m_plan.signedInfoMethod, *m_plan.algorithm); })) {
    TryKeys(signedInfo);
  }
}

// A verification tries its candidates until it finds the key that made the value. All other usable keys are tried here
// only for the report, so a failure with one of them is not a refusal.
void Explanation::TryKeys(const DigestValue &signedInfo) {
  const std::size_t refusalsBefore = m_report.refusals.size();
  std::vector<const Key *> tried;
  bool isMade = false;
  for (std::size_t index = 0; index < m_candidates.size() && !isMade; ++index) {
    Key &key = *m_candidates[index];
    Try(SignatureRule::VALUE, m_syntax.signatureValueElement, [&] { TryKey(key, signedInfo); });
    isMade = key.madeSignature;
    tried.push_back(&key);
  }
  if (!m_candidates.empty() && !isMade && m_report.refusals.size() == refusalsBefore) {
    Add(SignatureRule::VALUE, "", m_syntax.signatureValueElement).wanted = "a signature by a trusted key";
  }
  for (Key &key : m_report.keys) {
    if (key.isUsable && std::find(tried.begin(), tried.end(), &key) == tried.end()) {
      TryUnselected(key, signedInfo);
    }
  }
  if (!isMade) {
    NameUnselectedMaker();
  }
}

void Explanation::TryKey(Key &key, const DigestValue &signedInfo) {
  key.madeSignature = IsMadeBy(Crypto::GetPreparedKey(*key.certificate), m_syntax, *m_plan.algorithm, signedInfo);
  m_report.isValueChecked = true;
}

void Explanation::TryUnselected(Key &key, const DigestValue &signedInfo) {
  try {
    TryKey(key, signedInfo);
  } catch (const Crypto::CryptoException &) { // A verification does not try this key.
  }
}

/// If a key that the `KeyInfo` does not select made the value, adds this key to the refusals that are about keys.
void Explanation::NameUnselectedMaker() {
  const auto maker =
      std::find_if(m_report.keys.begin(), m_report.keys.end(), [](const Key &key) { return key.madeSignature; });
  if (maker == m_report.keys.end()) {
    return;
  }
  const SignatureReport::NamedCertificate certificate = DescribeCertificate(*maker->certificate);
  for (Refusal &refusal : m_report.refusals) {
    if (refusal.rule == SignatureRule::KEYS || refusal.rule == SignatureRule::VALUE) {
      refusal.found = "a signature by the trusted key of \"" + certificate.subject + "\" (SHA-256 thumbprint " +
                      certificate.thumbprint + "), which KeyInfo does not select";
    }
  }
}

void Explanation::CheckDigests() {
  std::size_t computed = 0;
  for (std::size_t index = 0; index < m_digestible.size(); ++index) {
    if (m_digestible[index] && CheckDigest(index)) {
      ++computed;
    }
  }
  m_report.areDigestsComputed = computed > 0 && computed == m_syntax.references.size();
}

/// @return whether the digest could be computed.
bool Explanation::CheckDigest(std::size_t index) {
  const ReferenceSyntax &syntax = m_syntax.references[index];
  const ReferencePlan &plan = m_plan.references[index];
  DigestValue digest{};
  if (!Try(SignatureRule::DIGESTS, syntax.element,
           [&] { digest = DigestTarget(m_signature, plan, *m_digestible[index]); })) {
    return false;
  }
  SignatureReport::Reference &reference = m_report.references[index];
  reference.digestComputed.assign(digest.begin(), digest.begin() + Crypto::DigestBytes(plan.digest));
  reference.digestMatches = IsWanted(digest, syntax, plan);
  if (!reference.digestMatches) {
    Refusal &refusal = Add(SignatureRule::DIGESTS, "", syntax.digestValueElement);
    refusal.found = TextOf(reference.digestComputed);
    refusal.wanted = TextOf(reference.digestWanted);
  }
  return true;
}

} // namespace

SignatureReport ExplainSignature(const SignatureInTree &signature, const KeyInfoResolver &resolver) {
  return Explanation(signature, resolver).Make();
}

} // namespace Tarvel::Xml::Security
