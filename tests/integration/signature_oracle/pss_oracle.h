// SPDX-License-Identifier: Apache-2.0
/// @file
/// RSA-PSS, which the xmlsec1 library of this time does not know: its digests, libxml2's canonical form of `SignedInfo`, and
/// OpenSSL's signature together.

#pragma once

#include "xmlsec_oracle.h"

#include <openssl/evp.h>

#include <memory>
#include <string>

namespace Testing {

class PssOracle {
public:
  /// @param digest of OpenSSL, as "SHA256". @param signatureUri the algorithm's URI.
  /// @param rsaKeyPath the PEM file with the signer's key. @param helperKeyPath one with an EC key, to have digests made.
  PssOracle(const std::string &digest, std::string signatureUri, const std::string &rsaKeyPath,
            const std::string &helperKeyPath);

  /// Fills digests and signature value into the first `Signature` element. @return whether that succeeded.
  bool Sign(xmlDoc &document) const;

  /// Whether the first `Signature` element verifies.
  bool Verifies(const xmlDoc &document) const;

private:
  struct KeyDeleter {
    void operator()(EVP_PKEY *key) const noexcept { EVP_PKEY_free(key); }
  };

  XmlDocHandle WithFreshDigests(const xmlDoc &document) const;

  const EVP_MD *const m_digest;
  const std::string m_signatureUri;
  std::unique_ptr<EVP_PKEY, KeyDeleter> m_key;
  XmlSecKeyHandle m_helperKey;
};

} // namespace Testing
