// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checks that assertions are refused after a change, and the messages that several refusals share.

#pragma once

#include "support/parsed_document.h"
#include "support/recorded_deviations.h"
#include "support/throws_message.h"
#include "token/assertion_parser.h"
#include "unit/token/assertion_text.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Testing {

/// A change of a valid assertion, and the message with which it is refused.
struct Refusal {
  std::string from;
  std::string to;
  std::string message;
};

inline void Parse(const std::string &text) {
  const ParsedDocument document(text);
  SsoClient::NodeFilterIterator iterator = document.Cursor();
  SsoClient::SamlAssertionType assertion;
  SsoClient::ParseSamlAssertionElement(iterator, assertion);
}

/// The text of the first deviation that a parse reports to a sink that does not throw.
inline std::string FirstDeviation(const std::string &text) {
  const ParsedDocument document(text);
  SsoClient::NodeFilterIterator iterator = document.Cursor();
  SsoClient::SamlAssertionType assertion;
  RecordedDeviations deviations;
  SsoClient::ParseSamlAssertionElement(iterator, assertion, deviations);
  return deviations.all.empty() ? std::string() : deviations.all.front().message;
}

/// Expects that `base` is accepted, and that it is refused after each of the changes. The exception must have the text
/// of the first deviation that a report would list.
inline void ExpectRefusals(const std::string &base, const std::vector<Refusal> &refusals) {
  ASSERT_NO_THROW(Parse(base));
  EXPECT_EQ("", FirstDeviation(base));
  for (const Refusal &refusal : refusals) {
    SCOPED_TRACE("replaced " + refusal.from + "\nby " + refusal.to);
    const std::string changed = ReplaceOnce(base, refusal.from, refusal.to);
    EXPECT_THROWS_MESSAGE(Parse(changed), SsoClient::ParseException, refusal.message);
    EXPECT_EQ(refusal.message, FirstDeviation(changed));
  }
}

inline std::string Twice(const std::string &text) {
  return text + text;
}

inline std::string NotFound(const std::string &name) {
  return "Expected element '" + name + "' not found.";
}

inline std::string OnlyText(const std::string &name) {
  return "Element '" + name + "' must only have textual content (but has extra children or is empty).";
}

} // namespace Testing
