// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient inspect`: shows what a token says, and that it was not checked.

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
    // One octet more than the parser accepts, so that the parser refuses a token that is too long.
    WriteOutput(Render(InspectToken(ReadInput(*file, Tarvel::Xml::MAX_DOCUMENT_BYTES + 1)), output.format));
    return ExitCode::DONE;
  };
}

} // namespace SsoClient::Tool
