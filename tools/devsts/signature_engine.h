// SPDX-License-Identifier: Apache-2.0
/// @file
/// XML signatures by libxmlsec1, restricted to the profile that messages and tokens use: exclusive C14N, RSA-SHA256,
/// SHA-256.

#pragma once

#include "certificate.h"
#include "state_folder.h"
#include "xml_tree.h"

#include <xmlsec/keys.h>

#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace DevSts {

/// Initialises libxml2 and libxmlsec1, and cleans up after them. Create one for the whole process, before any thread
/// uses either.
class SignatureEngine {
public:
  SignatureEngine();
  SignatureEngine(const SignatureEngine &) = delete;
  SignatureEngine &operator=(const SignatureEngine &) = delete;
  ~SignatureEngine();
};

struct SignatureKeyDeleter {
  void operator()(xmlSecKey *key) const noexcept { xmlSecKeyDestroy(key); }
};
using SignatureKey = std::unique_ptr<xmlSecKey, SignatureKeyDeleter>;

/// The private key together with its certificate. @throws std::runtime_error
SignatureKey LoadSigningKey(const Identity &identity);

/// The public key of a certificate. @throws std::runtime_error
SignatureKey PublicKeyOf(const X509 &certificate);

/// The content of a signature's reference.
struct SignatureReference {
  std::string id; ///< of the element that is signed
  bool isEnveloped = false;
};

/// The references of a `ds:Signature`, in their order. @throws Refusal (wsse:UnsupportedAlgorithm,
/// wsse:InvalidSecurity) unless it has exactly the profile's form. Its transforms are the canonicalisation, optionally
/// preceded by "enveloped".
std::vector<SignatureReference> ReadReferences(const xmlNode &signature);

/// The canonical form of `ds:SignedInfo`, if the signature's value and all digests are right; otherwise nullopt. The
/// value is checked with `key`, for every `KeyInfo`. Call it after `RegisterIdentifiers` for the document and a
/// successful `ReadReferences`.
std::optional<std::vector<unsigned char>> VerifiedSignedInfo(xmlNode &signature, const SignatureKey &key);

/// Whether the signature verifies, under the same conditions.
bool VerifiesWith(xmlNode &signature, const SignatureKey &key);

/// Signs the whole `element`, whose identifier is `id`, with an enveloped signature after its child `sibling`.
/// @throws std::runtime_error
void SignEnveloped(xmlNode &element, const std::string &id, xmlNode &sibling, const SignatureKey &key);

} // namespace DevSts
