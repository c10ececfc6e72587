// SPDX-License-Identifier: Apache-2.0

#include "faults.h"

#include <charconv>
#include <chrono>

namespace DevSts {

namespace {

constexpr int DRIP_SECONDS = 2;
constexpr int BAD_STATUS = 503;
constexpr int LONGEST_DELAY = 3600;
constexpr int DEEP_LEVELS = 1000;

struct NamedFault {
  std::string_view name;
  Fault fault;
};

constexpr Fault OfToken(TokenFault token) {
  Fault fault;
  fault.token = token;
  return fault;
}

constexpr Fault OfDocument(DocumentFault document) {
  Fault fault;
  fault.document = document;
  return fault;
}

constexpr Fault OfDelivery(DeliveryFault delivery, int number = 0) {
  Fault fault;
  fault.delivery = delivery;
  fault.number = number;
  return fault;
}

constexpr NamedFault NAMED[] = {
    {"stall", OfDelivery(DeliveryFault::STALL)},
    {"drip", OfDelivery(DeliveryFault::DRIP, DRIP_SECONDS)},
    {"reset", OfDelivery(DeliveryFault::RESET)},
    {"reset-in-header", OfDelivery(DeliveryFault::RESET_IN_HEADER)},
    {"reset-in-body", OfDelivery(DeliveryFault::RESET_IN_BODY)},
    {"truncate", OfDelivery(DeliveryFault::TRUNCATE)},
    {"oversize", OfDelivery(DeliveryFault::OVERSIZE)},
    {"bad-status", OfDelivery(DeliveryFault::BAD_STATUS, BAD_STATUS)},
    {"bad-content-length", OfDelivery(DeliveryFault::BAD_CONTENT_LENGTH)},
    {"garbage", OfDelivery(DeliveryFault::GARBAGE)},
    {"garbled-xml", OfDocument(DocumentFault::GARBLED_XML)},
    {"not-soap", OfDocument(DocumentFault::NOT_SOAP)},
    {"empty-body", OfDocument(DocumentFault::EMPTY_BODY)},
    {"no-token", OfDocument(DocumentFault::NO_TOKEN)},
    {"wrong-root", OfDocument(DocumentFault::WRONG_ROOT)},
    {"wrong-element", OfDocument(DocumentFault::WRONG_ELEMENT)},
    {"wrong-wrapper", OfDocument(DocumentFault::WRONG_WRAPPER)},
    {"wrong-status", OfDocument(DocumentFault::WRONG_STATUS)},
    {"no-leg", OfDocument(DocumentFault::NO_LEG)},
    {"garbage-leg", OfDocument(DocumentFault::GARBAGE_LEG)},
    {"no-context", OfDocument(DocumentFault::NO_CONTEXT)},
    {"other-context", OfDocument(DocumentFault::OTHER_CONTEXT)},
    {"expired-token", OfToken(TokenFault::EXPIRED)},
    {"early-token", OfToken(TokenFault::EARLY)},
    {"tampered-token", OfToken(TokenFault::TAMPERED)},
    {"wrong-signer", OfToken(TokenFault::WRONG_SIGNER)},
    {"unsigned-token", OfToken(TokenFault::UNSIGNED)},
    {"wrong-audience", OfToken(TokenFault::WRONG_AUDIENCE)},
    {"bearer-for-hok", OfToken(TokenFault::BEARER)},
    {"no-subject", OfToken(TokenFault::NO_SUBJECT)},
    {"unknown-element", OfToken(TokenFault::UNKNOWN_ELEMENT)},
    {"wrong-version", OfToken(TokenFault::WRONG_VERSION)},
    {"plain-token", OfToken(TokenFault::PLAIN)},
    {"short-lived-token", OfToken(TokenFault::SHORT_LIVED)},
    {"doctype", OfDocument(DocumentFault::DOCTYPE)},
    {"too-deep", OfDocument(DocumentFault::TOO_DEEP)},
    {"soap-fault-without-text", OfDocument(DocumentFault::SOAP_FAULT_WITHOUT_TEXT)},
    {"soap-fault-without-code", OfDocument(DocumentFault::SOAP_FAULT_WITHOUT_CODE)},
};

struct NumberedFault {
  std::string_view prefix;
  DeliveryFault delivery;
  int least;
  int most;
};

constexpr NumberedFault NUMBERED[] = {
    {"stall-then-answer-", DeliveryFault::DELAY, 0, LONGEST_DELAY},
    {"drip-", DeliveryFault::DRIP, 1, LONGEST_DELAY},
    {"bad-status-", DeliveryFault::BAD_STATUS, 200, 599},
};

constexpr std::string_view SOAP_FAULT_PREFIX = "soap-fault-";

struct NamedCode {
  std::string_view name;
  FaultCode code;
};

constexpr NamedCode CODES[] = {
    {"FailedAuthentication", Code::FAILED_AUTHENTICATION},
    {"InvalidSecurityToken", Code::INVALID_TARGET},
    {"wsse-InvalidSecurityToken", Code::INVALID_TOKEN},
    {"wsse-FailedAuthentication", {Ns::WSSE, "FailedAuthentication"}},
    {"InvalidRequest", Code::INVALID_REQUEST},
    {"RequestFailed", Code::REQUEST_FAILED},
    {"InvalidTimeRange", Code::INVALID_TIME_RANGE},
    {"UnableToRenew", Code::UNABLE_TO_RENEW},
    {"InvalidSecurity", Code::INVALID_SECURITY},
    {"FailedCheck", Code::FAILED_CHECK},
    {"MessageExpired", Code::MESSAGE_EXPIRED},
    {"Unknown", {{"devsts", "urn:corp.example:devsts"}, "Unknown"}},
};

std::optional<int> NumberIn(std::string_view text, int least, int most) {
  int number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size() || number < least || number > most) {
    return std::nullopt;
  }
  return number;
}

std::optional<Fault> ParseNumberedFault(std::string_view name) {
  for (const NumberedFault &known : NUMBERED) {
    if (name.substr(0, known.prefix.size()) != known.prefix) {
      continue;
    }
    if (const auto number = NumberIn(name.substr(known.prefix.size()), known.least, known.most)) {
      return OfDelivery(known.delivery, *number);
    }
  }
  return std::nullopt;
}

/// The first element with that local name at or below `root`.
xmlNode *FindBelow(xmlNode *root, const char *name) {
  if (!root || xmlStrEqual(root->name, XmlText(name))) {
    return root;
  }
  for (xmlNode *child : ChildElements(*root)) {
    if (xmlStrEqual(child->name, XmlText("Assertion"))) {
      continue; // these faults change the response around the token, not the token
    }
    if (xmlNode *found = FindBelow(child, name)) {
      return found;
    }
  }
  return nullptr;
}

void Rename(xmlNode *element, const char *name) {
  if (element) {
    xmlNodeSetName(element, XmlText(name));
  }
}

void Empty(xmlNode *element) {
  if (element) {
    xmlNodeSetContent(element, nullptr);
  }
}

void Remove(xmlNode *element) {
  if (element) {
    xmlUnlinkNode(element);
    xmlFreeNode(element);
  }
}

/// Corrupts the leg of a negotiation. A response without a leg stays as it is.
void CorruptLeg(xmlNode *root, DocumentFault fault) {
  xmlNode *const response = FindBelow(root, "RequestSecurityTokenResponse");
  xmlNode *const exchange = FindBelow(root, "BinaryExchange");
  if (!response || !exchange) {
    return;
  }
  switch (fault) {
  case DocumentFault::NO_LEG:
    Remove(exchange);
    return;
  case DocumentFault::GARBAGE_LEG:
    SetText(*exchange, "Z2FyYmFnZQ==");
    return;
  case DocumentFault::NO_CONTEXT:
    SetAttribute(*response, "Context", "");
    return;
  default:
    SetAttribute(*response, "Context", "urn:uuid:00000000-0000-4000-8000-000000000000");
    return;
  }
}

/// Removes the collection around a response, or adds one when there is none.
void SwapWrapper(xmlNode &body) {
  xmlNode &content = *ChildElements(body).front();
  if (IsElement(content, Ns::WST, "RequestSecurityTokenResponseCollection")) {
    xmlNode *const response = ChildElements(content).front();
    xmlUnlinkNode(response);
    xmlReplaceNode(&content, response);
    xmlReconciliateNs(body.doc, response);
    xmlFreeNode(&content);
    return;
  }
  xmlUnlinkNode(&content);
  xmlNode &collection = AddElement(body, Ns::WST, "RequestSecurityTokenResponseCollection");
  xmlAddChild(&collection, &content);
}

/// Adds many nested elements.
void Deepen(xmlNode &body) {
  xmlNode *innermost = &body;
  for (int level = 0; level < DEEP_LEVELS; ++level) {
    innermost = &AddElement(*innermost, Ns::WST, "Deeper");
  }
}

/// Makes the content of the body the whole document.
void RemoveEnvelope(xmlDoc &response, xmlNode &body) {
  xmlNode *const content = ChildElements(body).front();
  xmlUnlinkNode(content);
  xmlNode *const envelope = xmlDocSetRootElement(&response, content);
  xmlReconciliateNs(&response, content);
  xmlFreeNode(envelope);
}

/// Applies the faults that change the tree of the response.
void CorruptTree(xmlDoc &response, DocumentFault fault) {
  xmlNode *const root = xmlDocGetRootElement(&response);
  switch (fault) {
  case DocumentFault::NO_TOKEN:
    Empty(FindBelow(root, "RequestedSecurityToken"));
    Empty(FindBelow(root, "Status"));
    return;
  case DocumentFault::WRONG_ELEMENT:
    Rename(FindBelow(root, "RequestedSecurityToken"), "RequestedProofToken");
    Rename(FindBelow(root, "Status"), "State");
    return;
  case DocumentFault::WRONG_ROOT:
    RemoveEnvelope(response, RequireChild(*root, Ns::SOAPENV, "Body"));
    return;
  case DocumentFault::WRONG_WRAPPER:
    SwapWrapper(RequireChild(*root, Ns::SOAPENV, "Body"));
    return;
  case DocumentFault::WRONG_STATUS:
    if (xmlNode *code = FindBelow(root, "Code")) {
      SetText(*code, std::string(Ns::WST.uri) + "/status/unknown");
    }
    return;
  case DocumentFault::NO_LEG:
  case DocumentFault::GARBAGE_LEG:
  case DocumentFault::NO_CONTEXT:
  case DocumentFault::OTHER_CONTEXT:
    CorruptLeg(root, fault);
    return;
  case DocumentFault::TOO_DEEP:
    Deepen(RequireChild(*root, Ns::SOAPENV, "Body"));
    return;
  default:
    return;
  }
}

} // namespace

std::optional<Fault> ParseFault(std::string_view name) {
  for (const NamedFault &known : NAMED) {
    if (known.name == name) {
      return known.fault;
    }
  }
  if (name.substr(0, SOAP_FAULT_PREFIX.size()) == SOAP_FAULT_PREFIX) {
    for (const NamedCode &known : CODES) {
      if (known.name == name.substr(SOAP_FAULT_PREFIX.size())) {
        Fault fault = OfDocument(DocumentFault::SOAP_FAULT);
        fault.code = known.code;
        return fault;
      }
    }
  }
  return ParseNumberedFault(name);
}

std::string FaultHelp() {
  std::string help;
  std::string line = " ";
  const auto add = [&](const std::string &name) {
    if (line.size() + name.size() > 78) {
      help += line + "\n";
      line = " ";
    }
    line += " " + name;
  };
  for (const NamedFault &known : NAMED) {
    add(std::string(known.name));
  }
  for (const NumberedFault &known : NUMBERED) {
    add(std::string(known.prefix) + (known.delivery == DeliveryFault::BAD_STATUS ? "NNN" : "SECONDS"));
  }
  for (const NamedCode &known : CODES) {
    add(std::string(SOAP_FAULT_PREFIX) + std::string(known.name));
  }
  return help + line + "\n";
}

void CorruptFacts(TokenFacts &facts, TokenFault fault) {
  const auto life = facts.notOnOrAfter - facts.notBefore;
  constexpr std::chrono::hours DAY(24);
  switch (fault) {
  case TokenFault::EXPIRED:
    facts.notOnOrAfter = facts.notBefore - DAY;
    facts.notBefore = facts.notOnOrAfter - life;
    return;
  case TokenFault::EARLY:
    facts.notBefore += DAY;
    facts.notOnOrAfter += DAY;
    return;
  case TokenFault::WRONG_AUDIENCE:
    facts.audience = {"https://elsewhere.example/"};
    return;
  case TokenFault::BEARER:
    facts.certificate.clear();
    return;
  case TokenFault::PLAIN: // without anything that was asked for
    facts.delegation.clear();
    facts.audience.clear();
    facts.advice.clear();
    facts.renewals = 0;
    facts.delegations = 0;
    return;
  case TokenFault::SHORT_LIVED:
    facts.notOnOrAfter = facts.notBefore + life / 2;
    return;
  default:
    return;
  }
}

void CorruptToken(xmlDoc &token, TokenFault fault) {
  xmlNode &assertion = *xmlDocGetRootElement(&token);
  switch (fault) {
  case TokenFault::NO_SUBJECT: {
    xmlNode &subject = RequireChild(assertion, Ns::SAML, "Subject");
    xmlUnlinkNode(&subject);
    xmlFreeNode(&subject);
    return;
  }
  case TokenFault::UNKNOWN_ELEMENT:
    AddElement(assertion, Ns::SAML, "Surprise");
    return;
  case TokenFault::WRONG_VERSION:
    xmlSetProp(&assertion, XmlText("Version"), XmlText("1.1"));
    return;
  default:
    return;
  }
}

void TamperWith(xmlDoc &token) {
  xmlNode &subject = RequireChild(*xmlDocGetRootElement(&token), Ns::SAML, "Subject");
  SetText(RequireChild(subject, Ns::SAML, "NameID"), "mallory@corp.example");
}

std::string CorruptResponse(xmlDoc &response, DocumentFault fault) {
  CorruptTree(response, fault);
  std::string text = Serialise(response);
  switch (fault) {
  case DocumentFault::GARBLED_XML:
    return text.substr(0, text.rfind("</")) + "</garbled>";
  case DocumentFault::NOT_SOAP:
    return "<html><head><title>Welcome</title></head><body>It works!</body></html>";
  case DocumentFault::EMPTY_BODY:
    return {};
  case DocumentFault::DOCTYPE:
    return "<!DOCTYPE Envelope>" + text;
  default:
    return text;
  }
}

} // namespace DevSts
