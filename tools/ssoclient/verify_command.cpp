// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient verify`: verifies a token exactly as the library does, and shows what it says.

#include "command.h"
#include "token_report.h"
#include "trust.h"

#include <memory>
#include <string>

namespace SsoClient::Tool {
namespace {

struct VerifyOptions {
  TrustOptions trust;
  std::string file;
};

ExitCode Verify(const VerifyOptions &options, const OutputOptions &output) {
  const Tarvel::Crypto::CertificateList trusted = LoadTrusted(options.trust, output);
  const auto token = ReadToken(options.file, trusted, options.trust.toleranceSec);
  WriteOutput(Render(ReportOf(*token), output.format));
  return ExitCode::DONE;
}

} // namespace

Action DefineVerify(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<VerifyOptions>();
  AddTrustOptions(app, options->trust);
  AddTokenArgument(app, options->file);
  return [options, &output] { return Verify(*options, output); };
}

} // namespace SsoClient::Tool
