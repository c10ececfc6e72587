// SPDX-License-Identifier: Apache-2.0
/// @file
/// Child processes of the test, made by `fork` as a host makes them, and memory that the test shares with them.

#pragma once

#include "support/sanitized.h"

#include <functional>
#include <new>
#include <string>
#include <sys/types.h>

namespace Testing {

/// Whether a child can allocate memory even if other threads of its parent allocate at the moment of the fork. The C
/// library ensures this. AddressSanitizer's allocator does not: its locks may stay locked in the child.
constexpr bool MAY_FORK_WHILE_OTHERS_ALLOCATE = !IS_SANITIZED;

/// How a child ended: "" when its body ran to the end and all its expectations were met, otherwise the reason.
using ChildOutcome = std::string;

/// Forks, and runs `body` in the child, which then ends without destructors and without the functions of `atexit`. A
/// child that hangs is killed after a minute.
/// @throws std::system_error
pid_t StartChild(const std::function<void()> &body);

/// Waits for the child's end.
ChildOutcome WaitForChild(pid_t child);

inline ChildOutcome RunInChild(const std::function<void()> &body) {
  return WaitForChild(StartChild(body));
}

/// A page of memory that parent and children share.
void *MapSharedPage();
void UnmapSharedPage(void *page) noexcept;

/// A `T` that parent and children share, such as a `std::atomic<int>`.
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
