// SPDX-License-Identifier: Apache-2.0

#include "trust_request.h"

#include "refusal.h"

#include <algorithm>
#include <initializer_list>

namespace DevSts {

namespace {

constexpr std::chrono::hours LONGEST_LIFETIME(10 * 365 * 24);

[[noreturn]] void RefuseRequest(const std::string &reason) {
  throw Refusal(Code::INVALID_REQUEST, reason);
}

std::string WstUri(const char *path) {
  return std::string(Ns::WST.uri) + path;
}

bool ReadBoolean(const std::string &text) {
  if (text != "true" && text != "false") {
    RefuseRequest("'" + text + "' is neither true nor false");
  }
  return text == "true";
}

std::string ReadTokenType(const xmlNode &request, std::initializer_list<std::string> supported) {
  std::string type = TextOf(RequireChild(request, Ns::WST, "TokenType"));
  if (std::find(supported.begin(), supported.end(), type) == supported.end()) {
    RefuseRequest("unsupported token type '" + type + "'");
  }
  return type;
}

std::string ReadSamlTokenType(const xmlNode &request) {
  return ReadTokenType(request, {SAML_TOKEN_TYPE, SAML_PROFILE_TOKEN_TYPE});
}

RequestType ReadRequestType(const xmlNode &request) {
  const std::string text = TextOf(RequireChild(request, Ns::WST, "RequestType"));
  for (const RequestType type : {RequestType::ISSUE, RequestType::RENEW, RequestType::VALIDATE}) {
    if (text == WstUri("/") + RequestTypeName(type)) {
      return type;
    }
  }
  RefuseRequest("unsupported request type '" + text + "'");
}

bool ReadKeyType(const xmlNode &request) {
  const std::string type = TextOf(RequireChild(request, Ns::WST, "KeyType"));
  if (type != WstUri("/Bearer") && type != WstUri("/PublicKey")) {
    RefuseRequest("unsupported key type '" + type + "'");
  }
  return type == WstUri("/PublicKey");
}

std::chrono::milliseconds ReadLifetime(const xmlNode &request) {
  const xmlNode &lifetime = RequireChild(request, Ns::WST, "Lifetime");
  const std::optional<Time> created = ParseTime(TextOf(RequireChild(lifetime, Ns::WSU, "Created")));
  const std::optional<Time> expires = ParseTime(TextOf(RequireChild(lifetime, Ns::WSU, "Expires")));
  if (!created || !expires || *expires <= *created || *expires - *created > LONGEST_LIFETIME) {
    throw Refusal(Code::INVALID_TIME_RANGE, "the lifetime is malformed, empty or too long");
  }
  return *expires - *created;
}

/// The name in the username token of the child `element`.
std::optional<std::string> ReadParty(const xmlNode &request, const char *element, const char *role) {
  const xmlNode *const party = FindChild(request, Ns::WST, element);
  if (!party) {
    return std::nullopt;
  }
  std::string name = TextOf(RequireChild(RequireChild(*party, Ns::WSSE, "UsernameToken"), Ns::WSSE, "Username"));
  const std::size_t at = name.rfind('@');
  if (at == std::string::npos || at == 0 || at + 1 == name.size()) {
    RefuseRequest(std::string("the ") + role + " '" + name + "' is not of the form name@domain");
  }
  return name;
}

void ReadParties(const xmlNode &request, TrustRequest &read) {
  read.delegateTo = ReadParty(request, "DelegateTo", "delegate");
  read.onBehalfOf = ReadParty(request, "OnBehalfOf", "party");
  if (read.delegateTo && read.onBehalfOf) {
    RefuseRequest("the request has both wst:DelegateTo and wst:OnBehalfOf");
  }
  if (FindChild(request, Ns::WST14, "ActAs")) {
    RefuseRequest("wst14:ActAs is of WS-Trust 1.4; this service has version 1.3");
  }
}

void ReadUseKey(const xmlNode &useKey, TrustRequest &read) {
  const xmlNode *const keyInfo = FindChild(useKey, Ns::DS, "KeyInfo");
  if (keyInfo) {
    read.useKeyCertificate =
        TextOf(RequireChild(RequireChild(*keyInfo, Ns::DS, "X509Data"), Ns::DS, "X509Certificate"));
  }
  read.useKey = AttributeOf(useKey, "Sig");
  if (!keyInfo && !read.useKey) {
    RefuseRequest("wst:UseKey refers to no signature and contains no ds:KeyInfo");
  }
}

/// An element that is left out asks for nothing.
bool ReadRenewing(const xmlNode &request) {
  const xmlNode *const renewing = FindChild(request, Ns::WST, "Renewing");
  return renewing && ReadBoolean(AttributeOf(*renewing, "Allow").value_or(""));
}

bool ReadDelegatable(const xmlNode &request) {
  const xmlNode *const delegatable = FindChild(request, Ns::WST, "Delegatable");
  return delegatable && ReadBoolean(TextOf(*delegatable));
}

std::vector<std::string> ReadAudience(const xmlNode &request) {
  std::vector<std::string> audience;
  if (const xmlNode *participants = FindChild(request, Ns::WST, "Participants")) {
    for (const xmlNode *participant : ChildElements(*participants)) {
      const xmlNode &reference = RequireChild(*participant, Ns::WSA, "EndpointReference");
      audience.push_back(TextOf(RequireChild(reference, Ns::WSA, "Address")));
    }
  }
  return audience;
}

AdviceEntry ReadAdviceEntry(const xmlNode &advice) {
  AdviceEntry entry;
  entry.source = AttributeOf(advice, "AdviceSource").value_or("");
  for (const xmlNode *attribute : ChildElements(advice)) {
    AdviceAttribute &read = entry.attributes.emplace_back();
    read.name = AttributeOf(*attribute, "Name").value_or("");
    for (const xmlNode *value : ChildElements(*attribute)) {
      read.values.push_back(TextOf(*value));
    }
  }
  return entry;
}

std::vector<AdviceEntry> ReadAdvice(const xmlNode &request) {
  std::vector<AdviceEntry> advice;
  if (const xmlNode *set = FindChild(request, Ns::ADVICE, "AdviceSet")) {
    for (const xmlNode *entry : ChildElements(*set)) {
      advice.push_back(ReadAdviceEntry(*entry));
    }
  }
  return advice;
}

void ReadIssue(const xmlNode &request, TrustRequest &read) {
  read.tokenType = ReadSamlTokenType(request);
  read.wantsHolderOfKey = ReadKeyType(request);
  read.lifetime = ReadLifetime(request);
  read.renewable = ReadRenewing(request);
  read.delegable = ReadDelegatable(request);
  ReadParties(request, read);
  read.audience = ReadAudience(request);
  read.advice = ReadAdvice(request);
  if (const xmlNode *useKey = FindChild(request, Ns::WST, "UseKey")) {
    ReadUseKey(*useKey, read);
  }
  read.binaryExchange = FindChild(request, Ns::WST, "BinaryExchange");
}

const xmlNode *ReadTarget(const xmlNode &request, const char *name) {
  return &RequireChild(RequireChild(request, Ns::WST, name), Ns::SAML, "Assertion");
}

} // namespace

const char *RequestTypeName(RequestType type) {
  switch (type) {
  case RequestType::RENEW:
    return "Renew";
  case RequestType::VALIDATE:
    return "Validate";
  case RequestType::ISSUE:
    break;
  }
  return "Issue";
}

TrustRequest ReadTrustRequest(const xmlNode &request) {
  if (!IsElement(request, Ns::WST, "RequestSecurityToken")) {
    RefuseRequest("the body does not contain a wst:RequestSecurityToken");
  }
  TrustRequest read;
  read.type = ReadRequestType(request);
  switch (read.type) {
  case RequestType::ISSUE:
    ReadIssue(request, read);
    break;
  case RequestType::RENEW:
    read.tokenType = ReadSamlTokenType(request);
    read.lifetime = ReadLifetime(request);
    read.target = ReadTarget(request, "RenewTarget");
    break;
  case RequestType::VALIDATE:
    ReadTokenType(request, {WstUri("/RSTR/Status")});
    read.target = ReadTarget(request, "ValidateTarget");
    break;
  }
  return read;
}

} // namespace DevSts
