// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient verify`: verifies a token exactly as the library does, and shows what it says, or why it is refused.

#include "command.h"
#include "option.h"
#include "token_view.h"
#include "trust.h"

#include <ssoclient/token_verifier.h>

#include <exception>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Demands";

struct VerifyArguments {
  TrustOptions trust;
  std::vector<std::string> acceptedAudiences;
  std::string confirmation; ///< "bearer" or "holder-of-key"; empty: both are accepted
  bool explain = false;
  std::string file;
};

VerifyOptions DemandsOf(const VerifyArguments &arguments) {
  VerifyOptions demands;
  demands.clockToleranceSec = arguments.trust.toleranceSec;
  demands.acceptedAudiences.insert(arguments.acceptedAudiences.begin(), arguments.acceptedAudiences.end());
  if (!arguments.confirmation.empty()) {
    demands.requiredConfirmation =
        arguments.confirmation == ConfirmationText(SamlToken::BEARER) ? SamlToken::BEARER : SamlToken::HOLDER_OF_KEY;
  }
  return demands;
}

/// Shows the report, and also the token if it is accepted.
/// @throws the exception that refuses the token, after the report has been written
ExitCode Explain(const TokenVerifier &verifier, std::string xml, const OutputOptions &output) {
  TokenView view;
  std::exception_ptr refusal;
  try {
    view = ViewOf(*verifier.Verify(xml));
  } catch (const Tarvel::Exception &) {
    refusal = std::current_exception();
  }
  view.report = ReportView{verifier.Explain(xml)};
  view.xml = std::move(xml);
  WriteOutput(Render(view, output.format));
  if (refusal) {
    std::rethrow_exception(refusal);
  }
  return ExitCode::DONE;
}

ExitCode Verify(const VerifyArguments &arguments, const OutputOptions &output) {
  if (arguments.explain && output.format == Format::XML) {
    throw UsageException("--explain has no XML form; give --format text or json");
  }
  const Tarvel::Crypto::CertificateList trusted = LoadTrusted(arguments.trust, output);
  const TokenVerifier verifier(trusted, DemandsOf(arguments));
  if (arguments.explain) {
    return Explain(verifier, ReadTokenText(arguments.file), output);
  }
  WriteOutput(Render(ViewOf(*ReadToken(arguments.file, verifier)), output.format));
  return ExitCode::DONE;
}

} // namespace

Action DefineVerify(CLI::App &app, const OutputOptions &output) {
  const auto arguments = std::make_shared<VerifyArguments>();
  AddTrustOptions(app, arguments->trust);
  AddOption(app, "--accept-audience", arguments->acceptedAudiences,
            "Refuse a token that is restricted to other audiences; may be repeated")
      .TypeName("URI")
      .Group(GROUP);
  AddOption(app, "--require", arguments->confirmation, "Refuse a token with another confirmation")
      .OneOf({"bearer", "holder-of-key"})
      .TypeName("KIND")
      .Group(GROUP);
  AddFlag(app, "--explain", arguments->explain, "Show each check of the token, and what to do if it fails");
  AddTokenArgument(app, arguments->file);
  return [arguments, &output] { return Verify(*arguments, output); };
}

} // namespace SsoClient::Tool
