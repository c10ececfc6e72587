// SPDX-License-Identifier: Apache-2.0

#include "xml/security/signature_rules.h"

#include "crypto/public_key.h"
#include "xml/security/reference_target.h"

#include <tarvel/core/string_util.h>

#include <openssl/crypto.h>

#include <algorithm>
#include <functional>
#include <string>

namespace Tarvel::Xml::Security {

namespace {

constexpr std::size_t MAX_DESCRIBED_KEYS = 10; // in one text

std::string DescribeKey(const Crypto::PreparedKey &key) {
  if (key.GetKind() == Crypto::KeyKind::OTHER) {
    return "a key that is neither RSA nor on an accepted curve";
  }
  const std::string bits = std::to_string(key.GetBits()) + " bits";
  if (key.GetKind() != Crypto::KeyKind::RSA) {
    return "an EC key of " + bits;
  }
  return "an RSA key of " + bits + (key.HasAcceptableExponent() ? "" : " with an unsafe public exponent");
}

std::string DescribeKeys(const Crypto::CertificateList &keys) {
  std::string text;
  for (std::size_t index = 0; index < std::min(keys.size(), MAX_DESCRIBED_KEYS); ++index) {
    text.append(text.empty() ? "" : ", ")
        .append(keys[index] ? DescribeKey(Crypto::GetPreparedKey(*keys[index])) : "no key");
  }
  if (keys.size() > MAX_DESCRIBED_KEYS) {
    text += ", and " + std::to_string(keys.size() - MAX_DESCRIBED_KEYS) + " more";
  }
  return text.empty() ? "no trusted key" : text;
}

/// Refuses the keys for the signature's algorithm. The caller adds what was found.
SignatureReport::Refusal &RefuseKeys(const std::string &message, const SignatureSyntax &syntax,
                                     Crypto::SignatureScheme scheme, RefusalSink &sink) {
  SignatureReport::Refusal &refusal =
      sink.Add(SignatureRule::KEYS, message + " \"" + StringUtil::Shorten(syntax.signatureMethod.uri) + "\"",
               syntax.signatureMethod.element);
  refusal.wanted = scheme == Crypto::SignatureScheme::ECDSA
                       ? "an EC key on the curve P-256, P-384 or P-521"
                       : "an RSA key of at least 2048 bits with an odd public exponent of at least 3";
  return refusal;
}

bool IsWithin(const Node *node, const Node &apex) {
  while (node && node != &apex) {
    node = node->GetParent();
  }
  return node != nullptr;
}

void RefuseTarget(const ReferenceSyntax &reference, const char *why, RefusalSink &sink) {
  SignatureReport::Refusal &refusal =
      sink.Add(SignatureRule::REFERENCES, "The reference URI \"" + StringUtil::Shorten(reference.uri) + "\" " + why,
               reference.element);
  refusal.found = StringUtil::Shorten(reference.uri);
  refusal.wanted = "an element that contains the signature and more";
}

} // namespace

bool IsUsable(const Crypto::PreparedKey &key, Crypto::SignatureScheme scheme) {
  const bool isRsa = key.GetKind() == Crypto::KeyKind::RSA;
  return isRsa == (scheme != Crypto::SignatureScheme::ECDSA) && Crypto::RefuseKey(key).empty();
}

bool IsUsable(const Crypto::Certificate &certificate, Crypto::SignatureScheme scheme) {
  return IsUsable(Crypto::GetPreparedKey(certificate), scheme);
}

void RequireUsableKey(const SignatureSyntax &syntax, Crypto::SignatureScheme scheme, const Crypto::PreparedKey &key,
                      RefusalSink &sink) {
  if (!IsUsable(key, scheme)) {
    RefuseKeys("The key cannot be used with the signature algorithm", syntax, scheme, sink).found = DescribeKey(key);
  }
}

Crypto::CertificateList RequireUsableKeys(const SignatureSyntax &syntax, Crypto::SignatureScheme scheme,
                                          Crypto::CertificateList candidates, RefusalSink &sink) {
  const auto isUsable = [scheme](const Ref<const Crypto::Certificate> &candidate) {
    return candidate && IsUsable(*candidate, scheme);
  };
  if (std::none_of(candidates.begin(), candidates.end(), isUsable)) {
    RefuseKeys("No trusted key can be used with the signature algorithm", syntax, scheme, sink).found =
        DescribeKeys(candidates);
  }
  std::erase_if(candidates, std::not_fn(isUsable));
  return candidates;
}

std::vector<const Node *> ResolveTargets(const SignatureInTree &signature, const SignaturePlan &plan,
                                         RefusalSink &sink) {
  std::vector<ReferenceUri> uris;
  uris.reserve(plan.references.size());
  for (std::size_t index = 0; index < plan.references.size(); ++index) {
    const ReferenceSyntax &reference = signature.syntax.references[index];
    uris.push_back({reference.uri, reference.element});
  }
  return ResolveReferences(*signature.root, uris, sink);
}

bool RequireTargetContainsSignature(const SignatureInTree &signature, const ReferenceSyntax &reference,
                                    const ReferencePlan &plan, const Node &target, RefusalSink &sink) {
  const Node *const element = signature.element.get();
  if (plan.omitsSignature && (element == &target || !IsWithin(element, target))) {
    RefuseTarget(reference, "has the enveloped-signature transform, but does not envelop the signature", sink);
    return false;
  }
  // If the signature is the document element, nothing remains without it, and the digest of nothing matches every such
  // document.
  if (plan.omitsSignature && target.GetKind() == NodeKind::DOCUMENT && element->GetParent() == &target) {
    RefuseTarget(reference, "covers nothing but the signature, which the enveloped-signature transform removes", sink);
    return false;
  }
  return true;
}

DigestValue DigestSignedInfo(const SignatureInTree &signature, const CanonicalizationMethod &method,
                             SignatureAlgorithm algorithm) {
  return DigestCanonicalForm(*signature.syntax.signedInfo, method, nullptr, algorithm.digest);
}

bool IsMadeBy(const Crypto::PreparedKey &key, const SignatureSyntax &syntax, SignatureAlgorithm algorithm,
              const DigestValue &signedInfo) {
  return Crypto::VerifyDigest(key, algorithm.scheme, algorithm.digest, signedInfo.data(), syntax.signatureValue.data(),
                              syntax.signatureValue.size());
}

DigestValue DigestTarget(const SignatureInTree &signature, const ReferencePlan &plan, const Node &target) {
  const Node *const omitted = plan.omitsSignature ? signature.element.get() : nullptr;
  return DigestCanonicalForm(target, plan.method, omitted, plan.digest);
}

bool IsWanted(const DigestValue &digest, const ReferenceSyntax &reference, const ReferencePlan &plan) {
  return reference.digestValue.size() == Crypto::DigestBytes(plan.digest) &&
         CRYPTO_memcmp(reference.digestValue.data(), digest.data(), reference.digestValue.size()) == 0;
}

} // namespace Tarvel::Xml::Security
