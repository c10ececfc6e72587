// SPDX-License-Identifier: Apache-2.0
/// @file
/// Children of the test process, made by `fork` as a host makes them, and memory that they share with it.

#pragma once

#include "support/sanitized.h"

#include <functional>
#include <new>
#include <string>
#include <sys/types.h>

namespace Testing {

/// Whether a child has memory to work with though other threads of its parent may allocate in the moment of the fork. The
/// C library sees to that. AddressSanitizer's allocator does not: its locks may stay locked in the child.
constexpr bool MAY_FORK_WHILE_OTHERS_ALLOCATE = !IS_SANITIZED;

/// What became of a child: "" when its body ran to the end and all that it expected was so, else what ended it.
using ChildOutcome = std::string;

/// Forks, and runs `body` in the child, which then ends without destructors and without functions of `atexit`. A child
/// that hangs is killed after a minute.
/// @throws std::system_error
pid_t StartChild(const std::function<void()> &body);

/// Waits for the child's end.
ChildOutcome WaitForChild(pid_t child);

inline ChildOutcome RunInChild(const std::function<void()> &body) {
  return WaitForChild(StartChild(body));
}

/// A page of memory that is the same in parent and children.
void *MapSharedPage();
void UnmapSharedPage(void *page) noexcept;

/// A `T` that parent and children see alike, such as a `std::atomic<int>`.
template <typename T>
class Shared {
public:
  Shared() : m_object(new (MapSharedPage()) T{}) {}
  Shared(const Shared &) = delete;
  Shared &operator=(const Shared &) = delete;
  ~Shared() { UnmapSharedPage(m_object); }

  T &operator*() const noexcept { return *m_object; }
  T *operator->() const noexcept { return m_object; }

private:
  T *const m_object;
};

} // namespace Testing
