// SPDX-License-Identifier: Apache-2.0
/// @file
/// The WS-Security header: its elements, its timestamp, and what its signature covers.

#pragma once

#include "refusal.h"
#include "time_text.h"
#include "xml_tree.h"

#include <chrono>
#include <set>
#include <string>

namespace DevSts {

/// The elements that the security header may have, each at most once.
struct SecurityHeader {
  xmlNode *timestamp = nullptr; ///< never null
  xmlNode *usernameToken = nullptr;
  xmlNode *binaryToken = nullptr;
  xmlNode *assertion = nullptr;
  xmlNode *signature = nullptr;
};

/// What a signature must cover, and what else it may cover.
struct CoverageRule {
  std::set<const xmlNode *> required;
  std::set<const xmlNode *> optional;
  const char *refusal; ///< the reason when the signature covers less or more
};

/// Refuses a message with wsse:InvalidSecurity.
[[noreturn]] void RefuseSecurity(const std::string &reason);

/// @throws Refusal for an unknown element, an element that occurs twice, and a header without a timestamp
SecurityHeader ReadSecurityHeader(const xmlNode &security);

/// Returns when the message expires. @throws Refusal unless the timestamp is current
Time CheckTimestamp(const xmlNode &timestamp, std::chrono::seconds tolerance);

/// @throws Refusal unless the signature covers each element of `rule.required` once, each of `rule.optional` at most
/// once, and nothing else
void RequireCoverage(const xmlNode &signature, const Identifiers &identifiers, CoverageRule rule);

/// Whether `keyIdentifier`, of a key reference, refers to this SAML 2.0 assertion.
bool Identifies(const xmlNode &keyIdentifier, const xmlNode &assertion);

} // namespace DevSts
