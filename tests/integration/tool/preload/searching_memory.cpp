// SPDX-License-Identifier: Apache-2.0
// A test preloads this into a program. At the program's end it searches the memory for a text, and writes to standard error
// how often it occurs. The environment has the text in reverse, so that the search does not find it there.

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
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
      unsigned long begin = 0;
      unsigned long end = 0;
      char access[5] = {};
      if (std::sscanf(line.c_str(), "%lx-%lx %4s", &begin, &end, access) == 3 && std::strncmp(access, "rw", 2) == 0) {
        count += CountIn(reinterpret_cast<const char *>(begin), reinterpret_cast<const char *>(end), reversed);
      }
    }
    std::fprintf(stderr, "found %d times\n", count);
  }
} g_searchAtTheEnd;

} // namespace
