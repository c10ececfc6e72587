// SPDX-License-Identifier: Apache-2.0

#include "exchange/response_extractors.h"

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

void RequireSamlTokenType(const ElementNode &response) {
  const std::string type = TextOfChild(response, "TokenType");
  if (type != Namespaces::SAML) {
    // The parenthesis stays open: this is the established form of the message.
    throw SsoException("Invalid token type: " + type + " (expected: " + std::string(Namespaces::SAML));
  }
}

} // namespace

std::string ExtractIssuedToken(const ElementNode &body) {
  return CanonicalElementText(
      RequireElement(FindDescendant(&body, {"RequestSecurityTokenResponseCollection", "RequestSecurityTokenResponse",
                                            "RequestedSecurityToken", "Assertion"})));
}

std::string ExtractRenewedToken(const ElementNode &body) {
  return CanonicalElementText(
      RequireElement(FindDescendant(&body, {"RequestSecurityTokenResponse", "RequestedSecurityToken", "Assertion"})));
}

bool ExtractValidationStatus(const ElementNode &body) {
  const TextNode *const code = GetTextNode(FindDescendant(&body, {"RequestSecurityTokenResponse", "Status", "Code"}));
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

SPNegoResponse ExtractSPNegoLeg(const ElementNode &body) {
  const ElementNode *const intermediate = body.FindChildElement("RequestSecurityTokenResponse");
  const ElementNode &response = RequireElement(
      intermediate ? intermediate
                   : FindDescendant(&body, {"RequestSecurityTokenResponseCollection", "RequestSecurityTokenResponse"}));

  SPNegoResponse result;
  result.contextId = ReadContext(response);
  const std::string exchange = TextOfChild(response, "BinaryExchange");
  if (!exchange.empty()) {
    result.leg = DecodeLeg(exchange);
  }
  if (intermediate) {
    if (exchange.empty()) {
      ThrowUnexpectedFormat();
    }
    return result;
  }
  const ElementNode &assertion = RequireElement(FindDescendant(&response, {"RequestedSecurityToken", "Assertion"}));
  RequireSamlTokenType(response);
  result.tokenXml = CanonicalElementText(assertion);
  return result;
}

} // namespace SsoClient
