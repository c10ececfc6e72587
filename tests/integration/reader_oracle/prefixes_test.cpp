// SPDX-License-Identifier: Apache-2.0
// Documents that are cut off: no reader accepts one that another refuses.

#include "comparison.h"

#include "support/data_file.h"
#include "support/repetitions.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

namespace {

// Of documents with more than `LARGE` octets, a normal run reads only prefixes whose length is a multiple of
// `LARGE_STEP`.
constexpr std::size_t LARGE = 20'000;
constexpr std::size_t LARGE_STEP = 211;

/// The texts of all documents among the test data, sorted, so that those with a common beginning are adjacent.
std::vector<std::string> AllDocuments() {
  std::vector<std::string> documents;
  for (const auto &entry : std::filesystem::recursive_directory_iterator(Testing::DataPath(""))) {
    if (entry.path().extension() == ".xml") {
      std::ifstream file(entry.path(), std::ios::binary);
      documents.emplace_back(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
    }
  }
  std::sort(documents.begin(), documents.end());
  return documents;
}

/// Whether a normal run reads the prefix of `length` octets: it ends next to "<" or ">", or is one of some others.
bool IsNearBoundary(std::string_view text, std::size_t length) {
  constexpr std::size_t STEP = 251;
  const std::size_t begin = length == 0 ? 0 : length - 1;
  return text.substr(begin, 2).find_first_of("<>") != std::string_view::npos || length % STEP == 0;
}

TEST(PrefixesOfDocuments, AreReadAlikeByAllReaders) {
  const bool isFull = Testing::Repetitions(true, false); // otherwise only those next to markup, and some others
  std::string former;
  std::size_t accepted = 0;
  for (const std::string &document : AllDocuments()) {
    const auto different = std::mismatch(document.begin(), document.end(), former.begin(), former.end()).first;
    const std::size_t common = static_cast<std::size_t>(different - document.begin());
    for (std::size_t length = former.empty() ? 0 : common + 1; length <= document.size(); ++length) {
      if (!isFull && (document.size() > LARGE ? length % LARGE_STEP != 0 : !IsNearBoundary(document, length))) {
        continue;
      }
      const Testing::Comparison comparison = Testing::Compare(std::string_view(document).substr(0, length));
      ASSERT_EQ(comparison.unexplained, "") << "the first " << length << " octets";
      accepted += comparison.ours.isAccepted ? 1u : 0u;
    }
    former = document;
  }
  EXPECT_GT(accepted, 100u); // whole documents, with and without the line break at the end
}

} // namespace
