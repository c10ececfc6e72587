// SPDX-License-Identifier: Apache-2.0
/// @file
/// The algorithms and forms of signatures that are accepted. Everything else is refused, and the message names it.

#pragma once

#include "crypto/digest.h"
#include "crypto/public_key.h"
#include "xml/security/canonical_form.h"
#include "xml/security/refusal_sink.h"
#include "xml/security/signature_syntax.h"

#include <cstddef>
#include <optional>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// Signatures with more references are refused, and the further references are not examined.
constexpr std::size_t MAX_REFERENCES = 10;

struct SignatureAlgorithm {
  Crypto::SignatureScheme scheme;
  Crypto::DigestAlgorithm digest;
};

/// How the digest of a reference is computed from its target.
struct ReferencePlan {
  bool omitsSignature = false;   ///< the enveloped-signature transform
  CanonicalizationMethod method; ///< never with comments: same-document references leave them out
  Crypto::DigestAlgorithm digest = Crypto::DigestAlgorithm::SHA256;
  bool isComputable = true; ///< whether the digest can be computed: no algorithm or transform is refused
};

/// How a signature is verified. Algorithms that are refused are missing.
struct SignaturePlan {
  std::optional<CanonicalizationMethod> signedInfoMethod;
  std::optional<SignatureAlgorithm> algorithm;
  std::vector<ReferencePlan> references; ///< in the order of the syntax, at most `MAX_REFERENCES`
};

std::optional<SignatureAlgorithm> FindSignatureAlgorithm(std::string_view uri);
std::optional<Crypto::DigestAlgorithm> FindDigestAlgorithm(std::string_view uri);

/// How to verify a signature that has this syntax. `sink` receives what is outside the profile. If the sink throws at
/// the first refusal, each plan that is returned is complete.
SignaturePlan RequireProfile(const SignatureSyntax &syntax, RefusalSink &sink);

} // namespace Tarvel::Xml::Security
