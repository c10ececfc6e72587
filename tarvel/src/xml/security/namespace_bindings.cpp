// SPDX-License-Identifier: Apache-2.0

#include "xml/security/namespace_bindings.h"

#include "xml/reserved_namespaces.h"

namespace Tarvel::Xml::Security {

NamespaceBindings::NamespaceBindings() {
  m_buckets.fill(END_OF_BUCKET);
  // Both count as written: "xml" is never declared, and the empty default namespace only where the output has declared
  // another one.
  Declare("", "");
  Declare("xml", XML_NAMESPACE);
  for (Binding &binding : m_bindings) {
    binding.written = binding.uri;
    binding.isWritten = true;
  }
}

std::uint32_t NamespaceBindings::BucketOf(std::string_view prefix) noexcept {
  std::uint32_t hash = 2166136261u; // FNV-1a
  for (const char character : prefix) {
    hash = (hash ^ static_cast<unsigned char>(character)) * 16777619u;
  }
  return (hash ^ (hash >> 16)) & (BUCKETS - 1);
}

void NamespaceBindings::Declare(std::string_view prefix, std::string_view uri) {
  Binding binding;
  binding.prefix = prefix;
  binding.uri = uri;
  const std::size_t shadowed = Find(prefix);
  if (shadowed != NOT_BOUND) {
    binding.written = m_bindings[shadowed].written;
    binding.isWritten = m_bindings[shadowed].isWritten;
  }
  binding.bucket = BucketOf(prefix);
  binding.next = m_buckets[binding.bucket];
  m_bindings.push_back(binding);
  m_buckets[binding.bucket] = static_cast<std::uint32_t>(m_bindings.size() - 1);
  m_recent = NOT_BOUND;
}

std::size_t NamespaceBindings::Search(std::string_view prefix) noexcept {
  for (std::uint32_t index = m_buckets[BucketOf(prefix)]; index != END_OF_BUCKET; index = m_bindings[index].next) {
    if (m_bindings[index].prefix == prefix) {
      m_recent = index;
      return index;
    }
  }
  return NOT_BOUND;
}

bool NamespaceBindings::MarkAsWritten(std::size_t index) {
  Binding &binding = m_bindings[index];
  if (binding.isWritten && binding.written == binding.uri) {
    return false;
  }
  m_changes.push_back({index, binding.written, binding.isWritten});
  binding.written = binding.uri;
  binding.isWritten = true;
  return true;
}

void NamespaceBindings::Restore(Mark mark) noexcept {
  while (m_changes.size() > mark.changes) {
    const Change &change = m_changes.back();
    m_bindings[change.index].written = change.written;
    m_bindings[change.index].isWritten = change.isWritten;
    m_changes.pop_back();
  }
  while (m_bindings.size() > mark.bindings) {
    m_buckets[m_bindings.back().bucket] = m_bindings.back().next;
    m_bindings.pop_back();
    m_recent = NOT_BOUND;
  }
}

} // namespace Tarvel::Xml::Security
