// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient check-message`: checks a SOAP message with a token exactly as the library does, and shows what its sender
/// proved, or why it is refused.

#include "command.h"
#include "message_parts.h"
#include "message_view.h"
#include "option.h"
#include "trust.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/proof/exceptions.h>
#include <ssoclient/proof/message_verifier.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/core/exception.h>

#include <cstdint>
#include <exception>
#include <memory>
#include <string>
#include <vector>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Demands";
constexpr const char *EXPLAIN_HINT = "ssoclient check-message --explain shows each check of the message";
constexpr std::int64_t MOST_SECONDS = 24 * 60 * 60;

struct CheckMessageOptions {
  TrustOptions trust;
  std::vector<std::string> acceptedAudiences;
  MessagePartsOptions message;
  bool acceptsBearer = false;
  bool acceptsNoTimestamp = false;
  bool requiresSignedToken = false;
  std::string peerCertificateFile;
  std::int64_t messageToleranceSec = MessageVerifierOptions().clockToleranceSec;
  std::int64_t maxAgeSec = MessageVerifierOptions().maxAgeSec;
  bool explain = false;
  std::string file;
};

MessageVerifierOptions DemandsOf(const CheckMessageOptions &options) {
  MessageVerifierOptions demands;
  demands.role = ActorOf(options.message);
  demands.requiredParts = ParseParts(options.message.parts);
  demands.acceptBearer = options.acceptsBearer;
  demands.requireTimestamp = !options.acceptsNoTimestamp;
  demands.requireTokenCovered = options.requiresSignedToken;
  demands.clockToleranceSec = options.messageToleranceSec;
  demands.maxAgeSec = options.maxAgeSec;
  return demands;
}

VerifyOptions TokenDemandsOf(const CheckMessageOptions &options) {
  VerifyOptions demands = VerifyOptionsOf(options.trust);
  demands.acceptedAudiences.insert(options.acceptedAudiences.begin(), options.acceptedAudiences.end());
  return demands;
}

/// The certificate of the sender; null when none is given.
Tarvel::Ref<const Tarvel::Crypto::Certificate> LoadPeer(const CheckMessageOptions &options) {
  if (options.peerCertificateFile.empty()) {
    return {};
  }
  return Tarvel::Crypto::LoadCertificates(options.peerCertificateFile).front();
}

/// @throws HintedException for a message or a token that is refused
AcceptedMessage Verify(const MessageVerifier &verifier, const std::string &message,
                       const Tarvel::Crypto::Certificate *peerCertificate) {
  try {
    return ReadAsMessage([&] { return ViewOf(verifier.Verify(message, peerCertificate)); });
  } catch (const InvalidMessageException &refusal) {
    throw HintedException(refusal, EXPLAIN_HINT);
  } catch (const InvalidTokenException &refusal) {
    throw HintedException(refusal, EXPLAIN_HINT);
  }
}

/// Shows the report, and also the message if it is accepted.
/// @throws the exception that refuses the message, after the report has been written
ExitCode Explain(const MessageVerifier &verifier, const std::string &message,
                 const Tarvel::Crypto::Certificate *peerCertificate, Format format) {
  MessageView view;
  std::exception_ptr refusal;
  try {
    view.accepted = ViewOf(verifier.Verify(message, peerCertificate));
  } catch (const Tarvel::Exception &) {
    refusal = std::current_exception();
  }
  view.report = verifier.Explain(message, peerCertificate);
  WriteOutput(Render(view, format));
  if (refusal) {
    std::rethrow_exception(refusal);
  }
  return ExitCode::DONE;
}

ExitCode CheckMessage(const CheckMessageOptions &options, const OutputOptions &output) {
  if (output.format == Format::XML) {
    throw UsageException("a checked message has no XML form; give --format text or json");
  }
  const MessageVerifierOptions demands = DemandsOf(options);
  const TokenVerifier tokens(LoadTrusted(options.trust, output), TokenDemandsOf(options));
  const auto peer = LoadPeer(options);
  const MessageVerifier verifier(tokens, demands);
  const std::string message = ReadTokenText(options.file);
  if (options.explain) {
    return ReadAsMessage([&] { return Explain(verifier, message, peer.get(), output.format); });
  }
  MessageView view;
  view.accepted = Verify(verifier, message, peer.get());
  WriteOutput(Render(view, output.format));
  return ExitCode::DONE;
}

void AddDemands(CLI::App &app, CheckMessageOptions &options) {
  AddOption(app, "--accept-audience", options.acceptedAudiences,
            "Refuse a token that is restricted to other audiences; may be repeated")
      .TypeName("URI")
      .Group(GROUP);
  AddFlag(app, "--allow-bearer", options.acceptsBearer, "Accept a bearer token, which proves nothing").Group(GROUP);
  AddFlag(app, "--allow-no-timestamp", options.acceptsNoTimestamp, "Accept a message without a timestamp").Group(GROUP);
  AddFlag(app, "--require-signed-token", options.requiresSignedToken,
          "Refuse a message whose signature does not cover the token")
      .Group(GROUP);
  AddOption(app, "--peer-cert", options.peerCertificateFile,
            "Certificate with which the sender authenticated in TLS, PEM or DER; of a chain, the first")
      .TypeName("FILE")
      .Group(GROUP);
  AddOption(app, "--message-tolerance", options.messageToleranceSec,
            "By how many seconds the clocks of sender and receiver may differ")
      .Within(0, MOST_SECONDS)
      .ShowDefault()
      .TypeName("S")
      .Group(GROUP);
  AddOption(app, "--max-age", options.maxAgeSec,
            "Refuse a message that was created more seconds ago, in addition to the tolerance")
      .Within(1, MOST_SECONDS)
      .ShowDefault()
      .TypeName("S")
      .Group(GROUP);
}

} // namespace

Action DefineCheckMessage(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<CheckMessageOptions>();
  AddTrustOptions(app, options->trust);
  AddDemands(app, *options);
  AddMessagePartsOptions(
      app, options->message,
      "Header block that must be signed, in addition to the body and the timestamp; may be repeated");
  AddFlag(app, "--explain", options->explain, "Show each check of the message");
  AddMessageArgument(app, options->file);
  return [options, &output] { return CheckMessage(*options, output); };
}

} // namespace SsoClient::Tool
