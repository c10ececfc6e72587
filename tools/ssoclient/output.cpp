// SPDX-License-Identifier: Apache-2.0
/// @file
/// Input, output, warnings and failures.

#include "output.h"

#include "exit_code.h"
#include "input_descriptor.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/service/app.h>

#include <nlohmann/json.hpp>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include <unistd.h>

namespace SsoClient::Tool {
namespace {

bool CanSteerTerminal(unsigned codePoint) {
  return codePoint < 0x20 || (codePoint >= 0x7F && codePoint <= 0x9F) || codePoint == 0x61C ||
         (codePoint >= 0x200E && codePoint <= 0x200F) || (codePoint >= 0x2028 && codePoint <= 0x202E) ||
         (codePoint >= 0x2066 && codePoint <= 0x2069);
}

struct Decoded {
  unsigned codePoint;
  std::size_t length;
};

/// The length of the UTF-8 sequence that begins with `lead`; 1 for an octet that cannot begin one.
std::size_t AnnouncedLength(unsigned char lead) {
  if (lead < 0xC2 || lead > 0xF4) {
    return 1;
  }
  return lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
}

/// The first code point of `text`. An octet that does not begin a complete sequence, for example in a name that is not
/// UTF-8, counts as one code point, so that a control character after it is found.
Decoded DecodeFirst(std::string_view text) {
  const auto octet = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
  const std::size_t length = AnnouncedLength(octet(0));
  if (length == 1 || length > text.size()) {
    return {octet(0), 1};
  }
  unsigned codePoint = octet(0) & (0x7Fu >> length);
  for (std::size_t i = 1; i < length; ++i) {
    if ((octet(i) & 0xC0u) != 0x80u) {
      return {octet(0), 1};
    }
    codePoint = (codePoint << 6) | (octet(i) & 0x3Fu);
  }
  return {codePoint, length};
}

std::string Json(const nlohmann::ordered_json &value) {
  // A file name is not always UTF-8, but the message must still be JSON.
  return value.dump(-1, ' ', true, nlohmann::json::error_handler_t::replace);
}

} // namespace

std::string Printable(std::string_view text) {
  std::string out;
  while (!text.empty()) {
    const Decoded decoded = DecodeFirst(text);
    if (CanSteerTerminal(decoded.codePoint)) {
      std::array<char, 12> escaped{}; // enough for any 32 bits
      std::snprintf(escaped.data(), escaped.size(), "\\u%04X", decoded.codePoint);
      out += escaped.data();
    } else {
      out += text.substr(0, decoded.length);
    }
    text.remove_prefix(decoded.length);
  }
  return out;
}

std::string PrintableValue(std::string_view text) {
  return Tarvel::StringUtil::Shorten(Printable(text));
}

std::string ReadInput(const std::string &path, std::size_t limit) {
  const InputDescriptor file(path);
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
  const std::string line = "ssoclient: warning: " + PrintableValue(message) + "\n";
  std::fputs(line.c_str(), stderr);
}

void Warn(std::string_view message, const OutputOptions &output) {
  if (output.format != Format::JSON || output.verbose) {
    Warn(message);
  }
}

void ShowLibraryLog() {
  Tarvel::Service::GetApp().GetRootLogger()->SetSink([](const Tarvel::Service::LogRecord &record) {
    // The logger has already cut the message, but escapes make it longer.
    const std::string text = Tarvel::StringUtil::Shorten(Printable(record.message), Tarvel::StringUtil::MAX_LINE_BYTES);
    const std::string line = "ssoclient: log: " + text + "\n";
    std::fputs(line.c_str(), stderr);
  });
}

void ReportFailure(const std::exception &failure, Format format) {
  const Failure known = Classify(failure);
  const auto *const hinted = dynamic_cast<const HintedException *>(&failure);
  std::string lines;
  if (format == Format::JSON) {
    nlohmann::ordered_json json = {{"schema", 1}, {"error", {{"class", known.className}, {"message", failure.what()}}}};
    if (hinted) {
      json["error"]["hint"] = hinted->GetHint();
    }
    lines = Json(json) + "\n";
  } else {
    lines = "ssoclient: " + std::string(known.label) + ": " + PrintableValue(failure.what()) + "\n";
    if (hinted) {
      lines += "ssoclient: hint: " + hinted->GetHint() + "\n";
    }
  }
  std::fputs(lines.c_str(), stderr);
}

} // namespace SsoClient::Tool
