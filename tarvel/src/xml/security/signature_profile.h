// SPDX-License-Identifier: Apache-2.0
/// @file
/// The algorithms and forms of signatures that are accepted. Everything else is refused, and the message names it.

#pragma once

#include "crypto/digest.h"
#include "crypto/public_key.h"
#include "xml/security/canonical_form.h"
#include "xml/security/signature_syntax.h"

#include <optional>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

struct SignatureAlgorithm {
  Crypto::SignatureScheme scheme;
  Crypto::DigestAlgorithm digest;
};

/// How the digest of a reference is computed from its target.
struct ReferencePlan {
  bool omitsSignature = false;   ///< the enveloped-signature transform
  CanonicalizationMethod method; ///< never with comments: same-document references leave them out
  Crypto::DigestAlgorithm digest = Crypto::DigestAlgorithm::SHA256;
};

struct SignaturePlan {
  CanonicalizationMethod signedInfoMethod;
  SignatureAlgorithm algorithm;
  std::vector<ReferencePlan> references; ///< in the order of the syntax
};

std::optional<SignatureAlgorithm> FindSignatureAlgorithm(std::string_view uri);
std::optional<Crypto::DigestAlgorithm> FindDigestAlgorithm(std::string_view uri);

/// How to verify a signature that has this syntax.
/// @throws XmlSecurityException naming what is outside the profile.
SignaturePlan RequireProfile(const SignatureSyntax &syntax);

} // namespace Tarvel::Xml::Security
