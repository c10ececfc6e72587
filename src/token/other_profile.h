// SPDX-License-Identifier: Apache-2.0
/// @file
/// What the report for one profile states about the other profile.

#pragma once

#include <ssoclient/exceptions.h>

#include <string>

namespace SsoClient {

/// Why `rule`, which reports to `ThrowingSink`, refuses the token. Empty if it does not.
template <typename Rule>
std::string RefusalOf(const Rule &rule) {
  try {
    rule();
    return {};
  } catch (const ParseException &refusal) {
    return refusal.what();
  }
}

/// The sentence that states whether the profile `profile` reads or accepts the token.
/// @param verb "read" or "accept"
/// @param refusal why it does not; empty if it does
/// @param isRefused whether the profile of the report refuses the token
inline std::string OtherProfileSentence(const std::string &profile, const std::string &verb, const std::string &refusal,
                                        bool isRefused) {
  std::string text = "The profile " + profile;
  if (refusal.empty()) {
    return text + " " + verb + (isRefused ? "s it." : "s it, too.");
  }
  text += " does not " + verb + (isRefused ? " it either: " : " it: ") + refusal;
  return text.back() == '.' ? text : text + ".";
}

} // namespace SsoClient
