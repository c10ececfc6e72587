// SPDX-License-Identifier: Apache-2.0
/// @file
/// XML Signature, in the strict profile that tokens and messages need.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/key_info_resolver.h>

#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace Tarvel::Xml::Security {

/// Algorithm URIs of signatures, digests and transforms that the profile knows besides canonicalisation.
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

/// One `ds:Signature`: taken from a tree to be verified, or blank, to be filled and signed. Verification may run on
/// several threads at once; filling and signing is for one.
class TARVEL_API Signature : public Object {
public:
  /// One `ds:Reference`, as its URI says it.
  struct Reference {
    std::string uri; ///< "" is the document, "#x" the element whose identifier is x
  };

  /// The references in document order.
  virtual const std::vector<Reference> &GetReferences() const noexcept = 0;

  /// Checks the signature over `SignedInfo` with each candidate key until one fits, and then the digest of every
  /// reference: only a signer may ask for that work.
  /// @param signedUris receives the URIs of the references when the answer is true, and is left alone otherwise.
  /// @return false when a digest or the signature value is wrong.
  /// @throws OutOfMemoryException, and InvalidStateException when OpenSSL has cleaned itself up: neither is a verdict.
  /// @throws XmlSecurityException for an algorithm outside the profile, a reference that does not resolve to exactly one
  ///         node, a tree without canonical form, or when no candidate key can be used with the signature's algorithm.
  virtual bool Verify(const KeyInfoResolver &resolver, std::set<std::string> &signedUris) const = 0;

  /// Adds a reference to be signed, with one transform.
  /// @throws XmlSecurityException for a transform other than exclusive canonicalisation without comments, or a digest other
  ///         than SHA-256/384/512. @throws InvalidStateException after `Sign`, and for a signature taken from a tree.
  virtual void AddReference(std::string_view uri, std::string_view digestUri, std::string_view transformUri) = 0;

  /// Makes `content` the only child of the signature's `ds:KeyInfo`; it is put there by `Sign`.
  /// @throws InvalidStateException after `Sign`, and for a signature taken from a tree.
  virtual void SetKeyInfo(const Ref<ElementNode> &content) = 0;

  /// Computes the digests over the tree as it is now, and the signature value. The signature element must then be put
  /// into the tree; the place must not change the namespaces that its `SignedInfo` sees under exclusive canonicalisation.
  /// @throws OutOfMemoryException, and InvalidStateException when OpenSSL has cleaned itself up.
  /// @throws XmlSecurityException when there is no reference, one does not resolve, or the key cannot sign with the
  ///         algorithm; the signature then stays blank. @throws InvalidStateException after `Sign`, for a key info content
  ///         that has a parent, and for a signature taken from a tree.
  virtual void Sign(const Crypto::PrivateKey &key) = 0;

  /// The `ds:Signature` element that `Sign` made.
  /// @throws InvalidStateException before `Sign`, and for a signature taken from a tree.
  virtual Ref<ElementNode> GetElement() const = 0;

protected:
  ~Signature() override;
};

/// Reads the signature element `signature` for verification. References resolve in the document (or topmost element) that
/// holds `root`; the enveloped-signature transform takes out this very signature element and no other.
/// Both elements' tree is kept alive by the signature and must not be changed while it is used.
///
/// This judges syntax alone, so that `GetReferences` can tell what a signature claims to cover before anything is computed.
/// Syntax is: elements of the ds namespace in the order of XML Signature, no attribute but those it gives them, an
/// `Algorithm` wherever one belongs, a `URI` on each reference (one left out could be taken for ""), digest and signature
/// values that are Base64 text and nothing else, white space and comments alone between elements. What is outside the
/// profile though well-formed is refused by `Verify`: an unknown algorithm or parameter, `ds:Object`, a reference's `Type`,
/// no reference at all or more than ten, more than two transforms or a second one after a canonicalisation, an URI that is
/// neither "" nor a bare name.
/// @throws SignatureSyntaxException naming what is wrong and where.
TARVEL_API void CreateSignatureFromDom(const ElementNode &root, const ElementNode &signature, Ref<Signature> &out);

/// A blank signature to be filled and signed; its references resolve in the tree of `root`. Its elements have the prefix
/// `prefix`, which the signature element declares itself.
/// @throws XmlSecurityException for algorithms other than exclusive canonicalisation and RSA-SHA256/384/512.
TARVEL_API void CreateBlankSignature(const Ref<ElementNode> &root, std::string_view canonicalizationUri,
                                     std::string_view signatureUri, std::string_view prefix, Ref<Signature> &out);

} // namespace Tarvel::Xml::Security
