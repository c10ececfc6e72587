// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TextGatherer`, which puts a text together of what its source has and what replaces parts of it.

#pragma once

#include <tarvel/core/secure_wipe.h>

#include <algorithm>
#include <cstddef>
#include <memory>
#include <string_view>

namespace Tarvel::Xml {

/// A text in which nothing was replaced is a view of the source. What replaces a part of the source is never longer than
/// that part, so that one buffer as long as the rest of the source, made when it is first needed, has room for all texts
/// that are in use at one time.
class TextGatherer {
public:
  /// @param sourceEnd the end of the source that all texts are from.
  explicit TextGatherer(const char *sourceEnd) noexcept : m_sourceEnd(sourceEnd) {}
  TextGatherer(const TextGatherer &) = delete;
  TextGatherer &operator=(const TextGatherer &) = delete;
  ~TextGatherer() { Clear(); }

  /// Begins a text at `place` of the source.
  void Begin(const char *place) noexcept {
    m_pieceBegin = place;
    m_text = m_free;
  }

  /// In place of the source from `begin` to `end`, which are after all that was replaced before, the text has `by`, which is
  /// at most as long.
  void Replace(const char *begin, const char *end, std::string_view by) {
    Gather(begin, by);
    m_pieceBegin = end;
  }

  /// The text up to `place` of the source; it is valid until the next `Clear`.
  std::string_view End(const char *place) {
    if (m_free == m_text) {
      return std::string_view(m_pieceBegin, static_cast<std::size_t>(place - m_pieceBegin));
    }
    Gather(place, "");
    return std::string_view(m_text, static_cast<std::size_t>(m_free - m_text));
  }

  /// Overwrites all texts, which may be part of a bearer token, and frees their place.
  void Clear() noexcept {
    if (m_free != m_buffer.get()) {
      SecureWipe(m_buffer.get(), static_cast<std::size_t>(m_free - m_buffer.get()));
      m_free = m_buffer.get();
    }
  }

private:
  void Gather(const char *pieceEnd, std::string_view more) {
    if (!m_buffer) {
      m_buffer.reset(new char[static_cast<std::size_t>(m_sourceEnd - m_pieceBegin)]);
      m_text = m_free = m_buffer.get();
    }
    Append(std::string_view(m_pieceBegin, static_cast<std::size_t>(pieceEnd - m_pieceBegin)));
    Append(more);
  }

  void Append(std::string_view text) noexcept { m_free = std::copy(text.begin(), text.end(), m_free); }

  const char *m_sourceEnd;
  const char *m_pieceBegin = nullptr; // of what is not gathered yet
  std::unique_ptr<char[]> m_buffer;
  char *m_free = nullptr; // after all texts
  char *m_text = nullptr; // the current text begins there
};

} // namespace Tarvel::Xml
