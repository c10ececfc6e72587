// SPDX-License-Identifier: Apache-2.0
/// @file
/// Calling the service, and what a failure of the call means for the tool's caller.

#pragma once

#include "output.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/saml_token.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <boost/optional.hpp>

#include <functional>
#include <memory>

namespace SsoClient::Tool {

/// Whether the failure is about a document, and not about the key that signs a request.
bool SaysNoCanonicalForm(const Tarvel::Xml::Security::XmlSecurityException &failure);

/// Returns what `call` returns. `call` asks the service and does nothing else.
/// @throws SsoException in place of a failure to read the service's answer, since such a failure says nothing about the
///         caller's own token. Everything else that `call` throws is thrown unchanged.
template <typename Call>
auto CallService(const Call &call) {
  try {
    return call();
  } catch (const ParseException &error) {
    throw SsoException(error.what());
  } catch (const Tarvel::Xml::XMLParseException &error) {
    throw SsoException(error.what());
  } catch (const Tarvel::Xml::Security::XmlSecurityException &error) {
    if (SaysNoCanonicalForm(error)) {
      throw SsoException(error.what());
    }
    throw;
  }
}

/// Why known services refuse a certain request. The request is still sent, since the service decides.
struct Doubt {
  const char *warning;
  const char *hint; ///< what to do when the service has refused the request
};

struct IssuedToken {
  std::shared_ptr<const SamlToken> token;
  /// By this machine's clock; `boost::none` for a token that was not issued for this command.
  boost::optional<Tarvel::System::DateTime> askedAt;
};

/// Prints the doubt as a warning, unless it is null.
void WarnOf(const Doubt *doubt, const OutputOptions &output);

/// Returns what `call` returns, and explains a refusal by the doubt. `call` asks the service and does nothing else.
/// @param doubt null when there is none; `call` may set it, because it is read after the call
/// @throws HintedException when the service refuses a doubtful request. Also throws what `CallService` throws.
IssuedToken ExplainDoubt(const std::function<IssuedToken()> &call, const Doubt *const &doubt);

/// The token that `call` gets from the service; never null.
/// @param doubt null when there is none
/// @throws SsoException for a response without a token.
/// @throws HintedException when the service refuses a doubtful request. Also throws what `CallService` throws.
IssuedToken AskForToken(const std::function<std::shared_ptr<const SamlToken>()> &call, const Doubt *doubt,
                        const OutputOptions &output);

} // namespace SsoClient::Tool
