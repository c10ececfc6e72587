// SPDX-License-Identifier: Apache-2.0
/// @file
/// Input, output, warnings and failures.

#include "output.h"

#include "exit_code.h"

#include <tarvel/core/exception.h>

#include <nlohmann/json.hpp>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

/// A file descriptor that is closed at the end, unless it is standard input.
class InputFile {
public:
  explicit InputFile(const std::string &path) : m_descriptor(path == "-" ? STDIN_FILENO : Open(path)) {}
  InputFile(const InputFile &) = delete;
  InputFile &operator=(const InputFile &) = delete;
  ~InputFile() {
    if (m_descriptor != STDIN_FILENO) {
      close(m_descriptor);
    }
  }

  int Get() const { return m_descriptor; }

private:
  static int Open(const std::string &path) {
    const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (descriptor < 0) {
      throw Tarvel::IOException(path + ": " + std::strerror(errno));
    }
    return descriptor;
  }

  int m_descriptor;
};

bool CanSteerTerminal(unsigned codePoint) {
  return codePoint < 0x20 || (codePoint >= 0x7F && codePoint <= 0x9F) || codePoint == 0x61C ||
         (codePoint >= 0x200E && codePoint <= 0x200F) || (codePoint >= 0x2028 && codePoint <= 0x202E) ||
         (codePoint >= 0x2066 && codePoint <= 0x2069);
}

/// The code point of one, two or three octets at the start of `text`; longer sequences are none that can steer.
struct Decoded {
  unsigned codePoint;
  std::size_t length;
};

Decoded DecodeShort(std::string_view text) {
  const auto octet = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
  if ((octet(0) & 0xE0u) == 0xC0u && text.size() >= 2) {
    return {((octet(0) & 0x1Fu) << 6) | (octet(1) & 0x3Fu), 2};
  }
  if ((octet(0) & 0xF0u) == 0xE0u && text.size() >= 3) {
    return {((octet(0) & 0x0Fu) << 12) | ((octet(1) & 0x3Fu) << 6) | (octet(2) & 0x3Fu), 3};
  }
  // Also a lone octet of a name that is not UTF-8: it stands for itself, and the C1 controls among them are escaped.
  return {octet(0), 1};
}

std::size_t LengthOfLongSequence(std::string_view text) {
  return (static_cast<unsigned char>(text[0]) & 0xF8u) == 0xF0u && text.size() >= 4 ? 4 : 0;
}

std::string Json(const nlohmann::ordered_json &value) {
  // A name of a file may be no UTF-8; a message must still be JSON.
  return value.dump(-1, ' ', true, nlohmann::json::error_handler_t::replace);
}

} // namespace

std::string Printable(std::string_view text) {
  std::string out;
  while (!text.empty()) {
    const std::size_t longLength = LengthOfLongSequence(text);
    const Decoded decoded = longLength ? Decoded{0x10000, longLength} : DecodeShort(text);
    if (CanSteerTerminal(decoded.codePoint)) {
      std::array<char, 8> escaped{};
      std::snprintf(escaped.data(), escaped.size(), "\\u%04X", decoded.codePoint);
      out += escaped.data();
    } else {
      out += text.substr(0, decoded.length);
    }
    text.remove_prefix(decoded.length);
  }
  return out;
}

std::string ReadInput(const std::string &path, std::size_t limit) {
  const InputFile file(path);
  std::string content;
  std::array<char, 65536> buffer;
  while (content.size() < limit) {
    const ssize_t count = read(file.Get(), buffer.data(), std::min(buffer.size(), limit - content.size()));
    if (count == 0) {
      return content;
    }
    if (count < 0 && errno != EINTR) {
      throw Tarvel::IOException(path + ": " + std::strerror(errno));
    }
    if (count > 0) {
      content.append(buffer.data(), static_cast<std::size_t>(count));
    }
  }
  return content;
}

void WriteOutput(std::string_view text) {
  const bool written = std::fwrite(text.data(), 1, text.size(), stdout) == text.size();
  if (!written || std::fflush(stdout) != 0) {
    throw Tarvel::IOException(std::string("standard output: ") + std::strerror(errno));
  }
}

void Warn(std::string_view message) {
  const std::string line = "ssoclient: warning: " + Printable(message) + "\n";
  std::fputs(line.c_str(), stderr);
}

void ReportFailure(const std::exception &failure, Format format) {
  const Failure known = Classify(failure);
  std::string line;
  if (format == Format::JSON) {
    line = Json({{"schema", 1}, {"error", {{"class", known.className}, {"message", failure.what()}}}});
  } else {
    line = "ssoclient: " + std::string(known.label) + ": " + Printable(failure.what());
  }
  line += '\n';
  std::fputs(line.c_str(), stderr);
}

} // namespace SsoClient::Tool
