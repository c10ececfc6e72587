// SPDX-License-Identifier: Apache-2.0
/// @file
/// XML Signature, in the strict profile that tokens and messages need.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/crypto/verifying_key.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/key_info_resolver.h>
#include <tarvel/xml/security/signature_report.h>

#include <cstdint>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// Algorithm URIs that the profile accepts for signatures, digests and transforms, apart from canonicalisation.
namespace SignatureUri {
constexpr std::string_view RSA_SHA256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
constexpr std::string_view RSA_SHA384 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha384";
constexpr std::string_view RSA_SHA512 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha512";
constexpr std::string_view RSA_PSS_SHA256 = "http://www.w3.org/2007/05/xmldsig-more#sha256-rsa-MGF1";
constexpr std::string_view RSA_PSS_SHA384 = "http://www.w3.org/2007/05/xmldsig-more#sha384-rsa-MGF1";
constexpr std::string_view RSA_PSS_SHA512 = "http://www.w3.org/2007/05/xmldsig-more#sha512-rsa-MGF1";
constexpr std::string_view ECDSA_SHA256 = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256";
constexpr std::string_view ECDSA_SHA384 = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha384";
constexpr std::string_view ECDSA_SHA512 = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha512";
constexpr std::string_view DIGEST_SHA256 = "http://www.w3.org/2001/04/xmlenc#sha256";
constexpr std::string_view DIGEST_SHA384 = "http://www.w3.org/2001/04/xmldsig-more#sha384";
constexpr std::string_view DIGEST_SHA512 = "http://www.w3.org/2001/04/xmlenc#sha512";
constexpr std::string_view ENVELOPED_SIGNATURE = "http://www.w3.org/2000/09/xmldsig#enveloped-signature";
constexpr std::string_view NAMESPACE = "http://www.w3.org/2000/09/xmldsig#";
} // namespace SignatureUri

/// One `ds:Signature`: either read from a tree, for verification, or blank, for signing. Verification may run on
/// several threads at once; `AddReference`, `SetKeyInfo` and `Sign` are for one thread.
class TARVEL_API Signature : public Object {
public:
  /// One `ds:Reference`.
  struct Reference {
    std::string uri; ///< "" is the document, "#x" the element whose identifier is x
  };

  /// The references in document order.
  virtual const std::vector<Reference> &GetReferences() const noexcept = 0;

  /// Checks the signature over `SignedInfo` with each candidate key until one matches, and then the digest of every
  /// reference. In this order, only a signer can cause the work of computing the digests.
  /// @param signedUris the URIs of the references are added to it if the result is true; otherwise it is unchanged.
  /// @return false when a digest or the signature value is wrong.
  /// @throws OutOfMemoryException, and InvalidStateException when OpenSSL has cleaned itself up: neither is a verdict.
  /// @throws XmlSecurityException for an algorithm outside the profile, a reference that does not resolve to exactly one
  ///         node, a tree without a canonical form, or when no candidate key can be used with the signature's algorithm.
  virtual bool Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const = 0;

  /// What a signature covers, after its verification.
  struct Coverage {
    /// The target of a reference. What was signed is its canonical form.
    struct Target {
      const Node *node = nullptr;  ///< an element, or the document; never null; of the signature's tree
      bool omitsSignature = false; ///< the target contains the signature itself, which is not part of what was signed
    };
    std::vector<Target> targets;                ///< in the order of the references
    std::vector<std::uint8_t> signedInfoDigest; ///< of the canonical `SignedInfo`; the signature's value signs it
  };

  /// The same checks with one key, which need not have a certificate. The signature's `KeyInfo` is not read.
  /// @param coverage is set if the result is true; otherwise it is unchanged.
  /// @return false when a digest or the signature value is wrong.
  /// @throws what the first `Verify` throws; TypeMismatchException for a key that this library has not made.
  virtual bool Verify(const Crypto::VerifyingKey &key, Coverage &coverage) const = 0;

  /// Adds a reference to be signed, with one transform.
  /// @throws XmlSecurityException for a transform other than exclusive canonicalisation without comments, or a digest other
  ///         than SHA-256/384/512. @throws InvalidStateException after `Sign`, and for a signature read from a tree.
  virtual void AddReference(std::string_view uri, std::string_view digestUri, std::string_view transformUri) = 0;

  /// Makes `content` the only child of the signature's `ds:KeyInfo`, when `Sign` is called.
  /// @throws InvalidStateException after `Sign`, and for a signature read from a tree.
  virtual void SetKeyInfo(const Ref<ElementNode> &content) = 0;

  /// Computes the digests of the tree in its present state, and the signature value. The caller then inserts the signature
  /// element into the tree, where it must not change the exclusive canonical form of `SignedInfo`.
  /// @throws OutOfMemoryException, and InvalidStateException when OpenSSL has cleaned itself up.
  /// @throws XmlSecurityException when there is no reference, one does not resolve, or the key cannot sign with the
  ///         algorithm; the signature then stays blank. @throws InvalidStateException after `Sign`, for a `SetKeyInfo`
  ///         content that has a parent, and for a signature read from a tree.
  virtual void Sign(const Crypto::PrivateKey &key) = 0;

  /// The `ds:Signature` element that `Sign` made.
  /// @throws InvalidStateException before `Sign`, and for a signature read from a tree.
  virtual Ref<ElementNode> GetElement() const = 0;

  /// Checks what `Verify` checks, by the same rules, but continues after a failure and reports everything. It computes
  /// the digests of at most ten references even if no trusted key made the signature, so use it where a person waits
  /// for the answer.
  /// @throws OutOfMemoryException, and InvalidStateException when OpenSSL has cleaned itself up, like `Verify`; also
  ///         InvalidStateException for a blank signature before `Sign`. No content of the tree makes it throw, with one
  ///         exception: if the element of a blank signature was changed after `Sign` and has lost its syntax, it throws
  ///         a SignatureSyntaxException, like `Verify`.
  virtual SignatureReport Explain(const KeyInfoResolver &resolver) const = 0;

protected:
  ~Signature() override;
};

/// Reads the signature element `signature` for verification. References resolve in the document (or topmost element) that
/// contains `root`; the enveloped-signature transform removes this signature element and no other.
/// The signature keeps the tree of both elements alive. The tree must not be changed while the signature is used.
///
/// This checks only the syntax, so that `GetReferences` can report what a signature claims to cover before anything is
/// computed. The syntax is: elements of the ds namespace in the order of XML Signature, only the attributes that it defines,
/// an `Algorithm` wherever one belongs, a `URI` on each reference (a missing one could be read as ""), digest and
/// signature values that are Base64 text and nothing else, only white space and comments between elements. `Verify` refuses
/// what has this syntax but is outside the profile: an unknown algorithm or parameter, `ds:Object`, a reference's `Type`, no
/// reference at all or more than ten, more than two transforms or a second one after a canonicalisation, a URI that is
/// neither "" nor "#" followed by a name.
/// @throws SignatureSyntaxException whose message says what is wrong and where.
TARVEL_API void CreateSignatureFromDom(const ElementNode &root, const ElementNode &signature, Ref<Signature> &out);

/// A blank signature, for signing. Its references resolve in the tree of `root`. Its elements have the prefix `prefix`, which
/// the signature element declares.
/// @throws XmlSecurityException for algorithms other than exclusive canonicalisation, and RSA (PKCS#1 v1.5) or ECDSA with
///         SHA-256/384/512.
TARVEL_API void CreateBlankSignature(const Ref<ElementNode> &root, std::string_view canonicalizationUri,
                                     std::string_view signatureUri, std::string_view prefix, Ref<Signature> &out);

} // namespace Tarvel::Xml::Security
