// SPDX-License-Identifier: Apache-2.0
/// @file
/// HTTP requests with signatures for tests: those of tests/data/http, and requests that a test changes and signs itself.

#pragma once

#include <ssoclient/proof/http_proof.h>
#include <ssoclient/proof/http_request.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/crypto/message_digest.h>

#include <map>
#include <memory>
#include <string>

namespace Testing {

/// The SHA-256 thumbprint of the public key of tests/data/tokens/holder.key.
extern const char *const HOLDER_THUMBPRINT;

/// The request in tests/data/http/`name`.http. Its tokens are for tests/data/tokens/holder.key, or the key of the same name in
/// tests/data/crypto.
SsoClient::HttpRequest ReadHttpRequest(const std::string &name);

/// The verifier of the tokens in tests/data.
SsoClient::TokenVerifier HttpTokenVerifier(SsoClient::TokenProfile profile = SsoClient::TokenProfile::STRICT);

/// The value of Authorization with the token in tests/data/`file`.
std::string TokenField(const std::string &file);

/// The only field `name`, which must be there, for changes.
std::string &FieldOf(SsoClient::HttpRequest &request, const std::string &name);

/// A request that becomes a signed one. All parts may be changed before `Sign`.
struct UnsignedRequest {
  /// A POST request with a body, its digest, and the token tests/data/tokens/holder-of-key.xml.
  UnsignedRequest();

  SsoClient::HttpRequest request;
  std::string components; ///< quoted names, with a blank between two of them: what is signed
  std::string parameters; ///< of the signature, beginning with ";"
  std::string label = "proof";
  std::map<std::string, std::string> values; ///< of components that are not in `request` as they are signed
  std::string key = "tokens/holder.key";     ///< in tests/data
  Tarvel::Crypto::HashAlgorithm hash = Tarvel::Crypto::HashAlgorithm::SHA256;

  /// What is signed. It is computed by simple code, which shares nothing with the product.
  std::string Base() const;

  /// The request with the fields Signature-Input and Signature.
  SsoClient::HttpRequest Sign() const;
};

} // namespace Testing
