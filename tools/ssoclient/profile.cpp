// SPDX-License-Identifier: Apache-2.0

#include "profile.h"

#include "option.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/xml/parser.h>

namespace SsoClient::Tool {
namespace {

constexpr const char *STRICT = "strict";
constexpr const char *SAML2 = "saml2";

/// Why the token is refused; empty if it is accepted.
std::string RefusalOf(const std::string &xml, const Tarvel::Crypto::CertificateList &trusted,
                      const VerifyOptions &options) {
  try {
    TokenVerifier(trusted, options).Verify(xml);
    return {};
  } catch (const InvalidTokenException &refusal) {
    return refusal.what();
  } catch (const Tarvel::Xml::XMLParseException &refusal) {
    return refusal.what();
  }
}

} // namespace

void AddProfileOption(CLI::App &app, std::string &profile) {
  profile = STRICT;
  AddOption(app, "--profile", profile,
            "The form of token that is accepted: \"strict\" is that of the service for which the tool was written, "
            "\"saml2\" also that of other services")
      .OneOf({STRICT, SAML2})
      .ShowDefault()
      .TypeName("NAME");
}

TokenProfile ProfileOf(const std::string &name) noexcept {
  return name == SAML2 ? TokenProfile::SAML2 : TokenProfile::STRICT;
}

std::string OtherProfileHint(const std::string &xml, const Tarvel::Crypto::CertificateList &trusted,
                             const VerifyOptions &options) {
  if (options.profile == TokenProfile::SAML2) {
    return {};
  }
  VerifyOptions other = options;
  other.profile = TokenProfile::SAML2;
  const std::string refusal = RefusalOf(xml, trusted, other);
  if (refusal.empty()) {
    return "--profile saml2 accepts this token";
  }
  return refusal == RefusalOf(xml, trusted, options) ? std::string()
                                                     : "--profile saml2 does not accept this token either: " + refusal;
}

} // namespace SsoClient::Tool
