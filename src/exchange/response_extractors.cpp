// SPDX-License-Identifier: Apache-2.0

#include "exchange/response_extractors.h"

#include "compose/ws_trust.h"
#include "exchange/soap_response.h"
#include "model/namespaces.h"
#include "xml/xml_text.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;
using Tarvel::Xml::TextNode;

constexpr const char *UNEXPECTED_FORMAT = "Unexpected XML format";
// No response is refused with this text. It stays because it is one of the established texts.
[[maybe_unused]] constexpr const char *UNKNOWN_FAULT_CODE = "Unknown fault code:";

[[noreturn]] void ThrowUnexpectedFormat() {
  throw SsoException(UNEXPECTED_FORMAT);
}

const ElementNode &RequireElement(const ElementNode *element) {
  if (!element) {
    ThrowUnexpectedFormat();
  }
  return *element;
}

std::string TextOfChild(const ElementNode &parent, std::string_view localName) {
  return GetText(GetTextNode(parent.FindChildElement(localName)));
}

std::string ReadContext(const ElementNode &response) {
  const Tarvel::Xml::Attribute *const context = response.FindAttribute(std::string_view(), "Context");
  if (!context) {
    ThrowUnexpectedFormat();
  }
  return std::string(context->GetValue());
}

std::vector<std::uint8_t> DecodeLeg(const std::string &text) {
  try {
    return Tarvel::StringUtil::Base64Decode(text);
  } catch (const Tarvel::Base64FormatException &) {
    throw SsoException("Base64 format exception");
  }
}

void RequireTokenType(const ElementNode &response, const ServiceDialect &dialect) {
  const std::string type = TextOfChild(response, "TokenType");
  const std::string requested = RequestedTokenType(dialect);
  if (type != requested) {
    // The parenthesis stays open: this is the established form of the message.
    throw SsoException("Invalid token type: " + type + " (expected: " + requested);
  }
}

const ElementNode *FindInBody(const ElementNode &body) {
  return body.FindChildElement("RequestSecurityTokenResponse");
}

const ElementNode *FindInCollection(const ElementNode &body) {
  return FindDescendant(&body, {"RequestSecurityTokenResponseCollection", "RequestSecurityTokenResponse"});
}

/// `expected`; if that is null and the dialect accepts a response in any place, `other`. Each may be null.
const ElementNode *Choose(const ElementNode *expected, const ElementNode *other, const ServiceDialect &dialect) {
  return expected || !dialect.acceptsAnyResponse ? expected : other;
}

const ElementNode *FindAssertion(const ElementNode *response) {
  return FindDescendant(response, {"RequestedSecurityToken", "Assertion"});
}

} // namespace

std::string ExtractIssuedToken(const ElementNode &body, const ServiceDialect &dialect) {
  const ElementNode *const response = Choose(FindInCollection(body), FindInBody(body), dialect);
  return CanonicalElementText(RequireElement(FindAssertion(response)));
}

std::string ExtractRenewedToken(const ElementNode &body, const ServiceDialect &dialect) {
  const ElementNode *const response = Choose(FindInBody(body), FindInCollection(body), dialect);
  return CanonicalElementText(RequireElement(FindAssertion(response)));
}

bool ExtractValidationStatus(const ElementNode &body, const ServiceDialect &dialect) {
  const ElementNode *const response = Choose(FindInBody(body), FindInCollection(body), dialect);
  const TextNode *const code = GetTextNode(FindDescendant(response, {"Status", "Code"}));
  if (!code) {
    ThrowUnexpectedFormat();
  }
  if (code->GetValue() == WstUris::STATUS_VALID) {
    return true;
  }
  if (code->GetValue() == WstUris::STATUS_INVALID) {
    return false;
  }
  ThrowUnexpectedFormat();
}

SPNegoResponse ExtractSPNegoLeg(const ElementNode &body, const ServiceDialect &dialect) {
  const ElementNode *const inBody = FindInBody(body);
  const ElementNode &response = RequireElement(inBody ? inBody : FindInCollection(body));
  const ElementNode *const assertion = FindAssertion(&response);
  const bool isIntermediate = dialect.acceptsAnyResponse ? !assertion : inBody != nullptr;

  SPNegoResponse result;
  result.contextId = ReadContext(response);
  const std::string exchange = TextOfChild(response, "BinaryExchange");
  if (!exchange.empty()) {
    result.leg = DecodeLeg(exchange);
  }
  if (isIntermediate) {
    if (exchange.empty()) {
      ThrowUnexpectedFormat();
    }
    return result;
  }
  RequireElement(assertion);
  RequireTokenType(response, dialect);
  result.tokenXml = CanonicalElementText(*assertion);
  return result;
}

} // namespace SsoClient
