// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NamespaceBindings`, the namespaces in scope while a tree is walked, and what of them the output has declared.

#pragma once

#include <boost/container/small_vector.hpp>

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace Tarvel::Xml::Security {

/// A stack of prefix bindings with constant-time look-up. The default namespace has the empty prefix; it is bound to the
/// empty name, and "xml" to its fixed name, before anything is declared. Texts belong to the caller. For one thread.
class NamespaceBindings {
public:
  struct Binding {
    std::string_view prefix;
    std::string_view uri;
    std::string_view written; ///< what the output around this place binds the prefix to; meaningful when `isWritten`
    bool isWritten = false;
    std::uint32_t bucket = 0;
    std::uint32_t next = 0; ///< the binding below it in its bucket
  };

  /// A state to go back to.
  struct Mark {
    std::size_t bindings;
    std::size_t changes;
  };

  NamespaceBindings();

  /// Binds `prefix` from here on; the output's state for the prefix stays what it is.
  void Declare(std::string_view prefix, std::string_view uri);

  /// The index of the binding in force for `prefix`, or `NOT_BOUND`.
  std::size_t Find(std::string_view prefix) noexcept {
    return m_recent != NOT_BOUND && m_bindings[m_recent].prefix == prefix ? m_recent : Search(prefix);
  }

  const Binding &operator[](std::size_t index) const noexcept { return m_bindings[index]; }
  std::size_t Size() const noexcept { return m_bindings.size(); }

  /// Notes that the output binds the prefix as the source does. @return whether the output did not do so already, so that
  /// a declaration has to be written.
  bool Write(std::size_t index) {
    const Binding &binding = m_bindings[index];
    // The texts are the same one where nothing was declared since.
    const bool isSameText =
        binding.written.data() == binding.uri.data() && binding.written.size() == binding.uri.size();
    return !(binding.isWritten && isSameText) && WriteAnew(index);
  }

  Mark GetMark() const noexcept { return {m_bindings.size(), m_changes.size()}; }
  void GoBack(Mark mark) noexcept {
    if (m_changes.size() != mark.changes || m_bindings.size() != mark.bindings) {
      Undo(mark);
    }
  }

  static constexpr std::size_t NOT_BOUND = SIZE_MAX;

private:
  static constexpr std::uint32_t END_OF_BUCKET = UINT32_MAX;
  static constexpr std::uint32_t BUCKETS = 128; // a power of two
  static constexpr std::size_t EXPECTED = 16;   // so many bindings, and changes, cost no allocation

  struct Change {
    std::size_t index;
    std::string_view written;
    bool isWritten;
  };

  static std::uint32_t BucketOf(std::string_view prefix) noexcept;
  std::size_t Search(std::string_view prefix) noexcept;
  bool WriteAnew(std::size_t index);
  void Undo(Mark mark) noexcept;

  std::size_t m_recent = NOT_BOUND; // what was found last, as long as it is in force: mostly it is asked for again
  std::array<std::uint32_t, BUCKETS> m_buckets;
  boost::container::small_vector<Binding, EXPECTED> m_bindings;
  boost::container::small_vector<Change, EXPECTED> m_changes;
};

} // namespace Tarvel::Xml::Security
