// SPDX-License-Identifier: Apache-2.0
/// @file
/// The rules of a signature's verification that are checked after the profile: keys, references, value and digests.

#pragma once

#include "crypto/prepared_key.h"
#include "xml/security/canonical_digest.h"
#include "xml/security/refusal_sink.h"
#include "xml/security/signature_profile.h"
#include "xml/security/signature_syntax.h"

#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <vector>

namespace Tarvel::Xml::Security {

/// A signature that was read from a tree. It keeps the tree alive.
struct SignatureInTree {
  Ref<const ElementNode> root; ///< an element of the tree in which references resolve
  Ref<const ElementNode> element;
  SignatureSyntax syntax;
};

/// Whether the key, or the certificate's key, can be used with a scheme.
bool IsUsable(const Crypto::PreparedKey &key, Crypto::SignatureScheme scheme);
bool IsUsable(const Crypto::Certificate &certificate, Crypto::SignatureScheme scheme);

/// If the key cannot be used with the scheme, `sink` receives a refusal.
void RequireUsableKey(const SignatureSyntax &syntax, Crypto::SignatureScheme scheme, const Crypto::PreparedKey &key,
                      RefusalSink &sink);

/// The usable keys of `candidates`, which may contain nulls. If no key is usable, `sink` receives a refusal.
Crypto::CertificateList RequireUsableKeys(const SignatureSyntax &syntax, Crypto::SignatureScheme scheme,
                                          Crypto::CertificateList candidates, RefusalSink &sink);

/// The targets of the planned references, in their order. If a URI does not resolve, `sink` receives a refusal, and the
/// target is null.
std::vector<const Node *> ResolveTargets(const SignatureInTree &signature, const SignaturePlan &plan,
                                         RefusalSink &sink);

/// Whether `target` contains the signature and more, if the reference has the enveloped-signature transform; always
/// true without that transform. If the result is false, `sink` has received a refusal.
bool RequireTargetContainsSignature(const SignatureInTree &signature, const ReferenceSyntax &reference,
                                    const ReferencePlan &plan, const Node &target, RefusalSink &sink);

/// The digest that the signature's value signs.
/// @throws what `DigestCanonicalForm` throws.
DigestValue DigestSignedInfo(const SignatureInTree &signature, const CanonicalizationMethod &method,
                             SignatureAlgorithm algorithm);

/// Whether a key made the signature's value over the digest `signedInfo`.
/// @throws what `Crypto::VerifyDigest` throws.
bool IsMadeBy(const Crypto::PreparedKey &key, const SignatureSyntax &syntax, SignatureAlgorithm algorithm,
              const DigestValue &signedInfo);

/// The digest of `target`, for which `RequireTargetContainsSignature` must be true.
/// @throws what `DigestCanonicalForm` throws.
DigestValue DigestTarget(const SignatureInTree &signature, const ReferencePlan &plan, const Node &target);

/// Whether a digest is the one that the reference wants.
bool IsWanted(const DigestValue &digest, const ReferenceSyntax &reference, const ReferencePlan &plan);

} // namespace Tarvel::Xml::Security
