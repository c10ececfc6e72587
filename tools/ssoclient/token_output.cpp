// SPDX-License-Identifier: Apache-2.0

#include "token_output.h"

#include "atomic_file.h"
#include "exit_code.h"
#include "option.h"
#include "token_view.h"
#include "unmet_request.h"

#include <tarvel/core/exception.h>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Output";
constexpr const char *STANDARD_OUTPUT = "-";

/// Shows on standard output what the token in `file` says. A failure is only a warning: the command has done its work,
/// and the token is in its file.
void ShowToken(const std::string &file, const std::string &text) {
  try {
    WriteOutput(text);
  } catch (const Tarvel::IOException &failure) {
    Warn(file + " was written, but what it says cannot be shown: " + failure.what());
  }
}

} // namespace

void AddTokenOutputOptions(CLI::App &app, TokenOutputOptions &options) {
  AddOption(app, "--out", options.file,
            "File for the token's XML, mode 0600, written whole or not at all; \"-\" is standard output, to which "
            "nothing else is then written")
      .TypeName("FILE")
      .Group(GROUP);
  AddOption(app, "--save-refused", options.refusedFile,
            "File for a token that the service issues and the tool refuses, mode 0600; it is secret")
      .TypeName("FILE")
      .Group(GROUP);
  AddFlag(app, "--force", options.replace, "Replace an existing file").Group(GROUP);
}

void CheckTokenOutput(const TokenOutputOptions &options, const OutputOptions &output) {
  if (options.file == STANDARD_OUTPUT && output.format == Format::JSON) {
    throw UsageException("--out - and --format json cannot share standard output");
  }
  if (!options.file.empty() && options.file != STANDARD_OUTPUT) {
    RequireWritableFile(options.file, options.replace);
  }
  if (options.refusedFile == STANDARD_OUTPUT) {
    throw UsageException("--save-refused needs a file; a refused token is not written to standard output");
  }
  if (!options.refusedFile.empty()) {
    if (options.refusedFile == options.file) {
      throw UsageException("--out and --save-refused must be different files");
    }
    RequireWritableFile(options.refusedFile, options.replace);
  }
}

void WriteToken(const IssuedToken &issued, const TokenSpec &spec, const ServiceDialect &dialect,
                std::int64_t toleranceSec, const TokenOutputOptions &options, const OutputOptions &output) {
  TokenView view = ViewOf(*issued.token);
  if (issued.askedAt) {
    view.unmet = FindUnmet(spec, dialect, *issued.askedAt, *view.facts, toleranceSec);
    for (const UnmetRequest &request : *view.unmet) {
      Warn("asked for, but not given by the service: " + request.wanted);
    }
  }

  if (options.file == STANDARD_OUTPUT) {
    WriteOutput(Render(view, Format::XML));
    return;
  }
  if (options.file.empty()) {
    WriteOutput(Render(view, output.format));
    return;
  }
  WriteFileWhole(options.file, Render(view, Format::XML), options.replace);
  if (output.format != Format::XML) {
    ShowToken(options.file, Render(view, output.format));
  }
}

} // namespace SsoClient::Tool
