// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient inspect`: shows what a token says, how it deviates from the accepted form, and that it was not verified.

#include "command.h"
#include "profile.h"
#include "token_view.h"
#include "trust.h"

#include <memory>
#include <string>

namespace SsoClient::Tool {
namespace {

struct InspectArguments {
  std::string profile;
  std::string file;
};

} // namespace

Action DefineInspect(CLI::App &app, const OutputOptions &output) {
  const auto arguments = std::make_shared<InspectArguments>();
  AddProfileOption(app, arguments->profile);
  AddTokenArgument(app, arguments->file);
  return [arguments, &output] {
    const TokenProfile profile = ProfileOf(arguments->profile);
    WriteOutput(Render(InspectToken(ReadTokenText(arguments->file), profile), output.format));
    return ExitCode::DONE;
  };
}

} // namespace SsoClient::Tool
