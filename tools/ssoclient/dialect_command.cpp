// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient dialect`: lists the dialects, or writes one as a file that can be edited.

#include "command.h"
#include "dialect_file.h"
#include "dialect_options.h"
#include "option.h"

#include <ssoclient/service_dialect.h>

#include <nlohmann/json.hpp>

#include <memory>
#include <string>

namespace SsoClient::Tool {
namespace {

std::string RenderNames(Format format) {
  if (format == Format::JSON) {
    return nlohmann::ordered_json{{"schema", 1}, {"dialects", GetDialectNames()}}.dump() + "\n";
  }
  std::string lines;
  for (const std::string &name : GetDialectNames()) {
    lines += name + "\n";
  }
  return lines;
}

ExitCode ShowDialect(const std::string &nameOrFile, const OutputOptions &output) {
  if (output.format == Format::XML) {
    throw UsageException("a dialect has no XML form; give --format text or json");
  }
  WriteOutput(nameOrFile.empty() ? RenderNames(output.format) : WriteDialect(LoadDialect(nameOrFile)));
  return ExitCode::DONE;
}

} // namespace

Action DefineDialect(CLI::App &app, const OutputOptions &output) {
  const auto nameOrFile = std::make_shared<std::string>();
  AddOption(app, "DIALECT", *nameOrFile, "Name or file of the dialect to write as JSON; without it, list the names")
      .TypeName("");
  return [nameOrFile, &output] { return ShowDialect(*nameOrFile, output); };
}

} // namespace SsoClient::Tool
