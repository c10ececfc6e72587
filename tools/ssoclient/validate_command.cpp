// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient validate`: asks the service whether a token is valid.

#include "command.h"
#include "connection.h"
#include "dialect_options.h"
#include "interruption.h"
#include "operation_events.h"
#include "service_call.h"
#include "trust.h"

#include <memory>
#include <string>

namespace SsoClient::Tool {
namespace {

struct ValidateOptions {
  ConnectionOptions connection;
  DialectOptions dialect;
  TrustOptions trust;
  std::string file;
};

std::string RenderVerdict(bool isValid, Format format) {
  if (format == Format::JSON) {
    return std::string(R"({"schema":1,"valid":)") + (isValid ? "true" : "false") + "}\n";
  }
  return isValid ? "valid\n" : "invalid\n";
}

ExitCode Validate(const ValidateOptions &options, const OutputOptions &output) {
  if (output.format == Format::XML) {
    throw UsageException("a verdict has no XML form; give --format text or json");
  }
  CheckConnection(options.connection);
  ServiceOptions serviceOptions;
  serviceOptions.dialect = ToDialect(options.dialect);
  serviceOptions.observer = ObserverFor(output);

  const Tarvel::Crypto::CertificateList trusted = LoadTrusted(options.trust, output);
  const auto token = ReadToken(options.file, trusted, VerifyOptionsOf(options.trust));
  const auto client = CreateClient(options.connection, trusted, boost::none, serviceOptions);
  const bool isValid = CallService([&] { return client->Validate(token, GetCallOptions()); });
  WriteOutput(RenderVerdict(isValid, output.format));
  return isValid ? ExitCode::DONE : ExitCode::TOKEN_INVALID;
}

} // namespace

Action DefineValidate(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<ValidateOptions>();
  AddConnectionOptions(app, options->connection);
  AddDialectOptions(app, options->dialect);
  AddTrustOptions(app, options->trust);
  AddTokenArgument(app, options->file);
  return [options, &output] { return Validate(*options, output); };
}

} // namespace SsoClient::Tool
