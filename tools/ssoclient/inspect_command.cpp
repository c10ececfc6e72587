// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient inspect`: shows what a token says, how it deviates from the accepted form, and that it was not verified.

#include "command.h"
#include "token_view.h"
#include "trust.h"

#include <memory>
#include <string>

namespace SsoClient::Tool {

Action DefineInspect(CLI::App &app, const OutputOptions &output) {
  const auto file = std::make_shared<std::string>();
  AddTokenArgument(app, *file);
  return [file, &output] {
    WriteOutput(Render(InspectToken(ReadTokenText(*file)), output.format));
    return ExitCode::DONE;
  };
}

} // namespace SsoClient::Tool
