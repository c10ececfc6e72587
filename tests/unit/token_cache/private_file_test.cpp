// SPDX-License-Identifier: Apache-2.0
// Which files are used, and which are refused.

#include <tarvel/io/private_file.h>

#include "support/forked.h"
#include "unit/token_cache/private_file_fixture.h"

#include <gtest/gtest.h>

#include <string>

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

namespace {

using namespace Testing;
using Tarvel::IOException;
using Tarvel::PrivateFile;

using PrivateFileTest = PrivateFileFixture;

TEST_F(PrivateFileTest, RefusesAPathThatIsEmptyOrContainsANul) {
  const char message[] = "Invalid argument : the path of a private file is empty or contains a NUL";
  EXPECT_THROWS_MESSAGE(PrivateFile(""), Tarvel::InvalidArgumentException, message);
  EXPECT_THROWS_MESSAGE(PrivateFile(m_path + '\0' + "x"), Tarvel::InvalidArgumentException, message);
}

TEST_F(PrivateFileTest, HasNoContentIfItDoesNotExistAndIsNotMadeByARead) {
  EXPECT_EQ(m_file.Read(), boost::none);
  EXPECT_EQ(m_folder.Names(), Names{});
}

TEST_F(PrivateFileTest, IsNotMadeToLockAnExistingFile) {
  EXPECT_EQ(m_file.TryLockExisting(), nullptr);
  EXPECT_EQ(m_folder.Names(), Names{});
  WritePrivately("content");
  {
    const auto lock = m_file.TryLockExisting();
    ASSERT_NE(lock, nullptr);
    EXPECT_EQ(lock->Read(), "content");
    EXPECT_EQ(m_file.TryLock(), nullptr);
    EXPECT_EQ(m_file.TryLockExisting(), nullptr);
  }
  EXPECT_NE(m_file.TryLock(), nullptr);
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

TEST_F(PrivateFileTest, MayHaveAtMostThirtyTwoMebibytes) {
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
              if (::geteuid() == 0) { // root ignores permissions
                ASSERT_EQ(::chmod(m_folder.Path().c_str(), 0755), 0);
                ASSERT_EQ(::seteuid(65534), 0);
              }
              const std::string message = "Cannot open " + m_folder.Path() + "/closed/cache: Permission denied";
              EXPECT_THROWS_MESSAGE(file.Read(), IOException, message);
              EXPECT_THROWS_MESSAGE(file.TryLock(), IOException, message);
            }),
            "");
}

TEST_F(PrivateFileTest, KeepsItsMessageShortForALongPath) {
  const std::string path = "/" + std::string(5000, 'x');
  EXPECT_THROWS_MESSAGE(PrivateFile(path).Read(), IOException,
                        "Cannot open /" + std::string(1023, 'x') + "... (3977 more bytes): File name too long");
}

} // namespace
