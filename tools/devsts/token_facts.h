// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a token says, apart from its signature.

#pragma once

#include "time_text.h"

#include <cstdint>
#include <string>
#include <vector>

namespace DevSts {

struct DelegationStep {
  std::string name;
  Time instant;
};

struct AdviceAttribute {
  std::string name;
  std::vector<std::string> values;
};

struct AdviceEntry {
  std::string source;
  std::vector<AdviceAttribute> attributes;
};

struct TokenFacts {
  std::string subject;     ///< as "alice@corp.example"
  Time authenticated;      ///< when the subject proved to be who it is
  std::string context;     ///< how, a SAML authentication context class
  std::string certificate; ///< Base64 DER of the holder's, empty for a bearer token
  Time notBefore;
  Time notOnOrAfter;
  std::uint64_t renewals = 0;    ///< how often the token may be renewed yet
  std::uint64_t delegations = 0; ///< how often it may be delegated yet
  std::vector<DelegationStep> delegation;
  std::vector<std::string> audience;
  std::vector<AdviceEntry> advice;
  std::vector<std::string> groups; ///< as "corp.example\admins"
  std::string first;
  std::string last;
  bool isSolution = false;
};

} // namespace DevSts
