// SPDX-License-Identifier: Apache-2.0
// The generated documents reach all of the reader: each reason for a refusal occurs.

#include "generated_xml.h"
#include "readers.h"

#include "xml/refusals.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <set>
#include <string>
#include <string_view>

namespace {

using Tarvel::Xml::REFUSAL_TEXTS;

/// Whether `message` is `text` with its placeholders replaced.
bool IsOfText(std::string_view message, std::string_view text) {
  const std::string_view end = text.substr(text.rfind('%') == std::string_view::npos ? 0 : text.rfind('%') + 2);
  return message.starts_with(text.substr(0, text.find('%'))) && message.ends_with(end);
}

TEST(GeneratedDocuments, AreRefusedForEachReasonThatAShortDocumentCanHave) {
  constexpr std::uint64_t DOCUMENTS = 40'000;
  std::set<std::string_view> missing(std::begin(REFUSAL_TEXTS), std::end(REFUSAL_TEXTS));
  EXPECT_EQ(missing.erase("the document is longer than 16777216 bytes"), 1u);
  EXPECT_EQ(missing.erase("the document has more than 1048576 nodes and attributes"), 1u);
  for (std::uint64_t seed = 0; seed < DOCUMENTS && !missing.empty(); ++seed) {
    const std::string message = Testing::ReadWithPlatform(Testing::GenerateXml(seed)).message;
    if (!message.empty()) {
      std::erase_if(missing, [&](std::string_view text) { return IsOfText(message, text); });
    }
  }
  EXPECT_EQ(missing, std::set<std::string_view>());
}

} // namespace
