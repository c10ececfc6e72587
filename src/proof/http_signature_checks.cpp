// SPDX-License-Identifier: Apache-2.0

#include "proof/http_signature_checks.h"

#include "proof/content_digest.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <initializer_list>
#include <string_view>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;

/// The parameter `name`, which must be a `Type` if it is there; null if there is none.
template <typename Type>
const Type *FindTyped(const HttpSignature &signature, const char *name, const char *typeName) {
  const StructuredBareItem *const value = FindParameter(signature.input.parameters, name);
  if (!value) {
    return nullptr;
  }
  if (const Type *const typed = std::get_if<Type>(value)) {
    return typed;
  }
  throw InvalidMessageException(std::string("The parameter ") + name + " of the signature is not " + typeName);
}

const std::string *FindText(const HttpSignature &signature, const char *name) {
  return FindTyped<std::string>(signature, name, "a string");
}

boost::optional<DateTime> FindTime(const HttpSignature &signature, const char *name) {
  const auto *const seconds = FindTyped<std::int64_t>(signature, name, "an integer");
  if (!seconds) {
    return {};
  }
  return Tarvel::System::DateTimeFromUtc(Tarvel::System::SecondsToMicroseconds(*seconds), false);
}

bool IsCovered(const std::vector<std::string> &covered, std::string_view name) {
  return std::find(covered.begin(), covered.end(), name) != covered.end();
}

bool AreCovered(const std::vector<std::string> &covered, std::initializer_list<std::string_view> names) {
  return std::all_of(names.begin(), names.end(), [&](std::string_view name) { return IsCovered(covered, name); });
}

bool IsTargetCovered(const std::vector<std::string> &covered) {
  return IsCovered(covered, "@target-uri") ||
         (AreCovered(covered, {"@scheme", "@authority"}) &&
          (IsCovered(covered, "@request-target") || AreCovered(covered, {"@path", "@query"})));
}

void RequireCovered(bool isCovered, const std::string &what) {
  if (!isCovered) {
    throw InvalidMessageException("The signature does not cover " + what);
  }
}

} // namespace

const HttpSignature &SelectHttpSignature(const std::vector<HttpSignature> &signatures,
                                         const Tarvel::Crypto::VerifyingKey &key) {
  if (signatures.empty()) {
    throw InvalidProofException(
        "The request has no signature, so the sender did not prove that it has the token's key");
  }
  const std::string thumbprint = key.GetSha256Thumbprint();
  const HttpSignature *selected = nullptr;
  for (const HttpSignature &signature : signatures) {
    const std::string *const keyId = FindText(signature, "keyid");
    const bool isSelected = keyId ? *keyId == thumbprint : signatures.size() == 1;
    if (isSelected && selected) {
      throw InvalidMessageException("The request has more than one signature whose keyid is that of the token's key");
    }
    selected = isSelected ? &signature : selected;
  }
  if (!selected) {
    throw InvalidProofException("No signature of the request has the keyid of the token's key, which is " + thumbprint);
  }
  return *selected;
}

HttpSignatureTimes ReadSignatureParameters(const HttpSignature &signature, const HttpSignatureAlgorithm &algorithm) {
  const boost::optional<DateTime> created = FindTime(signature, "created");
  if (!created) {
    throw InvalidMessageException("The signature does not have the parameter created");
  }
  FindText(signature, "nonce");
  const std::string *const name = FindText(signature, "alg");
  if (name && *name != algorithm.name) {
    throw InvalidProofException("The signature has the algorithm \"" + Tarvel::StringUtil::Shorten(*name) +
                                "\", but that of the token's key is " + algorithm.name);
  }
  return {*created, FindTime(signature, "expires")};
}

void RequireCoverage(const HttpRequest &request, const std::vector<std::string> &covered,
                     const HttpProofOptions &options) {
  RequireCovered(IsCovered(covered, "@method"), "@method");
  RequireCovered(IsTargetCovered(covered), "the target: neither @target-uri, nor @scheme with @authority and "
                                           "either @request-target or @path with @query");
  RequireCovered(IsCovered(covered, FieldNameInLowerCase(options.tokenHeader.name)),
                 "the token's header field " + options.tokenHeader.name);
  RequireCovered(!request.body || request.body->empty() || IsCovered(covered, CONTENT_DIGEST),
                 "the content: Content-Digest is not covered");
  for (const std::string &name : options.requiredHeaders) {
    RequireCovered(IsCovered(covered, FieldNameInLowerCase(name)), "the header field " + name);
  }
}

} // namespace SsoClient
