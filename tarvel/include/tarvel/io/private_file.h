// SPDX-License-Identifier: Apache-2.0
/// @file
/// `PrivateFile`, a file that only its owner can use, which several processes share.

#pragma once

#include <tarvel/core/export.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

namespace Tarvel {

/// The exclusive lock of a `PrivateFile`, held until this object is destroyed or the process ends. For one thread at a time.
/// A child made by `fork` does not have the lock: destroying the object there leaves the parent's lock as it is.
class TARVEL_API PrivateFileLock {
public:
  /// Not for callers: `PrivateFile::TryLock` makes locks.
  /// @param descriptor of the locked file; the lock closes it
  PrivateFileLock(std::string path, int descriptor) noexcept;
  PrivateFileLock(const PrivateFileLock &) = delete;
  PrivateFileLock &operator=(const PrivateFileLock &) = delete;
  /// Releases the lock.
  ~PrivateFileLock();

  /// The whole content.
  /// @throws IOException when the file cannot be read; InvalidStateException in a child of the process that has the lock;
  ///         std::bad_alloc
  std::string Read() const;

  /// Replaces the content as a whole: at every moment, readers see the old content or the new one, even if a signal
  /// ends the process. The new content is first written to a file with the same path and ".new" after it. This file is
  /// removed if writing fails. Such a file of a killed process is replaced.
  /// @throws IOException when the content is larger than `PrivateFile::MAX_BYTES` or cannot be written, for example because
  ///         the disk is full; the old content and the lock then stay. InvalidStateException in a child of the process that has
  ///         the lock; std::bad_alloc
  void Replace(std::string_view content);

  /// Makes the file empty, which needs no space on the disk.
  /// @throws IOException when this fails; InvalidStateException in a child of the process that has the lock;
  ///         std::bad_alloc
  void Clear();

private:
  std::string m_path;
  int m_descriptor;
  unsigned m_generation; // of the process that has the lock
};

/// A file with mode 0600. It is opened without following a link in the last part of its path. It is refused unless it
/// is a regular file of at most `MAX_BYTES` that belongs to the effective user, has one name, and cannot be read or
/// written by other users. Its folder must exist, and other users must not be able to write to that folder (this is not
/// checked). Safe on any thread.
///
/// The lock is that of `flock`. A network file system that does not have such locks between machines is not suitable.
class TARVEL_API PrivateFile {
public:
  /// The maximum size of the file, in bytes: 32 MiB.
  static constexpr std::size_t MAX_BYTES = std::size_t{32} * 1024 * 1024;

  /// Does not touch the file.
  /// @throws InvalidArgumentException when the path is empty or contains a NUL; std::bad_alloc
  explicit PrivateFile(std::string path);

  /// The whole content; `boost::none` if there is no file. Needs no lock.
  /// @throws IOException when the file is refused or cannot be read; std::bad_alloc
  boost::optional<std::string> Read() const;

  /// Makes an empty file if there is no file, and takes the lock; null when another holder has the lock, in this
  /// process or in another one. Does not wait for the lock.
  /// @throws IOException when the file is refused, or cannot be made or locked; std::bad_alloc
  std::unique_ptr<PrivateFileLock> TryLock() const;

  /// Like `TryLock`, but makes no file: also null when there is no file.
  /// @throws IOException when the file is refused or cannot be locked; std::bad_alloc
  std::unique_ptr<PrivateFileLock> TryLockExisting() const;

private:
  std::string m_path;
};

} // namespace Tarvel
