// SPDX-License-Identifier: Apache-2.0

#include "unit/token_cache/system_faults.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace Testing {

namespace {

SystemFaults *g_faults = nullptr; // not owned; null without faults
unsigned g_calls = 0;

int Fail(int error) {
  errno = error;
  return -1;
}

/// The error of this call; 0 if it does not fail.
int ErrorOf(int SystemFaults::*error) {
  if (!g_faults) {
    return 0;
  }
  return g_faults->interruptsOften && ++g_calls % 2 == 1 ? EINTR : error ? g_faults->*error : 0;
}

void CountSynchronisation(int descriptor) {
  struct stat status = {};
  if (g_faults && ::fstat(descriptor, &status) == 0) {
    ++(S_ISDIR(status.st_mode) ? g_faults->synchronisedFolders : g_faults->synchronisedFiles);
  }
}

void CallOnce(std::function<void()> SystemFaults::*member) {
  if (g_faults && g_faults->*member) {
    std::exchange(g_faults->*member, nullptr)();
  }
}

} // namespace

ScopedFaults::ScopedFaults(SystemFaults &faults) noexcept {
  g_faults = &faults;
}

ScopedFaults::~ScopedFaults() {
  g_faults = nullptr;
}

} // namespace Testing

using Testing::SystemFaults;

#pragma GCC visibility push(default)
extern "C" {

ssize_t write(int descriptor, const void *bytes, std::size_t count) {
  if (Testing::g_faults && descriptor > STDERR_FILENO) {
    if (const int error = Testing::ErrorOf(nullptr)) {
      return Testing::Fail(error);
    }
    count = std::min({count, Testing::g_faults->largestWrite, Testing::g_faults->space});
    if (count == 0) {
      return Testing::Fail(ENOSPC);
    }
    Testing::g_faults->space -= count;
  }
  return syscall(SYS_write, descriptor, bytes, count);
}

ssize_t pread(int descriptor, void *bytes, std::size_t count, off_t offset) {
  const int error = Testing::ErrorOf(&SystemFaults::readError);
  return error ? Testing::Fail(error) : syscall(SYS_pread64, descriptor, bytes, count, offset);
}

int fsync(int descriptor) {
  if (const int error = Testing::ErrorOf(&SystemFaults::synchronisationError)) {
    return Testing::Fail(error);
  }
  Testing::CountSynchronisation(descriptor);
  if (Testing::g_faults && Testing::g_faults->skipsSynchronisation) {
    return 0;
  }
  return static_cast<int>(syscall(SYS_fsync, descriptor));
}

int flock(int descriptor, int operation) noexcept {
  if ((operation & LOCK_UN) == 0) {
    if (const int error = Testing::ErrorOf(&SystemFaults::lockError)) {
      return Testing::Fail(error);
    }
    Testing::CallOnce(&SystemFaults::beforeLock);
  }
  return static_cast<int>(syscall(SYS_flock, descriptor, operation));
}

int ftruncate(int descriptor, off_t length) noexcept {
  const int error = Testing::ErrorOf(&SystemFaults::truncationError);
  return error ? Testing::Fail(error) : static_cast<int>(syscall(SYS_ftruncate, descriptor, length));
}

int fchmod(int descriptor, mode_t mode) noexcept {
  return Testing::g_faults && Testing::g_faults->dropsModes ? Testing::Fail(EPERM)
                                                            : static_cast<int>(syscall(SYS_fchmod, descriptor, mode));
}

int rename(const char *from, const char *to) noexcept {
  if (Testing::g_faults && Testing::g_faults->renameError) {
    return Testing::Fail(Testing::g_faults->renameError);
  }
  Testing::CallOnce(&SystemFaults::beforeRename);
  return static_cast<int>(syscall(SYS_renameat2, AT_FDCWD, from, AT_FDCWD, to, 0));
}

uid_t geteuid() noexcept {
  return static_cast<uid_t>(syscall(SYS_geteuid)) + (Testing::g_faults && Testing::g_faults->isOtherUser ? 1 : 0);
}

} // extern "C"
#pragma GCC visibility pop
