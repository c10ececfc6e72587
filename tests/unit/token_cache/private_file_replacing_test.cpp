// SPDX-License-Identifier: Apache-2.0
// How the content is replaced, and who has the lock.

#include <tarvel/io/private_file.h>

#include "support/forked.h"
#include "unit/token_cache/private_file_fixture.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <string>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

using namespace Testing;
using Tarvel::IOException;
using Tarvel::PrivateFile;

using PrivateFileReplacing = PrivateFileFixture;

TEST_F(PrivateFileReplacing, IsReadAndWrittenWhenEachSystemCallIsInterrupted) {
  SystemFaults faults;
  faults.interruptsOften = true;
  faults.largestWrite = 1000;
  const ScopedFaults scope(faults);
  const std::string content(100'000, 'x');
  const auto lock = m_file.TryLock();
  lock->Replace(content);
  EXPECT_EQ(m_file.Read(), content);
  lock->Clear();
  EXPECT_EQ(m_file.Read(), std::string());
}

TEST_F(PrivateFileReplacing, SynchronisesTheFileBeforeItIsRenamedAndTheFolderAfterwards) {
  const auto lock = m_file.TryLock();
  SystemFaults faults;
  faults.beforeRename = [&faults] {
    EXPECT_EQ(faults.synchronisedFiles, 1);
    EXPECT_EQ(faults.synchronisedFolders, 0);
  };
  const ScopedFaults scope(faults);
  lock->Replace("content");
  EXPECT_EQ(faults.synchronisedFiles, 1);
  EXPECT_EQ(faults.synchronisedFolders, 1);
  EXPECT_EQ(faults.beforeRename, nullptr); // it was called
}

TEST_F(PrivateFileReplacing, KeepsItsContentWhenTheDiskIsFull) {
  SystemFaults faults;
  faults.space = 5;
  ExpectOldContentAfter(faults, "Cannot write " + m_path + ": No space left on device");
}

TEST_F(PrivateFileReplacing, KeepsItsContentWhenTheDiskFails) {
  SystemFaults faults;
  faults.synchronisationError = EIO;
  ExpectOldContentAfter(faults, "Cannot write " + m_path + ": Input/output error");
}

TEST_F(PrivateFileReplacing, KeepsItsContentWhenTheNewFileCannotBeRenamed) {
  SystemFaults faults;
  faults.renameError = EACCES;
  ExpectOldContentAfter(faults, "Cannot write " + m_path + ": Permission denied");
}

TEST_F(PrivateFileReplacing, KeepsItsContentWhenTheNewFileCannotBeLocked) {
  SystemFaults faults;
  faults.lockError = ENOLCK;
  ExpectOldContentAfter(faults, "Cannot lock " + m_path + ".new: No locks available");
}

TEST_F(PrivateFileReplacing, KeepsItsContentWhenTheNewFileExceedsTheLimitOfTheProcess) {
  WritePrivately("old");
  EXPECT_EQ(RunInChild([&] {
              std::signal(SIGXFSZ, SIG_IGN);
              const rlimit limit{1000, 1000};
              ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &limit), 0);
              EXPECT_THROWS_MESSAGE(m_file.TryLock()->Replace(std::string(2000, 'x')), IOException,
                                    "Cannot write " + m_path + ": File too large");
            }),
            "");
  EXPECT_EQ(m_file.Read(), std::string("old"));
  EXPECT_EQ(m_folder.Names(), Names{"cache"});
}

TEST_F(PrivateFileReplacing, ReportsAReadThatFails) {
  WritePrivately("content");
  SystemFaults faults;
  faults.readError = EIO;
  const ScopedFaults scope(faults);
  EXPECT_THROWS_MESSAGE(m_file.Read(), IOException, "Cannot read " + m_path + ": Input/output error");
}

TEST_F(PrivateFileReplacing, ReportsThatItCannotBeLocked) {
  SystemFaults faults;
  faults.lockError = ENOLCK;
  const ScopedFaults scope(faults);
  EXPECT_THROWS_MESSAGE(m_file.TryLock(), IOException, "Cannot lock " + m_path + ": No locks available");
}

TEST_F(PrivateFileReplacing, ReportsThatItCannotBeCleared) {
  WritePrivately("content");
  SystemFaults faults;
  faults.truncationError = EIO;
  const auto lock = m_file.TryLock();
  const ScopedFaults scope(faults);
  EXPECT_THROWS_MESSAGE(lock->Clear(), IOException, "Cannot write " + m_path + ": Input/output error");
}

TEST_F(PrivateFileReplacing, ReplacesWhatAKilledProcessLeft) {
  m_folder.Write("cache.new", "half of a f");
  WritePrivately("content");
  EXPECT_EQ(m_file.Read(), std::string("content"));
  EXPECT_EQ(m_folder.Names(), Names{"cache"});
}

TEST_F(PrivateFileReplacing, DoesNotFollowALinkInPlaceOfTheNewFile) {
  m_folder.Write("victim", "untouched");
  ASSERT_EQ(::symlink("victim", (m_folder / "cache.new").c_str()), 0);
  WritePrivately("content");
  EXPECT_EQ(m_folder.Read("victim"), "untouched");
  EXPECT_EQ(m_file.Read(), std::string("content"));
  EXPECT_EQ(m_folder.Names(), (Names{"cache", "victim"}));
}

TEST_F(PrivateFileReplacing, ReportsAFolderInPlaceOfTheNewFile) {
  ASSERT_EQ(::mkdir((m_folder / "cache.new").c_str(), 0700), 0);
  EXPECT_THROWS_MESSAGE(WritePrivately("content"), IOException, "Cannot replace " + m_path + ".new: Is a directory");
}

TEST_F(PrivateFileReplacing, HasOneHolderOfItsLockEvenWithinOneProcess) {
  auto lock = m_file.TryLock();
  EXPECT_EQ(PrivateFile(m_path).TryLock(), nullptr);
  lock.reset();
  EXPECT_NE(PrivateFile(m_path).TryLock(), nullptr);
}

TEST_F(PrivateFileReplacing, StaysLockedWhenItIsReplaced) {
  auto lock = m_file.TryLock();
  lock->Replace("first");
  EXPECT_EQ(m_file.TryLock(), nullptr);
  lock->Replace("second");
  EXPECT_EQ(m_file.TryLock(), nullptr);
  lock->Clear();
  EXPECT_EQ(m_file.TryLock(), nullptr);
  lock.reset();
  EXPECT_NE(m_file.TryLock(), nullptr);
}

TEST_F(PrivateFileReplacing, IsLockedBeforeTheNewFileHasItsName) {
  const auto lock = m_file.TryLock();
  SystemFaults faults;
  faults.beforeRename = [this] { EXPECT_EQ(PrivateFile(m_path + ".new").TryLock(), nullptr); };
  const ScopedFaults scope(faults);
  lock->Replace("content");
  EXPECT_EQ(faults.beforeRename, nullptr);
}

TEST_F(PrivateFileReplacing, IsLockedInsteadOfTheFileThatItHasReplaced) {
  WritePrivately("old");
  m_folder.Write("other", "new");
  ASSERT_EQ(::chmod((m_folder / "other").c_str(), 0600), 0);
  SystemFaults faults;
  faults.beforeLock = [this] { ASSERT_EQ(std::rename((m_folder / "other").c_str(), m_path.c_str()), 0); };
  const ScopedFaults scope(faults);
  const auto lock = m_file.TryLock();
  EXPECT_EQ(lock->Read(), "new");
  EXPECT_EQ(m_file.TryLock(), nullptr);
}

TEST_F(PrivateFileReplacing, IsMadeAgainIfItIsRemovedBeforeItIsLocked) {
  SystemFaults faults;
  faults.beforeLock = [this] { ASSERT_EQ(::unlink(m_path.c_str()), 0); };
  const ScopedFaults scope(faults);
  const auto lock = m_file.TryLock();
  EXPECT_EQ(m_folder.Names(), Names{"cache"});
  EXPECT_EQ(m_file.TryLock(), nullptr);
}

TEST_F(PrivateFileReplacing, IsClosedInProgramsThatTheProcessExecutes) {
  const auto lock = m_file.TryLock();
  lock->Replace("content");
  int inherited = 0;
  for (int descriptor = 3; descriptor < 1024; ++descriptor) {
    struct stat opened = {};
    struct stat named = {};
    if (::fstat(descriptor, &opened) == 0 && ::stat(m_path.c_str(), &named) == 0 && opened.st_ino == named.st_ino) {
      inherited += (::fcntl(descriptor, F_GETFD) & FD_CLOEXEC) == 0 ? 1 : 0;
    }
  }
  EXPECT_EQ(inherited, 0);
}

} // namespace
