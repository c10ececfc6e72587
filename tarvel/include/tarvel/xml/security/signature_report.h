// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SignatureReport`, what each rule of a signature's verification checked and found.

#pragma once

#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel::Xml::Security {

/// The rules of a verification, in their order.
enum class SignatureRule : std::uint8_t {
  PROFILE,    ///< algorithms, transforms and parts are those of the profile
  KEYS,       ///< a trusted key can be used with the signature's algorithm
  REFERENCES, ///< each reference resolves to one node, which contains the signature if it is enveloped
  VALUE,      ///< a key made the signature's value
  DIGESTS     ///< each reference has the digest of its target
};

/// The result of `Signature::Explain`. None of it may be trusted. Texts are as the sender wrote them. Pointers to
/// elements are valid as long as the signature's tree exists.
struct SignatureReport {
  /// One reason to refuse the signature.
  struct Refusal {
    SignatureRule rule = SignatureRule::PROFILE; ///< the rule that refuses the signature
    std::string message; ///< the text of the `XmlSecurityException` that `Verify` would throw; empty if
                         ///< `Verify` would return false
    const ElementNode *element = nullptr; ///< the place; null if there is none
    std::string found;  ///< what is there, shortened as in messages, or the computed digest; may be empty
    std::string wanted; ///< what the rule accepts there, or the digest in the reference; may be empty
  };

  /// One reference.
  struct Reference {
    std::string uri;                        ///< "" is the document, "#x" the element whose identifier is x
    const Node *target = nullptr;           ///< null if it does not resolve to exactly one node
    std::vector<std::string> transforms;    ///< the first ten
    std::string digestMethod;               ///< URI of the algorithm
    std::vector<std::uint8_t> digestWanted; ///< the octets of the DigestValue
    /// Empty if the digest cannot be computed: there is no target, or the target does not contain the signature
    /// although it should, or an algorithm is refused, or there is no canonical form.
    std::vector<std::uint8_t> digestComputed;
    bool digestMatches = false; ///< whether the two digests are the same
  };

  /// A key that the resolver trusts.
  struct Key {
    Ref<const Crypto::Certificate> certificate; ///< never null
    bool isNamed = false;                       ///< the `KeyInfo` contains its certificate, or selects it among others
    bool isUsable = false;                      ///< it can be used with the signature's algorithm
    bool madeSignature = false;                 ///< it made the signature's value
  };

  /// A certificate in the `KeyInfo`. It is only shown, and never used as a key. A certificate of more than 64 KiB is
  /// not read, unless it is trusted.
  struct NamedCertificate {
    std::string subject;    ///< empty if it cannot be read
    std::string thumbprint; ///< from `Certificate::GetSha256Thumbprint`; empty if it cannot be read
    bool isTrusted = false; ///< whether it is, byte for byte, the certificate of a trusted key
  };

  std::string canonicalizationMethod;              ///< URI of the algorithm
  std::string signatureMethod;                     ///< URI of the algorithm
  std::vector<Reference> references;               ///< the first ten
  std::vector<Key> keys;                           ///< all keys that the resolver trusts, each once, in order
  std::vector<NamedCertificate> namedCertificates; ///< the first 16 X509Certificate elements that contain only text
  /// In the order of the rules. Empty exactly when `Verify` returns true. Otherwise `Verify` throws an
  /// `XmlSecurityException` with the first message, or returns false if the first message is empty.
  std::vector<Refusal> refusals;
  bool areDigestsComputed = false; ///< whether there are references, and all their digests could be computed
  bool isValueChecked = false;     ///< whether at least one key could be tried
};

} // namespace Tarvel::Xml::Security
