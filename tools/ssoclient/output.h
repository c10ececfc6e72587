// SPDX-License-Identifier: Apache-2.0
/// @file
/// How the tool reads its input and writes its output, warnings and failures.

#pragma once

#include <cstddef>
#include <exception>
#include <string>
#include <string_view>

namespace SsoClient::Tool {

class InputDescriptor;

enum class Format { TEXT, JSON, XML };

/// The output options that all commands share.
struct OutputOptions {
  Format format = Format::TEXT;
  bool verbose = false;
};

/// `text` in printable form (`Tarvel::StringUtil::Printable`), cut at the length of a value
/// (`Tarvel::StringUtil::MAX_VALUE_BYTES`).
std::string PrintableValue(std::string_view text);

/// The octets of the file `path`, or of standard input when it is "-", at most `limit` of them.
/// @throws Tarvel::IOException naming the path.
std::string ReadInput(const std::string &path, std::size_t limit);

/// The same for a file that is open. `name` is its name in messages.
std::string ReadInput(const InputDescriptor &file, const std::string &name, std::size_t limit);

/// Writes all of `text` to standard output.
/// @throws Tarvel::IOException when it cannot be written in full.
void WriteOutput(std::string_view text);

/// Writes a warning to standard error, as one line. Use it only for warnings that no failure can follow.
void Warn(std::string_view message);

/// The same for warnings that a failure may follow. When the format is JSON, only a verbose command writes them:
/// programs expect only the failure's object on standard error.
void Warn(std::string_view message, const OutputOptions &output);

/// Writes `text` to standard error as one printable line, which is cut at the length of a line
/// (`Tarvel::StringUtil::MAX_LINE_BYTES`).
void WriteLine(std::string_view text);

/// The same for a message that a failure may follow. When the format is JSON, only a verbose command writes it.
void Note(std::string_view message, const OutputOptions &output);

/// From now on each line that the library logs is written to standard error.
void ShowLibraryLog();

/// The report of `failure`: one line in JSON; otherwise one line of text, and a second line for a hint.
std::string FailureText(const std::exception &failure, Format format);

/// Writes that report to standard error.
void ReportFailure(const std::exception &failure, Format format);

} // namespace SsoClient::Tool
