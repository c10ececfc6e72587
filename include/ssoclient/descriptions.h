// SPDX-License-Identifier: Apache-2.0
/// @file
/// One-line texts of the public records for log lines.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/delegate.h>
#include <ssoclient/export.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_spec.h>

#include <functional>
#include <string>
#include <vector>

namespace SsoClient {

/// The texts that `describe` returns for the elements, in order and separated by ", ". Empty texts at the beginning are not
/// followed by a separator.
/// @param describe anything that `std::invoke` can call with a pointer to a const element and that returns a text
template <typename Element, typename Describe>
std::string AsString(const std::vector<Element> &elements, const Describe &describe) {
  std::string text;
  for (const Element &element : elements) {
    if (!text.empty()) {
      text += ", ";
    }
    text += std::invoke(describe, &element);
  }
  return text;
}

/// The principal and the time of a delegation. `delegate` must not be null.
SSOCLIENT_API std::string WriteDelegate(const Delegate *delegate);

/// The name and the values of an attribute. `attribute` must not be null.
SSOCLIENT_API std::string WriteAdviceAttribute(const AdviceAttribute *attribute);

/// The source of an advice and its attributes. `advice` must not be null.
SSOCLIENT_API std::string WriteAdvice(const Advice *advice);

/// All fields of a specification. The text is not secret, but contains the names of principals.
SSOCLIENT_API std::string WriteTokenSpec(const TokenSpec &spec);

/// A description of a token for logs. It never contains the token's identifier, XML, signature, certificate, audience
/// or advice, nor the full name of the subject.
SSOCLIENT_API std::string CreateRedactedDescription(const SamlToken &token);

} // namespace SsoClient
