// SPDX-License-Identifier: Apache-2.0

#include "support/forked.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <exception>
#include <string.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>

namespace Testing {

namespace {

constexpr unsigned MAX_SECONDS = 60;
constexpr std::size_t PAGE_BYTES = 4096;

void RunAndExit(const std::function<void()> &body) noexcept {
  ::alarm(MAX_SECONDS);
  try {
    body();
  } catch (const std::exception &exception) {
    ADD_FAILURE() << "the child threw: " << exception.what();
  }
  std::fflush(stdout);
  ::_exit(testing::Test::HasFailure() ? 1 : 0);
}

} // namespace

pid_t StartChild(const std::function<void()> &body) {
  std::fflush(stdout); // otherwise the child would print the buffer too
  const pid_t child = ::fork();
  if (child < 0) {
    throw std::system_error(errno, std::system_category(), "fork");
  }
  if (child == 0) {
    RunAndExit(body);
  }
  return child;
}

ChildOutcome WaitForChild(pid_t child) {
  int status = 0;
  while (::waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) {
      return std::string("waitpid: ") + std::generic_category().message(errno);
    }
  }
  if (WIFSIGNALED(status)) {
    return std::string("the child was ended by signal ") + strsignal(WTERMSIG(status));
  }
  return WEXITSTATUS(status) == 0 ? "" : "the child ended with " + std::to_string(WEXITSTATUS(status));
}

void *MapSharedPage() {
  void *const page = ::mmap(nullptr, PAGE_BYTES, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (page == MAP_FAILED) {
    throw std::system_error(errno, std::system_category(), "mmap");
  }
  return page;
}

void UnmapSharedPage(void *page) noexcept {
  ::munmap(page, PAGE_BYTES);
}

} // namespace Testing
