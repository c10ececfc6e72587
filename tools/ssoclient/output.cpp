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

std::string Json(const nlohmann::ordered_json &value) {
  // A file name is not always UTF-8, but the message must still be JSON.
  return value.dump(-1, ' ', true, nlohmann::json::error_handler_t::replace);
}

} // namespace

std::string PrintableValue(std::string_view text) {
  return Tarvel::StringUtil::Shorten(Tarvel::StringUtil::Printable(text));
}

std::string ReadInput(const std::string &path, std::size_t limit) {
  return ReadInput(InputDescriptor(path), path, limit);
}

std::string ReadInput(const InputDescriptor &file, const std::string &name, std::size_t limit) {
  std::string content;
  std::array<char, 65536> buffer;
  while (content.size() < limit) {
    const ssize_t count = read(file.Get(), buffer.data(), std::min(buffer.size(), limit - content.size()));
    if (count == 0) {
      return content;
    }
    if (count < 0 && errno != EINTR) {
      throw Tarvel::IOException(name + ": " + std::strerror(errno));
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

void WriteLine(std::string_view text) {
  // What the library writes is cut already, but escapes make it longer.
  const std::string line =
      "ssoclient: " +
      Tarvel::StringUtil::Shorten(Tarvel::StringUtil::Printable(text), Tarvel::StringUtil::MAX_LINE_BYTES) + "\n";
  std::fputs(line.c_str(), stderr);
}

void Note(std::string_view message, const OutputOptions &output) {
  if (output.format != Format::JSON || output.verbose) {
    WriteLine(message);
  }
}

void ShowLibraryLog() {
  Tarvel::Service::GetApp().GetRootLogger()->SetSink(
      [](const Tarvel::Service::LogRecord &record) { WriteLine("log: " + std::string(record.message)); });
}

std::string FailureText(const std::exception &failure, Format format) {
  const Failure known = Classify(failure);
  const auto *const hinted = dynamic_cast<const HintedException *>(&failure);
  if (format == Format::JSON) {
    nlohmann::ordered_json json = {{"schema", 1}, {"error", {{"class", known.className}, {"message", failure.what()}}}};
    if (hinted) {
      json["error"]["hint"] = hinted->GetHint();
    }
    return Json(json) + "\n";
  }
  std::string lines = "ssoclient: " + std::string(known.label) + ": " + PrintableValue(failure.what()) + "\n";
  if (hinted) {
    lines += "ssoclient: hint: " + PrintableValue(hinted->GetHint()) + "\n";
  }
  return lines;
}

void ReportFailure(const std::exception &failure, Format format) {
  std::fputs(FailureText(failure, format).c_str(), stderr);
}

} // namespace SsoClient::Tool
