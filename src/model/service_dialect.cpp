// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/service_dialect.h>

#include "model/namespaces.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <iterator>
#include <string_view>

namespace SsoClient {

namespace {

constexpr char DEFAULT_DIALECT[] = "default";

/// An unchanged Apache CXF 3.6. It reports `FailedAuthentication` only with the setting
/// `ws-security.return.security.error`; without it, it reports one general fault for every reason.
ServiceDialect CxfDialect() {
  ServiceDialect dialect;
  dialect.declaresCharset = true;                                // otherwise CXF assumes ISO-8859-1
  dialect.delegatable = ServiceDialect::Statement::NEVER;        // an unknown element
  dialect.useKey = ServiceDialect::UseKey::CERTIFICATE;          // `Sig` is not read
  dialect.delegation = ServiceDialect::Delegation::ON_BEHALF_OF; // `wst:DelegateTo` is an unknown element
  dialect.standardTokenTypeReference = true;                     // the Basic Security Profile is enforced
  dialect.credentialFaults = {{std::string(Namespaces::WSSE), "FailedAuthentication"}};
  return dialect;
}

struct NamedDialect {
  const char *name;
  ServiceDialect (*create)();
};

constexpr NamedDialect DIALECTS[] = {
    {DEFAULT_DIALECT, [] { return ServiceDialect(); }},
    {"cxf", CxfDialect},
};

std::string Show(std::string_view text) {
  return '"' + Tarvel::StringUtil::Shorten(Tarvel::StringUtil::Printable(text)) + '"';
}

[[noreturn]] void Refuse(const std::string &reason) {
  throw Tarvel::InvalidArgumentException("ServiceDialect::" + reason);
}

bool IsAsciiLetter(char c) noexcept {
  return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
}

bool IsDigit(char c) noexcept {
  return c >= '0' && c <= '9';
}

bool IsHexDigit(char c) noexcept {
  return IsDigit(c) || (c >= 'A' && c <= 'F') || (c >= 'a' && c <= 'f');
}

/// Whether RFC 3986 allows `rest` after the scheme of a URI: it has only the allowed characters, two hexadecimal digits
/// after each "%", and at most one fragment, and is not empty.
bool IsUriRest(std::string_view rest) noexcept {
  constexpr std::string_view PUNCTUATION = "-._~:/?[]@!$&'()*+,;=";
  bool hasFragment = false;
  for (std::size_t i = 0; i < rest.size(); ++i) {
    const char c = rest[i];
    if (c == '#' && !hasFragment) {
      hasFragment = true;
    } else if (c == '%' && rest.size() - i > 2 && IsHexDigit(rest[i + 1]) && IsHexDigit(rest[i + 2])) {
      i += 2;
    } else if (!IsAsciiLetter(c) && !IsDigit(c) && PUNCTUATION.find(c) == std::string_view::npos) {
      return false;
    }
  }
  return !rest.empty();
}

/// Whether the text has the form of a URI with a scheme and more than the scheme (RFC 3986, section 3).
bool IsAbsoluteUri(std::string_view text) noexcept {
  const std::size_t colon = text.find(':');
  if (colon == std::string_view::npos || !IsAsciiLetter(text.front())) {
    return false;
  }
  const std::string_view scheme = text.substr(0, colon);
  return std::all_of(scheme.begin(), scheme.end(),
                     [](char c) { return IsAsciiLetter(c) || IsDigit(c) || c == '+' || c == '-' || c == '.'; }) &&
         IsUriRest(text.substr(colon + 1));
}

void CheckUri(const char *field, std::string_view text) {
  if (!IsAbsoluteUri(text)) {
    Refuse(std::string(field) + " is not an absolute URI: " + Show(text));
  }
}

template <typename Enum>
void CheckRange(const char *field, Enum value, Enum last) {
  if (value < Enum() || value > last) {
    Refuse(std::string(field) + " is not a value of its enumeration: " + std::to_string(static_cast<int>(value)));
  }
}

/// Beginnings of the token types that this client cannot read.
constexpr std::string_view UNREADABLE_TOKEN_TYPES[] = {
    "urn:oasis:names:tc:SAML:1.",
    "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV1",
    "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.0",
    "http://docs.oasis-open.org/wss/2004/01/oasis-2004-01-saml-token-profile-1.0",
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-saml-token-profile-1.0",
    "http://docs.oasis-open.org/ws-sx/ws-secureconversation/",
    "urn:ietf:params:oauth:token-type:jwt",
    WstUris::TOKEN_TYPE_STATUS,
};

void CheckTokenType(std::string_view type) {
  CheckUri("tokenType", type);
  if (std::any_of(std::begin(UNREADABLE_TOKEN_TYPES), std::end(UNREADABLE_TOKEN_TYPES),
                  [&](std::string_view beginning) { return type.starts_with(beginning); })) {
    Refuse("tokenType asks for tokens that this client cannot read, which are not SAML 2.0: " + Show(type));
  }
}

struct GeneralFault {
  std::string_view namespaceUri;
  std::string_view localName;
};

/// Faults that services also report for reasons other than the caller's credentials.
constexpr GeneralFault GENERAL_FAULTS[] = {
    {Namespaces::SOAPENV, "Client"},
    {Namespaces::SOAPENV, "Server"},
    {Namespaces::SOAPENV, "VersionMismatch"},
    {Namespaces::SOAPENV, "MustUnderstand"},
    {Namespaces::SOAP12, "Sender"},
    {Namespaces::SOAP12, "Receiver"},
    {Namespaces::SOAP12, "VersionMismatch"},
    {Namespaces::SOAP12, "MustUnderstand"},
    {Namespaces::SOAP12, "DataEncodingUnknown"},
    {Namespaces::WSSE, "InvalidSecurity"},
    {Namespaces::WSS4J, "SecurityError"},
    {Namespaces::WST, "RequestFailed"},
    {Namespaces::WST, "InvalidRequest"},
    {Namespaces::WST, "BadRequest"},
};

void CheckCredentialFault(const FaultName &fault) {
  if (fault.namespaceUri.empty() || fault.localName.empty()) {
    Refuse("credentialFaults has a fault without " +
           std::string(fault.namespaceUri.empty() ? "namespace" : "local name") + ": {" + Show(fault.namespaceUri) +
           ", " + Show(fault.localName) + "}");
  }
  CheckUri("credentialFaults: the namespace", fault.namespaceUri);
  if (fault.localName.find_first_of(": \t\r\n") != std::string::npos) {
    Refuse("credentialFaults: not a local name: " + Show(fault.localName));
  }
  if (std::any_of(std::begin(GENERAL_FAULTS), std::end(GENERAL_FAULTS), [&](const GeneralFault &general) {
        return fault.namespaceUri == general.namespaceUri && fault.localName == general.localName;
      })) {
    Refuse("credentialFaults has a general fault, which would make other failures refused credentials: {" +
           Show(fault.namespaceUri) + ", " + Show(fault.localName) + "}");
  }
}

} // namespace

ServiceDialect GetServiceDialect(const std::string &name) {
  const auto *const found = std::find_if(std::begin(DIALECTS), std::end(DIALECTS),
                                         [&](const NamedDialect &dialect) { return name == dialect.name; });
  if (found != std::end(DIALECTS)) {
    return found->create();
  }
  std::string known;
  for (const NamedDialect &dialect : DIALECTS) {
    known += std::string(known.empty() ? "" : ", ") + dialect.name;
  }
  throw Tarvel::InvalidArgumentException("unknown dialect " + Show(name) + "; the dialects are " + known);
}

std::vector<std::string> GetDialectNames() {
  std::vector<std::string> names;
  for (const NamedDialect &dialect : DIALECTS) {
    names.emplace_back(dialect.name);
  }
  return names;
}

void CheckServiceDialect(const ServiceDialect &dialect) {
  CheckRange("delegatable", dialect.delegatable, ServiceDialect::Statement::NEVER);
  CheckRange("renewing", dialect.renewing, ServiceDialect::Statement::NEVER);
  CheckRange("useKey", dialect.useKey, ServiceDialect::UseKey::NEVER);
  CheckRange("delegation", dialect.delegation, ServiceDialect::Delegation::ACT_AS);
  if (dialect.appliesTo) {
    CheckUri("appliesTo", *dialect.appliesTo);
  }
  if (!dialect.tokenType.empty()) {
    CheckTokenType(dialect.tokenType);
  }
  std::for_each(dialect.credentialFaults.begin(), dialect.credentialFaults.end(), CheckCredentialFault);
}

} // namespace SsoClient
