// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NamespaceBindings`, the namespaces in scope during a walk of a tree, and which of them the output has declared.

#pragma once

#include <boost/container/small_vector.hpp>

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace Tarvel::Xml::Security {

/// A stack of prefix bindings with constant-time look-up. The empty prefix means the default namespace. Before anything
/// is declared, it is bound to the empty name, and "xml" to its fixed name. The caller owns the texts. One thread at a
/// time may use it.
class NamespaceBindings {
public:
  struct Binding {
    std::string_view prefix;
    std::string_view uri;
    std::string_view written; ///< what the output binds the prefix to at this point; valid if `isWritten`
    bool isWritten = false;
    std::uint32_t bucket = 0;
    std::uint32_t next = 0; ///< the next older binding in the same bucket
  };

  /// A state that `RestoreTo` restores.
  struct Mark {
    std::size_t bindings;
    std::size_t changes;
  };

  NamespaceBindings();

  /// Binds `prefix` from here on. What the output binds the prefix to does not change.
  void Declare(std::string_view prefix, std::string_view uri);

  /// The index of the binding of `prefix` in scope, or `NOT_BOUND`.
  std::size_t Find(std::string_view prefix) noexcept {
    return m_recent != NOT_BOUND && m_bindings[m_recent].prefix == prefix ? m_recent : Search(prefix);
  }

  const Binding &operator[](std::size_t index) const noexcept { return m_bindings[index]; }
  std::size_t Size() const noexcept { return m_bindings.size(); }

  /// Makes the output bind the prefix in the same way as the source. @return whether a declaration must be written for
  /// this, because the output bound the prefix differently or not at all.
  bool Write(std::size_t index) {
    const Binding &binding = m_bindings[index];
    // If nothing was declared since, both are views of the same text.
    const bool isSameText =
        binding.written.data() == binding.uri.data() && binding.written.size() == binding.uri.size();
    return !(binding.isWritten && isSameText) && MarkAsWritten(index);
  }

  Mark GetMark() const noexcept { return {m_bindings.size(), m_changes.size()}; }
  void RestoreTo(Mark mark) noexcept {
    if (m_changes.size() != mark.changes || m_bindings.size() != mark.bindings) {
      Restore(mark);
    }
  }

  static constexpr std::size_t NOT_BOUND = SIZE_MAX;

private:
  static constexpr std::uint32_t END_OF_BUCKET = UINT32_MAX;
  static constexpr std::uint32_t BUCKETS = 128; // a power of two
  static constexpr std::size_t EXPECTED = 16;   // this many bindings and changes need no allocation

  struct Change {
    std::size_t index;
    std::string_view written;
    bool isWritten;
  };

  static std::uint32_t BucketOf(std::string_view prefix) noexcept;
  std::size_t Search(std::string_view prefix) noexcept;
  bool MarkAsWritten(std::size_t index);
  void Restore(Mark mark) noexcept;

  std::size_t m_recent = NOT_BOUND; // the binding found last, while it is in scope; the next search is usually for it
  std::array<std::uint32_t, BUCKETS> m_buckets;
  boost::container::small_vector<Binding, EXPECTED> m_bindings;
  boost::container::small_vector<Change, EXPECTED> m_changes;
};

} // namespace Tarvel::Xml::Security
