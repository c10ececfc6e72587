// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/large_pages.h>

#include <cstdint>

#include <sys/mman.h>

namespace Tarvel {

void AskForLargePages(void *memory, std::size_t bytes) noexcept {
  constexpr std::uintptr_t LARGE_PAGE_BYTES = std::uintptr_t{2} << 20;
  const auto begin = reinterpret_cast<std::uintptr_t>(memory);
  const std::uintptr_t offset = (LARGE_PAGE_BYTES - begin % LARGE_PAGE_BYTES) % LARGE_PAGE_BYTES;
  if (bytes >= offset + LARGE_PAGE_BYTES) {
    const std::uintptr_t whole = (bytes - offset) / LARGE_PAGE_BYTES * LARGE_PAGE_BYTES;
    madvise(static_cast<char *>(memory) + offset, whole, MADV_HUGEPAGE); // only a wish: a failure changes nothing
  }
}

} // namespace Tarvel
