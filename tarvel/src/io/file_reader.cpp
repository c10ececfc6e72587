// SPDX-License-Identifier: Apache-2.0

#include <tarvel/io/file_reader.h>

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <cerrno>
#include <fcntl.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Tarvel {

namespace {

[[noreturn]] void ThrowFor(const char *action, const std::string &name, int error) {
  throw IOException("Cannot " + std::string(action) + " " + StringUtil::Shorten(name) + ": " +
                    std::system_category().message(error));
}

class DescriptorReaderImpl : public Reader {
public:
  DescriptorReaderImpl(int descriptor, std::string name) : m_descriptor(descriptor), m_name(std::move(name)) {}

  std::size_t Read(char *buffer, std::size_t length) final {
    for (;;) {
      const ssize_t count = ::read(m_descriptor, buffer, length);
      if (count >= 0) {
        return static_cast<std::size_t>(count);
      }
      if (errno != EINTR) {
        ThrowFor("read", m_name, errno);
      }
    }
  }

protected:
  const int m_descriptor;

private:
  const std::string m_name;
};

class FileReaderImpl final : public DescriptorReaderImpl {
public:
  using DescriptorReaderImpl::DescriptorReaderImpl;
  ~FileReaderImpl() override { ::close(m_descriptor); }
};

int OpenForReading(const std::string &path) {
  // The system reads a path as a C string, and would silently ignore what follows a NUL.
  if (path.find('\0') != std::string::npos) {
    // NOLINTNEXTLINE(readability-redundant-string-cstr): the message shows the path up to its NUL.
    ThrowFor("open", path.c_str(), EINVAL);
  }
  for (;;) {
    const int descriptor = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (descriptor >= 0) {
      return descriptor;
    }
    if (errno != EINTR) {
      ThrowFor("open", path, errno);
    }
  }
}

} // namespace

Ref<Reader> OpenFile(const std::string &path) {
  const int descriptor = OpenForReading(path);
  try {
    return MakeRef<FileReaderImpl>(descriptor, path);
  } catch (...) {
    ::close(descriptor);
    throw;
  }
}

Ref<Reader> CreateDescriptorReader(int descriptor) {
  return MakeRef<DescriptorReaderImpl>(descriptor, "file descriptor " + std::to_string(descriptor));
}

} // namespace Tarvel
