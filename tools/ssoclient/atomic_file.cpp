// SPDX-License-Identifier: Apache-2.0

#include "atomic_file.h"

#include "interruption.h"

#include <tarvel/core/exception.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

[[noreturn]] void ThrowSystemError(const std::string &path, int error) {
  throw Tarvel::IOException(path + ": " + std::strerror(error));
}

[[noreturn]] void ThrowExists(const std::string &path) {
  throw Tarvel::IOException(path + ": already exists; --force replaces it");
}

std::string FolderOf(const std::string &path) {
  const std::size_t slash = path.rfind('/');
  return slash == std::string::npos ? "." : path.substr(0, slash + 1);
}

/// A new file in the folder of the final one. It is deleted unless it is published under the final name.
class TemporaryFile {
public:
  explicit TemporaryFile(const std::string &finalPath)
      : m_finalPath(finalPath), m_path(FolderOf(finalPath) + "/.ssoclient-XXXXXX"), m_unfinished([this] {
          m_descriptor = mkostemp(m_path.data(), O_CLOEXEC); // of mode 0600
          if (m_descriptor < 0) {
            ThrowSystemError(m_finalPath, errno);
          }
          return m_path;
        }) {}
  TemporaryFile(const TemporaryFile &) = delete;
  TemporaryFile &operator=(const TemporaryFile &) = delete;
  ~TemporaryFile() {
    close(m_descriptor);
    if (!m_isPublished) {
      unlink(m_path.c_str());
    }
  }

  void Write(std::string_view content) {
    while (!content.empty()) {
      const ssize_t count = write(m_descriptor, content.data(), content.size());
      if (count < 0 && errno != EINTR) {
        ThrowSystemError(m_finalPath, errno);
      }
      content.remove_prefix(count > 0 ? static_cast<std::size_t>(count) : 0);
    }
    if (fsync(m_descriptor) != 0) {
      ThrowSystemError(m_finalPath, errno);
    }
  }

  void PublishReplacing() {
    if (std::rename(m_path.c_str(), m_finalPath.c_str()) != 0) {
      ThrowSystemError(m_finalPath, errno);
    }
    m_isPublished = true;
  }

  // Makes a hard link, because renaming would replace a file that has been created in the meantime.
  void PublishAsNew() {
    if (link(m_path.c_str(), m_finalPath.c_str()) == 0) {
      return;
    }
    if (errno == EEXIST) {
      ThrowExists(m_finalPath);
    }
    ThrowSystemError(m_finalPath, errno);
  }

private:
  std::string m_finalPath;
  std::string m_path;
  int m_descriptor = -1;
  bool m_isPublished = false;
  const UnfinishedFile m_unfinished; // the last member: destroyed first, after the destructor's body
};

} // namespace

void RequireWritableFile(const std::string &path, bool replace) {
  struct stat status = {};
  if (lstat(path.c_str(), &status) == 0) {
    // A caller does not mean to replace a device or a symbolic link with a token.
    if (!S_ISREG(status.st_mode)) {
      throw Tarvel::IOException(path + ": is not a regular file");
    }
    if (!replace) {
      ThrowExists(path);
    }
  } else if (errno != ENOENT) {
    ThrowSystemError(path, errno);
  }
  if (access(FolderOf(path).c_str(), W_OK | X_OK) != 0) {
    ThrowSystemError(path, errno);
  }
}

void WriteFileWhole(const std::string &path, std::string_view content, bool replace) {
  RequireWritableFile(path, replace);
  TemporaryFile file(path);
  file.Write(content);
  if (replace) {
    file.PublishReplacing();
  } else {
    file.PublishAsNew();
  }
}

} // namespace SsoClient::Tool
