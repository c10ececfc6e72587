// SPDX-License-Identifier: Apache-2.0
/// @file
/// `TextGatherer`, which assembles a text from parts of its source and their replacements.

#pragma once

#include <tarvel/core/secure_wipe.h>

#include <algorithm>
#include <cstddef>
#include <memory>
#include <string_view>

namespace Tarvel::Xml {

/// A text without replacements is a view of the source. A replacement is never longer than the part that it replaces. So one
/// buffer as long as the rest of the source, allocated when it is first needed, is large enough for all texts that are in
/// use at one time.
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

  /// Replaces the source from `begin` to `end` by `by`, which is at most as long. All earlier replacements of the text
  /// are before `begin`.
  void Replace(const char *begin, const char *end, std::string_view by) {
    Gather(begin, by);
    m_pieceBegin = end;
  }

  /// Ends the text at `place` of the source and returns it. The text is valid until the next `Clear`.
  std::string_view End(const char *place) {
    if (m_free == m_text) {
      return std::string_view(m_pieceBegin, static_cast<std::size_t>(place - m_pieceBegin));
    }
    Gather(place, "");
    return std::string_view(m_text, static_cast<std::size_t>(m_free - m_text));
  }

  /// Overwrites all texts, which may be part of a bearer token, and reuses their memory.
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
  const char *m_pieceBegin = nullptr; // the beginning of the part of the source that is not copied yet
  std::unique_ptr<char[]> m_buffer;
  char *m_free = nullptr; // the end of all texts
  char *m_text = nullptr; // the beginning of the current text
};

} // namespace Tarvel::Xml
