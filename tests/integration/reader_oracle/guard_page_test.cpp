// SPDX-License-Identifier: Apache-2.0
// Documents next to pages that cannot be read: reading one octet too far ends the test.

#include "comparison.h"
#include "generated_xml.h"
#include "readers.h"

#include "support/data_file.h"
#include "support/repetitions.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <sys/mman.h>
#include <system_error>
#include <unistd.h>

namespace {

using Testing::Escaped;
using Testing::Reading;

/// Writable pages between two pages that can be neither read nor written.
class GuardedPages {
public:
  explicit GuardedPages(std::size_t bytes)
      : m_page(static_cast<std::size_t>(sysconf(_SC_PAGESIZE))), m_size((bytes + m_page - 1) / m_page * m_page) {
    void *const mapped = mmap(nullptr, m_size + 2 * m_page, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (mapped == MAP_FAILED) {
      throw std::system_error(errno, std::generic_category(), "mmap");
    }
    m_begin = static_cast<char *>(mapped) + m_page;
    if (mprotect(m_begin, m_size, PROT_READ | PROT_WRITE) != 0) {
      throw std::system_error(errno, std::generic_category(), "mprotect");
    }
  }
  GuardedPages(const GuardedPages &) = delete;
  GuardedPages &operator=(const GuardedPages &) = delete;
  ~GuardedPages() { munmap(m_begin - m_page, m_size + 2 * m_page); }

  std::string_view PutAtBegin(std::string_view text) { return Put(text, m_begin); }
  std::string_view PutAtEnd(std::string_view text) { return Put(text, m_begin + m_size - text.size()); }

private:
  static std::string_view Put(std::string_view text, char *place) {
    std::memcpy(place, text.data(), text.size());
    return std::string_view(place, text.size());
  }

  const std::size_t m_page;
  const std::size_t m_size;
  char *m_begin;
};

void ExpectSameReading(const Reading &reading, const Reading &expected, std::string_view document) {
  ASSERT_EQ(reading.isAccepted, expected.isAccepted) << Escaped(document);
  ASSERT_EQ(reading.message, expected.message) << Escaped(document);
  ASSERT_EQ(reading.line, expected.line) << Escaped(document);
  ASSERT_EQ(reading.column, expected.column) << Escaped(document);
  ASSERT_EQ(reading.events.Get(), expected.events.Get()) << Escaped(document);
}

/// Expects the same reading of `document` next to each of the pages as elsewhere.
void ExpectReadWithin(GuardedPages &pages, std::string_view document) {
  const Reading elsewhere = Testing::ReadWithPlatform(document);
  ExpectSameReading(Testing::ReadInPlace(pages.PutAtBegin(document)), elsewhere, document);
  ExpectSameReading(Testing::ReadInPlace(pages.PutAtEnd(document)), elsewhere, document);
}

constexpr std::size_t MOST_BYTES = 64 * 1024;

TEST(DocumentBetweenGuardPages, IsReadAsElsewhere) {
  const std::size_t documents = Testing::Repetitions<std::size_t>(1'000'000, 20'000);
  GuardedPages pages(MOST_BYTES);
  for (std::uint64_t seed = 0; seed < documents; ++seed) {
    const std::string document = Testing::GenerateXml(seed);
    ASSERT_LE(document.size(), MOST_BYTES);
    ASSERT_NO_FATAL_FAILURE(ExpectReadWithin(pages, document));
  }
}

TEST(DocumentBetweenGuardPages, IsReadAsElsewhereAfterAnyCut) {
  GuardedPages pages(MOST_BYTES);
  for (const std::string &document :
       {Testing::ReadDataFile("tokens/bearer-5k.xml"),
        std::string("\xEF\xBB\xBF<?xml version='1.0' encoding='US-ASCII' standalone='yes'?><!-- c --><?t d?>") +
            "<p:a xmlns:p='urn:p' xmlns = \"urn:a\" p:b='&#x41;&#66;&lt;\r\n\t'>&amp;]]\r\n<![CDATA[x]]]><b/>\n</p:a "
            ">\n",
        std::string(
            "<\xC3\xA9\xE2\x81\xB0 \xF0\x90\x80\x80='\xE2\x82\xAC'>\xC3\xA4\xF0\x9F\x98\x80</\xC3\xA9\xE2\x81\xB0>")}) {
    for (std::size_t length = 0; length <= document.size(); ++length) {
      ASSERT_NO_FATAL_FAILURE(ExpectReadWithin(pages, std::string_view(document).substr(0, length)));
    }
  }
}

} // namespace
