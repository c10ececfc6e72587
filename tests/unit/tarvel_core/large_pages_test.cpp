// SPDX-License-Identifier: Apache-2.0
// The request for large pages changes neither the content of an array nor what is around it.

#include <tarvel/core/large_pages.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <vector>

namespace {

constexpr std::size_t LARGE_PAGE_BYTES = std::size_t{2} << 20;

TEST(AskForLargePages, KeepsTheContentOfArraysOfEachSizeAndPlace) {
  std::vector<char> octets(5 * LARGE_PAGE_BYTES, 'x');
  for (const std::size_t offset : {std::size_t{0}, std::size_t{1}, LARGE_PAGE_BYTES - 1, LARGE_PAGE_BYTES}) {
    for (const std::size_t size : {std::size_t{0}, std::size_t{1}, LARGE_PAGE_BYTES, 3 * LARGE_PAGE_BYTES}) {
      Tarvel::AskForLargePages(octets.data() + offset, size);
    }
  }
  EXPECT_EQ(static_cast<std::ptrdiff_t>(octets.size()), std::count(octets.begin(), octets.end(), 'x'));
}

TEST(AskForLargePages, AcceptsNoMemory) {
  Tarvel::AskForLargePages(nullptr, 0);
}

} // namespace
