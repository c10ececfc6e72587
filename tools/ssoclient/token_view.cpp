// SPDX-License-Identifier: Apache-2.0

#include "token_view.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/token_verifier.h>

#include <utility>

#include <unistd.h>

namespace SsoClient::Tool {

TokenView ViewOf(const SamlToken &token) {
  TokenView view;
  view.verified = true;
  view.facts = FactsOf(token);
  view.xml = token.ToXml();
  return view;
}

TokenView InspectToken(std::string xml, TokenProfile profile) {
  VerifyOptions options;
  options.profile = profile;
  const TokenVerifier verifier({}, options);
  TokenReport report = verifier.Explain(xml);
  if (!report.claims.isAssertion) {
    verifier.Verify(xml); // throws the exception that the report quotes
    throw ParseException(report.refusal);
  }
  TokenView view;
  view.facts = FactsOf(report.claims);
  view.report = WithoutTrust(std::move(report));
  view.xml = std::move(xml);
  return view;
}

std::string Render(const TokenView &view, Format format) {
  std::string text = view.xml;
  if (format == Format::TEXT) {
    text = TokenText(view, StyleOf(STDOUT_FILENO));
  }
  if (format == Format::JSON) {
    text = TokenJson(view);
  }
  if (text.empty() || text.back() != '\n') {
    text += '\n';
  }
  return text;
}

} // namespace SsoClient::Tool
