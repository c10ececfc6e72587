// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient sign`: puts a token into a SOAP message, and signs the message with the token's key.

#include "atomic_file.h"
#include "command.h"
#include "message_parts.h"
#include "option.h"
#include "own_token.h"
#include "signing_key.h"
#include "token_spec_options.h"

#include <ssoclient/proof/sign_message.h>

#include <memory>
#include <string>
#include <vector>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Message";
constexpr const char *OUTPUT_GROUP = "Output";
constexpr const char *STANDARD_OUTPUT = "-";
constexpr const char *STANDARD_REFERENCE = "standard";
constexpr const char *ESTABLISHED_REFERENCE = "established";

struct SignOptions {
  std::string tokenFile;
  TrustOptions trust;
  SigningKeyOptions key;
  MessagePartsOptions message;
  std::string lifetime = "5m";
  std::string reference = ESTABLISHED_REFERENCE;
  bool isOptional = false; ///< whether a new header may be ignored
  std::string outFile = STANDARD_OUTPUT;
  bool replace = false;
  std::string file;
};

SecurityHeaderOptions HeaderOptionsOf(const SignOptions &options) {
  SecurityHeaderOptions header;
  header.role = ActorOf(options.message);
  header.mustUnderstand = !options.isOptional;
  header.lifetimeSec = ParseLifetime(options.lifetime);
  header.dialect.standardTokenTypeReference = options.reference == STANDARD_REFERENCE;
  return header;
}

void CheckCommandLine(const SignOptions &options) {
  InputClaims claims;
  claims.ClaimFile(options.file, "FILE");
  claims.ClaimFile(options.tokenFile, "--token");
  CheckSigningKey(options.key, claims);
  if (options.outFile != STANDARD_OUTPUT) {
    RequireWritableFile(options.outFile, options.replace);
  }
}

/// A bearer token can only be attached. With a holder-of-key token, its key must sign the message.
void CheckUse(const SamlToken &token, const SignOptions &options) {
  const bool isBearer = token.GetConfirmationMethod() == SamlToken::BEARER;
  if (!isBearer && !options.key.HasKey()) {
    throw UsageException("the token is bound to a key, which must sign the message; give --key or --p12");
  }
  if (isBearer && options.key.HasKey()) {
    throw UsageException("the token is a bearer token, which has no key; leave out --key and --p12");
  }
  if (isBearer && !options.message.parts.empty()) {
    throw UsageException("with a bearer token nothing is signed; leave out --part");
  }
}

std::string Present(const std::string &message, const SamlToken &token, const SignOptions &options,
                    const std::vector<MessagePart> &parts) {
  const SecurityHeaderOptions header = HeaderOptionsOf(options);
  if (token.GetConfirmationMethod() == SamlToken::BEARER) {
    return AttachToken(message, token, header);
  }
  return SignMessage(message, token, *LoadSigningKey(options.key), parts, header);
}

ExitCode Sign(const SignOptions &options, const OutputOptions &output) {
  HeaderOptionsOf(options); // refuses a wrong lifetime before any file is read
  const std::vector<MessagePart> parts = ParseParts(options.message.parts);
  CheckCommandLine(options);
  const auto token = ReadOwnToken(options.tokenFile, options.trust, output);
  CheckUse(*token, options);
  const std::string given = ReadTokenText(options.file);
  std::string message = ReadAsMessage([&] { return Present(given, *token, options, parts); });
  if (message.back() != '\n') {
    message += '\n';
  }
  if (options.outFile == STANDARD_OUTPUT) {
    WriteOutput(message);
  } else {
    WriteFileWhole(options.outFile, message, options.replace);
  }
  return ExitCode::DONE;
}

void AddMessageOptions(CLI::App &app, SignOptions &options) {
  AddMessagePartsOptions(app, options.message,
                         "Header block to sign, in addition to body, timestamp and token; may be repeated");
  AddOption(app, "--lifetime", options.lifetime, "How long the message is valid, such as 90s or 5m")
      .ShowDefault()
      .TypeName("TIME")
      .Group(GROUP);
  AddOption(app, "--token-type-reference", options.reference,
            "How the signature spells the type of the token: \"standard\" is the published spelling")
      .OneOf({ESTABLISHED_REFERENCE, STANDARD_REFERENCE})
      .ShowDefault()
      .TypeName("NAME")
      .Group(GROUP);
  AddFlag(app, "--optional", options.isOptional, "A receiver may ignore a new security header that it does not know")
      .Group(GROUP);
}

} // namespace

Action DefineSign(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<SignOptions>();
  AddOption(app, "--token", options->tokenFile, "The token, an XML file; \"-\" is standard input")
      .Required()
      .TypeName("FILE");
  AddOwnTokenOptions(app, options->trust);
  AddSigningKeyOptions(app, options->key);
  AddMessageOptions(app, *options);
  AddOption(app, "--out", options->outFile,
            "File for the message, mode 0600, written whole or not at all; \"-\" is standard output")
      .ShowDefault()
      .TypeName("FILE")
      .Group(OUTPUT_GROUP);
  AddFlag(app, "--force", options->replace, "Replace an existing file").Group(OUTPUT_GROUP);
  AddMessageArgument(app, options->file);
  return [options, &output] { return Sign(*options, output); };
}

} // namespace SsoClient::Tool
