// SPDX-License-Identifier: Apache-2.0

#include "security_header.h"

#include "signature_engine.h"

#include <algorithm>

namespace DevSts {

namespace {

constexpr std::chrono::hours LONGEST_MESSAGE_LIFE(24);

Time ReadTime(const xmlNode &timestamp, const char *name) {
  const std::optional<Time> time = ParseTime(TextOf(RequireChild(timestamp, Ns::WSU, name)));
  if (!time) {
    RefuseSecurity(std::string(name) + " of the timestamp is not a UTC date");
  }
  return *time;
}

} // namespace

void RefuseSecurity(const std::string &reason) {
  throw Refusal(Code::INVALID_SECURITY, reason);
}

SecurityHeader ReadSecurityHeader(const xmlNode &security) {
  SecurityHeader header;
  const struct {
    Namespace ns;
    const char *name;
    xmlNode *SecurityHeader::*place;
  } parts[] = {{Ns::WSU, "Timestamp", &SecurityHeader::timestamp},
               {Ns::WSSE, "UsernameToken", &SecurityHeader::usernameToken},
               {Ns::WSSE, "BinarySecurityToken", &SecurityHeader::binaryToken},
               {Ns::SAML, "Assertion", &SecurityHeader::assertion},
               {Ns::DS, "Signature", &SecurityHeader::signature}};
  for (xmlNode *child : ChildElements(security)) {
    const auto *const part = std::find_if(std::begin(parts), std::end(parts),
                                          [&](const auto &known) { return IsElement(*child, known.ns, known.name); });
    if (part == std::end(parts)) {
      throw Refusal(Code::UNSUPPORTED_TOKEN, "unknown element in the security header: '" +
                                                 std::string(reinterpret_cast<const char *>(child->name)) + "'");
    }
    if (header.*part->place) {
      RefuseSecurity(std::string("several ") + part->name + " in the security header");
    }
    header.*part->place = child;
  }
  if (!header.timestamp) {
    RefuseSecurity("no timestamp");
  }
  return header;
}

Time CheckTimestamp(const xmlNode &timestamp, std::chrono::seconds tolerance) {
  const Time created = ReadTime(timestamp, "Created");
  const Time expires = ReadTime(timestamp, "Expires");
  const Time now = Now();
  if (expires <= created || expires - created > LONGEST_MESSAGE_LIFE) {
    RefuseSecurity("the timestamp's period is empty or too long");
  }
  if (created > now + tolerance) {
    RefuseSecurity("the timestamp is in the future");
  }
  if (expires + tolerance <= now) {
    throw Refusal(Code::MESSAGE_EXPIRED, "the message has expired");
  }
  return expires;
}

void RequireCoverage(const xmlNode &signature, const Identifiers &identifiers, CoverageRule rule) {
  for (const SignatureReference &reference : ReadReferences(signature)) {
    const auto found = identifiers.find(reference.id);
    if (reference.isEnveloped || found == identifiers.end()) {
      RefuseSecurity("the signature refers to an element that does not exist");
    }
    if (rule.required.erase(found->second) + rule.optional.erase(found->second) == 0) {
      RefuseSecurity(rule.refusal);
    }
  }
  if (!rule.required.empty()) {
    RefuseSecurity(rule.refusal);
  }
}

bool Identifies(const xmlNode &keyIdentifier, const xmlNode &assertion) {
  return AttributeOf(keyIdentifier, "ValueType").value_or("") == SAML_ID_VALUE_TYPE &&
         TextOf(keyIdentifier) == AttributeOf(assertion, "ID");
}

} // namespace DevSts
