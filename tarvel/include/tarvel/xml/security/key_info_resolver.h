// SPDX-License-Identifier: Apache-2.0
/// @file
/// The source of the keys that signatures are verified with.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <vector>

namespace Tarvel::Xml::Security {

/// Chooses the certificates that a signature is checked with. Immutable; safe on any thread.
class TARVEL_API KeyInfoResolver : public Object {
public:
  /// The candidates, in order.
  using CertificateList = std::vector<Ref<const Crypto::Certificate>>;

  /// The candidates for a signature, in the order in which to try them.
  /// @param keyInfo the signature's `ds:KeyInfo`, or null. It can only narrow the choice; nothing in it becomes a key.
  virtual CertificateList Resolve(const ElementNode *keyInfo) const = 0;

protected:
  ~KeyInfoResolver() override;
};

/// A resolver over a fixed set of trusted certificates. Trust is in the key: validity dates, names and extensions of a
/// trusted certificate are not checked. A `KeyInfo` whose X509Data contains trusted certificates, byte for byte, selects these;
/// any other `KeyInfo`, or none, selects the whole set. Only the first 16 certificates of a `KeyInfo` are compared. Null
/// references in `trusted` are ignored, and equal certificates count once.
TARVEL_API Ref<KeyInfoResolver> CreateTrustSetKeyResolver(const KeyInfoResolver::CertificateList &trusted);

} // namespace Tarvel::Xml::Security
