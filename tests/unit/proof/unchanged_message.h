// SPDX-License-Identifier: Apache-2.0
/// @file
/// Checks that a call that throws has not changed its message.

#pragma once

#include "support/throws_message.h"
#include "support/xml_tree.h"

#include <string>

namespace Testing {

/// Runs `call` with the document `message`, and checks that it throws exactly `Expected` with the text `text`, and leaves the
/// tree as it was.
template <typename Expected, typename Call>
::testing::AssertionResult RefusesUnchanged(const std::string &message, const Call &call, const std::string &text) {
  const Tarvel::Ref<Tarvel::Xml::Document> document = ParseDocument(message);
  const std::string before = DescribeTree(*document->GetDocumentNode());
  const ::testing::AssertionResult result = ThrowsMessage<Expected>([&] { call(*document); }, text);
  const std::string after = DescribeTree(*document->GetDocumentNode());
  if (result && before != after) {
    return ::testing::AssertionFailure() << "The message was changed from " << before << " to " << after;
  }
  return result;
}

} // namespace Testing
