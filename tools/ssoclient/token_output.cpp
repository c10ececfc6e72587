// SPDX-License-Identifier: Apache-2.0

#include "token_output.h"

#include "atomic_file.h"
#include "exit_code.h"
#include "option.h"
#include "token_report.h"

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Output";
constexpr const char *STANDARD_OUTPUT = "-";

} // namespace

void AddTokenOutputOptions(CLI::App &app, TokenOutputOptions &options) {
  AddOption(app, "--out", options.file,
            "File for the token's XML, mode 0600, written whole or not at all; \"-\" is standard output, which "
            "then gets nothing else")
      .TypeName("FILE")
      .Group(GROUP);
  AddFlag(app, "--force", options.replace, "Replace the file that is there already").Group(GROUP);
}

void CheckTokenOutput(const TokenOutputOptions &options, const OutputOptions &output) {
  if (options.file == STANDARD_OUTPUT && output.format == Format::JSON) {
    throw UsageException("--out - and --format json cannot share standard output");
  }
  if (!options.file.empty() && options.file != STANDARD_OUTPUT) {
    RequireWritableFile(options.file, options.replace);
  }
}

void WriteToken(const SamlToken &token, const TokenOutputOptions &options, const OutputOptions &output) {
  if (options.file == STANDARD_OUTPUT) {
    WriteOutput(Render(ReportOf(token), Format::XML));
    return;
  }
  if (!options.file.empty()) {
    WriteFileWhole(options.file, Render(ReportOf(token), Format::XML), options.replace);
    if (output.format == Format::XML) {
      return;
    }
  }
  WriteOutput(Render(ReportOf(token), output.format));
}

} // namespace SsoClient::Tool
