// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/private_file.h>

#include "support/forked.h"
#include "support/sanitized.h"
#include "unit/token_cache/private_file_fixture.h"

#include <gtest/gtest.h>

#include <atomic>
#include <csignal>
#include <memory>
#include <string>
#include <vector>

#include <sched.h>
#include <unistd.h>

namespace {

using namespace Testing;
using Tarvel::PrivateFile;

using PrivateFileProcesses = PrivateFileFixture;

struct Counts {
  std::atomic<int> holders;
  std::atomic<int> writes;
};

constexpr std::size_t LENGTH_STEP = 9001;

/// Contents of different lengths. Each repeats one letter, which determines the length.
std::string ContentOf(int number) {
  return std::string(LENGTH_STEP * static_cast<std::size_t>(number % 8 + 1), static_cast<char>('a' + number % 8));
}

bool IsWhole(const std::string &content) {
  return !content.empty() && content == ContentOf(content[0] - 'a');
}

TEST_F(PrivateFileProcesses, ReadWholeContentsAndHaveOneHolderOfTheLockAtATime) {
  constexpr int PROCESSES = 8;
  constexpr int ROUNDS = IS_SANITIZED ? 50 : 200;
  m_file.TryLock()->Replace(ContentOf(0));
  const Shared<Counts> counts;
  std::vector<pid_t> children;
  for (int process = 0; process < PROCESSES; ++process) {
    children.push_back(StartChild([&, process] {
      SystemFaults faults;
      faults.skipsSynchronisation = true; // it would take nearly all of the time
      const ScopedFaults scope(faults);
      for (int round = 0; round < ROUNDS; ++round) {
        std::unique_ptr<Tarvel::PrivateFileLock> lock;
        while (!(lock = m_file.TryLock())) {
          ASSERT_TRUE(IsWhole(m_file.Read().value()));
          ::usleep(100); // lets the holder run
        }
        ASSERT_EQ(++counts->holders, 1);
        lock->Replace(ContentOf(process + round));
        ::sched_yield(); // others try while the new file is locked
        ++counts->writes;
        ASSERT_EQ(--counts->holders, 0);
      }
    }));
  }
  for (const pid_t child : children) {
    EXPECT_EQ(WaitForChild(child), "");
  }
  EXPECT_EQ(counts->writes, PROCESSES * ROUNDS);
  EXPECT_EQ(m_folder.Names(), Names{"cache"});
}

TEST_F(PrivateFileProcesses, HaveNoLockAfterAKill) {
  EXPECT_EQ(RunInChild([this] {
              const auto lock = m_file.TryLock();
              ASSERT_NE(lock, nullptr);
              ::raise(SIGKILL);
            }),
            "the child was ended by signal Killed");
  EXPECT_NE(m_file.TryLock(), nullptr);
}

TEST_F(PrivateFileProcesses, ReadTheOldContentAfterAKillBeforeTheNewFileHasItsName) {
  m_file.TryLock()->Replace("old");
  EXPECT_EQ(RunInChild([this] {
              SystemFaults faults;
              faults.beforeRename = [] { ::raise(SIGKILL); };
              const ScopedFaults scope(faults);
              m_file.TryLock()->Replace("new");
            }),
            "the child was ended by signal Killed");
  EXPECT_EQ(m_folder.Names(), (Names{"cache", "cache.new"}));
  EXPECT_EQ(m_file.Read(), std::string("old"));
  m_file.TryLock()->Replace("newer");
  EXPECT_EQ(m_file.Read(), std::string("newer"));
  EXPECT_EQ(m_folder.Names(), Names{"cache"});
}

TEST_F(PrivateFileProcesses, ThatAreChildrenDoNotReleaseTheParentsLock) {
  auto lock = m_file.TryLock();
  EXPECT_EQ(RunInChild([&] { lock.reset(); }), "");
  EXPECT_EQ(m_file.TryLock(), nullptr);
}

TEST_F(PrivateFileProcesses, ThatAreChildrenDoNotKeepTheParentsLock) {
  auto lock = m_file.TryLock();
  int pipe[2] = {};
  ASSERT_EQ(::pipe(pipe), 0);
  const pid_t child = StartChild([&pipe] { // keeps its copies until the parent closes the pipe
    ::close(pipe[1]);
    char end = 0;
    EXPECT_EQ(::read(pipe[0], &end, 1), 0);
  });
  lock.reset();
  EXPECT_NE(m_file.TryLock(), nullptr);
  ::close(pipe[0]);
  ::close(pipe[1]);
  EXPECT_EQ(WaitForChild(child), "");
}

TEST_F(PrivateFileProcesses, ThatAreChildrenCannotUseTheParentsLock) {
  const auto lock = m_file.TryLock();
  EXPECT_EQ(RunInChild([&] {
              const std::string message = "The lock of " + m_path + " belongs to the parent process";
              EXPECT_THROWS_MESSAGE(lock->Read(), Tarvel::InvalidStateException, message);
              EXPECT_THROWS_MESSAGE(lock->Replace("x"), Tarvel::InvalidStateException, message);
              EXPECT_THROWS_MESSAGE(lock->Clear(), Tarvel::InvalidStateException, message);
            }),
            "");
  lock->Replace("content");
  EXPECT_EQ(m_file.Read(), std::string("content"));
}

} // namespace
