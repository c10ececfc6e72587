// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/private_file.h>

#include "support/forked.h"
#include "support/process_resources.h"
#include "support/throws_message.h"
#include "support/work_folder.h"
#include "unit/token_cache/system_faults.h"

#include <tarvel/core/exception.h>

#include <boost/optional/optional_io.hpp>

#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <string>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

namespace {

using namespace Testing;
using Tarvel::IOException;
using Tarvel::PrivateFile;
using Names = std::set<std::string>;

mode_t ModeOf(const std::string &path) {
  struct stat status = {};
  EXPECT_EQ(::lstat(path.c_str(), &status), 0) << path;
  return status.st_mode & 07777;
}

/// A folder with one private file in it, "cache". Each test checks that it leaves no descriptor open.
class PrivateFileTest : public ::testing::Test {
protected:
  ~PrivateFileTest() override { EXPECT_EQ(CountDescriptors(), m_descriptors); }

  /// Both ways to open the file are refused.
  void ExpectRefusal(const std::string &reason) const {
    const std::string message = "Cannot use " + m_path + ": " + reason;
    EXPECT_THROWS_MESSAGE(m_file.Read(), IOException, message);
    EXPECT_THROWS_MESSAGE(m_file.TryLock(), IOException, message);
  }

  void WritePrivately(const std::string &content) const { m_file.TryLock()->Replace(content); }

  /// Expects that the content cannot be replaced, that the old one stays, and that the lock is still held.
  void ExpectOldContentAfter(SystemFaults &faults, const std::string &message) const {
    WritePrivately("old");
    const auto lock = m_file.TryLock();
    {
      const ScopedFaults scope(faults);
      EXPECT_THROWS_MESSAGE(lock->Replace("new content"), IOException, message);
    }
    EXPECT_EQ(m_file.Read(), std::string("old"));
    EXPECT_EQ(m_folder.Names(), Names{"cache"});
    EXPECT_EQ(m_file.TryLock(), nullptr);
    lock->Replace("newer");
    EXPECT_EQ(m_file.Read(), std::string("newer"));
  }

  const WorkFolder m_folder;
  const std::string m_path = m_folder / "cache";
  const PrivateFile m_file{m_path};

private:
  const std::size_t m_descriptors = CountDescriptors();
};

TEST_F(PrivateFileTest, RefusesAPathThatTheSystemWouldCut) {
  const char message[] = "Invalid argument : the path of a private file is empty or contains a NUL";
  EXPECT_THROWS_MESSAGE(PrivateFile(""), Tarvel::InvalidArgumentException, message);
  EXPECT_THROWS_MESSAGE(PrivateFile(m_path + '\0' + "x"), Tarvel::InvalidArgumentException, message);
}

TEST_F(PrivateFileTest, HasNoContentIfThereIsNoFileAndMakesNone) {
  EXPECT_EQ(m_file.Read(), boost::none);
  EXPECT_EQ(m_folder.Names(), Names{});
}

TEST_F(PrivateFileTest, MakesAnEmptyFileForItsOwnerOnlyWithAnyMask) {
  for (const mode_t mask : {0U, 0022U, 0777U}) {
    ::unlink(m_path.c_str());
    const mode_t previous = ::umask(mask);
    const auto lock = m_file.TryLock();
    ::umask(previous);
    EXPECT_EQ(ModeOf(m_path), 0600U) << std::oct << mask;
    EXPECT_EQ(m_file.Read(), std::string());
  }
}

TEST_F(PrivateFileTest, KeepsItsModeWhenItIsReplacedWithAnyMask) {
  for (const mode_t mask : {0U, 0777U}) {
    const mode_t previous = ::umask(mask);
    WritePrivately("content");
    ::umask(previous);
    EXPECT_EQ(ModeOf(m_path), 0600U) << std::oct << mask;
  }
}

TEST_F(PrivateFileTest, HasExactlyTheContentThatWasWritten) {
  for (const std::string &content : {std::string("text"), std::string(), std::string("a\0b\n", 4),
                                     std::string(65536, 'x'), std::string(1'000'000, 'y')}) {
    WritePrivately(content);
    EXPECT_EQ(m_file.Read(), content);
    EXPECT_EQ(m_file.TryLock()->Read(), content);
  }
}

TEST_F(PrivateFileTest, MayHaveThirtyTwoMebibytesAndNotMore) {
  const std::string largest(PrivateFile::MAX_BYTES, 'x');
  WritePrivately(largest);
  EXPECT_EQ(m_file.Read(), largest);
  EXPECT_THROWS_MESSAGE(m_file.TryLock()->Replace(largest + "y"), IOException,
                        "Cannot write " + m_path + ": the content is larger than 32 MiB");
  ASSERT_EQ(::truncate(m_path.c_str(), PrivateFile::MAX_BYTES + 1), 0);
  ExpectRefusal("it is larger than 32 MiB");
}

TEST_F(PrivateFileTest, IsRefusedIfItGrowsTooLargeWhileItIsLocked) {
  const auto lock = m_file.TryLock();
  ASSERT_EQ(::truncate(m_path.c_str(), PrivateFile::MAX_BYTES + 1), 0);
  EXPECT_THROWS_MESSAGE(lock->Read(), IOException, "Cannot use " + m_path + ": it is larger than 32 MiB");
}

TEST_F(PrivateFileTest, IsRefusedIfItIsASymbolicLink) {
  m_folder.Write("target", "secret");
  ::chmod((m_folder / "target").c_str(), 0600);
  ASSERT_EQ(::symlink("target", m_path.c_str()), 0);
  ExpectRefusal("it is a symbolic link");
  ASSERT_EQ(::unlink((m_folder / "target").c_str()), 0);
  ExpectRefusal("it is a symbolic link");
  EXPECT_EQ(m_folder.Names(), Names{"cache"}); // the target was not made
}

TEST_F(PrivateFileTest, MayBeReachedThroughALinkToItsFolder) {
  WritePrivately("content");
  ASSERT_EQ(::symlink(m_folder.Path().c_str(), (m_folder / "folder").c_str()), 0);
  EXPECT_EQ(PrivateFile(m_folder / "folder/cache").Read(), std::string("content"));
}

TEST_F(PrivateFileTest, IsRefusedIfItIsAFolder) {
  ASSERT_EQ(::mkdir(m_path.c_str(), 0700), 0);
  ExpectRefusal("it is not a regular file");
}

TEST_F(PrivateFileTest, IsRefusedIfItIsAFifoWithoutWaitingForItsOtherEnd) {
  ASSERT_EQ(::mkfifo(m_path.c_str(), 0600), 0);
  ExpectRefusal("it is not a regular file");
}

TEST_F(PrivateFileTest, IsRefusedIfItIsASocket) {
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  m_path.copy(address.sun_path, sizeof address.sun_path - 1);
  const int socket = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  ASSERT_EQ(::bind(socket, reinterpret_cast<const sockaddr *>(&address), sizeof address), 0);
  ExpectRefusal("it is not a regular file");
  ::close(socket);
}

TEST_F(PrivateFileTest, IsRefusedIfItIsADevice) {
  EXPECT_THROWS_MESSAGE(PrivateFile("/dev/null").Read(), IOException, "Cannot use /dev/null: it is not a regular file");
  EXPECT_THROWS_MESSAGE(PrivateFile("/dev/full").TryLock(), IOException,
                        "Cannot use /dev/full: it is not a regular file");
}

TEST_F(PrivateFileTest, IsRefusedIfItBelongsToAnotherUser) {
  WritePrivately("content");
  SystemFaults faults;
  faults.isOtherUser = true;
  const ScopedFaults scope(faults);
  ExpectRefusal("it belongs to another user");
}

TEST_F(PrivateFileTest, IsRefusedIfOthersMayUseItAndIsNotRepaired) {
  WritePrivately("content");
  for (const mode_t mode : {0640U, 0620U, 0610U, 0604U, 0602U, 0601U, 0644U, 0666U}) {
    ASSERT_EQ(::chmod(m_path.c_str(), mode), 0);
    ExpectRefusal("its mode lets other users read or write it; it must be 0600");
    EXPECT_EQ(ModeOf(m_path), mode);
  }
  ASSERT_EQ(::chmod(m_path.c_str(), 0600), 0);
  EXPECT_EQ(m_file.Read(), std::string("content"));
}

TEST_F(PrivateFileTest, IsRefusedIfItHasASecondName) {
  WritePrivately("content");
  ASSERT_EQ(::link(m_path.c_str(), (m_folder / "second").c_str()), 0);
  ExpectRefusal("it has a second name (a hard link)");
  ASSERT_EQ(::unlink((m_folder / "second").c_str()), 0);
  EXPECT_EQ(m_file.Read(), std::string("content"));
}

TEST_F(PrivateFileTest, NeedsItsFolder) {
  const PrivateFile file(m_folder / "none/cache");
  EXPECT_EQ(file.Read(), boost::none);
  EXPECT_THROWS_MESSAGE(file.TryLock(), IOException,
                        "Cannot create " + m_folder.Path() + "/none/cache: No such file or directory");
  m_folder.Write("none", "a file");
  EXPECT_THROWS_MESSAGE(file.Read(), IOException, "Cannot open " + m_folder.Path() + "/none/cache: Not a directory");
}

TEST_F(PrivateFileTest, NeedsPermissionForItsFolder) {
  ASSERT_EQ(::mkdir((m_folder / "closed").c_str(), 0), 0);
  const PrivateFile file(m_folder / "closed/cache");
  EXPECT_EQ(RunInChild([&] {
              if (::geteuid() == 0) { // permissions do not hold for root
                ASSERT_EQ(::chmod(m_folder.Path().c_str(), 0755), 0);
                ASSERT_EQ(::seteuid(65534), 0);
              }
              const std::string message = "Cannot open " + m_folder.Path() + "/closed/cache: Permission denied";
              EXPECT_THROWS_MESSAGE(file.Read(), IOException, message);
              EXPECT_THROWS_MESSAGE(file.TryLock(), IOException, message);
            }),
            "");
}

TEST_F(PrivateFileTest, IsReadAndWrittenWhenEachCallOfTheSystemIsInterrupted) {
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

TEST_F(PrivateFileTest, SynchronisesTheFileBeforeAndTheFolderAfterItHasItsName) {
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

TEST_F(PrivateFileTest, KeepsItsContentWhenTheDiskIsFull) {
  SystemFaults faults;
  faults.space = 5;
  ExpectOldContentAfter(faults, "Cannot write " + m_path + ": No space left on device");
}

TEST_F(PrivateFileTest, KeepsItsContentWhenTheDiskFails) {
  SystemFaults faults;
  faults.synchronisationError = EIO;
  ExpectOldContentAfter(faults, "Cannot write " + m_path + ": Input/output error");
}

TEST_F(PrivateFileTest, KeepsItsContentWhenTheNewFileCannotBeRenamed) {
  SystemFaults faults;
  faults.renameError = EACCES;
  ExpectOldContentAfter(faults, "Cannot write " + m_path + ": Permission denied");
}

TEST_F(PrivateFileTest, KeepsItsContentWhenTheNewFileCannotBeLocked) {
  SystemFaults faults;
  faults.lockError = ENOLCK;
  ExpectOldContentAfter(faults, "Cannot lock " + m_path + ".new: No locks available");
}

TEST_F(PrivateFileTest, KeepsItsContentBeyondTheLimitOfTheProcessForFiles) {
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

TEST_F(PrivateFileTest, ReportsAReadThatFails) {
  WritePrivately("content");
  SystemFaults faults;
  faults.readError = EIO;
  const ScopedFaults scope(faults);
  EXPECT_THROWS_MESSAGE(m_file.Read(), IOException, "Cannot read " + m_path + ": Input/output error");
}

TEST_F(PrivateFileTest, ReportsALockThatCannotBeTaken) {
  SystemFaults faults;
  faults.lockError = ENOLCK;
  const ScopedFaults scope(faults);
  EXPECT_THROWS_MESSAGE(m_file.TryLock(), IOException, "Cannot lock " + m_path + ": No locks available");
}

TEST_F(PrivateFileTest, ReportsThatItCannotBeCleared) {
  WritePrivately("content");
  SystemFaults faults;
  faults.truncationError = EIO;
  const auto lock = m_file.TryLock();
  const ScopedFaults scope(faults);
  EXPECT_THROWS_MESSAGE(lock->Clear(), IOException, "Cannot write " + m_path + ": Input/output error");
}

TEST_F(PrivateFileTest, ReplacesWhatAKilledProcessLeft) {
  m_folder.Write("cache.new", "half of a f");
  WritePrivately("content");
  EXPECT_EQ(m_file.Read(), std::string("content"));
  EXPECT_EQ(m_folder.Names(), Names{"cache"});
}

TEST_F(PrivateFileTest, DoesNotFollowALinkInPlaceOfTheNewFile) {
  m_folder.Write("victim", "untouched");
  ASSERT_EQ(::symlink("victim", (m_folder / "cache.new").c_str()), 0);
  WritePrivately("content");
  EXPECT_EQ(m_folder.Read("victim"), "untouched");
  EXPECT_EQ(m_file.Read(), std::string("content"));
  EXPECT_EQ(m_folder.Names(), (Names{"cache", "victim"}));
}

TEST_F(PrivateFileTest, ReportsAFolderInPlaceOfTheNewFile) {
  ASSERT_EQ(::mkdir((m_folder / "cache.new").c_str(), 0700), 0);
  EXPECT_THROWS_MESSAGE(WritePrivately("content"), IOException, "Cannot replace " + m_path + ".new: Is a directory");
}

TEST_F(PrivateFileTest, HasOneHolderOfItsLockAlsoInOneProcess) {
  auto lock = m_file.TryLock();
  EXPECT_EQ(PrivateFile(m_path).TryLock(), nullptr);
  lock.reset();
  EXPECT_NE(PrivateFile(m_path).TryLock(), nullptr);
}

TEST_F(PrivateFileTest, StaysLockedWhenItIsReplaced) {
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

TEST_F(PrivateFileTest, IsLockedBeforeTheNewFileHasItsName) {
  const auto lock = m_file.TryLock();
  SystemFaults faults;
  faults.beforeRename = [this] { EXPECT_EQ(PrivateFile(m_path + ".new").TryLock(), nullptr); };
  const ScopedFaults scope(faults);
  lock->Replace("content");
  EXPECT_EQ(faults.beforeRename, nullptr);
}

TEST_F(PrivateFileTest, IsLockedAndNotTheFileThatItReplacedInTheMeantime) {
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

TEST_F(PrivateFileTest, IsMadeAgainIfItIsRemovedBeforeItIsLocked) {
  SystemFaults faults;
  faults.beforeLock = [this] { ASSERT_EQ(::unlink(m_path.c_str()), 0); };
  const ScopedFaults scope(faults);
  const auto lock = m_file.TryLock();
  EXPECT_EQ(m_folder.Names(), Names{"cache"});
  EXPECT_EQ(m_file.TryLock(), nullptr);
}

TEST_F(PrivateFileTest, IsClosedInProgramsThatTheProcessExecutes) {
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

TEST_F(PrivateFileTest, KeepsItsMessageShortForALongPath) {
  const std::string path = "/" + std::string(5000, 'x');
  EXPECT_THROWS_MESSAGE(PrivateFile(path).Read(), IOException,
                        "Cannot open /" + std::string(1023, 'x') + "... (3977 more bytes): File name too long");
}

} // namespace
