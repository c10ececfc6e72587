// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/exchange_for_access_token.h>

#include "proof/base64_form.h"

#include <tarvel/core/exception.h>

#include <algorithm>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::InvalidArgumentException;
using Tarvel::SecretText;

using Parameter = std::pair<std::string, SecretText>;

constexpr std::string_view SAML2_BEARER = "urn:ietf:params:oauth:grant-type:saml2-bearer";
constexpr std::size_t ESCAPED = 3; // characters for one escaped octet

bool IsPrintable(char c) noexcept {
  return c >= ' ' && c <= '~';
}

bool IsLetter(char c) noexcept {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

bool IsLetterOrDigit(char c) noexcept {
  return IsLetter(c) || (c >= '0' && c <= '9');
}

bool IsScopeCharacter(char c) noexcept {
  return IsPrintable(c) && c != ' ' && c != '"' && c != '\\';
}

/// RFC 6749, section 3.3: tokens with one blank between two of them.
bool IsScope(std::string_view text) noexcept {
  bool isAfterToken = false;
  for (const char c : text) {
    if (!IsScopeCharacter(c) && !(c == ' ' && isAfterToken)) {
      return false;
    }
    isAfterToken = c != ' ';
  }
  return isAfterToken;
}

/// RFC 8707, section 2: an absolute URI without a fragment.
bool IsResource(std::string_view text) noexcept {
  const std::size_t colon = text.find(':');
  const std::string_view scheme = text.substr(0, colon);
  return colon != std::string_view::npos && !scheme.empty() && IsLetter(scheme.front()) &&
         std::all_of(scheme.begin(), scheme.end(),
                     [](char c) { return IsLetterOrDigit(c) || c == '+' || c == '-' || c == '.'; }) &&
         std::all_of(text.begin(), text.end(), [](char c) { return IsPrintable(c) && c != ' ' && c != '#'; });
}

void RequireOptions(const AccessTokenOptions &options) {
  if (options.scope && !IsScope(*options.scope)) {
    throw InvalidArgumentException(
        "AccessTokenOptions::scope is not a list of scopes with one blank between two of them");
  }
  if (options.clientId && !std::all_of(options.clientId->begin(), options.clientId->end(), IsPrintable)) {
    throw InvalidArgumentException("AccessTokenOptions::clientId must be printable ASCII");
  }
  if (!std::all_of(options.resources.begin(), options.resources.end(), IsResource)) {
    throw InvalidArgumentException(
        "AccessTokenOptions::resources has a text that is not an absolute URI without a fragment");
  }
}

/// Whether the octet stays as it is in a form (application/x-www-form-urlencoded in the URL standard of WHATWG).
bool IsUnescaped(char c) noexcept {
  return IsLetterOrDigit(c) || c == '*' || c == '-' || c == '.' || c == '_';
}

std::size_t EncodedLength(std::string_view text) noexcept {
  std::size_t length = 0;
  for (const char c : text) {
    length += IsUnescaped(c) || c == ' ' ? 1 : ESCAPED;
  }
  return length;
}

void AppendEncoded(std::string_view text, std::string &form) {
  constexpr std::string_view HEX_DIGITS = "0123456789ABCDEF";
  for (const char c : text) {
    const auto octet = static_cast<unsigned char>(c);
    if (IsUnescaped(c)) {
      form += c;
    } else if (c == ' ') {
      form += '+';
    } else {
      form += '%';
      form += HEX_DIGITS[octet >> 4];
      form += HEX_DIGITS[octet & 0x0F];
    }
  }
}

/// The length is reserved first, so that no shorter copy of the secret is left in memory.
SecretText EncodeForm(const std::vector<Parameter> &parameters) {
  std::size_t length = 0;
  for (const auto &[name, value] : parameters) {
    length += EncodedLength(name) + EncodedLength(value.Get()) + 2;
  }
  std::string form;
  form.reserve(length);
  for (const auto &[name, value] : parameters) {
    form += form.empty() ? "" : "&";
    AppendEncoded(name, form);
    form += '=';
    AppendEncoded(value.Get(), form);
  }
  return SecretText(std::move(form));
}

} // namespace

AccessTokenRequest ExchangeForAccessToken(const SamlToken &token, const AccessTokenOptions &options) {
  if (token.GetConfirmationMethod() != SamlToken::BEARER) {
    throw InvalidArgumentException("Only a bearer token can be exchanged for an access token (RFC 7522, section 3)");
  }
  RequireOptions(options);
  AccessTokenRequest request;
  const auto add = [&request](const char *name, SecretText value) {
    request.parameters.emplace_back(name, std::move(value));
  };
  add("grant_type", SecretText(SAML2_BEARER));
  add("assertion", SecretText(EncodeBase64(token.ToXml(), TokenHeader::Encoding::BASE64URL)));
  if (options.scope) {
    add("scope", SecretText(std::string_view(*options.scope)));
  }
  if (options.clientId) {
    add("client_id", SecretText(std::string_view(*options.clientId)));
  }
  for (const std::string &resource : options.resources) {
    add("resource", SecretText(std::string_view(resource)));
  }
  request.body = EncodeForm(request.parameters);
  return request;
}

} // namespace SsoClient
