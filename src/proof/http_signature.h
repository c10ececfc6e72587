// SPDX-License-Identifier: Apache-2.0
/// @file
/// HTTP message signatures (RFC 9421): what is signed, and by which algorithm.

#pragma once

#include "proof/http_components.h"
#include "proof/structured_fields.h"

#include <tarvel/crypto/message_digest.h>
#include <tarvel/crypto/verifying_key.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

// The names of the header fields, in lower case.
constexpr const char *SIGNATURE_INPUT_FIELD = "signature-input";
constexpr const char *SIGNATURE_FIELD = "signature";

/// One signature of a request.
struct HttpSignature {
  std::string label;
  StructuredInnerList input; ///< the covered components, with the parameters of the signature
  std::vector<std::uint8_t> value;
};

/// The signatures of a request, in the order of Signature-Input; empty if the request has neither of the two fields.
/// @throws InvalidMessageException when a field is malformed, or the labels of the two fields differ.
std::vector<HttpSignature> ReadHttpSignatures(const HttpComponents &components);

/// The algorithm of a key's signatures.
struct HttpSignatureAlgorithm {
  const char *name; ///< in the registry of RFC 9421, section 6.2; null if there is no algorithm for the key
  Tarvel::Crypto::HashAlgorithm hash;
  std::string refusal; ///< why there is none
};

/// The algorithm is fixed by the key, so a message cannot choose it. For RSA keys it is the one that
/// every key store can use.
HttpSignatureAlgorithm GetHttpSignatureAlgorithm(const Tarvel::Crypto::VerifyingKey &key);

/// The names of the covered components, in their order.
/// @throws InvalidMessageException when one is not a string, has a parameter, or is there twice.
std::vector<std::string> ReadComponentNames(const StructuredInnerList &input);

/// The signature base (RFC 9421, section 2.5).
/// @param names what `ReadComponentNames(input)` returns
/// @throws InvalidMessageException when a component is not known, is not in the request, or is not ASCII.
std::string MakeSignatureBase(const HttpComponents &components, const std::vector<std::string> &names,
                              const StructuredInnerList &input);

} // namespace SsoClient
