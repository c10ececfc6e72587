// SPDX-License-Identifier: Apache-2.0
/// @file
/// Calling the service, and what its failures mean to whoever called the tool.

#pragma once

#include "output.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/saml_token.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <functional>
#include <memory>

namespace SsoClient::Tool {

/// Whether a document is the reason, and not the key that signs a request.
bool SaysNoCanonicalForm(const Tarvel::Xml::Security::XmlSecurityException &failure);

/// What `call` returns, which asks the service and does nothing else.
/// @throws SsoException in place of a failure to read what the service has sent, which says nothing about a token that the
///         caller has. Everything else that `call` throws passes.
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

/// Why the services that are known refuse a request. It is sent all the same: the service decides.
struct Doubt {
  const char *warning;
  const char *hint; ///< what to do when the service does refuse it
};

struct IssuedToken {
  std::shared_ptr<const SamlToken> token;
  Tarvel::System::DateTime askedAt; ///< by this machine's clock
};

/// The token that `call` gets from the service; never null.
/// @param doubt null for none
/// @throws SsoException for a response without a token.
/// @throws HintedException when the service refuses a request that there is a doubt about, and as `CallService` does.
IssuedToken AskForToken(const std::function<std::shared_ptr<const SamlToken>()> &call, const Doubt *doubt,
                        const OutputOptions &output);

} // namespace SsoClient::Tool
