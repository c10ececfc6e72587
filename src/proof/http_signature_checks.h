// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a service requires of a request's signature, in addition to a correct value.

#pragma once

#include "proof/http_signature.h"
#include "proof/time_window.h"

#include <ssoclient/proof/http_proof.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <string>
#include <vector>

namespace SsoClient {

/// The signature by `key`: the one whose `keyid` is the key's thumbprint or, without a `keyid`, the only one.
/// @throws InvalidProofException when there is no such signature; InvalidMessageException when there are several, or a
///         `keyid` is not a string.
const HttpSignature &SelectHttpSignature(const std::vector<HttpSignature> &signatures,
                                         const Tarvel::Crypto::VerifyingKey &key);

/// The times in a signature's parameters.
struct HttpSignatureTimes {
  Tarvel::System::DateTime created;
  boost::optional<Tarvel::System::DateTime> expires;
};

/// Reads `created`, `expires`, `nonce` and `alg`, and checks their types and the algorithm. Other parameters are
/// ignored.
/// @throws InvalidMessageException when a parameter is not of its type, or `created` is missing; InvalidProofException
///         when the algorithm is not `algorithm`.
HttpSignatureTimes ReadSignatureParameters(const HttpSignature &signature, const HttpSignatureAlgorithm &algorithm);

/// Checks that the method, the target, the token, the content and the required fields are covered.
/// @throws InvalidMessageException when one of them is not.
void RequireCoverage(const HttpRequest &request, const std::vector<std::string> &covered,
                     const HttpProofOptions &options);

} // namespace SsoClient
