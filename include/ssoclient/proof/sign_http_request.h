// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SignHttpRequest`, with which a program shows its token to an HTTP service, by RFC 9421.

#pragma once

#include <ssoclient/export.h>
#include <ssoclient/proof/http_request.h>
#include <ssoclient/saml_token.h>
#include <tarvel/crypto/private_key.h>

#include <string>
#include <utility>
#include <vector>

namespace SsoClient {

/// How a request is signed.
struct HttpSigningOptions {
  TokenHeader tokenHeader;                 ///< how the token is written
  std::vector<std::string> coveredHeaders; ///< names of further header fields to sign; each must be in the request
  std::string label = "sso";               ///< of the signature; a key of a dictionary (RFC 8941, section 3.2)
  boost::optional<std::string> nonce;      ///< the `nonce` parameter; unset for a new random one
};

/// The header fields with which a request shows a holder-of-key token and proves its key (...): the token's field,
/// `Content-Digest` (RFC 9530) if the request has a body, `Signature-Input` and `Signature`. Add them to the request.
SSOCLIENT_API std::vector<std::pair<std::string, std::string>>
SignHttpRequest(const HttpRequest &request, const SamlToken &token, const Tarvel::Crypto::PrivateKey &identity,
                const HttpSigningOptions &options = {});

/// The header field with a bearer token.
SSOCLIENT_API std::pair<std::string, std::string> MakeTokenHeader(const SamlToken &token, const TokenHeader &form = {});

} // namespace SsoClient
