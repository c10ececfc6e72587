// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/private_file.h>

#include "core/fork_gate.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

namespace Tarvel {

namespace {

constexpr mode_t OWNER_ONLY = S_IRUSR | S_IWUSR;
constexpr mode_t OTHERS = S_IRWXG | S_IRWXO;

/// Without O_NONBLOCK, opening a FIFO would wait until another process opens it, too.
constexpr int SAFELY = O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;

/// How often other processes may replace or remove the file while one call tries to lock it.
constexpr int MAX_ATTEMPTS = 100;

[[noreturn]] void Fail(const char *action, const std::string &path, const std::string &reason) {
  throw IOException("Cannot " + std::string(action) + " " + StringUtil::Shorten(path) + ": " + reason);
}

[[noreturn]] void FailWith(int error, const char *action, const std::string &path) {
  Fail(action, path, std::system_category().message(error));
}

/// Calls a function of the system again as long as signals interrupt it.
template <typename Call>
auto Uninterrupted(const Call &call) {
  for (;;) {
    const auto result = call();
    if (result >= 0 || errno != EINTR) {
      return result;
    }
  }
}

/// Closes a descriptor, unless it is released.
class OwnedDescriptor {
public:
  explicit OwnedDescriptor(int descriptor) noexcept : m_descriptor(descriptor) {}
  OwnedDescriptor(OwnedDescriptor &&other) noexcept : m_descriptor(other.Release()) {}
  OwnedDescriptor &operator=(OwnedDescriptor &&) = delete;
  ~OwnedDescriptor() {
    if (m_descriptor >= 0) {
      ::close(m_descriptor);
    }
  }

  bool IsOpen() const noexcept { return m_descriptor >= 0; }
  int Get() const noexcept { return m_descriptor; }
  int Release() noexcept { return std::exchange(m_descriptor, -1); }

private:
  int m_descriptor;
};

/// Sets `errno` if the result is not open.
OwnedDescriptor Open(const std::string &path, int flags, mode_t mode = 0) {
  return OwnedDescriptor(Uninterrupted([&] { return ::open(path.c_str(), flags | SAFELY, mode); }));
}

struct stat StatusOf(int descriptor, const std::string &path) {
  struct stat status = {};
  if (::fstat(descriptor, &status) != 0) {
    FailWith(errno, "read", path);
  }
  return status;
}

[[noreturn]] void RefuseToOpen(int error, const std::string &path) {
  struct stat status = {};
  const bool isLink = error == ELOOP && ::lstat(path.c_str(), &status) == 0 && S_ISLNK(status.st_mode);
  if (isLink) {
    Fail("use", path, "it is a symbolic link");
  }
  if (error == EISDIR || error == ENXIO) { // ENXIO: a socket
    Fail("use", path, "it is not a regular file");
  }
  FailWith(error, "open", path);
}

void RequirePrivate(const struct stat &status, const std::string &path) {
  if (!S_ISREG(status.st_mode)) {
    Fail("use", path, "it is not a regular file");
  }
  if (status.st_uid != ::geteuid()) {
    Fail("use", path, "it belongs to another user");
  }
  if ((status.st_mode & OTHERS) != 0) {
    Fail("use", path, "its mode lets other users read or write it; it must be 0600");
  }
  // A file that was replaced after it was opened has no name.
  if (status.st_nlink > 1) {
    Fail("use", path, "it has a second name (a hard link)");
  }
  if (status.st_size > static_cast<off_t>(PrivateFile::MAX_BYTES)) {
    Fail("use", path, "it is larger than 32 MiB");
  }
}

/// Reads at most one byte more than a file may have.
std::string ReadContent(int descriptor, const std::string &path) {
  constexpr std::size_t PIECE_BYTES = 65536;
  std::string content;
  std::size_t length = 0;
  for (;;) {
    content.resize(std::min(length + PIECE_BYTES, PrivateFile::MAX_BYTES + 1));
    const ssize_t count = Uninterrupted([&] {
      return ::pread(descriptor, content.data() + length, content.size() - length, static_cast<off_t>(length));
    });
    if (count < 0) {
      FailWith(errno, "read", path);
    }
    length += static_cast<std::size_t>(count);
    if (length > PrivateFile::MAX_BYTES) {
      Fail("use", path, "it is larger than 32 MiB");
    }
    if (count == 0) {
      content.resize(length);
      return content;
    }
  }
}

/// A new, empty file. The result is not open if the file exists already.
OwnedDescriptor Create(const std::string &path) {
  OwnedDescriptor file = Open(path, O_RDWR | O_CREAT | O_EXCL, OWNER_ONLY);
  if (!file.IsOpen() && errno != EEXIST) {
    FailWith(errno, "create", path);
  }
  // The mask of the process may have removed the owner's own rights.
  if (file.IsOpen() && ::fchmod(file.Get(), OWNER_ONLY) != 0) {
    FailWith(errno, "create", path);
  }
  return file;
}

/// The result is not open if there is no file.
OwnedDescriptor OpenExisting(const std::string &path) {
  OwnedDescriptor file = Open(path, O_RDWR);
  if (!file.IsOpen() && errno != ENOENT) {
    RefuseToOpen(errno, path);
  }
  return file;
}

OwnedDescriptor OpenOrCreate(const std::string &path) {
  for (int attempt = 0; attempt < MAX_ATTEMPTS; ++attempt) {
    OwnedDescriptor file = OpenExisting(path);
    if (file.IsOpen()) {
      return file;
    }
    OwnedDescriptor created = Create(path);
    if (created.IsOpen()) {
      return created;
    }
  }
  Fail("open", path, "it is created and removed all the time");
}

bool TryToLock(int descriptor, const std::string &path) {
  if (Uninterrupted([&] { return ::flock(descriptor, LOCK_EX | LOCK_NB); }) == 0) {
    return true;
  }
  if (errno != EWOULDBLOCK) {
    FailWith(errno, "lock", path);
  }
  return false;
}

/// Whether the open file is the one that has this path now.
bool HasPath(int descriptor, const std::string &path) {
  const struct stat opened = StatusOf(descriptor, path);
  struct stat current = {};
  return ::lstat(path.c_str(), &current) == 0 && current.st_dev == opened.st_dev && current.st_ino == opened.st_ino;
}

/// The lock of the file that `open` opens; null if another holder has the lock, or if there is no file to open.
std::unique_ptr<PrivateFileLock> TryToLockFile(const std::string &path, OwnedDescriptor (*open)(const std::string &)) {
  for (int attempt = 0; attempt < MAX_ATTEMPTS; ++attempt) {
    OwnedDescriptor file = open(path);
    if (!file.IsOpen()) {
      return nullptr;
    }
    RequirePrivate(StatusOf(file.Get(), path), path);
    if (!TryToLock(file.Get(), path)) {
      return nullptr;
    }
    // The file may have been replaced before it was locked.
    if (HasPath(file.Get(), path)) {
      auto lock = std::make_unique<PrivateFileLock>(path, file.Get());
      file.Release();
      return lock;
    }
  }
  return nullptr;
}

/// The file with the new content, until it has the final path. Only the holder of the lock makes one, so an existing
/// file with this name is from a process that was killed.
class Replacement {
public:
  explicit Replacement(const std::string &finalPath)
      : m_finalPath(finalPath), m_path(finalPath + ".new"), m_file(CreateInPlace(m_path)) {}
  Replacement(const Replacement &) = delete;
  Replacement &operator=(const Replacement &) = delete;
  ~Replacement() {
    if (m_file.IsOpen()) {
      ::unlink(m_path.c_str());
    }
  }

  void Write(std::string_view content) {
    while (!content.empty()) {
      const ssize_t count = Uninterrupted([&] { return ::write(m_file.Get(), content.data(), content.size()); });
      if (count <= 0) {
        FailWith(count < 0 ? errno : ENOSPC, "write", m_finalPath);
      }
      content.remove_prefix(static_cast<std::size_t>(count));
    }
    if (Uninterrupted([&] { return ::fsync(m_file.Get()); }) != 0) {
      FailWith(errno, "write", m_finalPath);
    }
  }

  /// @return the descriptor of the file, which is locked before it gets the final path
  int Publish() {
    if (!TryToLock(m_file.Get(), m_path)) {
      Fail("lock", m_path, "another process has locked it");
    }
    if (std::rename(m_path.c_str(), m_finalPath.c_str()) != 0) {
      FailWith(errno, "write", m_finalPath);
    }
    return m_file.Release();
  }

private:
  static OwnedDescriptor CreateInPlace(const std::string &path) {
    OwnedDescriptor file = Create(path);
    if (file.IsOpen()) {
      return file;
    }
    if (::unlink(path.c_str()) != 0 && errno != ENOENT) {
      FailWith(errno, "replace", path);
    }
    OwnedDescriptor second = Create(path);
    if (!second.IsOpen()) {
      FailWith(EEXIST, "create", path);
    }
    return second;
  }

  const std::string &m_finalPath;
  const std::string m_path;
  OwnedDescriptor m_file; // released when it has the final path
};

std::string FolderOf(const std::string &path) {
  const std::size_t slash = path.rfind('/');
  return slash == std::string::npos ? "." : path.substr(0, slash + 1);
}

/// Makes new names in the folder permanent. Some file systems cannot do this; after a loss of power, the old content
/// may then be there again.
void SynchroniseFolder(const std::string &folder) noexcept {
  const OwnedDescriptor opened(
      Uninterrupted([&] { return ::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC); }));
  if (opened.IsOpen()) {
    Uninterrupted([&] { return ::fsync(opened.Get()); });
  }
}

/// Unlocks and closes the locked file. Closing is not enough if a child of `fork` has a copy of the descriptor.
void ReleaseLock(int descriptor, unsigned generation) noexcept {
  if (generation == GetForkGeneration()) {
    ::flock(descriptor, LOCK_UN);
  }
  ::close(descriptor);
}

void RequireOwnLock(unsigned generation, const std::string &path) {
  if (generation != GetForkGeneration()) {
    throw InvalidStateException("The lock of " + StringUtil::Shorten(path) + " belongs to the parent process");
  }
}

} // namespace

PrivateFileLock::PrivateFileLock(std::string path, int descriptor) noexcept
    : m_path(std::move(path)), m_descriptor(descriptor), m_generation(0) {
  const Computation computing; // from now on, forks are counted
  m_generation = GetForkGeneration();
}

PrivateFileLock::~PrivateFileLock() {
  ReleaseLock(m_descriptor, m_generation);
}

std::string PrivateFileLock::Read() const {
  RequireOwnLock(m_generation, m_path);
  return ReadContent(m_descriptor, m_path);
}

void PrivateFileLock::Replace(std::string_view content) {
  RequireOwnLock(m_generation, m_path);
  if (content.size() > PrivateFile::MAX_BYTES) {
    Fail("write", m_path, "the content is larger than 32 MiB");
  }
  const std::string folder = FolderOf(m_path);
  Replacement replacement(m_path);
  replacement.Write(content);
  const int descriptor = replacement.Publish();
  ReleaseLock(m_descriptor, m_generation);
  m_descriptor = descriptor;
  SynchroniseFolder(folder);
}

void PrivateFileLock::Clear() {
  RequireOwnLock(m_generation, m_path);
  if (Uninterrupted([this] { return ::ftruncate(m_descriptor, 0); }) != 0 ||
      Uninterrupted([this] { return ::fsync(m_descriptor); }) != 0) {
    FailWith(errno, "write", m_path);
  }
}

PrivateFile::PrivateFile(std::string path) : m_path(std::move(path)) {
  // The system reads a path as a C string, and would silently ignore what follows a NUL.
  if (m_path.empty() || m_path.find('\0') != std::string::npos) {
    throw InvalidArgumentException("the path of a private file is empty or contains a NUL");
  }
}

boost::optional<std::string> PrivateFile::Read() const {
  const OwnedDescriptor file = Open(m_path, O_RDONLY);
  if (!file.IsOpen()) {
    if (errno == ENOENT) {
      return boost::none;
    }
    RefuseToOpen(errno, m_path);
  }
  RequirePrivate(StatusOf(file.Get(), m_path), m_path);
  return ReadContent(file.Get(), m_path);
}

std::unique_ptr<PrivateFileLock> PrivateFile::TryLock() const {
  return TryToLockFile(m_path, OpenOrCreate);
}

std::unique_ptr<PrivateFileLock> PrivateFile::TryLockExisting() const {
  return TryToLockFile(m_path, OpenExisting);
}

} // namespace Tarvel
