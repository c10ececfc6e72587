// SPDX-License-Identifier: Apache-2.0

#include "service_call.h"

#include "exit_code.h"

#include <string_view>

namespace SsoClient::Tool {
namespace {

bool BeginsWith(const std::exception &failure, std::string_view begin) {
  return std::string_view(failure.what()).substr(0, begin.size()) == begin;
}

/// Whether the service has answered with a SOAP fault. A fault that is not about credentials has no class of its own,
/// but its text always begins like this.
bool IsRefusal(const SsoException &failure) {
  return dynamic_cast<const InvalidCredentialsException *>(&failure) != nullptr ||
         BeginsWith(failure, "Unexpected SOAP fault: ");
}

} // namespace

bool SaysNoCanonicalForm(const Tarvel::Xml::Security::XmlSecurityException &failure) {
  return BeginsWith(failure, "No canonical form: ");
}

void WarnOf(const Doubt *doubt, const OutputOptions &output) {
  if (doubt) {
    Warn(doubt->warning, output);
  }
}

IssuedToken ExplainDoubt(const std::function<IssuedToken()> &call, const Doubt *const &doubt) {
  try {
    return CallService(call);
  } catch (const SsoException &failure) {
    if (doubt && IsRefusal(failure)) {
      throw HintedException(failure, doubt->hint);
    }
    throw;
  }
}

IssuedToken AskForToken(const std::function<std::shared_ptr<const SamlToken>()> &call, const Doubt *doubt,
                        const OutputOptions &output) {
  WarnOf(doubt, output);
  const Tarvel::System::DateTime askedAt = Tarvel::System::GetUtcDateTime();
  const auto ask = [&]() -> IssuedToken { return {call(), askedAt}; };
  IssuedToken issued = ExplainDoubt(ask, doubt);
  if (!issued.token) {
    throw SsoException("The response holds no token");
  }
  return issued;
}

} // namespace SsoClient::Tool
