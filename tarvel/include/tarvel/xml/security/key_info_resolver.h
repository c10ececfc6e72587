// SPDX-License-Identifier: Apache-2.0
/// @file
/// Where the keys come from that signatures are verified with.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/node.h>

#include <vector>

namespace Tarvel::Xml::Security {

/// Names the certificates whose keys a signature may have been made with. Immutable; safe on any thread.
class TARVEL_API KeyInfoResolver : public Object {
public:
  using CertificateList = std::vector<Ref<const Crypto::Certificate>>;

  /// The candidates for a signature, in the order in which to try them.
  /// @param keyInfo the signature's `ds:KeyInfo`, or null. It can only narrow the choice; nothing in it becomes a key.
  virtual CertificateList Resolve(const ElementNode *keyInfo) const = 0;

protected:
  ~KeyInfoResolver() override;
};

/// A resolver over a fixed set of trusted certificates. Trust is in the key: validity dates, names and extensions of a
/// trusted certificate are not judged. A `KeyInfo` whose X509Data holds one of the certificates, byte for byte, selects that
/// one, and one that holds several selects these; every other `KeyInfo`, and none, leaves the whole set. Its first 16
/// certificates are compared. Null references in `trusted` are passed over, equal certificates count once.
TARVEL_API Ref<KeyInfoResolver> CreateTrustSetKeyResolver(const KeyInfoResolver::CertificateList &trusted);

} // namespace Tarvel::Xml::Security
