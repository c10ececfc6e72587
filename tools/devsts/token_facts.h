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
  std::string subject;     ///< such as "alice@corp.example"
  Time authenticated;      ///< when the subject was authenticated
  std::string context;     ///< how it was authenticated: a SAML authentication context class
  std::string certificate; ///< the holder's, as Base64 of its DER form; empty for a bearer token
  Time notBefore;
  Time notOnOrAfter;
  std::uint64_t renewals = 0;    ///< how often the token may still be renewed
  std::uint64_t delegations = 0; ///< how often it may still be delegated
  std::vector<DelegationStep> delegation;
  std::vector<std::string> audience;
  std::vector<AdviceEntry> advice;
  std::vector<std::string> groups; ///< such as "corp.example\admins"
  std::string first;
  std::string last;
  bool isSolution = false;
};

} // namespace DevSts
