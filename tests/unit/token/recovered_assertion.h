// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RecoveredAssertion`, what a parse that continues after deviations reports and reads.

#pragma once

#include "support/parsed_document.h"
#include "support/recorded_deviations.h"
#include "token/assertion_parser.h"

#include <string>
#include <vector>

namespace Testing {

/// A document, and what a parse read in it. The first deviation is compared with the exception of a verification.
struct RecoveredAssertion {
  explicit RecoveredAssertion(const std::string &text) : document(text) {
    deviations = DeviationsOf([&](SsoClient::DeviationSink &sink) {
      SsoClient::NodeFilterIterator iterator = document.Cursor();
      SsoClient::SamlAssertionType parsed;
      SsoClient::ParseSamlAssertionElement(iterator, parsed, sink);
      if (&sink != &SsoClient::ThrowingSink()) {
        EXPECT_EQ(nullptr, iterator.node);
        record = parsed;
      }
    });
  }

  /// "message | element" of each deviation. The tests of the rules check the other fields.
  std::vector<std::string> Messages() const {
    std::vector<std::string> messages;
    for (const ExpectedDeviation &deviation : deviations) {
      messages.push_back(deviation.message + " | " + deviation.element);
    }
    return messages;
  }

  ParsedDocument document;
  SsoClient::SamlAssertionType record;
  std::vector<ExpectedDeviation> deviations;
};

using Messages = std::vector<std::string>;

} // namespace Testing
