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

/// The texts of all elements in order, as `describe` gives them, with ", " between them. The separator stands wherever
/// something was written before: empty texts at the beginning leave none.
/// @param describe anything that `std::invoke` calls with a pointer to a const element and that returns a text.
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

// The pointers must not be null.
SSOCLIENT_API std::string WriteDelegate(const Delegate *delegate);
SSOCLIENT_API std::string WriteAdviceAttribute(const AdviceAttribute *attribute);
SSOCLIENT_API std::string WriteAdvice(const Advice *advice);

/// What is asked for. Not secret, but it names principals.
SSOCLIENT_API std::string WriteTokenSpec(const TokenSpec &spec);

/// What a log may show of a token: never its identifier, XML, signature, certificate, audience, advice or the subject's
/// full name.
SSOCLIENT_API std::string CreateRedactedDescription(const SamlToken &token);

} // namespace SsoClient
