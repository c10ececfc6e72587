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
  std::vector<std::string> recipients;
  std::string inResponseTo;
  std::string senderAddress;
  bool explain = false;
  std::string file;
};

/// Refuses an option that the profile strict would ignore: tokens of that profile state nothing to compare with it.
void RequireSaml2(const char *option, bool isGiven, const VerifyOptions &demands) {
  if (isGiven && demands.profile != TokenProfile::SAML2) {
    throw UsageException(std::string(option) + " needs --profile saml2; tokens of the profile strict do not state it");
  }
}

VerifyOptions DemandsOf(const VerifyArguments &arguments) {
  VerifyOptions demands = VerifyOptionsOf(arguments.trust);
  demands.acceptedAudiences.insert(arguments.acceptedAudiences.begin(), arguments.acceptedAudiences.end());
  if (!arguments.confirmation.empty()) {
    demands.requiredConfirmation =
        arguments.confirmation == ConfirmationText(SamlToken::BEARER) ? SamlToken::BEARER : SamlToken::HOLDER_OF_KEY;
  }
  RequireSaml2("--recipient", !arguments.recipients.empty(), demands);
  RequireSaml2("--in-response-to", !arguments.inResponseTo.empty(), demands);
  RequireSaml2("--sender-address", !arguments.senderAddress.empty(), demands);
  demands.acceptedRecipients.insert(arguments.recipients.begin(), arguments.recipients.end());
  if (!arguments.inResponseTo.empty()) {
    demands.expectedInResponseTo = arguments.inResponseTo;
  }
  if (!arguments.senderAddress.empty()) {
    demands.senderAddress = arguments.senderAddress;
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
  const VerifyOptions demands = DemandsOf(arguments);
  const Tarvel::Crypto::CertificateList trusted = LoadTrusted(arguments.trust, output);
  if (arguments.explain) {
    return Explain(TokenVerifier(trusted, demands), ReadTokenText(arguments.file), output);
  }
  WriteOutput(Render(ViewOf(*ReadToken(arguments.file, trusted, demands)), output.format));
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
  AddOption(app, "--recipient", arguments->recipients,
            "An address of this program (saml2 only): the token must be for one of them; may be repeated")
      .TypeName("URI")
      .Group(GROUP);
  AddOption(app, "--in-response-to", arguments->inResponseTo, "The request that the token must answer (saml2 only)")
      .TypeName("ID")
      .Group(GROUP);
  AddOption(app, "--sender-address", arguments->senderAddress,
            "The network address of the token's sender (saml2 only): refuse a token that states another")
      .TypeName("ADDRESS")
      .Group(GROUP);
  AddFlag(app, "--explain", arguments->explain, "Show each check of the token, and what to do if it fails");
  AddTokenArgument(app, arguments->file);
  return [arguments, &output] { return Verify(*arguments, output); };
}

} // namespace SsoClient::Tool
