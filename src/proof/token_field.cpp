// SPDX-License-Identifier: Apache-2.0

#include "proof/token_field.h"

#include "proof/base64_form.h"
#include "proof/content_digest.h"
#include "proof/http_signature.h"

#include <ssoclient/proof/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/secret_text.h>

#include <algorithm>
#include <string_view>

namespace SsoClient {

namespace {

bool IsBlank(char c) noexcept {
  return c == ' ' || c == '\t';
}

bool IsPrintable(const std::string &text) noexcept {
  return std::all_of(text.begin(), text.end(), [](char c) { return c >= ' ' && c <= '~'; });
}

} // namespace

void RequireTokenHeader(const TokenHeader &form) {
  if (!IsHttpToken(form.name)) {
    throw Tarvel::InvalidArgumentException("TokenHeader::name is not the name of a header field");
  }
  // Other parts of the proof are in these fields.
  const std::string name = FieldNameInLowerCase(form.name);
  if (name == SIGNATURE_INPUT_FIELD || name == SIGNATURE_FIELD || name == CONTENT_DIGEST) {
    throw Tarvel::InvalidArgumentException(
        "TokenHeader::name must not be Signature, Signature-Input or Content-Digest");
  }
  if (!IsPrintable(form.before) || !IsPrintable(form.after)) {
    throw Tarvel::InvalidArgumentException("TokenHeader::before and TokenHeader::after must be printable ASCII");
  }
  // A receiver removes blanks around the value.
  if ((!form.before.empty() && IsBlank(form.before.front())) || (!form.after.empty() && IsBlank(form.after.back()))) {
    throw Tarvel::InvalidArgumentException("A header field can neither begin nor end with a blank");
  }
}

std::string WriteTokenField(const SamlToken &token, const TokenHeader &form) {
  Tarvel::SecretText encoded(EncodeBase64(token.ToXml(), form.encoding));
  std::string value;
  value.reserve(form.before.size() + encoded.Get().size() + form.after.size());
  return value.append(form.before).append(encoded.Get()).append(form.after);
}

std::string ReadTokenField(const HttpComponents &components, const TokenHeader &form) {
  const std::string name = FieldNameInLowerCase(form.name);
  if (const std::size_t count = components.CountFields(name); count != 1) {
    throw InvalidMessageException("The request has " + std::string(count == 0 ? "no" : "more than one") +
                                  " header field " + form.name);
  }
  const std::string value = *components.FindField(name);
  std::string_view encoded = value;
  const bool isLongEnough = value.size() >= form.before.size() + form.after.size();
  if (!isLongEnough || encoded.substr(0, form.before.size()) != form.before ||
      encoded.substr(encoded.size() - form.after.size()) != form.after) {
    throw InvalidMessageException("The header field " + form.name + " does not have the form of a token");
  }
  encoded.remove_prefix(form.before.size());
  encoded.remove_suffix(form.after.size());
  const auto octets = DecodeBase64(encoded, form.encoding);
  if (!octets) {
    throw InvalidMessageException("The token in the header field " + form.name + " is not in canonical Base64");
  }
  return {octets->begin(), octets->end()};
}

} // namespace SsoClient
