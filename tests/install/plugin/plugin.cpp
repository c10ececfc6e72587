// SPDX-License-Identifier: Apache-2.0
// A plug-in that starts an operation which needs the library's threads. No process listens at the address.
#include <ssoclient/exceptions.h>
#include <ssoclient/security_token_service.h>

#include <future>
#include <string>

extern "C" int Run() {
  SsoClient::SecurityTokenServiceConfig config;
  config.stsUrl = "http://127.0.0.1:1/";
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 60;
  std::promise<int> exitCode;
  SsoClient::CreateSecurityTokenService(config)->AcquireTokenAsync(
      "alice@corp.example", "password", spec,
      [&exitCode](const std::shared_ptr<const SsoClient::SamlToken> &, const Tarvel::Exception *failure) {
        exitCode.set_value(dynamic_cast<const SsoClient::CommunicationException *>(failure) ? 0 : 1);
      });
  return exitCode.get_future().get();
}
