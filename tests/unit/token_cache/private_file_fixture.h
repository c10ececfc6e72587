// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PrivateFileFixture`, a folder for one private file.

#pragma once

#include "support/process_resources.h"
#include "support/throws_message.h"
#include "support/work_folder.h"
#include "unit/token_cache/system_faults.h"

#include <tarvel/core/exception.h>
#include <tarvel/io/private_file.h>

#include <boost/optional/optional_io.hpp>

#include <gtest/gtest.h>

#include <set>
#include <string>

#include <sys/stat.h>

namespace Testing {

using Names = std::set<std::string>;

inline mode_t ModeOf(const std::string &path) {
  struct stat status = {};
  EXPECT_EQ(::lstat(path.c_str(), &status), 0) << path;
  return status.st_mode & 07777;
}

/// An empty folder, and `PrivateFile` for the path "cache" in it. Each test checks that it leaves no descriptor open.
class PrivateFileFixture : public ::testing::Test {
protected:
  ~PrivateFileFixture() override { EXPECT_EQ(CountDescriptors(), m_descriptors); }

  /// Expects that each way to open the file is refused.
  void ExpectRefusal(const std::string &reason) const {
    const std::string message = "Cannot use " + m_path + ": " + reason;
    EXPECT_THROWS_MESSAGE(m_file.Read(), Tarvel::IOException, message);
    EXPECT_THROWS_MESSAGE(m_file.TryLock(), Tarvel::IOException, message);
    EXPECT_THROWS_MESSAGE(m_file.TryLockExisting(), Tarvel::IOException, message);
  }

  void WritePrivately(const std::string &content) const { m_file.TryLock()->Replace(content); }

  /// Expects that the content cannot be replaced, that the old content stays, and that the file is still locked.
  void ExpectOldContentAfter(SystemFaults &faults, const std::string &message) const {
    WritePrivately("old");
    const auto lock = m_file.TryLock();
    {
      const ScopedFaults scope(faults);
      EXPECT_THROWS_MESSAGE(lock->Replace("new content"), Tarvel::IOException, message);
    }
    EXPECT_EQ(m_file.Read(), std::string("old"));
    EXPECT_EQ(m_folder.Names(), Names{"cache"});
    EXPECT_EQ(m_file.TryLock(), nullptr);
    lock->Replace("newer");
    EXPECT_EQ(m_file.Read(), std::string("newer"));
  }

  const WorkFolder m_folder;
  const std::string m_path = m_folder / "cache";
  const Tarvel::PrivateFile m_file{m_path};

private:
  const std::size_t m_descriptors = CountDescriptors();
};

} // namespace Testing
