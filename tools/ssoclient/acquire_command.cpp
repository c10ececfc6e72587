// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient acquire`: asks the service for a token.

#include "command.h"
#include "interruption.h"
#include "operation_events.h"
#include "token_request.h"

#include <memory>

namespace SsoClient::Tool {
namespace {

ExitCode Acquire(const TokenRequestOptions &options, const OutputOptions &output) {
  const TokenRequest request(options, output, ObserverFor(output));
  request.Write([&] {
    const DoubtedCredential given = request.ReadCredential();
    return AskForToken(
        [&] { return request.GetClient()->Acquire(given.credential, request.GetSpec(), GetCallOptions()); },
        given.doubt, output);
  });
  return ExitCode::DONE;
}

} // namespace

Action DefineAcquire(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<TokenRequestOptions>();
  AddTokenRequestOptions(app, *options);
  return [options, &output] { return Acquire(*options, output); };
}

} // namespace SsoClient::Tool
