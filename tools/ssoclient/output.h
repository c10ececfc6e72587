// SPDX-License-Identifier: Apache-2.0
/// @file
/// How the tool reads its input and writes its output, warnings and failures.

#pragma once

#include <cstddef>
#include <exception>
#include <string>
#include <string_view>

namespace SsoClient::Tool {

enum class Format { TEXT, JSON, XML };

/// What every command lets its caller choose about output.
struct OutputOptions {
  Format format = Format::TEXT;
  bool verbose = false;
};

/// `text` with everything that could steer a terminal, or feign lines of its own, written as \uXXXX: control
/// characters, line and paragraph separators, and the characters that turn the direction of text. `text` is UTF-8.
std::string Printable(std::string_view text);

/// The same, cut at the length of a value (`Tarvel::StringUtil::MAX_VALUE_BYTES`).
std::string PrintableValue(std::string_view text);

/// The octets of the file `path`, or of standard input when it is "-", at most `limit` of them.
/// @throws Tarvel::IOException naming the path.
std::string ReadInput(const std::string &path, std::size_t limit);

/// Writes all of `text` to standard output.
/// @throws Tarvel::IOException when it cannot be written in full.
void WriteOutput(std::string_view text);

/// One line on standard error, for what comes after the command's success.
void Warn(std::string_view message);

/// The same for what a failure may follow. In JSON nothing is written unless the caller wants to see more: a program
/// expects the failure's object there, and nothing else.
void Warn(std::string_view message, const OutputOptions &output);

/// From now on each line that the library logs goes to standard error, as a line of its own.
void ShowLibraryLog();

/// Reports `failure` on standard error: one line of text, and a second one for a hint, or one line of JSON when that is the
/// format.
void ReportFailure(const std::exception &failure, Format format);

} // namespace SsoClient::Tool
