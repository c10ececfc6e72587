// SPDX-License-Identifier: Apache-2.0
// A test preloads this into a program. At the program's end it searches the memory for a text, and writes to standard error
// how often it occurs. The environment has the text in reverse, so that the search does not find it there.

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>

namespace {

bool IsReverseAt(const char *place, const char *reversed, std::size_t length) {
  for (std::size_t i = 0; i < length; ++i) {
    if (place[i] != reversed[length - 1 - i]) {
      return false;
    }
  }
  return true;
}

/// How often the text is in the memory from `begin` to `end`.
int CountIn(const char *begin, const char *end, const char *reversed) {
  const std::size_t length = std::strlen(reversed);
  int count = 0;
  for (const char *place = begin; place + length <= end; ++place) {
    count += IsReverseAt(place, reversed, length) ? 1 : 0;
  }
  return count;
}

struct SearchAtTheEnd {
  SearchAtTheEnd() = default;
  SearchAtTheEnd(const SearchAtTheEnd &) = delete;
  SearchAtTheEnd &operator=(const SearchAtTheEnd &) = delete;
  ~SearchAtTheEnd() {
    const char *const reversed = std::getenv("REVERSED_TEXT");
    if (!reversed) {
      return;
    }
    int count = 0;
    std::ifstream maps("/proc/self/maps");
    for (std::string line; std::getline(maps, line);) {
      std::istringstream fields(line);
      void *begin = nullptr;
      void *end = nullptr;
      char dash = 0;
      std::string access;
      if (fields >> begin >> dash >> end >> access && access.compare(0, 2, "rw") == 0) {
        count += CountIn(static_cast<const char *>(begin), static_cast<const char *>(end), reversed);
      }
    }
    std::fprintf(stderr, "found %d times\n", count);
  }
} g_searchAtTheEnd;

} // namespace
