// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/sign_http_request.h>

#include "proof/content_digest.h"
#include "proof/http_signature.h"
#include "proof/token_field.h"
#include "token/confirmation_key.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/crypto/detached_signature.h>
#include <tarvel/system/date_time.h>

#include <algorithm>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::InvalidArgumentException;
using Tarvel::Ref;
using Tarvel::Crypto::PrivateKey;
using Tarvel::Crypto::VerifyingKey;

using Fields = std::vector<std::pair<std::string, std::string>>;

void RequireOptions(const HttpSigningOptions &options) {
  RequireTokenHeader(options.tokenHeader);
  if (!IsStructuredKey(options.label)) {
    throw InvalidArgumentException("HttpSigningOptions::label must begin with a lower-case letter or '*', and may also "
                                   "contain digits and \"_-.\"");
  }
  if (options.nonce && !IsStructuredString(*options.nonce)) {
    throw InvalidArgumentException("HttpSigningOptions::nonce must be printable ASCII");
  }
}

/// The key of `token`, which must be that of `identity`.
Ref<const VerifyingKey> RequireKey(const SamlToken &token, const PrivateKey &identity) {
  if (token.GetConfirmationMethod() != SamlToken::HOLDER_OF_KEY) {
    throw InvalidArgumentException(
        "A bearer token has no key to sign with; MakeTokenHeader writes it into a header field");
  }
  Ref<const VerifyingKey> key = GetConfirmationKey(token);
  if (!key) {
    throw InvalidArgumentException("The token has no key that can be used");
  }
  if (!IsSameKey(*key, *Tarvel::Crypto::CreateVerifyingKey(identity))) {
    throw Tarvel::Crypto::KeyMismatchException("The private key is not the key of the token " +
                                               Tarvel::StringUtil::Shorten(token.GetId()));
  }
  return key;
}

HttpSignatureAlgorithm RequireAlgorithm(const VerifyingKey &key) {
  HttpSignatureAlgorithm algorithm = GetHttpSignatureAlgorithm(key);
  if (!algorithm.name) {
    throw InvalidArgumentException("The token's key cannot sign a request: " + algorithm.refusal);
  }
  return algorithm;
}

void RequireSoundFields(const HttpRequest &request) {
  for (const auto &[name, value] : request.headers) {
    if (std::any_of(value.begin(), value.end(), IsForbiddenInField)) {
      throw InvalidArgumentException("The header field " + Tarvel::StringUtil::Shorten(name) +
                                     " contains a control character");
    }
  }
}

void RequireAbsent(const HttpComponents &components, const std::string &name) {
  if (components.CountFields(FieldNameInLowerCase(name)) != 0) {
    throw InvalidArgumentException("The request has the header field " + name + " already");
  }
}

/// The covered components, and the fields that the signature adds to the request.
struct Plan {
  std::vector<std::string> names{"@method", "@target-uri"};
  Fields fields;
};

void AddField(const HttpComponents &components, std::string name, std::string value, Plan &plan) {
  RequireAbsent(components, name);
  plan.names.push_back(FieldNameInLowerCase(name));
  plan.fields.emplace_back(std::move(name), std::move(value));
}

void CoverField(const HttpComponents &components, const std::string &field, Plan &plan) {
  const std::string name = FieldNameInLowerCase(field);
  if (std::find(plan.names.begin(), plan.names.end(), name) != plan.names.end()) {
    throw InvalidArgumentException("The header field " + field + " would be covered twice");
  }
  if (const std::size_t count = components.CountFields(name); count != 1) {
    throw InvalidArgumentException("The request has " + std::string(count == 0 ? "no" : "more than one") +
                                   " header field " + field + ", which must be covered");
  }
  plan.names.push_back(name);
}

Plan MakePlan(const HttpRequest &request, const HttpComponents &components, const SamlToken &token,
              const HttpSigningOptions &options) {
  RequireAbsent(components, "Signature-Input");
  RequireAbsent(components, "Signature");
  Plan plan;
  AddField(components, options.tokenHeader.name, WriteTokenField(token, options.tokenHeader), plan);
  if (request.body) {
    AddField(components, "Content-Digest", WriteContentDigest(*request.body), plan);
  }
  for (const std::string &field : options.coveredHeaders) {
    CoverField(components, field, plan);
  }
  return plan;
}

StructuredInnerList MakeInput(const std::vector<std::string> &names, const VerifyingKey &key,
                              const HttpSignatureAlgorithm &algorithm, const HttpSigningOptions &options) {
  StructuredInnerList input;
  for (const std::string &name : names) {
    input.items.push_back({name, {}});
  }
  const std::int64_t now = Tarvel::System::GetUtcDateTime().GetUtcTime() / Tarvel::System::MICROSECONDS_PER_SECOND;
  input.parameters = {{"created", now},
                      {"nonce", options.nonce ? *options.nonce : Tarvel::StringUtil::GenerateUuid()},
                      {"keyid", key.GetSha256Thumbprint()},
                      {"alg", std::string(algorithm.name)}};
  return input;
}

/// The request with further fields, without its content.
HttpRequest WithFields(const HttpRequest &request, const Fields &fields) {
  HttpRequest whole{request.method, request.targetUri, request.headers, {}};
  whole.headers.insert(whole.headers.end(), fields.begin(), fields.end());
  return whole;
}

Fields Sign(const HttpRequest &request, const SamlToken &token, const PrivateKey &identity,
            const HttpSigningOptions &options) {
  const Ref<const VerifyingKey> key = RequireKey(token, identity);
  const HttpSignatureAlgorithm algorithm = RequireAlgorithm(*key);
  RequireSoundFields(request);
  Plan plan = MakePlan(request, HttpComponents(request), token, options);
  const StructuredInnerList input = MakeInput(plan.names, *key, algorithm, options);
  const HttpRequest whole = WithFields(request, plan.fields);
  const std::string base = MakeSignatureBase(HttpComponents(whole), plan.names, input);
  const StructuredBareItem value = Tarvel::Crypto::SignOctets(identity, algorithm.hash, base);
  plan.fields.emplace_back("Signature-Input", options.label + '=' + WriteStructured(input));
  plan.fields.emplace_back("Signature", options.label + '=' + WriteStructured(value));
  return std::move(plan.fields);
}

} // namespace

Fields SignHttpRequest(const HttpRequest &request, const SamlToken &token, const PrivateKey &identity,
                       const HttpSigningOptions &options) {
  RequireOptions(options);
  try {
    return Sign(request, token, identity, options);
  } catch (const InvalidMessageException &refusal) { // the rules of a service, applied to the caller's request
    throw InvalidArgumentException(refusal.what());
  }
}

std::pair<std::string, std::string> MakeTokenHeader(const SamlToken &token, const TokenHeader &form) {
  RequireTokenHeader(form);
  if (token.GetConfirmationMethod() != SamlToken::BEARER) {
    throw InvalidArgumentException(
        "A holder-of-key token is worth nothing without a proof; SignHttpRequest writes both");
  }
  return {form.name, WriteTokenField(token, form)};
}

} // namespace SsoClient
