// SPDX-License-Identifier: Apache-2.0
/// @file
/// The fixture tokens with other content, signed again, so that only one rule refuses them.

#pragma once

#include <tarvel/crypto/certificate.h>

#include <string>
#include <vector>

namespace Testing {

/// What a signature is made of. The defaults are those of a token that is accepted.
struct SigningChoices {
  std::string key = "sts-rsa"; ///< the name of the key file under tests/data/tokens
  std::string reference;       ///< the URI of the reference; "#" and the ID of the assertion if it is empty
  std::string keyInfo;         ///< the `ds:KeyInfo` element; may be empty
  std::string digest;          ///< the digest in Base64; the correct one if it is empty
};

/// `token` with a new signature in place of its own. @throws std::logic_error  it has no signature
std::string SignAgain(const std::string &token, const SigningChoices &choices = {});

/// The file tests/data/tokens/NAME.xml.
std::string TokenFixture(const std::string &name);

/// The certificates in the files tests/data/tokens/NAME.crt, in this order.
Tarvel::Crypto::CertificateList TokenCertificates(const std::vector<std::string> &names = {"sts-rsa"});

/// A `ds:KeyInfo` that contains these certificates.
std::string KeyInfoOf(const std::vector<std::string> &certificates);

} // namespace Testing
