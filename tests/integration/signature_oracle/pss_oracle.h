// SPDX-License-Identifier: Apache-2.0
/// @file
/// RSA-PSS, which this version of the xmlsec1 library does not have. `PssOracle` combines that library's digests,
/// libxml2's canonical form of `SignedInfo`, and OpenSSL's signature.

#pragma once

#include "xmlsec_oracle.h"

#include <openssl/evp.h>

#include <memory>
#include <string>

namespace Testing {

class PssOracle {
public:
  /// @param digest its name in OpenSSL, such as "SHA256". @param signatureUri the algorithm's URI.
  /// @param rsaKeyPath the PEM file with the signer's key. @param helperKeyPath one with an EC key, for making digests.
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
