// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient inspect`: tells what a token says, and that nobody checked it.

#include "command.h"
#include "token_report.h"
#include "trust.h"

#include <tarvel/xml/parser.h>

#include <memory>
#include <string>

namespace SsoClient::Tool {

Action DefineInspect(CLI::App &app, const OutputOptions &output) {
  const auto file = std::make_shared<std::string>();
  AddTokenArgument(app, *file);
  return [file, &output] {
    // One octet more than the parser takes, so that the parser is the one to refuse it.
    WriteOutput(Render(InspectToken(ReadInput(*file, Tarvel::Xml::MAX_DOCUMENT_BYTES + 1)), output.format));
    return ExitCode::DONE;
  };
}

} // namespace SsoClient::Tool
